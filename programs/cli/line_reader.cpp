#include "cli/line_reader.h"

#include <unistd.h>

#include <array>
#include <cerrno>

#include "cli/failure.h"
#include "cli/interrupt.h"

namespace cli {

namespace {

constexpr std::size_t kPiece = 65536;

// Appends what one read gives; false at the end.
bool ReadPiece(int fd, std::string* text) {
  std::array<char, kPiece> piece;
  for (;;) {
    WaitForInput(fd);
    const ssize_t count = read(fd, piece.data(), piece.size());
    if (count >= 0) {
      text->append(piece.data(), static_cast<std::size_t>(count));
      return count > 0;
    }
    if (errno != EINTR) {
      throw SystemFailure("cannot read");
    }
  }
}

}  // namespace

bool LineReader::Fill() {
  ahead_.erase(0, taken_);
  taken_ = 0;
  ended_ = ended_ || !ReadPiece(fd_, &ahead_);
  return !ended_;
}

bool LineReader::Next(std::string* line) {
  std::size_t looked = 0;
  for (;;) {
    const std::size_t end = ahead_.find('\n', taken_ + looked);
    if (end != std::string::npos) {
      *line = ahead_.substr(taken_, end - taken_);
      taken_ = end + 1;
      break;
    }
    looked = ahead_.size() - taken_;
    if (looked > longest_) {
      break;
    }
    if (!Fill()) {
      *line = ahead_.substr(taken_);
      taken_ = ahead_.size();
      return !line->empty();
    }
  }
  if (looked > longest_ || line->size() > longest_) {
    throw Failure(ExitStatus::kUsage, "a line is too long");
  }
  return true;
}

std::string ReadAll(int fd, std::size_t most) {
  std::string text;
  while (text.size() <= most && ReadPiece(fd, &text)) {
  }
  if (text.size() > most) {
    throw Failure(ExitStatus::kUsage, "there is more than " + std::to_string(most) + " bytes");
  }
  return text;
}

}  // namespace cli
