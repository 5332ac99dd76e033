#include "common/program_module.h"

#include <array>
#include <dlfcn.h>
#include <system_error>
#include <unistd.h>

#include <fmt/core.h>

namespace mirevo {
namespace {

/// Where modules may be, relative to the folder of the program: installed, and in the build tree.
constexpr std::array<const char*, 2> kFolders = {MIREVO_MODULE_FOLDER, "lib/mirevo"};

}  // namespace

ProgramModule findModule(std::string_view name) {
  std::error_code failure;
  const auto program = std::filesystem::read_symlink("/proc/self/exe", failure);
  const auto pathIn = [&](const char* folder) {
    return (program.parent_path() / folder / fmt::format("mirevo-{}.so", name)).lexically_normal();
  };
  for (const char* folder : kFolders) {
    if (::access(pathIn(folder).c_str(), F_OK) == 0) return {pathIn(folder), true};
  }
  return {pathIn(kFolders[0]), false};
}

void* loadModule(const ProgramModule& module, ModuleScope scope, std::string& reason) {
  if (!module.exists) {
    reason = module.path.string() + " does not exist";
    return nullptr;
  }
  // Never unloaded: its code is in use, and what its libraries register for the end of the process.
  const int flags = RTLD_NOW | RTLD_NODELETE | (scope == ModuleScope::ofProgram ? RTLD_GLOBAL : RTLD_LOCAL);
  void* const handle = ::dlopen(module.path.c_str(), flags);
  if (handle == nullptr) {
    reason = fmt::format("{} cannot be loaded: {}", module.path.string(), ::dlerror());
    return nullptr;
  }
  void* const versionOf = symbolOf(handle, kModuleVersionName);
  if (versionOf == nullptr) {
    reason = module.path.string() + " is not a part of Mirevo";
    return nullptr;
  }
  const char* const version = reinterpret_cast<const char* (*)()>(versionOf)();
  if (std::string_view(version) != MIREVO_MODULE_VERSION) {
    reason = fmt::format("{} is of Mirevo {}, and this is {}", module.path.string(), version, MIREVO_MODULE_VERSION);
    return nullptr;
  }
  return handle;
}

void* symbolOf(void* module, const char* name) {
  return ::dlsym(module, name);
}

const void* contentOfModule(std::string_view name, const char* symbol, std::string& reason) {
  const ProgramModule file = findModule(name);
  void* const module = loadModule(file, ModuleScope::own, reason);
  const void* const content = module == nullptr ? nullptr : symbolOf(module, symbol);
  if (module != nullptr && content == nullptr) reason = file.path.string() + " is not a part of this Mirevo";
  return content;
}

}  // namespace mirevo
