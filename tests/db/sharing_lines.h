// What the migration writes to the system log, whole: with facility, priority, source line, process
// and line feeds.
#ifndef TESTS_DB_SHARING_LINES_H_
#define TESTS_DB_SHARING_LINES_H_

#include <unistd.h>

#include <string>

#include "support/source_line.h"

namespace tuvo_test {

constexpr char kSchemaFolder[] = "/usr/tuvo/share/tuvosharing/db_schema/";

// The line that the statement of sharing_db.cpp which begins with `statement` writes.
inline std::string SharingLine(const std::string& statement, const std::string& message) {
  return "user.err sharing_db:" + std::to_string(SourceLine("db/sharing_db.cpp", statement)) +
         " (" + std::to_string(getpid()) + ") " + message + "\n\n";
}

inline std::string VersionNotAsked(const std::string& reason) {
  const std::string condition = "!pdb_->Execute(\"PRAGMA user_version\", result)";
  return SharingLine("SHARING_RETURN_FALSE_IF(" + condition + ");",
                     "Failed [" + condition + "], err=" + reason);
}

inline std::string NoVersion() {
  return SharingLine("SHARING_LOG_PID(\"user_version", "user_version is not correct");
}

inline std::string CannotMigrate(int from, int to) {
  return SharingLine("SHARING_LOG_PID(\"cannot migrate",
                     "cannot migrate from " + std::to_string(from) + " to " + std::to_string(to));
}

inline std::string CannotOpen(int version, const std::string& reason) {
  return SharingLine(
      "SHARING_LOG_PID(\"file %s",
      "file " + (kSchemaFolder + std::to_string(version)) + ".sql open failed " + reason + ".");
}

inline std::string ScriptFailed(const std::string& reason) {
  const std::string condition = "!pdb_->Execute(sstr.str().c_str())";
  return SharingLine("SHARING_RETURN_FALSE_IF(" + condition + ");",
                     "Failed [" + condition + "], err=" + reason);
}

}  // namespace tuvo_test

#endif  // TESTS_DB_SHARING_LINES_H_
