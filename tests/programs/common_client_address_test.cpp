#include "common/client_address.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace common {
namespace {

TEST(CommonClientAddress, IsCanonical) {
  setenv("REMOTE_ADDR", "::ffff:192.0.2.1", 1);
  EXPECT_EQ(ClientAddress(), "192.0.2.1");
  setenv("REMOTE_ADDR", "2001:DB8:0::1", 1);
  EXPECT_EQ(ClientAddress(), "2001:db8::1");
}

TEST(CommonClientAddress, IsEmptyWithoutOne) {
  unsetenv("REMOTE_ADDR");
  EXPECT_EQ(ClientAddress(), "");
  setenv("REMOTE_ADDR", "somewhere", 1);
  EXPECT_EQ(ClientAddress(), "");
}

}  // namespace
}  // namespace common
