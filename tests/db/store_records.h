// Legal records for the stores' tests.
#ifndef TESTS_DB_STORE_RECORDS_H_
#define TESTS_DB_STORE_RECORDS_H_

#include <json/value.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/session.h>
#include <tuvosharing/token.h>

#include <ctime>
#include <string>

namespace tuvo_test {

inline TUVO::sharing::record::Entry LegalEntry(const std::string& hash) {
  TUVO::sharing::record::Entry entry;
  entry.set_hash(hash).set_project_name("photo").set_owner_uid(1026).set_app(
      Json::Value(Json::objectValue));
  return entry;
}

inline TUVO::sharing::record::Session LegalSession(const std::string& identifier) {
  TUVO::sharing::record::Session session;
  session.set_session_id(identifier).set_ip("192.0.2.1").set_timeout(std::time(nullptr) + 1000);
  return session;
}

inline TUVO::sharing::record::Token LegalToken(int entry_id, int session_id) {
  TUVO::sharing::record::Token token;
  token.set_entry_id(entry_id);
  token.set_session_id(session_id);
  token.set_timeout(std::time(nullptr) + 1000);
  return token;
}

}  // namespace tuvo_test

#endif  // TESTS_DB_STORE_RECORDS_H_
