#ifndef ORVEX_BASE_TESTING_SCRATCH_MOUNT_H_
#define ORVEX_BASE_TESTING_SCRATCH_MOUNT_H_

// Small file systems for fault-injection tests: a size-limited or read-only
// tmpfs mounted in a private mount namespace of the calling process. The
// namespace comes with a user namespace when the process may make one, so
// neither root nor any privilege is needed where the kernel allows it, and
// nothing is visible outside the process.
//
// Call MountScratchTmpfs only in a child process (a death test's statement):
// the namespaces cannot be left again. ScratchMountsAvailable() probes in a
// throw-away child so that a test can skip where the kernel refuses.

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <string>

namespace orvex::testing {

namespace scratch_internal {

inline bool WriteProcFile(const char* path, const std::string& text) {
  const int fd = open(path, O_WRONLY | O_CLOEXEC);
  if (fd < 0) return false;
  const bool ok = write(fd, text.data(), text.size()) == static_cast<ssize_t>(text.size());
  close(fd);
  return ok;
}

// Enters a mount namespace of its own whose mounts do not propagate.
inline bool EnterPrivateMountNamespace() {
  const uid_t uid = geteuid();
  const gid_t gid = getegid();
  if (unshare(CLONE_NEWUSER | CLONE_NEWNS) == 0) {
    // Keep the same identity inside, so that files stay ours.
    if (!WriteProcFile("/proc/self/setgroups", "deny") ||
        !WriteProcFile("/proc/self/uid_map",
                       std::to_string(uid) + " " + std::to_string(uid) + " 1") ||
        !WriteProcFile("/proc/self/gid_map",
                       std::to_string(gid) + " " + std::to_string(gid) + " 1")) {
      return false;
    }
  } else if (unshare(CLONE_NEWNS) != 0) {
    return false;
  }
  return mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
}

}  // namespace scratch_internal

// Mounts a tmpfs with `options` (for example "size=16k") on the existing
// directory `path`, read-only when `read_only`. Returns false on failure.
inline bool MountScratchTmpfs(const std::string& path, const std::string& options,
                              bool read_only = false) {
  if (!scratch_internal::EnterPrivateMountNamespace()) return false;
  return mount("orvex_scratch", path.c_str(), "tmpfs", read_only ? MS_RDONLY : 0,
               options.c_str()) == 0;
}

// Makes the tmpfs mounted on `path` read-only from now on.
inline bool RemountReadOnly(const std::string& path) {
  return mount(nullptr, path.c_str(), nullptr, MS_REMOUNT | MS_RDONLY, nullptr) == 0;
}

// True when this process could mount a scratch tmpfs on `path`.
inline bool ScratchMountsAvailable(const std::string& path) {
  const pid_t child = fork();
  if (child == 0) _exit(MountScratchTmpfs(path, "size=4k") ? 0 : 1);
  int status = 0;
  return child > 0 && waitpid(child, &status, 0) == child && WIFEXITED(status) &&
         WEXITSTATUS(status) == 0;
}

}  // namespace orvex::testing

#endif  // ORVEX_BASE_TESTING_SCRATCH_MOUNT_H_
