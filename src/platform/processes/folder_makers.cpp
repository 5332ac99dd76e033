#include "platform/processes/folder_makers.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <exception>
#include <fcntl.h>
#include <memory>
#include <new>
#include <optional>
#include <poll.h>
#include <sched.h>
#include <string_view>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>
#include <vector>

#include "common/clock.h"
#include "common/descriptor.h"
#include "common/fatal_error.h"
#include "platform/processes/child_process.h"
#include "platform/processes/close_descriptors.h"
#include "platform/processes/folder_tree.h"
#include "platform/processes/process_folder.h"

namespace mirevo {
namespace {

constexpr int kLookMilliseconds = 100;
constexpr double kLookSeconds = 0.1;
/// From so much on, in all folders, more than one process is worth its start.
constexpr std::uint64_t kMuchBytes = 20'000'000;
constexpr std::size_t kManyEntries = 1000;
constexpr int kMostMakers = 8;
/// The share of a file's copying that does not depend on its size, as so many bytes.
constexpr double kBytesPerFile = 50'000.0;

/// What the processes share.
struct SharedState {
  CopiedAmount amount;
  std::atomic<std::size_t> next{0};  ///< folder to be made
  std::atomic<bool> hasError{false};
  std::array<char, 4096> error{};  ///< of the first that failed
  std::array<char, 4096> detail{};
  std::array<std::atomic<bool>, 4096> isMade{};  ///< of the first folders
};

void setText(std::array<char, 4096>& to, std::string_view text) {
  to[text.copy(to.data(), to.size() - 1)] = '\0';
}

/// Memory that child processes share.
class SharedMemory final {
 public:
  SharedMemory()
      : memory_(::mmap(nullptr, sizeof(SharedState), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0)) {
    if (memory_ == MAP_FAILED) throw std::bad_alloc();
    state_ = std::construct_at(static_cast<SharedState*>(memory_));
  }
  ~SharedMemory() { ::munmap(memory_, sizeof(SharedState)); }
  SharedMemory(const SharedMemory&) = delete;
  SharedMemory& operator=(const SharedMemory&) = delete;
  SharedState& state() const { return *state_; }

 private:
  void* memory_;
  SharedState* state_ = nullptr;
};

int coresOfProcess() {
  cpu_set_t cores;
  return ::sched_getaffinity(0, sizeof cores, &cores) == 0 ? CPU_COUNT(&cores) : 1;
}

/// One making of process folders.
class FolderMakers final {
 public:
  FolderMakers(const FolderListing& listing, std::span<const std::string> targets, const FolderMaking& making,
               const std::function<void(const FoldersMade&)>& look)
      : listing_(listing), paths_(pathsOf(listing)), targets_(targets), making_(making), look_(look) {}
  ~FolderMakers() { endChildren(); }
  FolderMakers(const FolderMakers&) = delete;
  FolderMakers& operator=(const FolderMakers&) = delete;

  FoldersMade makeAll() {
    const bool isMuch =
        listing_.bytes * targets_.size() > kMuchBytes || listing_.entries.size() * targets_.size() > kManyEntries;
    const int count = std::min({coresOfProcess(), static_cast<int>(targets_.size()), kMostMakers});
    if (isMuch && count > 1 && startChildren(count)) {
      awaitChildren();
    } else {
      makeHere();
    }
    FoldersMade all = made();
    all.share = 1.0;
    return all;
  }

 private:
  SharedState& shared() const { return memory_.state(); }

  FoldersMade made() const {
    const double folders = static_cast<double>(targets_.size());
    const CopiedAmount& amount = shared().amount;
    const auto work = [](double bytes, double files) { return bytes + kBytesPerFile * files; };
    const double all =
        work(static_cast<double>(listing_.bytes), static_cast<double>(listing_.entries.size())) * folders;
    const double done = work(static_cast<double>(amount.bytes), static_cast<double>(amount.files));
    return {targets_.size(), std::min(0.99, done / all), runTimeClock() - began_, listing_.bytes, amount.files,
            amount.keptFiles};
  }

  /// In this process.
  void makeHere() {
    double lookedAt = runTimeClock();
    const CopyProgress progress(&shared().amount, [this, &lookedAt] {
      if (runTimeClock() - lookedAt < kLookSeconds) return;
      look_(made());
      lookedAt = runTimeClock();
    });
    makeNext(progress);
  }

