#include "login/other_writer.h"

#include <gtest/gtest.h>
#include <tuvosharing/keys.h>
#include <unistd.h>

#include <thread>

#include "db/sqlite_file.h"

namespace tuvo_test {

pid_t StartWriter(const std::string& change, std::chrono::milliseconds hold) {
  int ends[2];
  if (pipe(ends) != 0) {
    return -1;
  }
  const pid_t writer = fork();
  if (writer == 0) {
    SqliteFile file(TUVO::sharing::SZF_SHARING_DB_PATH);
    file.Execute("BEGIN IMMEDIATE; " + change);
    close(ends[1]);
    std::this_thread::sleep_for(hold);
    file.Execute("COMMIT");
    _exit(0);
  }
  close(ends[1]);
  char byte = 0;
  EXPECT_EQ(0, read(ends[0], &byte, 1));  // it has closed its end
  close(ends[0]);
  return writer;
}

}  // namespace tuvo_test
