#include "cli/live_database.h"

#include <gtest/gtest.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/sharing_db.h>

#include <filesystem>

namespace cli {
namespace {

namespace fs = std::filesystem;

const fs::path& Database() {
  static const fs::path path = TUVO::sharing::SZF_SHARING_DB_PATH;
  EXPECT_TRUE(TUVO::sharing::db::SharingDB::Instance().IsGood());
  return path;
}

TEST(CliLiveDatabase, ItsFolderIsTakenWhetherTheFileIsThereOrNot) {
  for (const char* name : {"", "-wal", "-shm", "-journal", ".bak"}) {
    EXPECT_TRUE(BelongsToDatabase(Database().string() + name)) << name;
  }
  EXPECT_TRUE(BelongsToDatabase((Database().parent_path() / "autoblock.db").string()));
  EXPECT_TRUE(BelongsToDatabase((Database().parent_path() / "other").string()));
}

TEST(CliLiveDatabase, FoldersBelowAreTakenToo) {
  const fs::path below = Database().parent_path() / "below";
  fs::create_directory(below);
  EXPECT_TRUE(BelongsToDatabase((below / "x").string()));
  fs::remove(below);
}

TEST(CliLiveDatabase, WaysThereAreFollowed) {
  const fs::path folder = Database().parent_path();
  EXPECT_TRUE(BelongsToDatabase((folder / ".." / folder.filename() / "x").string()));
  fs::create_directory_symlink(folder, "/tmp/way");
  EXPECT_TRUE(BelongsToDatabase("/tmp/way/x"));
  fs::remove("/tmp/way");
  const fs::path here = fs::current_path();
  fs::current_path(folder);
  EXPECT_TRUE(BelongsToDatabase("x"));
  fs::current_path(here);
}

TEST(CliLiveDatabase, OtherNamesOfItsFilesAreTaken) {
  fs::create_symlink(Database(), "/tmp/another");
  EXPECT_TRUE(BelongsToDatabase("/tmp/another"));
  fs::remove("/tmp/another");
}

TEST(CliLiveDatabase, OtherPlacesAreFree) {
  EXPECT_FALSE(BelongsToDatabase("/tmp/sharing.db"));
  EXPECT_FALSE(BelongsToDatabase("/nowhere/x"));
  EXPECT_FALSE(BelongsToDatabase("/x"));
  EXPECT_FALSE(BelongsToDatabase((Database().parent_path().parent_path() / "x").string()));
}

}  // namespace
}  // namespace cli
