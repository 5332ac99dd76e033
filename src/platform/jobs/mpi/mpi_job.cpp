#include <algorithm>
#include <array>
#include <csignal>
#include <cstdlib>
#include <ctime>
#include <functional>
#include <list>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <unistd.h>
#include <utility>
#include <vector>

#include <fmt/core.h>
#include <mpi.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "platform/jobs/job_launcher.h"
#include "platform/jobs/mpi/near_processes.h"
#include "platform/jobs/mpi_module.h"

namespace mirevo {
namespace {

// MPI's own waits spin. A wait here is a probe and a nap, and naps grow with the time since the last message: an
// immediate answer is received at once, one that takes 50 ms or longer is received later by a hundredth of that time on
// average, and a process that waits long uses a few thousandths of a core.
constexpr double kShortestNap = 50e-6;
constexpr double kLongestNap = 5e-3;
constexpr double kSteepness = 1.0 / 16.0;  ///< of the nap's growth with the time waited, up to kPlateau
constexpr double kPlateau = 1e-3;          ///< of the nap, from 16 ms to 200 ms of waiting
constexpr double kLateSteepness = 1.0 / 200.0;

/// Time for the launcher to take note that this process aborts the job.
constexpr unsigned kAbortSeconds = 2;
/// Longest time for messages to be taken by their receivers when a job is left that outlives losses.
constexpr double kLastMessagesSeconds = 2.0;
/// Longest time for a process to end that is killed, and time for the launcher to take note of it.
constexpr double kEndSeconds = 1.0;
constexpr double kNoticeSeconds = 0.1;
/// Longest time for MPI to finalise in such a job: it may wait for processes that are lost, also for some that have
/// ended. The second is for a job of which the master knows that it has lost some.
constexpr unsigned kFinaliseSeconds = 10;
constexpr unsigned kFinaliseWithoutSomeSeconds = 2;
/// Longest time for MPI to begin in such a job: it waits for ever for a process that is lost meanwhile.
constexpr unsigned kInitialiseSeconds = 300;

/// Tag of the messages by which processes introduce themselves; those of the job's user are above it.
constexpr int kIntroduction = 0;

double napLength(double waited) {
  const double length = std::min(waited * kSteepness, std::max(kPlateau, waited * kLateSteepness));
  return std::clamp(length, kShortestNap, kLongestNap);
}

void nap(double seconds) {
  const timespec pause{0, static_cast<long>(std::max(seconds, 0.0) * 1e9)};
  ::nanosleep(&pause, nullptr);
}

double secondsSince(double start) {
  return runTimeClock() - start;
}

std::string errorText(int code) {
  std::array<char, MPI_MAX_ERROR_STRING> text{};
  int length = 0;
  if (MPI_Error_string(code, text.data(), &length) != MPI_SUCCESS) return fmt::format("error {}", code);
  return {text.data(), static_cast<std::size_t>(length)};
}

/// As mpirun sees it: it starts a daemon on each of its nodes.
bool isJobOnOneNode(int processCount) {
  const char* count = std::getenv("OMPI_COMM_WORLD_LOCAL_SIZE");
  return count != nullptr && std::atoi(count) == processCount;
}

/// mpirun ends all processes, and then itself with 1.
void endLauncher() {
  if (const pid_t launcher = mpirunProcess(); launcher > 0) ::kill(launcher, SIGTERM);
}

void check(int code, std::string_view call) {
  if (code == MPI_SUCCESS) return;
  fatalError(kCommunicationFailed, fmt::format("{}: {}", call, errorText(code)));
}

/// For when MPI does not come to its end: what the process then ends with, the processes that would keep the launcher
/// from ending, or null, and the launcher to be ended, or 0.
int exitCodeOfLeaving = 0;
const NearProcesses* keepersOfLeaving = nullptr;
pid_t launcherOfLeaving = 0;

void leaveFromSignal(int) {
  if (keepersOfLeaving != nullptr) keepersOfLeaving->killAll();
  if (launcherOfLeaving > 0) ::kill(launcherOfLeaving, SIGTERM);
  ::_exit(exitCodeOfLeaving);
}

void giveUpJoining(int) {
  constexpr std::string_view kText =
      "Error: The processes of the job cannot reach each other by MPI: one of them was lost as they began\n";
  static_cast<void>(::write(STDERR_FILENO, kText.data(), kText.size()) < 0);
  exitCodeOfLeaving = 1;
  leaveFromSignal(SIGALRM);
}

bool isDone(MPI_Request& request) {
  int done = 0;
  check(MPI_Test(&request, &done, MPI_STATUS_IGNORE), "MPI_Test");
  return done != 0;
}

/// Messages on their way. Lists, since MPI refers to contents and requests by address.
struct Traffic {
  struct Send {
    int rank = 0;  ///< the receiver's
    std::string content;
    MPI_Request request = MPI_REQUEST_NULL;
  };
  /// A message whose sender may be stopped half-way through it, so that waiting for its end could last for ever.
  struct Arrival {
    Message message;
    MPI_Request request = MPI_REQUEST_NULL;
    bool isWhole = false;
  };
  std::list<Send> running;
  std::list<Arrival> arriving;          ///< in the order of sending, for each sender
  double lastMessage = runTimeClock();  ///< sent or received

