#pragma once

#include <span>
#include <string>
#include <string_view>

namespace mirevo {

/// The program's version, "0.2.0".
std::string_view programVersion();

/// What a program answers to --version: in the first line its name and version, then a line each about the compiler,
/// the libraries of the languages, the other libraries ("fmt 9.1.0", and those given), and the options of the build.
std::string versionText(std::string_view program, std::span<const std::string> libraries = {});

}  // namespace mirevo
