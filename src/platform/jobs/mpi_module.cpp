#include "platform/jobs/mpi_module.h"

#include <string>
#include <string_view>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/program_module.h"

namespace mirevo {
namespace {

constexpr std::string_view kMpi = "mpi";
constexpr const char* kCannotJoin = "Error: Mirevo cannot take part in this MPI job";
constexpr std::string_view kRemedy =
    "A job launcher (mpirun, srun) has started this process as one of several, which would all do the same run. "
    "Use the Debian packages mirevo and mirevo-mpi, both, or build Mirevo where the MPI is, with MIREVO_MPI=ON; or "
    "start it without the launcher.";

}  // namespace

std::string mpiSupport() {
  const ProgramModule module = findModule(kMpi);
  return module.exists ? "yes, by " + module.path.string() : fmt::format("no, {} is not there", module.path.string());
}

std::unique_ptr<Job> joinMpiJob() {
  const ProgramModule file = findModule(kMpi);
  std::string reason;
  // Of the program, since the plugins that OpenMPI loads look for its symbols there.
  void* const module = loadModule(file, ModuleScope::ofProgram, reason);
  if (module == nullptr) {
    fatalError(kCannotJoin, fmt::format("Its part for MPI is {}: {}. {}", file.exists ? "of no use" : "not installed",
                                        reason, kRemedy));
  }
  void* const join = symbolOf(module, kJoinMpiJobName);
  if (join == nullptr) {
    fatalError(kCannotJoin, fmt::format("{} is not the part for MPI of this Mirevo. {}", file.path.string(), kRemedy));
  }
  return std::unique_ptr<Job>(reinterpret_cast<JoinMpiJob*>(join)());
}

}  // namespace mirevo
