#pragma once

#include <filesystem>
#include <string>
#include <string_view>

namespace mirevo {

// Some parts of the program are modules, lib/mirevo/mirevo-<name>.so: libraries that take time to load are linked with
// these and not with the program, so that only runs that need them pay for them.

struct ProgramModule {
  std::filesystem::path path;  ///< if it is not there, where it should be
  bool exists = false;
};

/// The module of that name, beside the program.
ProgramModule findModule(std::string_view name);

enum class ModuleScope { own, ofProgram };

/// Loads a module for good; null with the reason if it cannot be loaded or is none of this version. `ofProgram`: what
/// it and its libraries define is found by libraries that they load themselves.
void* loadModule(const ProgramModule& module, ModuleScope scope, std::string& reason);

/// The address of a symbol of a loaded module, or of the libraries that it is linked with; null if there is none.
void* symbolOf(void* module, const char* name);

/// loadModule() by name; the address of what the module exports under `symbol`, null with the reason on failure.
const void* contentOfModule(std::string_view name, const char* symbol, std::string& reason);

/// The function by which every module tells its version, MIREVO_MODULE_VERSION. None of the modules sees another's.
inline constexpr const char* kModuleVersionName = "mirevoModuleVersion";

}  // namespace mirevo
