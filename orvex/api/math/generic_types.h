#ifndef ORVEX_API_MATH_GENERIC_TYPES_H_
#define ORVEX_API_MATH_GENERIC_TYPES_H_

// Plain value types shared across the library: a size, a rectangle and an
// inclusive range.
//
// Thread safety: plain values.

#include <ostream>

namespace orvex {

// Width, then height.
template <typename T>
struct GenericSize {
  T width{};
  T height{};

  friend bool operator==(const GenericSize&, const GenericSize&) = default;
  friend std::ostream& operator<<(std::ostream& os, const GenericSize& s) {
    return os << s.width << "x" << s.height;
  }
};

// Left, top, right, bottom; width = right - left, height = bottom - top.
template <typename T>
struct GenericRoi {
  T left{};
  T top{};
  T right{};
  T bottom{};

  constexpr T width() const { return right - left; }
  constexpr T height() const { return bottom - top; }
  friend bool operator==(const GenericRoi&, const GenericRoi&) = default;
};

}  // namespace orvex

namespace orvex_api {

// An inclusive range [lower, upper].
template <typename T>
struct Range {
  T lower{};
  T upper{};

  friend bool operator==(const Range&, const Range&) = default;
  // "[" lower ", " upper "]", for example "[1, 4]".
  friend std::ostream& operator<<(std::ostream& os, const Range& r) {
    return os << "[" << r.lower << ", " << r.upper << "]";
  }
};

}  // namespace orvex_api

#endif  // ORVEX_API_MATH_GENERIC_TYPES_H_
