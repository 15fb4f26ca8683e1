#ifndef ORVEX_PLATFORM_CUTILS_PROPERTIES_H_
#define ORVEX_PLATFORM_CUTILS_PROPERTIES_H_

// Host stand-in for the three Android system-property calls that
// liborvex_base makes. An Android build uses the platform's own header and
// library instead.
//
// Host behaviour, matching the Android property service where a caller can
// tell the difference:
// - one process-wide store of key/value strings, safe to use from any thread;
// - a value holds at most PROPERTY_VALUE_MAX - 1 (91) characters; longer
//   values are refused by property_set;
// - a property set to the empty string reads as unset;
// - keys starting with "ro." can be set only once;
// - keys are non-empty and made of letters, digits and the characters
//   ".-_@:", without a leading, trailing or doubled "."; others are refused.
//
// Seeding: at first use the store loads the file named by the environment
// variable ORVEX_PROPERTIES_FILE (if set), in the Android property-file
// syntax: one "key=value" per line, blank lines and lines starting with "#"
// ignored, whitespace around key and value dropped. Lines that are malformed
// or that the store refuses are reported on stderr and skipped.

#include <stdint.h>

#define PROPERTY_KEY_MAX 32
#define PROPERTY_VALUE_MAX 92

#ifdef __cplusplus
extern "C" {
#endif

// Copies the value of `key` (NUL-terminated, at most PROPERTY_VALUE_MAX
// bytes with the terminator) into `value` and returns its length. When the
// property is unset or empty, copies `default_value` instead (truncated to
// PROPERTY_VALUE_MAX - 1 characters; the empty string when it is null) and
// returns that length. `value` must hold PROPERTY_VALUE_MAX bytes.
__attribute__((visibility("default"))) int property_get(const char* key, char* value,
                                                        const char* default_value);

// Sets `key` to `value` (null reads as the empty string). Returns 0 on
// success and -1 when the key is invalid, the value too long or the key a
// read-only property that is already set.
__attribute__((visibility("default"))) int property_set(const char* key, const char* value);

// Reads `key` as a boolean: "1", "y", "yes", "on", "true" give 1; "0", "n",
// "no", "off", "false" give 0; anything else (unset included) gives
// `default_value`.
__attribute__((visibility("default"))) int8_t property_get_bool(const char* key,
                                                                int8_t default_value);

#ifdef __cplusplus
}
#endif

#endif  // ORVEX_PLATFORM_CUTILS_PROPERTIES_H_
