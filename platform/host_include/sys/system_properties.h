#ifndef ORVEX_PLATFORM_HOST_SYS_SYSTEM_PROPERTIES_H_
#define ORVEX_PLATFORM_HOST_SYS_SYSTEM_PROPERTIES_H_

// Host builds only: the two limits that Android's C library defines here and
// that cutils/properties.h takes as PROPERTY_KEY_MAX and PROPERTY_VALUE_MAX.
// glibc has no such header; an Android build uses the C library's own.

#define PROP_NAME_MAX 32
#define PROP_VALUE_MAX 92

#endif  // ORVEX_PLATFORM_HOST_SYS_SYSTEM_PROPERTIES_H_
