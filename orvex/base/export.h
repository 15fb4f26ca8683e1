#ifndef ORVEX_BASE_EXPORT_H_
#define ORVEX_BASE_EXPORT_H_

// ORVEX_EXPORT marks the library's exported interface. The shared library is
// built with hidden visibility, so anything not marked stays internal.
#if defined(__GNUC__) || defined(__clang__)
#define ORVEX_EXPORT [[gnu::visibility("default")]]
#else
#define ORVEX_EXPORT
#endif

#endif  // ORVEX_BASE_EXPORT_H_
