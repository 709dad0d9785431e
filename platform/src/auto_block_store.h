// The file of failed logins and denied networks.
#ifndef PLATFORM_SRC_AUTO_BLOCK_STORE_H_
#define PLATFORM_SRC_AUTO_BLOCK_STORE_H_

#include <cstdint>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <variant>

#include "auto_block_config.h"

struct sqlite3;

namespace tuvo_platform {

// What the file holds at most of either kind. A stranger with very many addresses must not fill the
// disk; when there are more, the oldest are forgotten.
constexpr int64_t kMaxAutoBlockRows = 50000;

// One connection to the file, for one operation. Every change is one transaction that takes the
// write lock at its beginning, so processes counting at once lose no count; a process waits up to
// 10 seconds for the others. All members throw std::runtime_error when the file fails them.
class AutoBlockStore {
 public:
  // Opens the file, creating it with mode 0660 and its tables when they are missing.
  explicit AutoBlockStore(const std::string& path);

  // Counts one failed login of `network` at `service` now, unless the network is denied already.
  // When that makes `limits.failures` of them within the window, the network is denied for
  // `limits.block_seconds` and its failures are forgotten: they have had their effect.
  void CountFailure(const std::string& network, const std::string& service,
                    const AutoBlockLimits& limits);

  // Forgets the failures of `network` at every service and lifts its denial.
  void Forget(const std::string& network);

  bool IsDenied(const std::string& network);

 private:
  using Value = std::variant<int64_t, std::string>;

  struct Closer {
    void operator()(sqlite3* database) const;
  };
  class Transaction;

  void Prepare();
  void ForgetWhatIsOver(int64_t now, const AutoBlockLimits& limits);
  void Deny(const std::string& network, int64_t until);
  bool IsDeniedAt(const std::string& network, int64_t now);

  // Runs one statement; the first column of its first row, if there is one.
  std::optional<int64_t> Run(const char* sql, std::initializer_list<Value> values = {});

  std::unique_ptr<sqlite3, Closer> database_;
};

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_AUTO_BLOCK_STORE_H_
