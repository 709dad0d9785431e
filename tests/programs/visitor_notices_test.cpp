#include "visitor/notices.h"

#include <gtest/gtest.h>

#include <map>
#include <set>

namespace visitor {
namespace {

const std::map<Notice, int> kStatuses = {
    {Notice::kNotFound, 404},         {Notice::kUsedUp, 410},
    {Notice::kBlocked, 429},          {Notice::kFailure, 500},
    {Notice::kBadRequest, 400},       {Notice::kMethod, 405},
    {Notice::kFromElsewhere, 403},    {Notice::kRange, 416},
    {Notice::kPrecondition, 412},     {Notice::kFileGone, 404},
    {Notice::kFileNotReadable, 500},  {Notice::kMisconfigured, 500},
    {Notice::kOtherApplication, 200}, {Notice::kLoggedOut, 200},
    {Notice::kLogoutFailed, 500},
};

TEST(VisitorNotices, EachHasItsStatus) {
  for (const auto& [notice, status] : kStatuses) {
    EXPECT_EQ(TextOf(notice).status, status) << static_cast<int>(notice);
  }
}

TEST(VisitorNotices, EachSaysSomethingOfItsOwn) {
  std::set<std::string_view> headings;
  for (const auto& [notice, status] : kStatuses) {
    EXPECT_FALSE(TextOf(notice).text.empty());
    headings.insert(TextOf(notice).heading);
  }
  EXPECT_EQ(headings.size(), kStatuses.size());
}

}  // namespace
}  // namespace visitor
