// What grows with the size of a run: time, processor time, peak memory and files of the built program.
//
//   scale FIGURE [FOLDER]   FIGURE is one of the names that it prints without arguments; FOLDER is where a folder for
//                           it is made (default: the temporary one)
#include <cstdio>
#include <filesystem>
#include <string>
#include <string_view>
#include <unistd.h>

#include <fmt/format.h>

#include "analyses.h"
#include "common/fatal_error.h"
#include "large_result.h"
#include "setups.h"

namespace {

using namespace mirevo::bench;

void restart(const std::string& folder) {
  constexpr int kRows = 1'000'000;
  const std::string setup =
      writeSetup(folder, {.simulation = "Restart = 1\nReport = 0\n", .task = ddsSections(kRows + 10)});
  leaveInterruptedSearch(setup, kRows);
  measureProgram("restart of 1,000,000 rows", setup);
}

void uncertainty(const std::string& folder) {
  constexpr int kParameters = 10'000;
  const std::string setup = writeSetup(folder, {.option = 3,
                                                .parameters = kParameters,
                                                .simulation = "Report = 0\n",
                                                .task = uncertaintySections(100, kParameters)});
  measureProgram("uncertainty of 10,000 parameters, 100 runs", setup);
}

/// 1,000 measures: 20 selections of the observations of each of 50 series of ten years of hourly values.
void series(const std::string& folder) {
  constexpr int kSeries = 50;
  constexpr int kSelections = 20;
  std::string measures = itemCount(kSeries * kSelections);
  for (int i = 0; i < kSeries * kSelections; ++i) {
    const std::string item = fmt::format("Item_No = {}\n", i % kSeries + 1);
    measures += section(fmt::format("MEASURE_{}", i + 1),
                        {fmt::format("Name = 'm{}'\nStatistic_Type = 1\nFunction_Name = 'all'\n", i + 1),
                         fmt::format("Lowest_Observed = 0.0{:02}\n", i / kSeries + 1),
                         section("SIMULATION_FILE", {"File_Name = 'base/simulated.csv'\n", item}),
                         section("OBSERVATION_FILE", {"File_Name = 'observed.csv'\n", item})});
  }
  const std::string setup = writeSetup(folder, {.simulation = "Report = 0\n",
                                                .measures = measures,
                                                .task = ddsSections(4),
                                                .model = "cat input.csv > simulated.csv\n"});
  for (const std::string file : {"/base/input.csv", "/base/simulated.csv", "/observed.csv"}) {
    writeHourlySeries(folder + file, kSeries);
  }
  measureProgram("1,000 measures over 50 series of 87,600 rows, 5 runs, Report = 0", setup);
}

void surrogate(const std::string& /*folder*/) {
  measureQuadraticSurrogate();
}
void covariance(const std::string& /*folder*/) {
  measureCovariance();
}

struct Figure {
  std::string_view name;
  void (*measure)(const std::string& folder);
};

constexpr Figure kFigures[] = {{"restart", restart},
                               {"uncertainty", uncertainty},
                               {"series", series},
                               {"surrogate", surrogate},
                               {"covariance", covariance}};

}  // namespace

int main(int argc, char** argv) {
  for (const Figure& figure : kFigures) {
    if (argc < 2) fmt::print("{}\n", figure.name);
    if (argc < 2 || figure.name != argv[1]) continue;
    const std::filesystem::path parent =
        argc > 2 ? std::filesystem::path(argv[2]) : std::filesystem::temp_directory_path();
    const std::string folder = (parent / fmt::format("mirevo_scale_{}", ::getpid())).string();
    int code = 0;
    try {
      figure.measure(folder);
    } catch (const mirevo::FatalError& error) {
      fmt::print(stderr, "{}\n{}\n", error.message(), error.detail());
      code = 1;
    }
    std::filesystem::remove_all(folder);
    return code;
  }
  return argc < 2 ? 0 : 2;
}
