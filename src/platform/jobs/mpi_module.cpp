#include "platform/jobs/mpi_module.h"

#include <array>
#include <dlfcn.h>
#include <filesystem>
#include <string>
#include <string_view>
#include <unistd.h>

#include <fmt/core.h>

#include "common/fatal_error.h"

namespace mirevo {
namespace {

constexpr const char* kCannotJoin = "Error: Mirevo cannot take part in this MPI job";
constexpr std::string_view kRemedy =
    "A job launcher (mpirun, srun) has started this process as one of several, which would all do the same run. "
    "Use the Debian packages mirevo and mirevo-mpi, both, or build Mirevo where the MPI is, with MIREVO_MPI=ON; or "
    "start it without the launcher.";

/// Where the module may be, relative to the folder of the program: installed, and in the build tree.
constexpr std::array<const char*, 2> kModules = {MIREVO_MODULE_FOLDER "/mirevo-mpi.so", "lib/mirevo/mirevo-mpi.so"};

struct ModuleFile {
  std::filesystem::path path;  ///< if it is not there, where it should be
  bool exists = false;
};

ModuleFile findModule() {
  std::error_code failure;
  const auto program = std::filesystem::read_symlink("/proc/self/exe", failure);
  const auto pathOf = [&](const char* name) { return (program.parent_path() / name).lexically_normal(); };
  for (const char* name : kModules) {
    if (::access(pathOf(name).c_str(), F_OK) == 0) return {pathOf(name), true};
  }
  return {pathOf(kModules[0]), false};
}

/// The address of a symbol of the module.
void* symbolOf(void* module, const char* name, const std::filesystem::path& path) {
  if (void* symbol = ::dlsym(module, name)) return symbol;
  fatalError(kCannotJoin, fmt::format("{} is not the part for MPI of this Mirevo. {}", path.string(), kRemedy));
}

}  // namespace

std::string mpiSupport() {
  const ModuleFile module = findModule();
  return module.exists ? "yes, by " + module.path.string() : fmt::format("no, {} is not there", module.path.string());
}

std::unique_ptr<Job> joinMpiJob() {
  const auto [path, exists] = findModule();
  if (!exists) {
    fatalError(kCannotJoin,
               fmt::format("Its part for MPI is not installed: {} does not exist. {}", path.string(), kRemedy));
  }
  // Global, since the plugins that OpenMPI loads look for its symbols there. It is never unloaded: the job's code is in
  // it, and what MPI registers for the end of the process.
  void* module = ::dlopen(path.c_str(), RTLD_NOW | RTLD_GLOBAL | RTLD_NODELETE);
  if (module == nullptr) {
    fatalError(kCannotJoin, fmt::format("Its part for MPI cannot be loaded: {}. {}", ::dlerror(), kRemedy));
  }
  const std::string_view version = static_cast<const char*>(symbolOf(module, kModuleVersionName, path));
  if (version != MIREVO_MODULE_VERSION) {
    fatalError(kCannotJoin, fmt::format("{} is of Mirevo {}, and this is {}. {}", path.string(), version,
                                        MIREVO_MODULE_VERSION, kRemedy));
  }
  return std::unique_ptr<Job>(reinterpret_cast<JoinMpiJob*>(symbolOf(module, kJoinMpiJobName, path))());
}

}  // namespace mirevo
