#include "platform/processes/process_groups.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <dirent.h>
#include <memory>
#include <new>
#include <optional>
#include <sys/mman.h>

#include "common/files.h"

namespace mirevo {
namespace {

std::atomic<const ProcessGroupTable*> currentTable{nullptr};

static_assert(std::atomic<pid_t>::is_always_lock_free && std::atomic<const ProcessGroupTable*>::is_always_lock_free);

/// A process of /proc; empty if it has ended in the meantime or is a zombie.
std::optional<GroupMember> readProcess(const std::string& id) {
  std::string reason;
  const auto text = readTextFile("/proc/" + id + "/stat", reason);
  if (!text) return std::nullopt;
  // `id (name) state parent group ...`; the name may hold blanks and parentheses.
  const auto open = text->find('(');
  const auto close = text->rfind(')');
  if (open == std::string::npos || close == std::string::npos || close + 4 > text->size()) return std::nullopt;
  const char state = (*text)[close + 2];
  if (state == 'Z' || state == 'X') return std::nullopt;
  GroupMember process;
  process.name = text->substr(open + 1, close - open - 1);
  std::from_chars(id.data(), id.data() + id.size(), process.id);
  const auto parent = close + 4;
  const auto group = text->find(' ', parent);
  if (group == std::string::npos) return std::nullopt;
  std::from_chars(text->data() + group + 1, text->data() + text->size(), process.group);
  return process;
}

}  // namespace

ProcessGroupTable::ProcessGroupTable(int entryCount) {
  const auto count = static_cast<std::size_t>(std::max(entryCount, 1));
  void* memory =
      ::mmap(nullptr, count * sizeof(std::atomic<pid_t>), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) throw std::bad_alloc();
  auto* first = static_cast<std::atomic<pid_t>*>(memory);
  std::uninitialized_value_construct_n(first, count);
  entries_ = {first, count};
}

ProcessGroupTable::~ProcessGroupTable() {
  const ProcessGroupTable* self = this;
  currentTable.compare_exchange_strong(self, nullptr);
  ::munmap(entries_.data(), entries_.size_bytes());
}

void ProcessGroupTable::signalAll(int signal) const noexcept {
  for (const std::atomic<pid_t>& entry : entries_) {
    const pid_t group = entry.load();
    if (group > 1) ::kill(-group, signal);
  }
}

void ProcessGroupTable::makeCurrent() const noexcept {
  currentTable.store(this);
}

void haltProcessesFromSignal() noexcept {
  const int saved = errno;
  if (const ProcessGroupTable* table = currentTable.load()) table->signalAll(SIGKILL);
  errno = saved;
}

std::vector<GroupMember> runningMembers(std::span<const pid_t> groups) {
  std::vector<GroupMember> members;
  const std::unique_ptr<DIR, int (*)(DIR*)> folder(::opendir("/proc"), &::closedir);
  if (!folder) return members;
  while (const dirent* entry = ::readdir(folder.get())) {
    if (entry->d_name[0] < '0' || entry->d_name[0] > '9') continue;
    auto process = readProcess(entry->d_name);
    if (process && std::find(groups.begin(), groups.end(), process->group) != groups.end()) {
      members.push_back(std::move(*process));
    }
  }
  return members;
}

}  // namespace mirevo
