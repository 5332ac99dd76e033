#include "platform/jobs/mpi/near_processes.h"

#include <array>
#include <cerrno>
#include <charconv>
#include <climits>
#include <csignal>
#include <fstream>
#include <poll.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <fmt/core.h>

namespace mirevo {
namespace {

constexpr int kGone = -1;  ///< in place of a descriptor: it had ended before it was met

std::string targetOf(const std::string& link) {
  std::array<char, PATH_MAX> text{};
  const ssize_t length = ::readlink(link.c_str(), text.data(), text.size());
  return {text.data(), static_cast<std::size_t>(length < 0 ? 0 : length)};
}

/// The running kernel, and the name space of process numbers: containers on one machine have their own.
std::string systemName() {
  std::string boot;
  std::getline(std::ifstream("/proc/sys/kernel/random/boot_id"), boot);
  return fmt::format("{} {}", boot, targetOf("/proc/self/ns/pid"));
}

}  // namespace

NearProcesses::~NearProcesses() {
  for (const auto& [rank, descriptor] : descriptors_) {
    if (descriptor != kGone) ::close(descriptor);
  }
}

std::string NearProcesses::introduction() {
  return fmt::format("{} {}", ::getpid(), systemName());
}

void NearProcesses::meet(int rank, std::string_view introduction) {
  const auto space = introduction.find(' ');
  if (descriptors_.contains(rank) || space == std::string_view::npos) return;
  if (introduction.substr(space + 1) != systemName()) return;
  pid_t process = 0;
  std::from_chars(introduction.data(), introduction.data() + space, process);
  if (process <= 0) return;
  const auto descriptor = static_cast<int>(::syscall(SYS_pidfd_open, process, 0U));
  if (descriptor < 0 && errno == ESRCH) descriptors_.emplace(rank, kGone);
  if (descriptor < 0) return;
  // It may have ended since, and its number may be another's; once the descriptor is there, that cannot happen any
  // more.
  const std::string program = targetOf(fmt::format("/proc/{}/exe", process));
  if (program.empty() || program == targetOf("/proc/self/exe")) {
    descriptors_.emplace(rank, descriptor);
  } else {
    ::close(descriptor);
  }
}

bool NearProcesses::hasEnded(int rank) const {
  const auto found = descriptors_.find(rank);
  if (found == descriptors_.end()) return false;
  if (found->second == kGone) return true;
  pollfd ended{found->second, POLLIN, 0};
  return ::poll(&ended, 1, 0) == 1;
}

void NearProcesses::killAll() const {
  for (const auto& [rank, descriptor] : descriptors_) kill(rank);
}

bool NearProcesses::kill(int rank) const {
  const auto found = descriptors_.find(rank);
  if (found == descriptors_.end()) return false;
  if (found->second != kGone) ::syscall(SYS_pidfd_send_signal, found->second, SIGKILL, nullptr, 0U);
  return true;
}

}  // namespace mirevo