  void makeNext(CopyProgress progress) const {
    for (std::size_t i = 0; (i = shared().next++) < targets_.size();) {
      renewProcessFolder(listing_, paths_, targets_[i], making_, progress);
      if (i < shared().isMade.size()) shared().isMade[i] = true;
    }
  }

  /// False if not one could be started.
  bool startChildren(int count) {
    std::array<int, 2> ends{-1, -1};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) return false;
    end_.emplace(ends[0]);
    Descriptor childrens(ends[1]);
    const pid_t parent = ::getpid();
    for (int i = 0; i < count; ++i) {
      const pid_t child = forkWithSignalsBlocked();
      if (child == 0) runChild(parent, childrens.get());
      if (child < 0) break;
      children_.push_back(child);
    }
    return !children_.empty();
  }

  /// All signals are blocked: those of the terminal reach the program, which ends its children.
  [[noreturn]] void runChild(pid_t parent, int pipe) const {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != parent) ::_exit(0);
    ::prctl(PR_SET_NAME, "mirevo_copy");
    closeDescriptors(STDERR_FILENO + 1, pipe - 1);  // locks are the program's
    closeDescriptors(pipe + 1);
    const auto refuse = [this, pipe](std::string_view error, std::string_view detail) {
      if (shared().hasError.exchange(true)) ::_exit(1);  // the first one tells when its text is there
      setText(shared().error, error);
      setText(shared().detail, detail);
      const char failed = 1;
      [[maybe_unused]] const ssize_t written = ::write(pipe, &failed, 1);
      ::_exit(1);
    };
    try {
      makeNext(CopyProgress(&shared().amount, {}));
    } catch (const FatalError& error) {
      refuse(error.message(), error.detail());
    } catch (const std::exception& error) {
      refuse("Error: Unable to make the process folders", error.what());
    }
    ::_exit(0);
  }

  void awaitChildren() {
    while (true) {
      pollfd poll{end_->get(), POLLIN, 0};
      const int ready = ::poll(&poll, 1, kLookMilliseconds);
      if (ready > 0) break;  // one has failed, or all have ended
      look_(made());
    }
    char failed = 0;
    const bool hasFailed = ::read(end_->get(), &failed, 1) > 0;
    if (!hasFailed && areMade()) return;
    endChildren();
    removeUnfinished();
    if (hasFailed) fatalError(shared().error.data(), shared().detail.data());
    fatalError("Unable to make the process folders: a process that copied was " + ending_);
  }

  /// Waits for the processes, which are about to end.
  bool areMade() {
    bool areAll = true;
    for (const pid_t child : std::exchange(children_, {})) {
      int status = 0;
      while (::waitpid(child, &status, 0) < 0 && errno == EINTR) {
      }
      if (WIFSIGNALED(status)) ending_ = "ended by signal " + std::to_string(WTERMSIG(status));
      areAll = areAll && WIFEXITED(status) && WEXITSTATUS(status) == 0;
    }
    return areAll;
  }

  void endChildren() {
    for (const pid_t child : children_) ::kill(child, SIGKILL);
    areMade();
  }

  void removeUnfinished() const {
    const std::size_t begun = std::min<std::size_t>(shared().next, targets_.size());
    for (std::size_t i = 0; i < std::min(begun, shared().isMade.size()); ++i) {
      if (!shared().isMade[i]) removeIfPossible(targets_[i]);
    }
  }

  const FolderListing& listing_;
  ListedPaths paths_;
  std::span<const std::string> targets_;
  const FolderMaking& making_;
  const std::function<void(const FoldersMade&)>& look_;
  SharedMemory memory_;
  double began_ = runTimeClock();
  std::vector<pid_t> children_;
  std::optional<Descriptor> end_;
  std::string ending_ = "ended early";
};

}  // namespace

FoldersMade makeProcessFolders(const FolderListing& listing, std::span<const std::string> targets,
                               const FolderMaking& making, const std::function<void(const FoldersMade&)>& look) {
  for (const std::string& target : targets) requireProcessFolder(target);
  return FolderMakers(listing, targets, making, look).makeAll();
}

}  // namespace mirevo
