#include "algorithms/numbers/number_libraries.h"

#include <algorithm>
#include <string_view>

#include <boost/version.hpp>
#include <fmt/core.h>

#include "algorithms/numbers/lapack_functions.h"
#include "common/fatal_error.h"

namespace mirevo {

std::vector<std::string> numberLibraries() {
  std::vector<std::string> libraries;
  try {
    if (lapack().ilaver != nullptr) {
      int major = 0;
      int minor = 0;
      int patch = 0;
      lapack().ilaver(&major, &minor, &patch);
      libraries.push_back(fmt::format("LAPACK {}.{}.{}", major, minor, patch));
    }
    if (lapack().openblasConfiguration != nullptr) {
      const std::string_view text = lapack().openblasConfiguration();  // "OpenBLAS 0.3.21 NO_LAPACKE ..."
      const std::size_t nameEnd = std::min(text.find(' '), text.size());
      libraries.emplace_back(text.substr(0, text.find(' ', nameEnd + 1)));
    }
  } catch (const FatalError& error) {
    libraries.push_back(fmt::format("no LAPACK ({})", error.detail()));
  }
  libraries.push_back(
      fmt::format("Boost {}.{}.{}", BOOST_VERSION / 100000, BOOST_VERSION / 100 % 1000, BOOST_VERSION % 100));
  return libraries;
}

}  // namespace mirevo
