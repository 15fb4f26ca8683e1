#include "tools/orvex/table.h"

#include <algorithm>

#include "fmt/format.h"

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

std::string EscapeControlCharacters(std::string_view text) {
  std::string out;
  out.reserve(text.size());
  for (size_t i = 0; i < text.size(); ++i) {
    const auto c = static_cast<unsigned char>(text[i]);
    const auto next = i + 1 < text.size() ? static_cast<unsigned char>(text[i + 1]) : 0;
    if (c < 0x20 || c == 0x7f) {
      out += fmt::format("\\x{:02x}", c);
    } else if (c == 0xc2 && next >= 0x80 && next <= 0x9f) {
      out += fmt::format("\\u{:04x}", next);
      ++i;
    } else if (c == '\\') {
      out += "\\\\";
    } else {
      out += static_cast<char>(c);
    }
  }
  return out;
}

}  // namespace orvex_tool
