#include "platform/processes/side_command.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstddef>
#include <cstring>
#include <ctime>
#include <fcntl.h>
#include <poll.h>
#include <string_view>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/descriptor.h"
#include "common/descriptor_output.h"
#include "common/reading_watch.h"
#include "platform/processes/child_process.h"
#include "platform/processes/process_groups.h"
#include "platform/processes/spawn_process.h"

namespace mirevo {
namespace {

using Kind = SideCommandEnd::Kind;

/// Longest wait for what a command has left to be gone once it is killed.
constexpr double kLeftSeconds = 2.0;
constexpr double kMessageSeconds = 5.0;
constexpr double kEndSeconds = 4.0;
constexpr std::size_t kMostOutput = 2000;

struct RequestHead {
  std::int32_t isStart = 0;  ///< otherwise: the command is to be ended
  double mostSeconds = 0.0;
  double graceSeconds = 0.0;
  /// Of the parts that follow, each with a zero byte behind it: command, folder, input, variables.
  std::uint64_t size = 0;
};
struct AnswerHead {
  Kind kind = Kind::lost;
  std::int32_t code = 0;
  double seconds = 0.0;
  std::uint64_t size = 0;  ///< of the output that follows
};

void pause(double seconds) {
  const timespec time{0, static_cast<long>(seconds * 1e9)};
  ::nanosleep(&time, nullptr);
}

/// The same file by a descriptor that a process can be started with; -1 if there can be none.
int aboveStandard(int file) {
  if (file < 0 || file > STDERR_FILENO) return file;
  const Descriptor low(file);
  return ::fcntl(file, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
}

/// The end of what comes out of a pipe: nothing else of it is kept, however much a command prints.
class OutputTail final {
 public:
  /// The end of a new pipe that the command is to write to; -1 if there can be none.
  int open() {
    text_.clear();
    std::array<int, 2> ends{-1, -1};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) return -1;
    pipe_.emplace(ends[0]);
    ::fcntl(ends[0], F_SETFL, O_NONBLOCK);
    return aboveStandard(ends[1]);
  }
  /// -1 once nothing writes to it any more.
  int descriptor() const { return pipe_ ? pipe_->get() : -1; }
  /// Takes what is there, at most so much that time limits are kept however fast it is filled.
  void drain() {
    constexpr int kMostParts = 32;  // more than a pipe holds
    std::array<char, 65536> part;
    for (int i = 0; pipe_ && i < kMostParts; ++i) {
      const ssize_t count = ::read(pipe_->get(), part.data(), part.size());
      if (count < 0 && errno == EINTR) continue;
      if (count < 0 && errno == EAGAIN) return;
      if (count <= 0) return pipe_.reset();
      text_.append(part.data(), static_cast<std::size_t>(count));
      if (text_.size() > kMostOutput) text_.erase(0, text_.size() - kMostOutput);
    }
  }
  std::string close() {
    drain();
    pipe_.reset();
    return std::exchange(text_, {});
  }

 private:
  std::optional<Descriptor> pipe_;
  std::string text_;
};

/// The helper's side: one command after another.
class Watcher final {
 public:
  explicit Watcher(int socket) : socket_(socket) {}

  void serve() {
    while (true) {
      std::array<pollfd, 3> events{pollfd{socket_, POLLIN, 0}, pollfd{pidfd_, POLLIN, 0},
                                   pollfd{output_.descriptor(), POLLIN, 0}};
      ::poll(events.data(), events.size(), group_ == 0 ? -1 : milliseconds());
      if (events[2].revents != 0) output_.drain();
      if (events[0].revents != 0 && !obey()) break;
      if (group_ != 0 && !look()) break;
    }
    if (group_ != 0) ::kill(-group_, SIGKILL);
    endRest();
  }

 private:
  /// Until the next look.
  int milliseconds() const {
    constexpr int kUnwatched = 20;
    const double next = (stopped_ ? *stopped_ + graceSeconds_ : started_ + mostSeconds_) - runTimeClock();
    const double limit = std::clamp(next, 0.0, 1000.0) * 1000.0 + 1.0;
    return pidfd_ >= 0 ? static_cast<int>(limit) : std::min(static_cast<int>(limit), kUnwatched);
  }

