#ifndef ORVEX_TOOLS_ORVEX_TABLE_H_
#define ORVEX_TOOLS_ORVEX_TABLE_H_

// An aligned plain-text table: a header row and data rows, columns separated
// by two spaces, numeric columns right-aligned, no trailing blanks.

#include <string>
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

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_TABLE_H_
