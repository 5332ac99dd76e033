/// Fits the 27 nonlinear regression problems of the StRD by GLM, from both starts and with the whole program, and
/// prints the table of docs/algorithms/glm.md: model runs and how many certified digits the parameters, their standard
/// deviations and the sum of squares have. Usage: nist FOLDER_OF_DATA_SETS [NAME...]

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "algorithms/strd_functions.h"
#include "program_case.h"
#include "strd_file.h"

namespace mirevo::bench {
namespace {

namespace fs = std::filesystem;

/// Certified values have eleven digits.
constexpr double kMostDigits = 11.0;

/// The logarithm of the relative error: the digits that two values share.
double digitsOf(double value, double certified) {
  const double error = std::abs(value - certified) / std::abs(certified);
  return std::clamp(error > 0.0 ? -std::log10(error) : kMostDigits, 0.0, kMostDigits);
}

std::string dayOf(std::size_t i) {
  return fmt::format("{:04}-{:02}-{:02}", 2001 + i / 336, 1 + i / 28 % 12, 1 + i % 28);
}

constexpr const char* kSeriesFiles = R"([SIMULATION_FILE]
File_Name = 'model/simulated.csv'
Item_No = 1
[/SIMULATION_FILE]
[OBSERVATION_FILE]
File_Name = 'observed.csv'
Item_No = 1
[/OBSERVATION_FILE]
)";
constexpr const char* kTask = R"([OPTIMISATION_ALGORITHM]
Algorithm_Type = 'GLM'
Use_Surrogate_Model = 0
[GLM_CONTROL_PARAMETERS]
Perturbation_Option = 'value'
Perturbation_Fraction = 1e-5
Broyden_Updates = 0
Singular_Value_Limit = 1e-13
Min_Step = 0
Min_Gradient = 0
[/GLM_CONTROL_PARAMETERS]
[INITIAL_SAMPLE]
Include_Initial_Parameters = 1
Random_Seed = 1
[/INITIAL_SAMPLE]
[STOPPING_CRITERIA]
Max_No_Evaluations = 3000
Min_Change = 0
[/STOPPING_CRITERIA]
[/OPTIMISATION_ALGORITHM]
)";

void writeStrdCase(const fs::path& folder, const std::string& data, const StrdSet& set, int start) {
  ProgramCase one{.option = "2",
                  .title = set.name,
                  .endDate = dayOf(set.y.size() - 1),
                  .name = "squares",
                  .statistic = "'sum of squared errors'",
                  .seriesFiles = kSeriesFiles,
                  .task = kTask,
                  .modelCommand = fmt::format("{} {} {}", NIST_MODEL, data, set.name)};
  for (std::size_t j = 0; j < set.certified.size(); ++j) {
    const double values[] = {set.starts[0][j], set.starts[1][j], set.certified[j]};
    const auto [least, most] = std::ranges::minmax(values);
    const double size = std::max(std::abs(least), std::abs(most));
    one.parameters.push_back({fmt::format("b{}", j + 1), set.starts[start][j], least - 2.0 * size, most + 2.0 * size});
  }
  writeCase(folder, one);
  std::string observed = "time,y\n";
  for (std::size_t i = 0; i < set.y.size(); ++i) observed += fmt::format("{},{:.17g}\n", dayOf(i), set.y[i]);
  writeText(folder / "observed.csv", observed);
}

/// The cells of the line of a parameter in the table of limits; empty if there is none.
std::vector<std::string> rowOf(const fs::path& table, const std::string& parameter) {
  std::ifstream file(table);
  for (std::string line; std::getline(file, line);) {
    std::istringstream cells(line);
    std::vector<std::string> row;
    for (std::string cell; std::getline(cells, cell, '\t');) row.push_back(cell);
    if (!row.empty() && row.front() == parameter) return row;
  }
  return {};
}

/// The sum of squares that the log gives last, and the evaluations.
void readLog(const fs::path& log, double& sum, int& evaluations) {
  std::ifstream file(log);
  for (std::string line; std::getline(file, line);) {
    const std::size_t place = line.rfind("sum of squares ");
    if (line.starts_with("Run 1 of GLM ended") && place != std::string::npos) sum = std::stod(line.substr(place + 15));
    if (line.find(" model evaluations, ") != std::string::npos) evaluations = std::atoi(line.c_str());
  }
}

void measure(const std::string& data, const std::string& name) {
  const StrdSet set = readStrdSet(data, name);
  fmt::print("| {} | {} ", name, set.certified.size());
  for (const int start : {0, 1}) {
    const fs::path folder = fs::temp_directory_path() / fmt::format("nist-{}-{}", name, start + 1);
    fs::remove_all(folder);
    writeStrdCase(folder, data, set, start);
    const std::string prepare =
        fmt::format("cd {0}/model && ./run.sh && cd .. && VOLK_PROGRESS=NONE {1} case.kdx >/dev/null 2>&1",
                    folder.string(), MIREVO_PROGRAM);
    const bool hasRun = std::system(prepare.c_str()) == 0;
    double sum = 0.0;
    int evaluations = 0;
    readLog(folder / "case.log", sum, evaluations);
    double digits = kMostDigits;
    double ofDeviations = kMostDigits;
    for (std::size_t j = 0; j < set.certified.size(); ++j) {
      const std::vector<std::string> row =
          rowOf(folder / "case_Optimisation_ParameterLimits.dat", fmt::format("b{}", j + 1));
      const auto cell = [&](std::size_t k) { return row.size() > k ? std::atof(row[k].c_str()) : 0.0; };
      digits = std::min(digits, digitsOf(cell(1), set.certified[j]));
      ofDeviations = std::min(ofDeviations, digitsOf(cell(2), set.deviations[j]));
    }
    fmt::print("| {} | {:.1f} | {:.1f} | {:.1f} {}", evaluations, digits, ofDeviations, digitsOf(sum, set.sumOfSquares),
               hasRun ? "" : "(error) ");
    if (hasRun && digits > 6.0) fs::remove_all(folder);
  }
  fmt::print("|\n");
  std::fflush(stdout);
}

}  // namespace
}  // namespace mirevo::bench

int main(int argc, char** argv) {
  if (argc < 2) return 1;
  const std::string data = std::filesystem::absolute(argv[1]).string();
  std::vector<std::string> names(argv + 2, argv + argc);
  if (names.empty()) {
    for (const auto& [name, model] : mirevo::testing::strdModels()) names.push_back(name);
  }
  fmt::print(
      "| data set | parameters | runs, start 1 | digits | of deviations | of the sum | runs, start 2 | digits | of "
      "deviations | of the sum |\n|---|---|---|---|---|---|---|---|---|---|\n");
  for (const std::string& name : names) mirevo::bench::measure(data, name);
  return 0;
}