  /// False when the program is gone.
  bool obey() {
    RequestHead head;
    if (!receiveInHelper(socket_, &head, sizeof head)) return false;
    std::string parts(head.size, '\0');
    if (!receiveInHelper(socket_, parts.data(), parts.size())) return false;
    if (head.isStart == 0) {
      graceSeconds_ = std::min(graceSeconds_, head.graceSeconds);
      if (group_ != 0) stop(Kind::stopped);
      return true;
    }
    mostSeconds_ = head.mostSeconds;
    graceSeconds_ = head.graceSeconds;
    std::vector<std::string> texts;
    for (std::size_t at = 0; at < parts.size(); at += texts.back().size() + 1) texts.emplace_back(parts.c_str() + at);
    return start(texts);
  }

  bool start(std::vector<std::string>& texts) {
    started_ = runTimeClock();
    stopped_.reset();
    status_.reset();
    endedBy_ = Kind::exited;
    const Descriptor input(aboveStandard(::memfd_create("mirevo", MFD_CLOEXEC)));
    const Descriptor output(output_.open());
    if (input.get() < 0 || output.get() < 0) return answer(Kind::couldNotStart, errno);
    if (const int error = writeWhole(input.get(), texts[2]).error; error != 0)
      return answer(Kind::couldNotStart, error);
    ::lseek(input.get(), 0, SEEK_SET);
    std::vector<char*> environment;
    const auto isReplaced = [&texts](std::string_view variable) {
      const std::string_view name = variable.substr(0, variable.find('=') + 1);
      return std::any_of(texts.begin() + 3, texts.end(),
                         [name](const std::string& text) { return text.starts_with(name); });
    };
    for (char** variable = ::environ; variable != nullptr && *variable != nullptr; ++variable) {
      if (!isReplaced(*variable)) environment.push_back(*variable);
    }
    for (std::size_t i = 3; i < texts.size(); ++i) environment.push_back(texts[i].data());
    environment.push_back(nullptr);
    const SpawnCommand command("/bin/sh", texts[1], {"-c", texts[0]});
    const SpawnedProcess process =
        spawnProcess(command, {environment.data(), input.get(), output.get(), &entry_, ignored_});
    if (process.error != 0) return answer(Kind::couldNotStart, process.error);
    group_ = process.id;
    pidfd_ = process.pidfd;
    return true;
  }

  void stop(Kind why) {
    if (stopped_) return;
    stopped_ = runTimeClock();
    endedBy_ = why;
    ::kill(-group_, SIGTERM);
  }

  /// False when the program is gone.
  bool look() {
    const double now = runTimeClock();
    if (!status_) {
      int status = 0;
      if (::waitpid(group_, &status, WNOHANG) == group_) status_ = status;
    }
    if (!status_) {
      if (!stopped_ && now - started_ > mostSeconds_) stop(Kind::timedOut);
      if (stopped_ && now - *stopped_ > graceSeconds_) ::kill(-group_, SIGKILL);
      return true;
    }
    if (pidfd_ >= 0) ::close(pidfd_);
    pidfd_ = -1;
    if (stopped_ && now - *stopped_ <= graceSeconds_ && hasGroup()) return true;
    ::kill(-group_, SIGKILL);  // the rest of the group
    group_ = 0;
    endRest();
    if (endedBy_ != Kind::exited) return answer(endedBy_, 0);
    if (WIFSIGNALED(*status_)) return answer(Kind::signalled, WTERMSIG(*status_));
    return answer(Kind::exited, WEXITSTATUS(*status_));
  }

  /// Whether something of the group is left. SIGTERM ends a shell at once, and not what it runs, which has its time.
  bool hasGroup() const {
    while (::waitpid(-group_, nullptr, WNOHANG) > 0) {
    }
    return ::kill(-group_, 0) == 0;
  }

  /// Ends what has left the group: it has become a child of this process.
  static void endRest() {
    const double deadline = runTimeClock() + kLeftSeconds;
    while (true) {
      while (::waitpid(-1, nullptr, WNOHANG) > 0) {
      }
      const std::vector<pid_t> left = childrenOf(::getpid());
      if (left.empty() || runTimeClock() > deadline) return;
      for (const pid_t child : left) ::kill(child, SIGKILL);
      pause(0.002);
    }
  }