  /// Removes messages that have arrived.
  void complete() {
    for (auto send = running.begin(); send != running.end();) {
      send = isDone(send->request) ? running.erase(send) : std::next(send);
    }
  }
  /// Begins to receive what others have begun to send.
  void accept();
  bool isRunningTo(const std::set<int>& others) const {
    return std::any_of(running.begin(), running.end(), [&](const Send& send) { return !others.contains(send.rank); });
  }
  /// The first message that is whole and has no earlier one of the same sender before it.
  std::optional<Message> take();
};

class MpiJob final : public Job {
 public:
  MpiJob(int rank, int processCount) : rank_(rank), processCount_(processCount) {
    if (isKept_ && rank_ > 0) send(0, kIntroduction, NearProcesses::introduction());
  }

  std::string_view means() const override { return "MPI"; }
  int rank() const override { return rank_; }
  int processCount() const override { return processCount_; }
  void send(int rank, int tag, std::string content) override;
  std::optional<Message> receive(double seconds) override;
  bool finalise(const std::function<bool()>& isEnough) override;
  bool outlivesLosses() const override { return isKept_; }
  bool hasEnded(int rank) override { return near_.hasEnded(rank); }
  void leaveWithout(const std::set<int>& lost) override;
  void abort(int exitCode) override;
  void end(int exitCode) override;

 private:
  void takeIntroduction(const Message& message);
  void finaliseOrLeave(int exitCode);

