#include "owner/file_link.h"

#include <gtest/gtest.h>
#include <json/value.h>

namespace owner {
namespace {

using TUVO::sharing::record::Entry;

Json::Value App(const char* path) {
  Json::Value app(Json::objectValue);
  app["path"] = path;
  return app;
}

Entry FileOf(unsigned int uid, const char* path) {
  Entry link;
  link.set_project_name("file").set_owner_uid(uid).set_app(App(path));
  return link;
}

FileLook LookOf(unsigned int uid, const char* path, const char* resolved) {
  return {true, uid, App(path), App(resolved)};
}

Error ErrorOf(const MaybeProblem& problem) {
  return problem ? problem->error : Error::kInternal;
}

TEST(OwnerFileLink, LookIsUsedForTheLinkThatItWasOf) {
  Entry link = FileOf(2001, "/a/../b");
  EXPECT_EQ(UseLook(LookOf(2001, "/a/../b", "/b"), &link), std::nullopt);
  EXPECT_EQ(link.get_app(), App("/b"));
}

TEST(OwnerFileLink, LookIsNotUsedForALinkThatHasChanged) {
  const FileLook look = LookOf(2001, "/a", "/b");
  Entry other_file = FileOf(2001, "/c");
  Entry other_owner = FileOf(2002, "/a");
  Entry other_project = FileOf(2001, "/a").set_project_name("photos");
  for (Entry* link : {&other_file, &other_owner, &other_project}) {
    const Json::Value app = link->get_app();
    EXPECT_EQ(ErrorOf(UseLook(look, link)), Error::kBusy);
    EXPECT_EQ(link->get_app(), app);
  }
  Entry file = FileOf(2001, "/a");
  EXPECT_EQ(ErrorOf(UseLook(FileLook(), &file)), Error::kBusy);
}

TEST(OwnerFileLink, LinkOfAnotherProjectIsNotLookedAt) {
  Entry link = FileOf(2001, "/etc/shadow").set_project_name("photos");
  FileLook look;
  EXPECT_EQ(LookAtFile({}, link, false, &look), std::nullopt);
  link.set_owner_uid(2002);
  EXPECT_EQ(UseLook(look, &link), std::nullopt);
  EXPECT_EQ(link.get_app(), App("/etc/shadow"));
}

TEST(OwnerFileLink, LookLeavesTheLinkAsItIs) {
  const Entry link = FileOf(2001, "/nothing/there");
  FileLook look;
  EXPECT_EQ(ErrorOf(LookAtFile({"/nothing"}, link, false, &look)), Error::kFileNotAllowed);
  EXPECT_EQ(link.get_app(), App("/nothing/there"));
}

}  // namespace
}  // namespace owner
