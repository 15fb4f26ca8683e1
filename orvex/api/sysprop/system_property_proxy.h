#ifndef ORVEX_API_SYSPROP_SYSTEM_PROPERTY_PROXY_H_
#define ORVEX_API_SYSPROP_SYSTEM_PROPERTY_PROXY_H_

// Property proxies: the replaceable back end behind SystemProperties.
//
// SystemPropertyProxy reads and writes Android system properties. Values it
// returns are at most 91 characters (the platform's value buffer), and a
// property set to the empty string reads as missing. Writing is a factory
// test facility: unless "persist.vendor.camera.fatp.enable" is true, only
// two debug keys may be written, and any other write ends the process.
//
// FakePropertyProxy keeps properties in memory for tests; it has no length
// limit, keeps empty values, and allows every write.
//
// Thread safety: SystemPropertyProxy may be used from any thread.
// FakePropertyProxy is not synchronised: use it from one thread at a time.

#include <string>

#include "absl/container/flat_hash_map.h"
#include "orvex/base/export.h"

namespace orvex_api {

// Results: 0 on success, nonzero (typically -1) when there is no value or
// the write failed.
class ORVEX_EXPORT PropertyProxy {
 public:
  virtual ~PropertyProxy() = default;

  // The value of `key`, or -1 when it has none.
  virtual int SystemPropertyGet(const std::string& key, std::string& value) const = 0;
  // As above, with `default_value` standing in for a missing value; -1 when
  // neither gives a value.
  virtual int SystemPropertyGet(const std::string& key, const std::string& default_value,
                                std::string& value) const = 0;
  // Writes `value` under `key`; 0 on success.
  virtual int SystemPropertySet(const std::string& key, const std::string& value) = 0;
};

}  // namespace orvex_api

namespace orvex {

class ORVEX_EXPORT SystemPropertyProxy final : public orvex_api::PropertyProxy {
 public:
  // An unset or empty property gives -1.
  int SystemPropertyGet(const std::string& key, std::string& value) const override;
  // An unset or empty property gives `default_value`; -1 when that is empty.
  int SystemPropertyGet(const std::string& key, const std::string& default_value,
                        std::string& value) const override;
  // Precondition: factory test is enabled, or `key` is one of the two debug
  // keys that may always be written. Returns the platform's result.
  int SystemPropertySet(const std::string& key, const std::string& value) override;
};

class ORVEX_EXPORT FakePropertyProxy final : public orvex_api::PropertyProxy {
 public:
  // A stored value (the empty string included) gives 0; absent gives -1.
  int SystemPropertyGet(const std::string& key, std::string& value) const override;
  // An absent key takes a non-empty `default_value`; -1 when it is empty.
  int SystemPropertyGet(const std::string& key, const std::string& default_value,
                        std::string& value) const override;
  // Stores the value; always 0.
  int SystemPropertySet(const std::string& key, const std::string& value) override;

 private:
  absl::flat_hash_map<std::string, std::string> properties_;
};

}  // namespace orvex

#endif  // ORVEX_API_SYSPROP_SYSTEM_PROPERTY_PROXY_H_
