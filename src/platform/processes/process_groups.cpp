#include "platform/processes/process_groups.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <dirent.h>
#include <memory>
#include <new>
#include <string_view>
#include <sys/mman.h>
#include <system_error>
#include <utility>

#include "common/files.h"

namespace mirevo {
namespace {

std::atomic<const ProcessGroupTable*> currentTable{nullptr};

static_assert(std::atomic<pid_t>::is_always_lock_free && std::atomic<const ProcessGroupTable*>::is_always_lock_free);

/// Passes the number of every process of the system to `take`.
template <class Take>
void forEachProcess(Take take) {
  const std::unique_ptr<DIR, int (*)(DIR*)> folder(::opendir("/proc"), &::closedir);
  while (const dirent* entry = folder ? ::readdir(folder.get()) : nullptr) {
    const std::string_view name = entry->d_name;
    pid_t id = 0;
    if (std::from_chars(name.data(), name.data() + name.size(), id).ec == std::errc()) take(id);
  }
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

void haltGroupsFromSignal() noexcept {
  const int saved = errno;
  if (const ProcessGroupTable* table = currentTable.load()) table->signalAll(SIGKILL);
  errno = saved;
}

std::optional<FoundProcess> findProcess(pid_t id) {
  std::string reason;
  const auto text = readTextFile("/proc/" + std::to_string(id) + "/stat", reason);
  if (!text) return std::nullopt;
  // `id (name) state parent group ...`; the name may hold blanks and parentheses.
  const auto open = text->find('(');
  const auto close = text->rfind(')');
  if (open == std::string::npos || close == std::string::npos || close + 4 > text->size()) return std::nullopt;
  FoundProcess process{.id = id, .state = (*text)[close + 2], .name = text->substr(open + 1, close - open - 1)};
  std::replace_if(
      process.name.begin(), process.name.end(), [](unsigned char c) { return c < ' ' || c == '\x7f'; }, '?');
  const char* const end = text->data() + text->size();
  const auto parent = std::from_chars(text->data() + close + 4, end, process.parent);
  if (parent.ptr == end || std::from_chars(parent.ptr + 1, end, process.group).ec != std::errc()) return std::nullopt;
  return process;
}

std::vector<FoundProcess> runningMembers(std::span<const pid_t> groups) {
  std::vector<FoundProcess> members;
  forEachProcess([&](pid_t id) {
    auto process = findProcess(id);
    if (process && process->state != 'Z' && process->state != 'X' &&
        std::find(groups.begin(), groups.end(), process->group) != groups.end()) {
      members.push_back(std::move(*process));
    }
  });
  return members;
}

std::vector<pid_t> childrenOf(pid_t parent) {
  std::vector<pid_t> children;
  forEachProcess([&](pid_t id) {
    const auto process = findProcess(id);
    if (process && process->parent == parent) children.push_back(id);
  });
  return children;
}

}  // namespace mirevo
