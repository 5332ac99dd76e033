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

constexpr double kGraceSeconds = 2.0;
/// Longest wait for what a command has left to be gone once it is killed.
constexpr double kLeftSeconds = 2.0;
constexpr double kMessageSeconds = 5.0;
constexpr std::size_t kMostOutput = 2000;

struct RequestHead {
  std::int32_t isStart = 0;  ///< otherwise: the command is to be ended
  double mostSeconds = 0.0;
  std::uint64_t size =
      0;  ///< of the parts that follow, each with a zero byte behind it: command, folder, input, variables
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

/// The descriptor of a file without a name, for a process that is to be started; -1 if there can be none.
int unnamedFile() {
  const int file = ::memfd_create("mirevo", MFD_CLOEXEC);
  if (file < 0 || file > STDERR_FILENO) return file;
  const Descriptor low(file);
  return ::fcntl(file, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
}

/// The helper's side: one command after another.
class Watcher final {
 public:
  explicit Watcher(int socket) : socket_(socket) {}

  void serve() {
    while (true) {
      std::array<pollfd, 2> events{pollfd{socket_, POLLIN, 0}, pollfd{pidfd_, POLLIN, 0}};
      ::poll(events.data(), events.size(), group_ == 0 ? -1 : milliseconds());
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
    const double next = (stopped_ ? *stopped_ + kGraceSeconds : started_ + mostSeconds_) - runTimeClock();
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
      if (group_ != 0) stop(Kind::stopped);
      return true;
    }
    mostSeconds_ = head.mostSeconds;
    std::vector<std::string> texts;
    for (std::size_t at = 0; at < parts.size(); at += texts.back().size() + 1) texts.emplace_back(parts.c_str() + at);
    return start(texts);
  }

  bool start(std::vector<std::string>& texts) {
    started_ = runTimeClock();
    stopped_.reset();
    endedBy_ = Kind::exited;
    const Descriptor input(unnamedFile());
    output_.emplace(unnamedFile());
    if (input.get() < 0 || output_->get() < 0) return answer(Kind::couldNotStart, errno);
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
    const SpawnedProcess process = spawnProcess(command, {environment.data(), input.get(), output_->get(), &entry_});
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
    int status = 0;
    const double now = runTimeClock();
    if (::waitpid(group_, &status, WNOHANG) != group_) {
      if (!stopped_ && now - started_ > mostSeconds_) stop(Kind::timedOut);
      if (stopped_ && now - *stopped_ > kGraceSeconds) ::kill(-group_, SIGKILL);
      return true;
    }
    ::kill(-group_, SIGKILL);  // the rest of the group
    if (pidfd_ >= 0) ::close(pidfd_);
    pidfd_ = -1;
    group_ = 0;
    endRest();
    if (endedBy_ != Kind::exited) return answer(endedBy_, 0);
    if (WIFSIGNALED(status)) return answer(Kind::signalled, WTERMSIG(status));
    return answer(Kind::exited, WEXITSTATUS(status));
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
    const AnswerHead empty{kind, code, runTimeClock() - started_, 0};
    std::string output;
    if (const off_t size = output_->get() < 0 ? 0 : ::lseek(output_->get(), 0, SEEK_END); size > 0) {
      output.resize(std::min(static_cast<std::size_t>(size), kMostOutput));
      const ssize_t count = ::pread(output_->get(), output.data(), output.size(), size - std::ssize(output));
      output.resize(static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
    }
    output_.reset();
    AnswerHead head = empty;
    head.size = output.size();
    return sendFromHelper(socket_, &head, sizeof head) && sendFromHelper(socket_, output.data(), output.size());
  }

  int socket_;
  pid_t group_ = 0;              ///< also the command's process; 0: none runs
  std::atomic<pid_t> entry_{0};  ///< needed to start a process, and not used
  int pidfd_ = -1;
  std::optional<Descriptor> output_;
  double started_ = 0.0;
  double mostSeconds_ = 0.0;
  std::optional<double> stopped_;  ///< when it was sent SIGTERM
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
      return fmt::format("was ended because it ran longer than {:g} seconds", mostSeconds);
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
  const double deadline = runTimeClock() + kGraceSeconds + kLeftSeconds;
  while (!take() && runTimeClock() < deadline) pause(0.005);
}

bool SideCommand::start(const SideCommandCall& call, std::string& reason) {
  if (!helper_.isRunning() && !helper_.start(watchCommands, reason)) return false;
  std::string parts = call.command + '\0' + call.folder + '\0' + call.input + '\0';
  for (const std::string& variable : call.variables) parts += variable + '\0';
  const RequestHead head{1, call.mostSeconds, parts.size()};
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

void SideCommand::stop() {
  if (!isRunning_) return;
  const RequestHead head;
  ReadingWatch watch;
  watch.begin(kMessageSeconds, "its limit");
  helper_.send(&head, sizeof head, watch);
}

}  // namespace mirevo
