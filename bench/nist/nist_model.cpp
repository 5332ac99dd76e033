/// The model of a data set of the StRD: reads `parameters.txt`, one value a line, and writes `simulated.csv` with the
/// response of each observation as that of a day, with all digits. Usage: nist_model FOLDER_OF_DATA_SETS NAME

#include <cstdio>
#include <exception>
#include <fstream>
#include <vector>

#include <fmt/core.h>

#include "algorithms/strd_functions.h"
#include "strd_file.h"

int main(int argc, char** argv) {
  using namespace mirevo;
  if (argc != 3) return 2;
  try {
    const bench::StrdSet set = bench::readStrdSet(argv[1], argv[2]);
    std::vector<double> b;
    std::ifstream file("parameters.txt");
    for (double value = 0.0; file >> value;) b.push_back(value);
    std::ofstream results("simulated.csv");
    results << "time,y\n";
    for (std::size_t i = 0; i < set.x.size(); ++i) {
      const double y = testing::strdModels().at(set.name)(b, set.x[i]);
      results << fmt::format("{:04}-{:02}-{:02},{:.17g}\n", 2001 + i / 336, 1 + i / 28 % 12, 1 + i % 28, y);
    }
    return results.flush() ? 0 : 1;
  } catch (const std::exception& error) {
    fmt::print(stderr, "{}\n", error.what());
    return 1;
  }
}
