#ifndef ORVEX_API_SYSPROP_SYSTEM_PROPERTIES_H_
#define ORVEX_API_SYSPROP_SYSTEM_PROPERTIES_H_

// SystemProperties: typed access to system properties through a replaceable
// proxy (see system_property_proxy.h).
//
//   auto& props = orvex::SystemProperties::GetInstance();
//   orvex::StatusOr<bool> dump = props.GetAs<bool>("vendor.camera.debug.x");
//
// The process has one instance, created on first use and pointed at the
// process-wide SystemPropertyProxy. SetFake(true) points it at the
// process-wide FakePropertyProxy instead; the fake keeps its contents across
// switches.
//
// Errors:
//   no proxy installed        UNAVAILABLE "API PropertyProxy unset"
//   proxy result r != 0       INTERNAL "API PropertyProxy returned error: <r>
//                             trying to get property with key: <key>" (for
//                             Set: "... trying to set property with key:
//                             <key>, and value: <value>")
//   GetAs parse failure       INVALID_ARGUMENT "system property value: <value>
//                             not convertible to <int|float|bool>"
//
// GetAs parse rules:
//   int    base 0 as strtol reads it (surrounding whitespace, optional sign,
//          "0x" hexadecimal, leading "0" octal, otherwise decimal), all of the
//          text, within 32 bits; failing that, a value of 3 or more
//          characters starting with "0b" is read in base 2 from the rest.
//          Out-of-range values are INVALID_ARGUMENT.
//   float  decimal or scientific notation, "inf" and "nan", with surrounding
//          whitespace; values beyond the float range read as infinity.
//   bool   exactly "1", "true", "yes", "y", "on" or "0", "false", "no", "n",
//          "off" (case-sensitive).
//
// Thread safety: reads and writes may run from any thread while the system
// proxy is installed. SetFake/SetProxy and every use of the fake proxy must
// not run concurrently with other property calls.

#include <atomic>
#include <string>
#include <string_view>

#include "orvex/api/sysprop/system_property_proxy.h"
#include "orvex/base/export.h"
#include "orvex/status/status.h"
#include "orvex/status/statusor.h"

namespace orvex {

class ORVEX_EXPORT SystemProperties {
 public:
  // The process-wide instance (thread-safe first-use construction).
  static SystemProperties& GetInstance();

  SystemProperties(const SystemProperties&) = delete;
  SystemProperties& operator=(const SystemProperties&) = delete;

  // true: use the process-wide FakePropertyProxy; false: use the
  // process-wide SystemPropertyProxy.
  void SetFake(bool fake);

  // Installs a caller-owned proxy, which must outlive its use; nullptr leaves
  // no proxy, so that reads and writes fail with UNAVAILABLE.
  void SetProxy(orvex_api::PropertyProxy* proxy);

  // The value of `key`; INTERNAL when the proxy has none.
  StatusOr<std::string> Get(std::string_view key) const;
  // The value of `key`, or `default_value` when there is none or no proxy.
  std::string Get(std::string_view key, std::string_view default_value) const;
  // Writes `value` under `key`.
  Status Set(std::string_view key, std::string_view value);

  // Get(key) parsed as T (int, float or bool only); Get's error unchanged.
  template <typename T>
  StatusOr<T> GetAs(std::string_view key) const;

 private:
  SystemProperties();

  std::atomic<orvex_api::PropertyProxy*> proxy_;
};

template <>
ORVEX_EXPORT StatusOr<int> SystemProperties::GetAs<int>(std::string_view key) const;
template <>
ORVEX_EXPORT StatusOr<float> SystemProperties::GetAs<float>(std::string_view key) const;
template <>
ORVEX_EXPORT StatusOr<bool> SystemProperties::GetAs<bool>(std::string_view key) const;

}  // namespace orvex

#endif  // ORVEX_API_SYSPROP_SYSTEM_PROPERTIES_H_
