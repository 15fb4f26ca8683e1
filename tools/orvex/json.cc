#include "tools/orvex/json.h"

#include <cmath>

#include "fmt/format.h"
#include "orvex/status/log.h"

namespace orvex_tool {

Json& Json::Append(Json value) {
  ORVEX_CHECK(std::holds_alternative<Array>(value_)) << "Append on a JSON value that is no array";
  std::get<Array>(value_).push_back(std::move(value));
  return *this;
}

Json& Json::Set(std::string key, Json value) {
  ORVEX_CHECK(std::holds_alternative<Object>(value_)) << "Set on a JSON value that is no object";
  std::get<Object>(value_).emplace_back(std::move(key), std::move(value));
  return *this;
}

std::string Json::Dump() const {
  std::string out;
  DumpTo(out, 0);
  out += '\n';
  return out;
}

bool Json::IsContainer() const {
  return std::holds_alternative<Array>(value_) || std::holds_alternative<Object>(value_);
}

void Json::DumpTo(std::string& out, int indent) const {
  // Containers of containers go one element per line; others on one line.
  auto write_elements = [&](const auto& elements, char open, char close, auto&& write_one) {
    bool nested = false;
    for (const auto& element : elements) {
      if (write_one(nullptr, element)) nested = true;
    }
    out += open;
    if (elements.empty()) {
      out += close;
      return;
    }
    const std::string inner(static_cast<size_t>(indent + 2), ' ');
    bool first = true;
    for (const auto& element : elements) {
      if (!first) out += nested ? ",\n" : ", ";
      if (first && nested) out += '\n';
      if (nested) out += inner;
      first = false;
      write_one(&out, element);
    }
    if (nested) {
      out += '\n';
      out.append(static_cast<size_t>(indent), ' ');
    }
    out += close;
  };
  const int child_indent = indent + 2;
  if (std::holds_alternative<std::monostate>(value_)) {
    out += "null";
  } else if (const bool* b = std::get_if<bool>(&value_)) {
    out += *b ? "true" : "false";
  } else if (const int64_t* i = std::get_if<int64_t>(&value_)) {
    out += fmt::format("{}", *i);
  } else if (const uint64_t* u = std::get_if<uint64_t>(&value_)) {
    out += fmt::format("{}", *u);
  } else if (const double* d = std::get_if<double>(&value_)) {
    out += std::isfinite(*d) ? fmt::format("{}", *d) : "null";
  } else if (const std::string* s = std::get_if<std::string>(&value_)) {
    out += JsonQuote(*s);
  } else if (const Array* a = std::get_if<Array>(&value_)) {
    write_elements(*a, '[', ']', [&](std::string* dest, const Json& element) {
      if (dest != nullptr) element.DumpTo(*dest, child_indent);
      return element.IsContainer();
    });
  } else {
    const Object& o = std::get<Object>(value_);
    write_elements(o, '{', '}', [&](std::string* dest, const std::pair<std::string, Json>& kv) {
      if (dest != nullptr) {
        *dest += JsonQuote(kv.first);
        *dest += ": ";
        kv.second.DumpTo(*dest, child_indent);
      }
      return kv.second.IsContainer();
    });
  }
}

std::string JsonQuote(std::string_view text) {
  std::string out = "\"";
  for (char c : text) {
    switch (c) {
      case '"':
        out += "\\\"";
        break;
      case '\\':
        out += "\\\\";
        break;
      case '\n':
        out += "\\n";
        break;
      case '\r':
        out += "\\r";
        break;
      case '\t':
        out += "\\t";
        break;
      default:
        if (static_cast<unsigned char>(c) < 0x20) {
          out += fmt::format("\\u{:04x}", static_cast<unsigned>(static_cast<unsigned char>(c)));
        } else {
          out += c;
        }
    }
  }
  out += '"';
  return out;
}

}  // namespace orvex_tool
