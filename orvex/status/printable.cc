#include "orvex/status/printable.h"

namespace orvex {

Printable::~Printable() = default;

std::string Printable::GetInstanceName() const { return std::string(); }

std::ostream& operator<<(std::ostream& os, const Printable& printable) {
  return os << printable.DebugStr();
}

std::string BuildOrvexDebugStr(
    std::string_view type,
    const std::vector<std::pair<std::string_view, std::string_view>>& fields) {
  size_t size = type.size() + 8;
  for (const auto& [name, text] : fields) size += name.size() + text.size() + 4;
  std::string out;
  out.reserve(size);
  out += "{type: ";
  out += type;
  for (const auto& [name, text] : fields) {
    out += ", ";
    out += name;
    out += ": ";
    out += text;
  }
  out += '}';
  return out;
}

std::string BuildOrvexDebugStrWithStrings(
    std::string_view type, const std::vector<std::pair<std::string, std::string>>& fields) {
  std::vector<std::pair<std::string_view, std::string_view>> views;
  views.reserve(fields.size());
  for (const auto& [name, text] : fields) views.emplace_back(name, text);
  return BuildOrvexDebugStr(type, views);
}

}  // namespace orvex
