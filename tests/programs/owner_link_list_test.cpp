#include "owner/link_list.h"

#include <gtest/gtest.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>

#include <algorithm>

namespace owner {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr std::time_t kNow = 1700000000;

class OwnerLinkList : public testing::Test {
 protected:
  void TearDown() override { db_.Execute("DELETE FROM entry"); }

  static Entry Link(const std::string& hash) {
    Entry link;
    link.set_hash(hash).set_project_name("album").set_owner_uid(2001).set_app(Json::objectValue);
    return link;
  }

  void Store(Entry link) { ASSERT_TRUE(EntryDB(db_).Create(link)) << link.get_hash(); }

  // The hashes of the page, in order.
  std::vector<std::string> List(const ListRequest& request) {
    std::vector<Entry> links;
    EXPECT_EQ(ListLinks(db_, request, kNow, &links, &total_), std::nullopt);
    std::vector<std::string> hashes;
    for (const Entry& link : links) {
      hashes.push_back(link.get_hash());
    }
    return hashes;
  }

  std::vector<std::string> Search(const std::string& piece) {
    ListRequest request;
    request.search = piece;
    return List(request);
  }

  using Hashes = std::vector<std::string>;
  SharingDB& db_ = SharingDB::Instance();
  int total_ = -1;
};

TEST_F(OwnerLinkList, EmptyTableHasAnEmptyPage) {
  EXPECT_EQ(List({}), Hashes());
  EXPECT_EQ(total_, 0);
}

TEST_F(OwnerLinkList, WithoutFiltersEverythingIsListedByRow) {
  Store(Link("ccc"));
  Store(Link("aaa"));
  Store(Link("bbb"));
  EXPECT_EQ(List({}), (Hashes{"ccc", "aaa", "bbb"}));
  EXPECT_EQ(total_, 3);
}

TEST_F(OwnerLinkList, FiltersByOwner) {
  Store(Link("aaa"));
  Store(Link("bbb").set_owner_uid(2002));
  ListRequest request;
  request.owner_uid = 2002;
  EXPECT_EQ(List(request), Hashes{"bbb"});
  EXPECT_EQ(total_, 1);
}

TEST_F(OwnerLinkList, FiltersByProject) {
  Store(Link("aaa"));
  Store(Link("bbb").set_project_name("it's"));
  ListRequest request;
  request.project_name = "it's";
  EXPECT_EQ(List(request), Hashes{"bbb"});
}

TEST_F(OwnerLinkList, FiltersByState) {
  Store(Link("aaa"));
  Store(Link("bbb").set_enabled(false));
  ListRequest request;
  request.state = LinkState::kDisabled;
  EXPECT_EQ(List(request), Hashes{"bbb"});
  EXPECT_EQ(total_, 1);
}

TEST_F(OwnerLinkList, FiltersHoldTogether) {
  Store(Link("aaa").set_owner_uid(2002));
  Store(Link("bbb").set_owner_uid(2002).set_enabled(false));
  Store(Link("ccc").set_enabled(false));
  ListRequest request;
  request.owner_uid = 2002;
  request.state = LinkState::kDisabled;
  request.project_name = "album";
  request.search = "b";
  EXPECT_EQ(List(request), Hashes{"bbb"});
  EXPECT_EQ(total_, 1);
}

TEST_F(OwnerLinkList, SearchLooksIntoHashProjectAndTitle) {
  Store(Link("xNEEDLEx"));
  Store(Link("bbb").set_project_name("needles"));
  Store(Link("ccc").set_protect_title("The Needle"));
  Store(Link("ddd"));
  EXPECT_EQ(Search("needle"), (Hashes{"xNEEDLEx", "bbb", "ccc"}));
}

TEST_F(OwnerLinkList, SearchIsForTheTextItself) {
  Store(Link("aaa").set_protect_title("100% sure"));
  Store(Link("bbb").set_protect_title("100 sure"));
  Store(Link("ccc").set_protect_title("a_b"));
  Store(Link("ddd").set_protect_title("a\\b"));
  Store(Link("eee").set_protect_title("it's"));
  EXPECT_EQ(Search("0% s"), Hashes{"aaa"});
  EXPECT_EQ(Search("a_b"), Hashes{"ccc"});
  EXPECT_EQ(Search("a\\b"), Hashes{"ddd"});
  EXPECT_EQ(Search("t's"), Hashes{"eee"});
  EXPECT_EQ(Search("' OR 1=1 --"), Hashes());
}

TEST_F(OwnerLinkList, SearchDoesNotLookIntoTheRestOfTheDocument) {
  Entry link = Link("aaa");
  Json::Value hidden;
  hidden["x"] = "needle";
  link.set_private_data(hidden).set_app(hidden);
  Store(link);
  EXPECT_EQ(Search("needle"), Hashes());
}

TEST_F(OwnerLinkList, RowWhoseDocumentIsNoJsonDoesNotStopASearch) {
  Store(Link("aaa"));
  Store(Link("needle"));
  ASSERT_TRUE(db_.Execute("UPDATE entry SET data = 'x' WHERE hash = 'aaa'"));
  EXPECT_EQ(Search("needle"), Hashes{"needle"});
}

TEST_F(OwnerLinkList, RowThatDoesNotLoadIsCountedAndLeftOut) {
  Store(Link("aaa"));
  Store(Link("bbb"));
  ASSERT_TRUE(db_.Execute("UPDATE entry SET data = 'x' WHERE hash = 'aaa'"));
  EXPECT_EQ(List({}), Hashes{"bbb"});
  EXPECT_EQ(total_, 2);
}

TEST_F(OwnerLinkList, SortsByEveryColumn) {
  Entry first = Link("aaa");
  first.set_project_name("a").set_owner_uid(1).set_enabled(false);
  first.set_start_at(1).set_expire_at(1).set_expire_times(1).set_use_count(1);
  Entry second = Link("bbb");
  second.set_project_name("b").set_owner_uid(20).set_enabled(true);
  second.set_start_at(20).set_expire_at(20).set_expire_times(20).set_use_count(20);
  Store(first);
  Store(second);
  for (const std::string& column : SortColumns()) {
    ListRequest request;
    request.sort = column;
    EXPECT_EQ(List(request), (Hashes{"aaa", "bbb"})) << column;
    request.descending = true;
    EXPECT_EQ(List(request), (Hashes{"bbb", "aaa"})) << column;
  }
}

TEST_F(OwnerLinkList, ColumnsAreTheDocumentedOnes) {
  EXPECT_EQ(SortColumns(), (Hashes{"id", "hash", "project_name", "owner_uid", "enabled", "start_at",
                                   "expire_at", "expire_times", "use_count"}));
}

TEST_F(OwnerLinkList, EqualRowsFollowTheirIds) {
  Store(Link("ccc"));
  Store(Link("aaa"));
  Store(Link("bbb"));
  ListRequest request;
  request.sort = "project_name";
  EXPECT_EQ(List(request), (Hashes{"ccc", "aaa", "bbb"}));
  request.descending = true;
  EXPECT_EQ(List(request), (Hashes{"bbb", "aaa", "ccc"}));
}

TEST_F(OwnerLinkList, PagesAreCutFromTheWhole) {
  for (const char* hash : {"aaa", "bbb", "ccc", "ddd", "eee"}) {
    Store(Link(hash));
  }
  ListRequest request;
  request.limit = 2;
  EXPECT_EQ(List(request), (Hashes{"aaa", "bbb"}));
  EXPECT_EQ(total_, 5);
  request.offset = 4;
  EXPECT_EQ(List(request), Hashes{"eee"});
  request.offset = 9;
  EXPECT_EQ(List(request), Hashes());
  EXPECT_EQ(total_, 5);
}

}  // namespace
}  // namespace owner
