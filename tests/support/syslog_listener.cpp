#include "support/syslog_listener.h"

#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <stdexcept>
#include <utility>

namespace tuvo_test {

namespace {

constexpr char kPath[] = "/dev/log";
constexpr char kMark[] = "-mark-";
constexpr char kStop[] = "-stop-";

sockaddr_un Address() {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::memcpy(address.sun_path, kPath, sizeof kPath);
  return address;
}

void Send(const char* text) {
  const int fd = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
  const sockaddr_un address = Address();
  if (sendto(fd, text, std::strlen(text), 0, reinterpret_cast<const sockaddr*>(&address),
             sizeof address) < 0) {
    std::perror("sendto /dev/log");
  }
  close(fd);
}

// "<PRI>Mmm dd hh:mm:ss name[pid]: text"
LogLine Parse(const std::string& datagram) {
  const size_t end = datagram.find('>');
  const int pri = std::atoi(datagram.c_str() + 1);
  const size_t colon = datagram.find(": ", end + 1 + 16);
  return {pri & LOG_FACMASK, pri & LOG_PRIMASK, datagram.substr(colon + 2)};
}

}  // namespace

SyslogListener::SyslogListener() : socket_(socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
  if (std::getenv("TUVO_PRIVATE_ROOT") == nullptr) {
    throw std::runtime_error("run this test under scripts/private-root");
  }
  unlink(kPath);
  const sockaddr_un address = Address();
  if (bind(socket_, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0 ||
      chmod(kPath, 0666) != 0) {
    throw std::runtime_error("cannot listen on /dev/log");
  }
  closelog();  // a connection to an earlier listener would swallow the first line
  receiver_ = std::thread([this] { Receive(); });
  // Waits for the thread to be at rest: tests fork next, and the address sanitizer's memory would
  // stay locked for ever in the child of a process in which another thread was just using it.
  Take();
}

SyslogListener::~SyslogListener() {
  Send(kStop);
  receiver_.join();
  close(socket_);
  unlink(kPath);
  closelog();
}

// A thread of its own empties the socket: its queue is short, and a writer waits when it is full.
void SyslogListener::Receive() {
  for (;;) {
    const ssize_t length = recv(socket_, buffer_.data(), buffer_.size(), 0);
    if (length < 0) {
      continue;
    }
    // Nothing is allocated but under the lock: Take leaves this thread at rest.
    const std::lock_guard<std::mutex> lock(mutex_);
    const std::string datagram(buffer_.data(), static_cast<size_t>(length));
    if (datagram == kStop) {
      return;
    }
    if (datagram == kMark) {
      ++marks_seen_;
    } else {
      lines_.push_back(Parse(datagram));
    }
  }
}

std::vector<LogLine> SyslogListener::Take() {
  Send(kMark);  // datagrams arrive in order: once the mark is seen, so is all that came before
  ++marks_sent_;
  for (;;) {
    {
      const std::lock_guard<std::mutex> lock(mutex_);
      if (marks_seen_ == marks_sent_) {
        return std::exchange(lines_, {});
      }
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
}

std::vector<std::string> SyslogListener::TakeTexts() {
  std::vector<std::string> texts;
  for (const LogLine& line : Take()) {
    texts.push_back(line.text);
  }
  return texts;
}

std::string Normalized(const std::string& text) {
  std::string out = text;
  const size_t colon = out.find(':');
  if (colon != std::string::npos) {
    const size_t blank = out.find_first_not_of("0123456789", colon + 1);
    if (blank != colon + 1) {
      out.replace(colon + 1, blank - colon - 1, "LINE");
    }
  }
  const std::string pid = "(" + std::to_string(getpid()) + ")";
  const size_t at = out.find(pid);
  if (at != std::string::npos) {
    out.replace(at, pid.size(), "(PID)");
  }
  return out;
}

}  // namespace tuvo_test