  bool answer(Kind kind, int code) {
    const std::string output = output_.close();
    const AnswerHead head{kind, code, runTimeClock() - started_, output.size()};
    return sendFromHelper(socket_, &head, sizeof head) && sendFromHelper(socket_, output.data(), output.size());
  }

  int socket_;
  pid_t group_ = 0;              ///< also the command's process; 0: none runs
  std::atomic<pid_t> entry_{0};  ///< needed to start a process, and not used
  int pidfd_ = -1;
  OutputTail output_;
  std::vector<int> ignored_ = ignoredSignals();  ///< by a helper process, and SIGTERM is to reach the command
  double started_ = 0.0;
  double mostSeconds_ = 0.0;
  double graceSeconds_ = 0.0;
  std::optional<double> stopped_;  ///< when it was sent SIGTERM
  std::optional<int> status_;      ///< of the command's process, once it has ended
  Kind endedBy_ = Kind::exited;
};

void watchCommands(int socket) {
  // Not to be killed with the program: the end of the socket tells of that, and there is something to be ended.
  ::prctl(PR_SET_PDEATHSIG, 0);
  ::prctl(PR_SET_CHILD_SUBREAPER, 1);
  Watcher(socket).serve();
}

}  // namespace

std::string SideCommandEnd::text(double mostSeconds) const {
  switch (kind) {
    case Kind::exited:
      return fmt::format("exited with code {}", code);
    case Kind::signalled:
      return endedBySignal(code);
    case Kind::timedOut:
      return fmt::format("was ended because it ran longer than {:g} second{}", mostSeconds,
                         mostSeconds == 1.0 ? "" : "s");
    case Kind::stopped:
      return "was ended, as the run has ended";
    case Kind::couldNotStart:
      return fmt::format("could not be started: {}", std::strerror(code));
    case Kind::lost:
      break;
  }
  return "was lost: the process that watches it has ended";
}

SideCommand::~SideCommand() {
  if (!isRunning_) return;
  stop();
  const double deadline = runTimeClock() + kEndSeconds;
  while (!take() && runTimeClock() < deadline) pause(0.005);
}

bool SideCommand::start(const SideCommandCall& call, std::string& reason) {
  if (!helper_.isRunning() && !helper_.start(watchCommands, reason)) return false;
  std::string parts = call.command + '\0' + call.folder + '\0' + call.input + '\0';
  for (const std::string& variable : call.variables) parts += variable + '\0';
  const RequestHead head{1, call.mostSeconds, call.graceSeconds, parts.size()};
  ReadingWatch watch;
  watch.begin(kMessageSeconds, "its limit");
  if (helper_.send(&head, sizeof head, watch) != HelperProcess::Outcome::done ||
      helper_.send(parts.data(), parts.size(), watch) != HelperProcess::Outcome::done) {
    reason = "the process that watches it does not answer";
    helper_.end();
    return false;
  }
  isRunning_ = true;
  return true;
}

std::optional<SideCommandEnd> SideCommand::take() {
  if (!isRunning_ || !helper_.hasAnswer()) return std::nullopt;
  isRunning_ = false;
  ReadingWatch watch;
  watch.begin(kMessageSeconds, "its limit");
  AnswerHead head;
  SideCommandEnd end;
  if (helper_.receive(&head, sizeof head, watch) == HelperProcess::Outcome::done) {
    end.output.resize(std::min<std::uint64_t>(head.size, kMostOutput));
    if (helper_.receive(end.output.data(), end.output.size(), watch) == HelperProcess::Outcome::done) {
      end.kind = head.kind;
      end.code = head.code;
      end.seconds = head.seconds;
      return end;
    }
  }
  helper_.end();
  return SideCommandEnd{};
}

void SideCommand::stop(double graceSeconds) {
  if (!isRunning_) return;
  const RequestHead head{0, 0.0, graceSeconds, 0};
  ReadingWatch watch;
  watch.begin(kMessageSeconds, "its limit");
  helper_.send(&head, sizeof head, watch);
}

void SideCommand::abandon() {
  isRunning_ = false;
  helper_.leave();
}

}  // namespace mirevo
