#include "platform/processes/process_mark.h"

#include <cerrno>
#include <csignal>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <dirent.h>
#include <fcntl.h>
#include <string_view>
#include <sys/random.h>
#include <sys/types.h>
#include <unistd.h>

#include <fmt/core.h>

#include "common/descriptor.h"
#include "common/files.h"

namespace mirevo {
namespace {

// A guard forked from a program with threads must not allocate, so all buffers are on the stack.

constexpr int kMostRounds = 100;
constexpr timespec kPause{0, 20'000'000};  ///< for killed processes to end

/// Whether the environment of the process (a folder name of /proc) contains the text. False for a process that has
/// ended or belongs to another user.
bool isInEnvironment(std::string_view text, const char* process) noexcept {
  std::array<char, 64> path{};
  const std::size_t length = std::strlen(process);
  constexpr std::string_view kFront = "/proc/";
  constexpr std::string_view kBack = "/environ";
  if (kFront.size() + length + kBack.size() >= path.size()) return false;
  kFront.copy(path.data(), kFront.size());
  std::memcpy(path.data() + kFront.size(), process, length);
  kBack.copy(path.data() + kFront.size() + length, kBack.size());
  const Descriptor file(::open(path.data(), O_RDONLY | O_CLOEXEC));
  if (file.get() < 0) return false;
  std::array<char, 8192> bytes{};
  std::size_t kept = 0;  // bytes kept from the end of the previous piece, in which the text may begin
  while (true) {
    const ssize_t count = ::read(file.get(), bytes.data() + kept, bytes.size() - kept);
    if (count <= 0) return false;
    const std::size_t size = kept + static_cast<std::size_t>(count);
    if (std::string_view(bytes.data(), size).find(text) != std::string_view::npos) return true;
    kept = size < text.size() ? size : text.size() - 1;
    std::memmove(bytes.data(), bytes.data() + size - kept, kept);
  }
}

/// Kills every process with the mark. Returns whether there was any.
bool killBearers(std::string_view mark) noexcept {
  const Descriptor folder(::open("/proc", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  alignas(dirent64) std::array<char, 8192> entries{};
  bool any = false;
  while (true) {
    const ssize_t size = folder.get() < 0 ? -1 : ::getdents64(folder.get(), entries.data(), entries.size());
    if (size <= 0) return any;
    for (ssize_t at = 0; at < size;) {
      const auto* entry = reinterpret_cast<const dirent64*>(entries.data() + at);
      at += entry->d_reclen;
      const char* name = entry->d_name;
      if (name[0] < '1' || name[0] > '9' || !isInEnvironment(mark, name)) continue;
      ::kill(static_cast<pid_t>(std::strtol(name, nullptr, 10)), SIGKILL);
      any = true;
    }
  }
}

}  // namespace

ProcessMark::ProcessMark() {
  std::uint64_t number = 0;
  if (::getrandom(&number, sizeof number, GRND_NONBLOCK) != sizeof number) {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    number = static_cast<std::uint64_t>(now.tv_sec) * 1'000'000'000U + static_cast<std::uint64_t>(now.tv_nsec);
  }
  fmt::format_to_n(text_.data(), text_.size() - 1, "MIREVO_RUN={:016x}", number);
}

std::string ProcessMark::variable(int slot) const {
  return fmt::format("{}.{}", text_.data(), slot);
}

int ProcessMark::slotOf(pid_t process) const {
  std::string reason;
  const auto environment = readTextFile(fmt::format("/proc/{}/environ", process), reason);
  const std::string front = fmt::format("{}.", text_.data());
  const auto at = environment ? environment->find(front) : std::string::npos;
  return at == std::string::npos ? 0 : std::atoi(environment->c_str() + at + front.size());
}

void ProcessMark::endBearers() const noexcept {
  const int saved = errno;
  for (int round = 0; round < kMostRounds && killBearers(text_.data()); ++round) ::nanosleep(&kPause, nullptr);
  errno = saved;
}

}  // namespace mirevo
