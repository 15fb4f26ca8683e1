#include "tools/orvex/table.h"

#include <algorithm>

namespace orvex_tool {

void TextTable::AddRow(std::vector<std::string> cells) {
  cells.resize(columns_.size());
  rows_.push_back(std::move(cells));
}

std::string TextTable::Render() const {
  std::vector<size_t> widths(columns_.size());
  for (size_t c = 0; c < columns_.size(); ++c) {
    widths[c] = columns_[c].header.size();
    for (const auto& row : rows_) widths[c] = std::max(widths[c], row[c].size());
  }
  std::string out;
  auto render_row = [&](const std::vector<std::string>& cells) {
    std::string line;
    for (size_t c = 0; c < columns_.size(); ++c) {
      if (c > 0) line += "  ";
      const size_t pad = widths[c] - cells[c].size();
      if (columns_[c].align == Align::kRight) line.append(pad, ' ');
      line += cells[c];
      if (columns_[c].align == Align::kLeft) line.append(pad, ' ');
    }
    line.erase(line.find_last_not_of(' ') + 1);
    out += line;
    out += '\n';
  };
  std::vector<std::string> headers;
  for (const Column& column : columns_) headers.push_back(column.header);
  render_row(headers);
  for (const auto& row : rows_) render_row(row);
  return out;
}

}  // namespace orvex_tool
