#ifndef ORVEX_BASE_PATH_H_
#define ORVEX_BASE_PATH_H_

// Slash-separated path helpers, directory creation with parents, and a
// reversible string scrambling pair.
//
//   orvex::JoinPath("/data/vendor", "camera/profiler")  // "/data/vendor/camera/profiler"
//   orvex::CleanPath("a//b/./c/../")                    // "a/b"
//
// The string functions are purely lexical: they never look at the file
// system, and ".." is resolved without regard to symbolic links. Functions
// returning std::string_view return a view into their argument.
//
// Thread safety: everything here is stateless and may run from any thread.

#include <string>
#include <string_view>
#include <utility>

#include "orvex/base/export.h"
#include "orvex/status/status.h"

namespace orvex {

// Everything before the last "/"; "/" when the only slash is the first
// character; empty when there is no slash.
ORVEX_EXPORT std::string_view Dirname(std::string_view path);

// Everything after the last "/"; the whole path when there is no slash.
ORVEX_EXPORT std::string_view Basename(std::string_view path);

// (Dirname(path), Basename(path)).
ORVEX_EXPORT std::pair<std::string_view, std::string_view> SplitPath(std::string_view path);

// The text after the last "." of Basename(path); empty when it has no ".".
ORVEX_EXPORT std::string_view Extension(std::string_view path);

// The path with a "/" appended unless it already ends in one; "" stays "".
ORVEX_EXPORT std::string AddSlash(std::string_view path);

// `a` and `b` joined by one "/": a trailing "/" of `a` and a leading "/" of
// `b` merge into one. If either is empty, the other.
ORVEX_EXPORT std::string JoinPath(std::string_view a, std::string_view b);

// The canonical form: runs of "/" collapse, "." components go, ".." removes
// the component before it (at the root of an absolute path it is dropped; at
// the start of a relative path it stays), no trailing "/" except for "/"
// itself, and "." for an empty result. Idempotent; an absolute path stays
// absolute; the result never has more ".." components than the input.
ORVEX_EXPORT std::string CleanPath(std::string_view path);

// Creates the directory `path` and its missing parents with mode 0777 (less
// the process umask). An empty path, "." and "/" succeed at once, and so
// does an existing directory. An error is the errno status of the first
// directory that could not be made, with the message "Error creating
// directory <path>: <reason>". A path with a NUL byte is INVALID_ARGUMENT
// and nothing is made.
ORVEX_EXPORT Status RecursivelyCreateDir(std::string_view path);

// Reverses `text` and XORs every byte with one key byte chosen by the
// length. Applying it twice gives `text` back, so the two are the same
// transformation; only this library's key table reads the result back.
ORVEX_EXPORT std::string Obfuscate(std::string_view text);
ORVEX_EXPORT std::string Deobfuscate(std::string_view text);

}  // namespace orvex

#endif  // ORVEX_BASE_PATH_H_
