#include "common/version.h"

#include <gnu/libc-version.h>

#include <fmt/format.h>

namespace mirevo {
namespace {

std::string compilerText() {
#if defined(__clang__)
  return fmt::format("Clang {}.{}.{}", __clang_major__, __clang_minor__, __clang_patchlevel__);
#elif defined(__GNUC__)
  return fmt::format("GCC {}.{}.{}", __GNUC__, __GNUC_MINOR__, __GNUC_PATCHLEVEL__);
#else
  return "not known";
#endif
}

std::string standardLibraryText() {
#if defined(_LIBCPP_VERSION)
  return fmt::format("libc++ {}", _LIBCPP_VERSION);
#elif defined(_GLIBCXX_RELEASE)
  return fmt::format("libstdc++ {} ({})", _GLIBCXX_RELEASE, __GLIBCXX__);
#else
  return "not known";
#endif
}

}  // namespace

std::string_view programVersion() {
  return MIREVO_VERSION;
}

std::string versionText(std::string_view program, std::span<const std::string> libraries) {
  std::string used = fmt::format("fmt {}.{}.{}", FMT_VERSION / 10000, FMT_VERSION / 100 % 100, FMT_VERSION % 100);
  for (const std::string& library : libraries) used.append(", ").append(library);
  return fmt::format(
      "{} {}\n"
      "Compiler: {}\n"
      "C++ library: {}\n"
      "C library: glibc {}\n"
      "Libraries: {}\n"
      "Build: {}\n",
      program, programVersion(), compilerText(), standardLibraryText(), ::gnu_get_libc_version(), used, MIREVO_BUILD);
}

}  // namespace mirevo
