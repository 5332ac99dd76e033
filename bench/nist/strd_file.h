#pragma once

#include <string>
#include <vector>

namespace mirevo::bench {

/// A data set of the StRD, read from its file (https://www.itl.nist.gov/div898/strd/nls/nls_main.shtml).
struct StrdSet {
  std::string name;
  std::vector<double> starts[2];  ///< p each
  std::vector<double> certified;
  std::vector<double> deviations;      ///< certified standard deviations
  double sumOfSquares = 0.0;           ///< certified
  std::vector<double> y;               ///< of Nelson the logarithm
  std::vector<std::vector<double>> x;  ///< of each observation
};

/// Throws std::runtime_error.
StrdSet readStrdSet(const std::string& folder, const std::string& name);

}  // namespace mirevo::bench
