#include "cli/line_reader.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <string>
#include <thread>

#include "cli/failure.h"
#include "common/stream.h"
#include "common/unique_fd.h"

namespace cli {
namespace {

// The reading end of a pipe through which `text` comes.
class Text {
 public:
  explicit Text(const std::string& text) {
    int ends[2] = {-1, -1};
    EXPECT_EQ(pipe(ends), 0);
    end_ = common::UniqueFd(ends[0]);
    writer_ = std::thread([text, fd = ends[1]] {
      const common::UniqueFd out(fd);
      EXPECT_TRUE(common::WriteAll(out.get(), text));
    });
  }
  ~Text() {
    char rest[4096];
    while (read(end_.get(), rest, sizeof(rest)) > 0) {
    }
    writer_.join();
  }
  int fd() const { return end_.get(); }

 private:
  common::UniqueFd end_;
  std::thread writer_;
};

TEST(CliLineReader, LinesComeOneByOneWithoutTheirEnds) {
  const Text text("one\n\ntwo\n");
  LineReader reader(text.fd(), 100);
  std::string line;
  EXPECT_TRUE(reader.Next(&line));
  EXPECT_EQ(line, "one");
  EXPECT_TRUE(reader.Next(&line));
  EXPECT_EQ(line, "");
  EXPECT_TRUE(reader.Next(&line));
  EXPECT_EQ(line, "two");
  EXPECT_FALSE(reader.Next(&line));
  EXPECT_FALSE(reader.Next(&line));
}

TEST(CliLineReader, LastLineMayLackItsEnd) {
  const Text text("one\ntwo");
  LineReader reader(text.fd(), 100);
  std::string line;
  EXPECT_TRUE(reader.Next(&line));
  EXPECT_TRUE(reader.Next(&line));
  EXPECT_EQ(line, "two");
  EXPECT_FALSE(reader.Next(&line));
}

TEST(CliLineReader, LongLinesCrossPieces) {
  const std::string first(200000, 'a');
  const std::string second(70000, 'b');
  const Text text(first + "\n" + second + "\n");
  LineReader reader(text.fd(), 200000);
  std::string line;
  EXPECT_TRUE(reader.Next(&line));
  EXPECT_EQ(line, first);
  EXPECT_TRUE(reader.Next(&line));
  EXPECT_EQ(line, second);
  EXPECT_FALSE(reader.Next(&line));
}

TEST(CliLineReader, LineThatIsTooLongIsAFailure) {
  for (const char* end : {"", "\n"}) {
    const Text text("12345678901" + std::string(end));
    LineReader reader(text.fd(), 10);
    std::string line;
    EXPECT_THROW(reader.Next(&line), Failure);
  }
  const Text endless(std::string(300000, 'x'));
  LineReader reader(endless.fd(), 1000);
  std::string line;
  EXPECT_THROW(reader.Next(&line), Failure);
}

TEST(CliLineReader, ReadingThatFailsIsAFailure) {
  const common::UniqueFd folder(open("/tmp", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  LineReader reader(folder.get(), 10);
  std::string line;
  EXPECT_THROW(reader.Next(&line), Failure);
}

TEST(CliLineReader, AllIsReadUpToTheMost) {
  const Text text(std::string(100000, 'x'));
  EXPECT_EQ(ReadAll(text.fd(), 100000).size(), 100000U);
  const Text more(std::string(100001, 'x'));
  EXPECT_THROW(ReadAll(more.fd(), 100000), Failure);
}

}  // namespace
}  // namespace cli
