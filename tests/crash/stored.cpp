#include "crash/stored.h"

#include <gtest/gtest.h>
#include <json/value.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>

#include "concurrency/visitors.h"
#include "db/sqlite_file.h"

namespace tuvo_test {

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

// Repeated so often that a row takes three pages.
constexpr int kRepetitions = 900;

std::string LongText(const std::string& generation) {
  std::string text;
  for (int i = 0; i < kRepetitions; ++i) {
    text += generation + " ";
  }
  return text;
}

}  // namespace

void ExpectGood(const std::string& path) {
  {
    const SharingDB db(path);
    EXPECT_TRUE(db.IsGood());
  }
  SqliteFile file(path);
  EXPECT_EQ("ok", file.Value("PRAGMA integrity_check"));
  EXPECT_TRUE(file.Rows("PRAGMA foreign_key_check").empty());
  EXPECT_EQ("2", file.Value("PRAGMA user_version"));
}

Entry BigLink(int generation) {
  Entry link = OpenLink();
  SetGeneration(link, generation);
  return link;
}

void SetGeneration(Entry& link, int generation) {
  const std::string text = std::to_string(generation);
  Json::Value app(Json::objectValue);
  app["text"] = LongText(text);
  link.set_protect_title(text).set_redirect_uri("/" + text).set_app(app);
}

int GenerationOf(const Entry& link) {
  const std::string text = link.get_protect_title();
  const bool whole = !text.empty() && link.get_redirect_uri() == "/" + text &&
                     link.get_app()["text"].asString() == LongText(text);
  return whole ? std::stoi(text) : -1;
}

std::vector<Entry> StoredLinks(const std::string& path) {
  SharingDB db(path);
  std::vector<Entry> links;
  EXPECT_TRUE(EntryDB(db).Query(links)) << db.GetLastError();
  return links;
}

long NumberIn(const std::string& path, const std::string& sql) {
  return std::stol(SqliteFile(path).Value(sql));
}

std::string Contents(const std::string& path) {
  SqliteFile file(path);
  std::string contents;
  for (const char* table : {"entry", "session", "token", "sqlite_sequence"}) {
    for (const TextRow& row : file.Rows(std::string("SELECT * FROM ") + table + " ORDER BY 1")) {
      contents += table;
      for (const std::string& value : row) {
        contents += '|' + value;
      }
      contents += '\n';
    }
  }
  return contents;
}

}  // namespace tuvo_test
