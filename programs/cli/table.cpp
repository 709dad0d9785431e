#include "cli/table.h"

#include <algorithm>
#include <numeric>
#include <utility>

#include "cli/display.h"

namespace cli {

namespace {

constexpr std::size_t kGap = 2;

std::size_t Total(const std::vector<std::size_t>& widths) {
  return std::accumulate(widths.begin(), widths.end(), (widths.size() - 1) * kGap);
}

}  // namespace

Table::Table(std::vector<Column> columns) : columns_(std::move(columns)) {
  for (const Column& column : columns_) {
    widths_.push_back(DisplayWidth(column.title));
  }
}

void Table::Add(const std::vector<std::string>& cells) {
  std::vector<std::string> row;
  for (std::size_t i = 0; i < columns_.size(); ++i) {
    row.push_back(Harmless(cells[i]));
    widths_[i] = std::max(widths_[i], DisplayWidth(row.back()));
  }
  rows_.push_back(std::move(row));
}

std::vector<std::size_t> Table::Fitted(std::size_t width) const {
  std::vector<std::size_t> widths = widths_;
  while (width != 0 && Total(widths) > width) {
    std::size_t widest = columns_.size();
    for (std::size_t i = 0; i < columns_.size(); ++i) {
      const bool better = widest == columns_.size() || widths[i] > widths[widest];
      if (columns_[i].may_shrink && widths[i] > kLeastWidth && better) {
        widest = i;
      }
    }
    if (widest == columns_.size()) {
      break;
    }
    --widths[widest];
  }
  return widths;
}

void Table::PrintRow(std::ostream& out, const std::vector<std::string>& cells,
                     const std::vector<std::size_t>& widths) const {
  std::string line;
  for (std::size_t i = 0; i < cells.size(); ++i) {
    const std::string cell = Cut(cells[i], widths[i]);
    const std::string blanks(widths[i] - std::min(widths[i], DisplayWidth(cell)), ' ');
    line += columns_[i].to_the_right ? blanks + cell : cell + blanks;
    line.append(kGap, ' ');
  }
  line.erase(line.find_last_not_of(' ') + 1);
  out << line << '\n';
}

void Table::Print(std::ostream& out, std::size_t width) const {
  const std::vector<std::size_t> widths = Fitted(width);
  std::vector<std::string> titles;
  for (const Column& column : columns_) {
    titles.push_back(column.title);
  }
  PrintRow(out, titles, widths);
  for (const std::vector<std::string>& row : rows_) {
    PrintRow(out, row, widths);
  }
}

}  // namespace cli
