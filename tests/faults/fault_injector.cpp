// A library to be loaded before all others (LD_PRELOAD) that makes one chosen system call of the program fail, as a
// full disk, a missing permission or exhausted descriptors would, that can let the clock run backwards or differ from
// those of other machines, and that can make files slow.
// Environment:
//
//   FAULT_PROGRAM  the program file that it works in; the processes that this starts are left alone
//   FAULT_RANK     of the processes of an MPI job, the one that it works in
//   FAULT_FOLDER   calls to paths in this folder count; they are named relative to it. Starting a process is a call to
//                  the path "(process)".
//   FAULT_RECORD   the file to which every call is appended, a line "call<tab>path" each
//   FAULT          "call<tab>path<tab>N<tab>errno<tab>how": the N-th such call, from 1, fails. How: "once"; "lasting":
//                  so do all after it; "short": a write takes half of the bytes and the next one fails;
//                  "stuck": it does not return, and only SIGKILL ends the program. A line "failed" goes to the record
//                  when the call is met.
//   FAULT_KILL     the program is killed (SIGKILL) at its call of this number, from 1, before it is made
//   FAULT_OLD      a kernel that has no pidfds and no close_range
//   FAULT_SKEW     that many seconds are added to the time of day
//   FAULT_DELAY    that many microseconds each call in the folder takes longer
//   FAULT_CLOCK    that many seconds are taken from the time of day, once more with each look at it
//
// The calls go to the C library's own functions. The library keeps no open file and allocates nothing, so that the
// program's descriptors and memory are those of a run without it.

#ifndef _GNU_SOURCE
#define _GNU_SOURCE 1
#endif
#include <array>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <dlfcn.h>
#include <fcntl.h>
#include <sched.h>
#include <string_view>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <time.h>
#include <type_traits>
#include <unistd.h>

namespace {

struct Settings {
  bool active = false;
  std::array<char, PATH_MAX> folder{};
  std::array<char, PATH_MAX> record{};
  std::array<char, 40> call{};
  std::array<char, PATH_MAX> path{};
  long number = 0;
  int error = 0;
  bool isLasting = false;
  bool isShort = false;
  bool isStuck = false;
  long killAt = 0;
  long clockStep = 0;
  bool isOld = false;
  long clockSkew = 0;
  long delay = 0;
};
Settings settings;
long callsMade = 0;
long callsMet = 0;  ///< that are like the one that is to fail
bool shortWriteWasMade = false;
long clockLooks = 0;

/// The C library's function of that name.
template <typename Function>
Function* original(const char* name) {
  return reinterpret_cast<Function*>(::dlsym(RTLD_NEXT, name));
}

/// What a function of the C library returns where it fails.
template <typename Result>
Result failure() {
  if constexpr (std::is_pointer_v<Result>) {
    return nullptr;
  } else {
    return -1;
  }
}

template <std::size_t kSize>
void copyText(std::array<char, kSize>& to, const char* text) {
  std::snprintf(to.data(), to.size(), "%s", text == nullptr ? "" : text);
}

void readFault(const char* text) {
  std::array<char, 20> how{};
  std::sscanf(text, "%39[^\t]\t%4095[^\t]\t%ld\t%d\t%19s", settings.call.data(), settings.path.data(), &settings.number,
              &settings.error, how.data());
  settings.isLasting = std::string_view(how.data()) == "lasting";
  settings.isShort = std::string_view(how.data()) == "short";
  settings.isStuck = std::string_view(how.data()) == "stuck";
}

__attribute__((constructor)) void initialise() {
  std::array<char, PATH_MAX> self{};
  const ssize_t length = ::readlink("/proc/self/exe", self.data(), self.size() - 1);
  const char* program = std::getenv("FAULT_PROGRAM");
  if (length <= 0 || program == nullptr || std::string_view(self.data()) != program) return;
  const char* rank = std::getenv("OMPI_COMM_WORLD_RANK");
  const char* chosen = std::getenv("FAULT_RANK");
  if (rank != nullptr && chosen != nullptr && std::string_view(rank) != chosen) {
    ::unsetenv("LD_PRELOAD");
    return;
  }
  copyText(settings.folder, std::getenv("FAULT_FOLDER"));
  copyText(settings.record, std::getenv("FAULT_RECORD"));
  if (const char* fault = std::getenv("FAULT")) readFault(fault);
  if (const char* kill = std::getenv("FAULT_KILL")) settings.killAt = std::atol(kill);
  settings.isOld = std::getenv("FAULT_OLD") != nullptr;
  if (const char* clock = std::getenv("FAULT_CLOCK")) settings.clockStep = std::atol(clock);
  if (const char* skew = std::getenv("FAULT_SKEW")) settings.clockSkew = std::atol(skew);
  if (const char* delay = std::getenv("FAULT_DELAY")) settings.delay = std::atol(delay);
  ::unsetenv("LD_PRELOAD");  // the model's processes start without it
  settings.active = true;
}

/// By raw system calls, past the functions below.
void appendToRecord(const char* first, const char* second) {
  if (settings.record[0] == '\0') return;
  std::array<char, PATH_MAX + 64> line{};
  const int length = std::snprintf(line.data(), line.size(), "%s\t%s\n", first, second);
  const long file = ::syscall(SYS_openat, AT_FDCWD, settings.record.data(), O_WRONLY | O_CREAT | O_APPEND, 0666);
  if (file < 0) return;
  ::syscall(SYS_write, file, line.data(), static_cast<std::size_t>(length));
  ::syscall(SYS_close, file);
}

/// Takes note of a call; whether it is to fail, with errno set.
bool fails(const char* call, const char* path) {
  if (!settings.active) return false;
  const std::string_view folder = settings.folder.data();
  const std::string_view name = path;
  const char* relative = path;
  if (name.front() != '(') {
    if (!name.starts_with(folder) || name.size() <= folder.size() + 1 || name[folder.size()] != '/') return false;
    relative += folder.size() + 1;
  }
  if (++callsMade == settings.killAt) ::raise(SIGKILL);
  const int saved = errno;
  appendToRecord(call, relative);
  if (settings.delay > 0) ::usleep(static_cast<useconds_t>(settings.delay));
  errno = saved;
  if (std::string_view(call) != settings.call.data() || std::string_view(relative) != settings.path.data())
    return false;
  ++callsMet;
  if (callsMet < settings.number || (callsMet > settings.number && !settings.isLasting)) return false;
  appendToRecord("failed", relative);
  if (settings.isStuck) {
    sigset_t all;
    ::sigfillset(&all);
    ::sigprocmask(SIG_BLOCK, &all, nullptr);
    while (true) ::pause();
  }
  errno = settings.error;
  return true;
}

/// The same for a call on a descriptor.
bool failsOn(const char* call, int descriptor) {
  if (!settings.active) return false;
  std::array<char, 40> link{};
  std::array<char, PATH_MAX> path{};
  std::snprintf(link.data(), link.size(), "/proc/self/fd/%d", descriptor);
  const int saved = errno;
  const ssize_t length = ::readlink(link.data(), path.data(), path.size() - 1);
  errno = saved;
  return length > 0 && path[0] == '/' && fails(call, path.data());
}

bool isWritable(int flags) {
  return (flags & O_ACCMODE) != O_RDONLY;
}

const char* openName(int flags) {
  return isWritable(flags) ? "open-to-write" : "open-to-read";
}

long shiftOfClock() {
  return settings.active ? settings.clockStep * ++clockLooks - settings.clockSkew : 0;
}

int openWith(int (*real)(const char*, int, ...), const char* path, int flags, va_list arguments) {
  const unsigned mode = (flags & (O_CREAT | O_TMPFILE)) != 0 ? va_arg(arguments, unsigned) : 0;
  return fails(openName(flags), path) ? failure<int>() : real(path, flags, mode);
}

}  // namespace

