// Tables for people.
#ifndef PROGRAMS_CLI_TABLE_H_
#define PROGRAMS_CLI_TABLE_H_

#include <cstddef>
#include <ostream>
#include <string>
#include <vector>

namespace cli {

struct Column {
  std::string title;
  bool to_the_right = false;  // numbers
  bool may_shrink = false;    // texts that are of use when cut
};

class Table {
 public:
  explicit Table(std::vector<Column> columns);

  // One text for each column; each is made harmless.
  void Add(const std::vector<std::string>& cells);

  // Titles and rows, each column as wide as its widest text. When that is more than `width` (0: any
  // will do), the columns that may shrink do so, the widest first, down to kLeastWidth; what is
  // wider even then stays so.
  void Print(std::ostream& out, std::size_t width) const;

  static constexpr std::size_t kLeastWidth = 8;

 private:
  std::vector<std::size_t> Fitted(std::size_t width) const;
  void PrintRow(std::ostream& out, const std::vector<std::string>& cells,
                const std::vector<std::size_t>& widths) const;

  std::vector<Column> columns_;
  std::vector<std::vector<std::string>> rows_;
  std::vector<std::size_t> widths_;
};

}  // namespace cli

#endif  // PROGRAMS_CLI_TABLE_H_
