#include "common/event_log.h"

#include <gtest/gtest.h>
#include <syslog.h>

#include <string>
#include <vector>

#include "support/syslog_listener.h"

namespace common {
namespace {

using tuvo_test::SyslogListener;
using Texts = std::vector<std::string>;

TEST(CommonEventLog, LineHasEveryField) {
  SyslogListener listener;
  LogEvent({"login", 7, "192.0.2.1", -9, {}});
  EXPECT_EQ(listener.TakeTexts(), Texts{"sharing event=login link=7 address=192.0.2.1 result=-9"});
}

TEST(CommonEventLog, OwnersChangesNameTheOwner) {
  SyslogListener listener;
  LogEvent({"create", 7, "local", 1, 0U});
  LogEvent({"delete", 7, "2001:db8::1", 205, 4294967294U});
  EXPECT_EQ(listener.TakeTexts(),
            (Texts{"sharing event=create link=7 address=local result=1 by=0",
                   "sharing event=delete link=7 address=2001:db8::1 result=205 by=4294967294"}));
}

TEST(CommonEventLog, PriorityIsInfo) {
  SyslogListener listener;
  LogEvent({"logout", 0, "::1", 1, {}});
  const std::vector<tuvo_test::LogLine> lines = listener.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].facility, LOG_USER);
  EXPECT_EQ(lines[0].priority, LOG_INFO);
}

TEST(CommonEventLog, UnknownAddressIsADash) {
  SyslogListener listener;
  LogEvent({"login", 0, "", -4, {}});
  EXPECT_EQ(listener.TakeTexts(), Texts{"sharing event=login link=0 address=- result=-4"});
}

TEST(CommonEventLog, AddressAddsNoFieldAndNoLine) {
  SyslogListener listener;
  for (const std::string& address :
       {std::string("1 result=1"), std::string("1\nsharing"), std::string("a=b"),
        std::string("%s%n"), std::string(65, '1'), std::string("1\0002", 3)}) {
    LogEvent({"login", 1, address, 1, {}});
    EXPECT_EQ(listener.TakeTexts(), Texts{"sharing event=login link=1 address=- result=1"});
  }
}

}  // namespace
}  // namespace common
