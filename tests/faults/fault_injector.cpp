// A library to be loaded before all others (LD_PRELOAD) that makes one chosen system call of the program fail, as a
// full disk, a missing permission or exhausted descriptors would, and that can let the clock run backwards.
// Environment:
//
//   FAULT_PROGRAM  the program file that it works in; the processes that this starts are left alone
//   FAULT_FOLDER   calls to paths in this folder count; they are named relative to it. Starting a process is a call to
//                  the path "(process)".
//   FAULT_RECORD   the file to which every call is appended, a line "call<tab>path" each
//   FAULT          "call<tab>path<tab>N<tab>errno<tab>how": the N-th such call, from 1, fails. How: "once"; "lasting":
//                  so do all after it; "short": a write takes half of the bytes and the next one fails. A line
//                  "failed" goes to the record when the call is met.
//   FAULT_KILL     the program is killed (SIGKILL) at its call of this number, from 1, before it is made
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
  long killAt = 0;
  long clockStep = 0;
};
Settings settings;
long callsMade = 0;
long callsMet = 0;  ///< that are like the one that is to fail
bool shortWriteWasMade = false;
long clockLooks = 0;

template <typename Function>
Function* original(const char* name) {
  return reinterpret_cast<Function*>(::dlsym(RTLD_NEXT, name));
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
}

__attribute__((constructor)) void initialise() {
  std::array<char, PATH_MAX> self{};
  const ssize_t length = ::readlink("/proc/self/exe", self.data(), self.size() - 1);
  const char* program = std::getenv("FAULT_PROGRAM");
  if (length <= 0 || program == nullptr || std::string_view(self.data()) != program) return;
  copyText(settings.folder, std::getenv("FAULT_FOLDER"));
  copyText(settings.record, std::getenv("FAULT_RECORD"));
  if (const char* fault = std::getenv("FAULT")) readFault(fault);
  if (const char* kill = std::getenv("FAULT_KILL")) settings.killAt = std::atol(kill);
  if (const char* clock = std::getenv("FAULT_CLOCK")) settings.clockStep = std::atol(clock);
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
  errno = saved;
  if (std::string_view(call) != settings.call.data() || std::string_view(relative) != settings.path.data())
    return false;
  ++callsMet;
  if (callsMet < settings.number || (callsMet > settings.number && !settings.isLasting)) return false;
  appendToRecord("failed", relative);
  errno = settings.error;
  return true;
}

bool fails(const char* call, int folder, const char* path) {
  if (path[0] == '/' || folder == AT_FDCWD) return fails(call, path);
  return false;
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

unsigned modeFrom(int flags, va_list arguments) {
  return (flags & (O_CREAT | O_TMPFILE)) != 0 ? va_arg(arguments, unsigned) : 0;
}

const char* openName(int flags) {
  return isWritable(flags) ? "open-to-write" : "open-to-read";
}

long shiftOfClock() {
  return settings.active ? settings.clockStep * ++clockLooks : 0;
}

}  // namespace