/// A function of the C library that fails where `isToFail` holds, an expression of its parameters. `parameters` are
/// written as in a declaration, `noexcept` included, `arguments` as in a call.
#define MAY_FAIL(Result, name, parameters, arguments, isToFail)   \
  Result name parameters {                                        \
    static auto* const real = original<Result parameters>(#name); \
    return (isToFail) ? failure<Result>() : real arguments;       \
  }

/// The two names of opening a file.
#define OPEN_MAY_FAIL(name)                                                     \
  int name(const char* path, int flags, ...) {                                  \
    static auto* const real = original<int(const char* path, int, ...)>(#name); \
    va_list arguments;                                                          \
    va_start(arguments, flags);                                                 \
    const int descriptor = openWith(real, path, flags, arguments);              \
    va_end(arguments);                                                          \
    return descriptor;                                                          \
  }

extern "C" {

OPEN_MAY_FAIL(open)
OPEN_MAY_FAIL(open64)
MAY_FAIL(ssize_t, read, (int descriptor, void* bytes, size_t count), (descriptor, bytes, count),
         failsOn("read", descriptor))
MAY_FAIL(ssize_t, pread, (int descriptor, void* bytes, size_t count, off_t offset), (descriptor, bytes, count, offset),
         failsOn("read-at", descriptor))
MAY_FAIL(int, fsync, (int descriptor), (descriptor), failsOn("fsync", descriptor))
MAY_FAIL(int, ftruncate, (int descriptor, off_t length) noexcept, (descriptor, length), failsOn("truncate", descriptor))
MAY_FAIL(int, fchmod, (int descriptor, mode_t mode) noexcept, (descriptor, mode), failsOn("chmod", descriptor))
MAY_FAIL(int, futimens, (int descriptor, const timespec times[2]) noexcept, (descriptor, times),
         failsOn("set-times", descriptor))
MAY_FAIL(int, utimensat, (int folder, const char* path, const timespec times[2], int flags) noexcept,
         (folder, path, times, flags), (path[0] == '/' || folder == AT_FDCWD) && fails("set-times", path))
MAY_FAIL(int, rename, (const char* from, const char* to) noexcept, (from, to), fails("rename", from))
MAY_FAIL(int, mkdir, (const char* path, mode_t mode) noexcept, (path, mode), fails("mkdir", path))
MAY_FAIL(int, unlink, (const char* path) noexcept, (path), fails("unlink", path))
MAY_FAIL(int, rmdir, (const char* path) noexcept, (path), fails("rmdir", path))
MAY_FAIL(int, symlink, (const char* content, const char* path) noexcept, (content, path), fails("symlink", path))
MAY_FAIL(ssize_t, readlink, (const char* path, char* buffer, size_t size) noexcept, (path, buffer, size),
         fails("readlink", path))
MAY_FAIL(int, access, (const char* path, int mode) noexcept, (path, mode), fails("access", path))
MAY_FAIL(int, stat, (const char* path, struct stat* status) noexcept, (path, status), fails("stat", path))
MAY_FAIL(int, lstat, (const char* path, struct stat* status) noexcept, (path, status), fails("stat", path))
MAY_FAIL(DIR*, opendir, (const char* path), (path), fails("open-folder", path))
MAY_FAIL(dirent*, readdir, (DIR * folder), (folder), failsOn("read-folder", ::dirfd(folder)))
MAY_FAIL(pid_t, fork, (), (), fails("fork", "(process)"))

// The ways to copy are one call: a disk that is full is so for each of them.
MAY_FAIL(ssize_t, copy_file_range,
         (int from, off64_t* fromOffset, int to, off64_t* toOffset, size_t count, unsigned flags),
         (from, fromOffset, to, toOffset, count, flags), failsOn("copy", to))
MAY_FAIL(ssize_t, sendfile, (int to, int from, off_t* offset, size_t count), (to, from, offset, count),
         failsOn("copy", to))

int ioctl(int descriptor, unsigned long request, ...) {
  va_list arguments;
  va_start(arguments, request);
  void* argument = va_arg(arguments, void*);
  va_end(arguments);
  static auto* const real = original<int(int, unsigned long, ...)>("ioctl");
  return failsOn("copy", descriptor) ? -1 : real(descriptor, request, argument);
}

int fcntl(int descriptor, int command, ...) {
  va_list arguments;
  va_start(arguments, command);
  void* argument = va_arg(arguments, void*);
  va_end(arguments);
  static auto* const real = original<int(int, int, ...)>("fcntl");
  const bool locks = command == F_OFD_SETLK && static_cast<struct flock*>(argument)->l_type == F_WRLCK;
  return locks && failsOn("lock", descriptor) ? -1 : real(descriptor, command, argument);
}

ssize_t write(int descriptor, const void* bytes, size_t count) {
  static auto* const real = original<ssize_t(int, const void*, size_t)>("write");
  if (shortWriteWasMade) {
    shortWriteWasMade = false;
    errno = settings.error;
    return -1;
  }
  if (!failsOn("write", descriptor)) return real(descriptor, bytes, count);
  if (!settings.isShort || count < 2) return -1;
  shortWriteWasMade = true;
  return real(descriptor, bytes, count / 2);
}

/// A network file system may tell of a write that it could not make only here.
int close(int descriptor) {
  static auto* const real = original<int(int)>("close");
  const int flags = settings.active ? ::fcntl(descriptor, F_GETFL) : -1;
  const bool failed = flags >= 0 && isWritable(flags) && failsOn("close", descriptor);
  const int error = errno;
  const int result = real(descriptor);
  if (failed) errno = error;
  return failed ? -1 : result;
}

int clone(int (*function)(void*), void* stack, int flags, void* argument, ...) noexcept {
  va_list arguments;
  va_start(arguments, argument);
  void* parentId = va_arg(arguments, void*);
  va_end(arguments);
  static auto* const real = original<int(int (*)(void*), void*, int, void*, ...)>("clone");
  if (settings.isOld) flags &= ~CLONE_PIDFD;  // such a kernel does not look at it
  return fails("clone", "(process)") ? -1 : real(function, stack, flags, argument, parentId);
}

long syscall(long number, ...) noexcept {
  std::array<long, 6> values{};
  va_list arguments;
  va_start(arguments, number);
  for (long& value : values) value = va_arg(arguments, long);
  va_end(arguments);
  static auto* const real = original<long(long, ...)>("syscall");
  // Without clone3 the program starts processes by clone(), which can fail here.
  if (number == SYS_clone3 || (settings.isOld && (number == SYS_pidfd_open || number == SYS_close_range))) {
    errno = ENOSYS;
    return -1;
  }
  return real(number, values[0], values[1], values[2], values[3], values[4], values[5]);
}

int clock_gettime(clockid_t clock, timespec* now) noexcept {
  static auto* const real = original<int(clockid_t, timespec*)>("clock_gettime");
  const int result = real(clock, now);
  if (clock == CLOCK_REALTIME) now->tv_sec -= shiftOfClock();
  return result;
}

time_t time(time_t* out) noexcept {
  timespec now{};
  ::clock_gettime(CLOCK_REALTIME, &now);
  if (out != nullptr) *out = now.tv_sec;
  return now.tv_sec;
}

}  // extern "C"
