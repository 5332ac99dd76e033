#include "platform/jobs/mpi_job.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <ctime>
#include <list>
#include <optional>
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

void check(int code, std::string_view call) {
  if (code == MPI_SUCCESS) return;
  fatalError(kCommunicationFailed, fmt::format("{}: {}", call, errorText(code)));
}

/// Messages on their way. A list, since MPI refers to contents and requests by address.
struct Traffic {
  struct Send {
    std::string content;
    MPI_Request request = MPI_REQUEST_NULL;
  };
  std::list<Send> running;
  double lastMessage = runTimeClock();  ///< sent or received

  /// Removes messages that have arrived.
  void complete() {
    for (auto send = running.begin(); send != running.end();) {
      int done = 0;
      check(MPI_Test(&send->request, &done, MPI_STATUS_IGNORE), "MPI_Test");
      send = done != 0 ? running.erase(send) : std::next(send);
    }
  }
};

class MpiJob final : public Job {
 public:
  MpiJob(int rank, int processCount) : rank_(rank), processCount_(processCount) {}

  std::string_view means() const override { return "MPI"; }
  int rank() const override { return rank_; }
  int processCount() const override { return processCount_; }
  void send(int rank, int tag, std::string content) override;
  std::optional<Message> receive(double seconds) override;
  void finalise(double seconds) override;
  void abort(int exitCode) override;

 private:
  int rank_;
  int processCount_;
  Traffic traffic_;
};

// Traffic::complete() tests the request until it is done, which the checker does not see.
// NOLINTBEGIN(clang-analyzer-optin.mpi.MPI-Checker)
void MpiJob::send(int rank, int tag, std::string content) {
  traffic_.complete();
  Traffic::Send& send = traffic_.running.emplace_back();
  send.content = std::move(content);
  check(MPI_Isend(send.content.data(), static_cast<int>(send.content.size()), MPI_BYTE, rank, tag, MPI_COMM_WORLD,
                  &send.request),
        "MPI_Isend");
  traffic_.lastMessage = runTimeClock();
}
// NOLINTEND(clang-analyzer-optin.mpi.MPI-Checker)

std::optional<Message> MpiJob::receive(double seconds) {
  const double start = runTimeClock();
  while (true) {
    traffic_.complete();
    int arrived = 0;
    MPI_Status status;
    check(MPI_Iprobe(MPI_ANY_SOURCE, MPI_ANY_TAG, MPI_COMM_WORLD, &arrived, &status), "MPI_Iprobe");
    if (arrived != 0) {
      Message message{status.MPI_SOURCE, status.MPI_TAG, {}};
      int size = 0;
      check(MPI_Get_count(&status, MPI_BYTE, &size), "MPI_Get_count");
      message.content.resize(static_cast<std::size_t>(size));
      check(MPI_Recv(message.content.data(), size, MPI_BYTE, message.rank, message.tag, MPI_COMM_WORLD,
                     MPI_STATUS_IGNORE),
            "MPI_Recv");
      traffic_.lastMessage = runTimeClock();
      return message;
    }
    const double waited = secondsSince(start);
    if (waited >= seconds) return std::nullopt;
    nap(std::min(napLength(secondsSince(traffic_.lastMessage)), seconds - waited));
  }
}

void MpiJob::finalise(double seconds) {
  if (!hasWorkers()) return;  // has been called before
  const double start = runTimeClock();
  for (traffic_.complete(); !traffic_.running.empty(); traffic_.complete()) {
    const double waited = secondsSince(start);
    if (waited >= seconds) {
      fatalError(kCommunicationFailed, fmt::format("a message was not taken within {} seconds", seconds));
    }
    nap(std::min(napLength(waited), seconds - waited));
  }
  check(MPI_Finalize(), "MPI_Finalize");
  processCount_ = 1;
  rank_ = -1;
}

void MpiJob::abort(int exitCode) {
  if (hasWorkers()) MPI_Abort(MPI_COMM_WORLD, exitCode);
  ::_exit(exitCode);
}

}  // namespace

std::unique_ptr<Job> joinMpiJob() {
  const auto launched = launchedProcessCount();
  const bool isLaunched = launched || launcherRank() >= 0;
  if (!isLaunched) return nullptr;  // variables that the user has set for a model's own MPI are kept
  if (launched && *launched <= 1) {
    hideJobFromModels();
    return nullptr;
  }
  // MPI_Finalize spins; several processes may share a core.
  ::setenv("OMPI_MCA_mpi_yield_when_idle", "1", 0);
  int code = MPI_Init(nullptr, nullptr);
  int count = 1;
  int rank = 0;
  if (code == MPI_SUCCESS) {
    MPI_Comm_set_errhandler(MPI_COMM_WORLD, MPI_ERRORS_RETURN);
    code = MPI_Comm_size(MPI_COMM_WORLD, &count);
    if (code == MPI_SUCCESS) code = MPI_Comm_rank(MPI_COMM_WORLD, &rank);
  }
  hideJobFromModels();
  if (code == MPI_SUCCESS && count > 1) return std::make_unique<MpiJob>(rank, count);
  if (code == MPI_SUCCESS) MPI_Finalize();
  if (!launched) return nullptr;
  fatalError("Error: The processes of the job cannot reach each other by MPI",
             fmt::format("A job launcher started {} processes, of which each finds itself alone{}. Start them with the "
                         "mpirun of the MPI that Mirevo is linked with, or with srun --mpi=pmix.",
                         *launched, code == MPI_SUCCESS ? "" : ": " + errorText(code)));
}

}  // namespace mirevo
