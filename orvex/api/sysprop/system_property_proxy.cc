#include "orvex/api/sysprop/system_property_proxy.h"

#include <cutils/properties.h>

#include "orvex/status/log.h"

namespace orvex {
namespace {

// Reads through the platform into a zeroed value buffer; -1 for an unset or
// empty property (and an empty or absent default).
int PlatformGet(const std::string& key, const char* default_value, std::string& value) {
  // The platform takes C strings: a key with an embedded NUL would silently
  // name a different property.
  if (key.find('\0') != std::string::npos) return -1;
  char buffer[PROPERTY_VALUE_MAX] = {};
  const int length = property_get(key.c_str(), buffer, default_value);
  if (length <= 0) return -1;
  value.assign(buffer);
  return 0;
}

}  // namespace

int SystemPropertyProxy::SystemPropertyGet(const std::string& key, std::string& value) const {
  return PlatformGet(key, nullptr, value);
}

int SystemPropertyProxy::SystemPropertyGet(const std::string& key, const std::string& default_value,
                                           std::string& value) const {
  return PlatformGet(key, default_value.c_str(), value);
}

int SystemPropertyProxy::SystemPropertySet(const std::string& key, const std::string& value) {
  const bool is_fatp_enable = property_get_bool("persist.vendor.camera.fatp.enable", false) != 0;
  ORVEX_CHECK(is_fatp_enable || !key.compare("vendor.camera.debug.force_dpm_mif_clock_war") ||
              !key.compare("vendor.camera.debug.vrix_io_entry_debug_mode_enable"))
      << "PropertySet can slow down program significantly, please refrain from calling this!";
  if (key.find('\0') != std::string::npos || value.find('\0') != std::string::npos) return -1;
  return property_set(key.c_str(), value.c_str());
}

int FakePropertyProxy::SystemPropertyGet(const std::string& key, std::string& value) const {
  auto it = properties_.find(key);
  if (it == properties_.end()) return -1;
  value = it->second;
  return 0;
}

int FakePropertyProxy::SystemPropertyGet(const std::string& key, const std::string& default_value,
                                         std::string& value) const {
  const int result = SystemPropertyGet(key, value);
  if (result == 0) return 0;
  if (default_value.empty()) return result;
  value = default_value;
  return 0;
}

int FakePropertyProxy::SystemPropertySet(const std::string& key, const std::string& value) {
  properties_.insert_or_assign(key, value);
  return 0;
}

}  // namespace orvex