  int rank_;
  int processCount_;
  bool isKept_ = launcherKeepsJob();
  bool isOnOneNode_ = isJobOnOneNode(processCount_);
  MPI_Request leaving_ = MPI_REQUEST_NULL;
  Traffic traffic_;
  NearProcesses near_;                          ///< in a job that outlives losses
  std::optional<std::set<int>> leavesWithout_;  ///< processes that are lost
  bool isLauncherBound_ = false;                ///< the launcher would wait for ever for a process that is lost
};

// Requests are tested until they are done, which the checker does not see.
// NOLINTBEGIN(clang-analyzer-optin.mpi.MPI-Checker)
void Traffic::accept() {
  while (true) {
    int found = 0;
    MPI_Message handle = MPI_MESSAGE_NULL;
    MPI_Status status;
    check(MPI_Improbe(MPI_ANY_SOURCE, MPI_ANY_TAG, MPI_COMM_WORLD, &found, &handle, &status), "MPI_Improbe");
    if (found == 0) return;
    int size = 0;
    check(MPI_Get_count(&status, MPI_BYTE, &size), "MPI_Get_count");
    Arrival& arrival = arriving.emplace_back();
    arrival.message = {status.MPI_SOURCE, status.MPI_TAG, std::string(static_cast<std::size_t>(size), '\0')};
    check(MPI_Imrecv(arrival.message.content.data(), size, MPI_BYTE, &handle, &arrival.request), "MPI_Imrecv");
  }
}

void MpiJob::send(int rank, int tag, std::string content) {
  traffic_.complete();
  Traffic::Send& send = traffic_.running.emplace_back();
  send.rank = rank;
  send.content = std::move(content);
  check(MPI_Isend(send.content.data(), static_cast<int>(send.content.size()), MPI_BYTE, rank, tag, MPI_COMM_WORLD,
                  &send.request),
        "MPI_Isend");
  traffic_.lastMessage = runTimeClock();
}
// NOLINTEND(clang-analyzer-optin.mpi.MPI-Checker)

std::optional<Message> Traffic::take() {
  std::vector<int> unfinished;  // senders
  for (auto arrival = arriving.begin(); arrival != arriving.end(); ++arrival) {
    if (!arrival->isWhole) arrival->isWhole = isDone(arrival->request);
    const int rank = arrival->message.rank;
    if (!arrival->isWhole) unfinished.push_back(rank);
    if (std::find(unfinished.begin(), unfinished.end(), rank) != unfinished.end()) continue;
    Message message = std::move(arrival->message);
    arriving.erase(arrival);
    return message;
  }
  return std::nullopt;
}

std::optional<Message> MpiJob::receive(double seconds) {
  const double start = runTimeClock();
  while (true) {
    traffic_.complete();
    traffic_.accept();
    if (auto message = traffic_.take()) {
      traffic_.lastMessage = runTimeClock();
      if (message->tag != kIntroduction) return message;
      takeIntroduction(*message);
      continue;
    }
    const double waited = secondsSince(start);
    if (waited >= seconds) return std::nullopt;
    nap(std::min(napLength(secondsSince(traffic_.lastMessage)), seconds - waited));
  }
}

/// Workers introduce themselves to the master, which does so in return.
void MpiJob::takeIntroduction(const Message& message) {
  near_.meet(message.rank, message.content);
  if (rank_ == 0) send(message.rank, kIntroduction, NearProcesses::introduction());
}

// MPI_Finalize waits for every process, and can wait for ever: they meet before it.
// NOLINTBEGIN(clang-analyzer-optin.mpi.MPI-Checker)
bool MpiJob::finalise(const std::function<bool()>& isEnough) {
  if (!hasWorkers()) return true;  // has been called before
  check(MPI_Ibarrier(MPI_COMM_WORLD, &leaving_), "MPI_Ibarrier");
  const double start = runTimeClock();
  for (bool haveAllCome = false; true; nap(napLength(secondsSince(start)))) {
    traffic_.complete();
    haveAllCome = haveAllCome || isDone(leaving_);
    if (haveAllCome && traffic_.running.empty()) break;
    if (isEnough()) return false;
  }
  check(MPI_Finalize(), "MPI_Finalize");
  processCount_ = 1;
  rank_ = -1;
  return true;
}
// NOLINTEND(clang-analyzer-optin.mpi.MPI-Checker)

// A process that is stopped would keep the launcher from ending. With several nodes it does not even end when the last
// of its processes has, if one of them was lost.
void MpiJob::leaveWithout(const std::set<int>& lost) {
  leavesWithout_ = lost;
  isLauncherBound_ = !isOnOneNode_ && !lost.empty();
  for (const int rank : lost) {
    if (!near_.kill(rank)) isLauncherBound_ = true;
  }
  // The launcher should know of their end before MPI is finalised.
  const auto hasEnded = [this](int rank) { return near_.hasEnded(rank); };
  const double start = runTimeClock();
  while (!isLauncherBound_ && !std::all_of(lost.begin(), lost.end(), hasEnded) && secondsSince(start) < kEndSeconds) {
    nap(kLongestNap);
  }
  if (!lost.empty()) nap(kNoticeSeconds);
}

void MpiJob::finaliseOrLeave(int exitCode) {
  const double start = runTimeClock();
  for (traffic_.complete(); traffic_.isRunningTo(*leavesWithout_) && secondsSince(start) < kLastMessagesSeconds;) {
    nap(kShortestNap);
    traffic_.complete();
  }
  exitCodeOfLeaving = exitCode;
  const bool areAllNear = isOnOneNode_ && near_.count() + 1 == static_cast<std::size_t>(processCount_);
  if (rank_ == 0 && (exitCode != 0 || isLauncherBound_ || !areAllNear)) launcherOfLeaving = mpirunProcess();
  if (isLauncherBound_ || exitCode != 0) leaveFromSignal(SIGALRM);
  if (rank_ == 0) keepersOfLeaving = &near_;
  ::signal(SIGALRM, leaveFromSignal);
  ::alarm(leavesWithout_->empty() ? kFinaliseSeconds : kFinaliseWithoutSomeSeconds);
  MPI_Finalize();
  ::alarm(0);
}

void MpiJob::abort(int exitCode) {
  if (isKept_) endLauncher();  // MPI_Abort would end this process alone
  ::signal(SIGALRM, SIG_DFL);
  ::alarm(kAbortSeconds);
  if (hasWorkers()) MPI_Abort(MPI_COMM_WORLD, exitCode);
  ::_exit(exitCode);
}

void MpiJob::end(int exitCode) {
  if (leavesWithout_) return finaliseOrLeave(exitCode);
  if (hasWorkers()) abort(exitCode);
  if (isKept_ && exitCode != 0) endLauncher();  // which makes its exit code 1
}

}  // namespace

extern "C" {

/// The program refuses a module of another version.
const char* mirevoModuleVersion() {
  return MIREVO_MODULE_VERSION;
}

Job* mirevoJoinMpiJob() {
  // MPI_Finalize spins; several processes may share a core.
  ::setenv("OMPI_MCA_mpi_yield_when_idle", "1", 0);
  if (launcherKeepsJob()) {
    launcherOfLeaving = mpirunProcess();
    ::signal(SIGALRM, giveUpJoining);
    ::alarm(kInitialiseSeconds);
  }
  int code = MPI_Init(nullptr, nullptr);
  ::alarm(0);
  launcherOfLeaving = 0;
  int count = 1;
  int rank = 0;
  if (code == MPI_SUCCESS) {
    MPI_Comm_set_errhandler(MPI_COMM_WORLD, MPI_ERRORS_RETURN);
    code = MPI_Comm_size(MPI_COMM_WORLD, &count);
    if (code == MPI_SUCCESS) code = MPI_Comm_rank(MPI_COMM_WORLD, &rank);
  }
  if (code == MPI_SUCCESS && count > 1) return new MpiJob(rank, count);
  if (code == MPI_SUCCESS) MPI_Finalize();
  const auto launched = launchedProcessCount();
  if (!launched) return nullptr;
  fatalError("Error: The processes of the job cannot reach each other by MPI",
             fmt::format("A job launcher started {} processes, of which each finds itself alone{}. Start them with the "
                         "mpirun of the MPI that its part for MPI is linked with, or with srun --mpi=pmix.",
                         *launched, code == MPI_SUCCESS ? "" : ": " + errorText(code)));
}

}  // extern "C"

}  // namespace mirevo
