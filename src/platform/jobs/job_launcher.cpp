#include "platform/jobs/job_launcher.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <fstream>
#include <string>
#include <string_view>
#include <unistd.h>
#include <vector>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

/// Variables by which launchers tell a process its rank and the number of processes: OpenMPI's mpirun, and the process
/// management interface of other launchers and of Slurm, old (PMI) and new (PMIX, which has no variable for the size).
constexpr std::array<const char*, 3> kRankVariables = {"OMPI_COMM_WORLD_RANK", "PMIX_RANK", "PMI_RANK"};
constexpr std::array<const char*, 2> kSizeVariables = {"OMPI_COMM_WORLD_SIZE", "PMI_SIZE"};
/// Prefixes of the variables that a launcher or MPI sets in a process of the job.
constexpr std::array<std::string_view, 6> kJobPrefixes = {"OMPI_", "PMIX_", "PMI_", "ORTE_", "OPAL_", "PRTE_"};

template <class Names>
std::optional<int> firstNumber(const Names& names) {
  for (const char* name : names) {
    const char* value = std::getenv(name);
    if (value == nullptr) continue;
    if (const auto number = parseInteger(value)) return *number;
  }
  return std::nullopt;
}

}  // namespace

int launcherRank() {
  return firstNumber(kRankVariables).value_or(-1);
}

std::optional<int> launchedProcessCount() {
  return firstNumber(kSizeVariables);
}

bool launcherKeepsJob() {
  const char* value = std::getenv("OMPI_MCA_orte_enable_recovery");
  return value != nullptr && (value == std::string_view("1") || value == std::string_view("true"));
}

pid_t mpirunProcess() {
  constexpr std::array<std::string_view, 3> kNames = {"mpirun", "mpiexec", "orterun"};
  const pid_t parent = ::getppid();
  std::string name;
  std::getline(std::ifstream(fmt::format("/proc/{}/comm", parent)), name);
  return std::find(kNames.begin(), kNames.end(), name) != kNames.end() ? parent : 0;
}

void hideJobFromModels() {
  std::vector<std::string> names;
  for (char** variable = ::environ; *variable != nullptr; ++variable) {
    const std::string_view text = *variable;
    const bool isJobs = std::any_of(kJobPrefixes.begin(), kJobPrefixes.end(),
                                    [text](std::string_view prefix) { return text.starts_with(prefix); });
    if (isJobs) names.emplace_back(text.substr(0, text.find('=')));
  }
  for (const std::string& name : names) ::unsetenv(name.c_str());
}

}  // namespace mirevo
