#ifndef ORVEX_TOOLS_ORVEX_JSON_H_
#define ORVEX_TOOLS_ORVEX_JSON_H_

// A small JSON document builder for the tool's --json outputs: null, bool,
// integers, numbers (shortest text that reads back exactly; null when not
// finite), strings, arrays and objects that keep their keys in insertion
// order (so the printed shape is fixed).
//
// Printing: two-space indentation; a container that holds no container is
// printed on one line ({"level": 0, "width": 4000}), which keeps tables of
// records one record per line.

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

namespace orvex_tool {

class Json {
 public:
  using Array = std::vector<Json>;
  using Object = std::vector<std::pair<std::string, Json>>;

  Json() = default;                                        // null
  Json(bool value) : value_(value) {}                      // NOLINT(google-explicit-constructor)
  Json(int value) : value_(int64_t{value}) {}              // NOLINT(google-explicit-constructor)
  Json(int64_t value) : value_(value) {}                   // NOLINT(google-explicit-constructor)
  Json(uint64_t value) : value_(value) {}                  // NOLINT(google-explicit-constructor)
  Json(double value) : value_(value) {}                    // NOLINT(google-explicit-constructor)
  Json(std::string value) : value_(std::move(value)) {}    // NOLINT(google-explicit-constructor)
  Json(const char* value) : value_(std::string(value)) {}  // NOLINT(google-explicit-constructor)

  static Json MakeArray() { return Json(Array{}); }
  static Json MakeObject() { return Json(Object{}); }

  // Appends to an array; returns *this.
  Json& Append(Json value);
  // Adds a key to an object (keys are not checked for duplicates).
  Json& Set(std::string key, Json value);

  // The document followed by a newline.
  std::string Dump() const;

 private:
  explicit Json(Array value) : value_(std::move(value)) {}
  explicit Json(Object value) : value_(std::move(value)) {}

  bool IsContainer() const;
  void DumpTo(std::string& out, int indent) const;

  std::variant<std::monostate, bool, int64_t, uint64_t, double, std::string, Array, Object> value_;
};

// `text` as a JSON string literal, quotes included.
std::string JsonQuote(std::string_view text);

}  // namespace orvex_tool

#endif  // ORVEX_TOOLS_ORVEX_JSON_H_