extern "C" {

int open(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const unsigned mode = modeFrom(flags, arguments);
  va_end(arguments);
  if (fails(openName(flags), path)) return -1;
  static auto* const real = original<int(const char*, int, ...)>("open");
  return real(path, flags, mode);
}

int open64(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const unsigned mode = modeFrom(flags, arguments);
  va_end(arguments);
  if (fails(openName(flags), path)) return -1;
  static auto* const real = original<int(const char*, int, ...)>("open64");
  return real(path, flags, mode);
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

ssize_t read(int descriptor, void* bytes, size_t count) {
  static auto* const real = original<ssize_t(int, void*, size_t)>("read");
  return failsOn("read", descriptor) ? -1 : real(descriptor, bytes, count);
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

// The ways to copy are one call: a disk that is full is so for each of them.
int ioctl(int descriptor, unsigned long request, ...) {
  va_list arguments;
  va_start(arguments, request);
  void* argument = va_arg(arguments, void*);
  va_end(arguments);
  static auto* const real = original<int(int, unsigned long, ...)>("ioctl");
  return failsOn("copy", descriptor) ? -1 : real(descriptor, request, argument);
}

ssize_t copy_file_range(int from, off64_t* fromOffset, int to, off64_t* toOffset, size_t count, unsigned flags) {
  static auto* const real = original<ssize_t(int, off64_t*, int, off64_t*, size_t, unsigned)>("copy_file_range");
  return failsOn("copy", to) ? -1 : real(from, fromOffset, to, toOffset, count, flags);
}

ssize_t sendfile(int to, int from, off_t* offset, size_t count) {
  static auto* const real = original<ssize_t(int, int, off_t*, size_t)>("sendfile");
  return failsOn("copy", to) ? -1 : real(to, from, offset, count);
}

int fsync(int descriptor) {
  static auto* const real = original<int(int)>("fsync");
  return failsOn("fsync", descriptor) ? -1 : real(descriptor);
}

int ftruncate(int descriptor, off_t length) noexcept {
  static auto* const real = original<int(int, off_t)>("ftruncate");
  return failsOn("truncate", descriptor) ? -1 : real(descriptor, length);
}

int fchmod(int descriptor, mode_t mode) noexcept {
  static auto* const real = original<int(int, mode_t)>("fchmod");
  return failsOn("chmod", descriptor) ? -1 : real(descriptor, mode);
}

int rename(const char* from, const char* to) noexcept {
  static auto* const real = original<int(const char*, const char*)>("rename");
  return fails("rename", from) ? -1 : real(from, to);
}

int mkdir(const char* path, mode_t mode) noexcept {
  static auto* const real = original<int(const char*, mode_t)>("mkdir");
  return fails("mkdir", path) ? -1 : real(path, mode);
}

int unlink(const char* path) noexcept {
  static auto* const real = original<int(const char*)>("unlink");
  return fails("unlink", path) ? -1 : real(path);
}

int rmdir(const char* path) noexcept {
  static auto* const real = original<int(const char*)>("rmdir");
  return fails("rmdir", path) ? -1 : real(path);
}

int symlink(const char* content, const char* path) noexcept {
  static auto* const real = original<int(const char*, const char*)>("symlink");
  return fails("symlink", path) ? -1 : real(content, path);
}

ssize_t readlink(const char* path, char* buffer, size_t size) noexcept {
  static auto* const real = original<ssize_t(const char*, char*, size_t)>("readlink");
  return fails("readlink", path) ? -1 : real(path, buffer, size);
}

int access(const char* path, int mode) noexcept {
  static auto* const real = original<int(const char*, int)>("access");
  return fails("access", path) ? -1 : real(path, mode);
}

int stat(const char* path, struct stat* status) noexcept {
  static auto* const real = original<int(const char*, struct stat*)>("stat");
  return fails("stat", path) ? -1 : real(path, status);
}

int lstat(const char* path, struct stat* status) noexcept {
  static auto* const real = original<int(const char*, struct stat*)>("lstat");
  return fails("stat", path) ? -1 : real(path, status);
}

int utimensat(int folder, const char* path, const timespec times[2], int flags) noexcept {
  static auto* const real = original<int(int, const char*, const timespec*, int)>("utimensat");
  return fails("set-times", folder, path) ? -1 : real(folder, path, times, flags);
}

int futimens(int descriptor, const timespec times[2]) noexcept {
  static auto* const real = original<int(int, const timespec*)>("futimens");
  return failsOn("set-times", descriptor) ? -1 : real(descriptor, times);
}

DIR* opendir(const char* path) {
  static auto* const real = original<DIR*(const char*)>("opendir");
  return fails("open-folder", path) ? nullptr : real(path);
}

dirent* readdir(DIR* folder) {
  static auto* const real = original<dirent*(DIR*)>("readdir");
  return failsOn("read-folder", ::dirfd(folder)) ? nullptr : real(folder);
}

pid_t fork() {
  static auto* const real = original<pid_t()>("fork");
  return fails("fork", "(process)") ? -1 : real();
}

int clone(int (*function)(void*), void* stack, int flags, void* argument, ...) noexcept {
  va_list arguments;
  va_start(arguments, argument);
  void* parentId = va_arg(arguments, void*);
  va_end(arguments);
  static auto* const real = original<int(int (*)(void*), void*, int, void*, ...)>("clone");
  return fails("clone", "(process)") ? -1 : real(function, stack, flags, argument, parentId);
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
