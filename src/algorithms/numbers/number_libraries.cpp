#include "algorithms/numbers/number_libraries.h"

#include <algorithm>
#include <string_view>

#include <boost/version.hpp>
#include <fmt/core.h>

#include "common/loaded_function.h"

namespace mirevo {

std::vector<std::string> numberLibraries() {
  std::vector<std::string> libraries;
  if (auto* const lapackVersion = loadedFunction<void(int*, int*, int*)>("ilaver_"); lapackVersion != nullptr) {
    int major = 0;
    int minor = 0;
    int patch = 0;
    lapackVersion(&major, &minor, &patch);
    libraries.push_back(fmt::format("LAPACK {}.{}.{}", major, minor, patch));
  }
  if (auto* const configuration = loadedFunction<char*()>("openblas_get_config"); configuration != nullptr) {
    const std::string_view text = configuration();  // "OpenBLAS 0.3.21 NO_LAPACKE ..."
    const std::size_t nameEnd = std::min(text.find(' '), text.size());
    libraries.emplace_back(text.substr(0, text.find(' ', nameEnd + 1)));
  }
  libraries.push_back(
      fmt::format("Boost {}.{}.{}", BOOST_VERSION / 100000, BOOST_VERSION / 100 % 1000, BOOST_VERSION % 100));
  return libraries;
}

}  // namespace mirevo
