#ifndef ORVEX_TOOLS_ORVEX_TABLE_H_
#define ORVEX_TOOLS_ORVEX_TABLE_H_

// An aligned plain-text table: a header row and data rows, columns separated
// by two spaces, numeric columns right-aligned, no trailing blanks.

#include <string>
#include <string_view>
#include <vector>

namespace orvex_tool {

class TextTable {
 public:
  enum class Align { kLeft, kRight };
  struct Column {
    std::string header;
    Align align = Align::kLeft;
  };

  explicit TextTable(std::vector<Column> columns) : columns_(std::move(columns)) {}

  // A row with as many cells as there are columns (missing cells are empty,
  // extra cells are dropped).
  void AddRow(std::vector<std::string> cells);

  std::string Render() const;

 private:
  std::vector<Column> columns_;
  std::vector<std::vector<std::string>> rows_;
};

// `text` safe to print on a terminal: control characters (C0, DEL, NUL and
// the UTF-8 encoded C1 range U+0080..U+009F) become "\xHH" or "\u00HH", and
// a backslash becomes "\\", so names read from files cannot move the
// cursor, set the title or hide earlier lines. Other UTF-8 stays as it is.
std::string EscapeControlCharacters(std::string_view text);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_TABLE_H_
