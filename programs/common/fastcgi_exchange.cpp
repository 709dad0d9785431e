#include "common/fastcgi_exchange.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <utility>

namespace common {

namespace {

constexpr size_t kPiece = 65536;  // the protocol library counts in int

// Some bytes of a file; 0 at its end, -1 on an error.
ssize_t ReadPiece(int fd, std::int64_t offset, std::array<char, kPiece>* piece, size_t size) {
  ssize_t count = 0;
  do {
    count = pread(fd, piece->data(), size, offset);
  } while (count < 0 && errno == EINTR);
  return count;
}

}  // namespace

FastCgiExchange::FastCgiExchange(FCGX_Request* request) : request_(request) {}

FastCgiExchange::~FastCgiExchange() {
  Finish();
}

size_t FastCgiExchange::Read(char* data, size_t size) {
  if (request_ == nullptr) {
    return 0;
  }
  const int count = FCGX_GetStr(data, static_cast<int>(std::min(size, kPiece)), request_->in);
  return count < 0 ? 0 : static_cast<size_t>(count);
}

bool FastCgiExchange::Write(std::string_view bytes) {
  while (request_ != nullptr && !bytes.empty()) {
    const std::string_view piece = bytes.substr(0, kPiece);
    if (FCGX_PutStr(piece.data(), static_cast<int>(piece.size()), request_->out) < 0) {
      return false;
    }
    bytes.remove_prefix(piece.size());
  }
  return bytes.empty();
}

bool FastCgiExchange::WriteFile(int fd, std::int64_t offset, std::int64_t length) {
  std::array<char, kPiece> piece{};
  while (length > 0) {
    const auto size = static_cast<size_t>(std::min<std::int64_t>(length, kPiece));
    const ssize_t count = ReadPiece(fd, offset, &piece, size);
    if (count <= 0 || !Write({piece.data(), static_cast<size_t>(count)})) {
      return false;
    }
    offset += count;
    length -= count;
  }
  return true;
}

bool FastCgiExchange::Finish() {
  FCGX_Request* request = std::exchange(request_, nullptr);
  if (request == nullptr) {
    return true;
  }
  const bool sent = FCGX_FFlush(request->out) == 0;
  FCGX_Finish_r(request);
  FCGX_Free(request, 1);
  return sent;
}

}  // namespace common
