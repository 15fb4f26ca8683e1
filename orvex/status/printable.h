#ifndef ORVEX_STATUS_PRINTABLE_H_
#define ORVEX_STATUS_PRINTABLE_H_

// Printable objects describe themselves in one line of text shaped
//   {type: <Type>, <name>: <value>, ...}
// built with BuildOrvexDebugStr. Writing a Printable to a stream (or to a
// StatusBuilder) writes its DebugStr().
//
// Example:
//
//   std::string Crop::DebugStr() const {
//     return orvex::BuildOrvexDebugStrWithStrings(
//         "Crop", {{"left", std::to_string(left_)}, {"top", std::to_string(top_)}});
//   }
//   // -> "{type: Crop, left: 4, top: 8}"
//
// Thread safety: the free functions are pure.

#include <ostream>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "orvex/base/export.h"

namespace orvex {

class ORVEX_EXPORT Printable {
 public:
  virtual ~Printable();
  // One line describing the object.
  virtual std::string DebugStr() const = 0;
  // The instance's name; empty unless a class supplies one.
  virtual std::string GetInstanceName() const;
};

ORVEX_EXPORT std::ostream& operator<<(std::ostream& os, const Printable& printable);

// "{type: <type>, <name>: <text>, ...}" with names and texts copied as they
// are (nothing quoted or escaped), fields in vector order.
ORVEX_EXPORT std::string BuildOrvexDebugStr(
    std::string_view type,
    const std::vector<std::pair<std::string_view, std::string_view>>& fields);

// BuildOrvexDebugStr over owned strings.
ORVEX_EXPORT std::string BuildOrvexDebugStrWithStrings(
    std::string_view type, const std::vector<std::pair<std::string, std::string>>& fields);

// The elements of `container`, each formatted by `format`, joined by ", "
// and, when kBraces is set, enclosed in "{" and "}" ("{}" when empty).
template <bool kBraces = true, typename Container, typename Formatter>
std::string ContainerDebugStr(const Container& container, Formatter&& format) {
  std::string out;
  if constexpr (kBraces) out += '{';
  bool first = true;
  for (const auto& element : container) {
    if (!first) out += ", ";
    first = false;
    out += format(element);
  }
  if constexpr (kBraces) out += '}';
  return out;
}

}  // namespace orvex

#endif  // ORVEX_STATUS_PRINTABLE_H_
