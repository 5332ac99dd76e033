// What grows with the size of a run: time, processor time, peak memory and files of the built program.
//
//   scale FIGURE [FOLDER [COUNT]]   FIGURE is one of the names that it prints without arguments; FOLDER is where a
//                                   folder for it is made (default: the temporary one). COUNT: of `bands` and `glue`
//                                   the model runs, of `report` the measures of each series, of `sensitivity` and
//                                   `glm` the parameters
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
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

void restart(const std::string& folder, int /*count*/) {
  constexpr int kRows = 1'000'000;
  const std::string setup =
      writeSetup(folder, {.simulation = "Restart = 1\nReport = 0\n", .task = ddsSections(kRows + 10)});
  leaveInterruptedSearch(setup, kRows);
  measureProgram("restart of 1,000,000 rows", setup);
}

void uncertainty(const std::string& folder, int /*count*/) {
  constexpr int kParameters = 10'000;
  const std::string setup = writeSetup(folder, {.option = 3,
                                                .parameters = kParameters,
                                                .simulation = "Report = 0\n",
                                                .task = uncertaintySections(100, kParameters)});
  measureProgram("uncertainty of 10,000 parameters, 100 runs", setup);
}

constexpr int kSeries = 50;

/// So many selections of the observations of each of 50 series of ten years of hourly values, by default 20, which are
/// 1,000 measures.
void measureSeries(const std::string& folder, int selections, int report) {
  std::string measures = itemCount(kSeries * selections);
  for (int i = 0; i < kSeries * selections; ++i) {
    const std::string item = fmt::format("Item_No = {}\n", i % kSeries + 1);
    measures += section(fmt::format("MEASURE_{}", i + 1),
                        {fmt::format("Name = 'm{}'\nStatistic_Type = 1\nFunction_Name = 'all'\n", i + 1),
                         fmt::format("Lowest_Observed = 0.0{:02}\n", i / kSeries + 1),
                         section("SIMULATION_FILE", {"File_Name = 'base/simulated.csv'\n", item}),
                         section("OBSERVATION_FILE", {"File_Name = 'observed.csv'\n", item})});
  }
  const std::string setup = writeSetup(folder, {.simulation = fmt::format("Report = {}\n", report),
                                                .measures = measures,
                                                .task = ddsSections(4),
                                                .model = "cat input.csv > simulated.csv\n"});
  for (const std::string file : {"/base/input.csv", "/base/simulated.csv", "/observed.csv"}) {
    writeHourlySeries(folder + file, kSeries);
  }
  measureProgram(fmt::format("{} measures over {} series of 87,600 rows, 5 runs, Report = {}", kSeries * selections,
                             kSeries, report),
                 setup);
}

void series(const std::string& folder, int count) {
  measureSeries(folder, count > 0 ? count : 20, 0);
}
void report(const std::string& folder, int count) {
  measureSeries(folder, count > 0 ? count : 20, 1);
}

/// An uncertainty analysis of a series of 87,600 values, of which a band is made, with a model that answers at once.
void bands(const std::string& folder, int count) {
  const int runs = count > 0 ? count : 1000;
  const std::string measure =
      itemCount(1) +
      section("MEASURE_1", {"Name = 'm'\nStatistic_Type = 1\nFunction_Name = 'all'\n",
                            section("SIMULATION_FILE", {"File_Name = 'base/simulated.csv'\nItem_No = 1\n"}),
                            section("OBSERVATION_FILE", {"File_Name = 'observed.csv'\nItem_No = 1\n"})});
  const std::string setup = writeSetup(folder, {.option = 3,
                                                .simulation = "Report = 0\n",
                                                .measures = measure,
                                                .task = uncertaintySections(runs, 4),
                                                .model = "cat input.csv > simulated.csv\n"});
  for (const std::string file : {"/base/input.csv", "/base/simulated.csv", "/observed.csv"}) {
    writeHourlySeries(folder + file, 1);
  }
  measureProgram(fmt::format("uncertainty of 4 parameters, {} runs of 87,600 values", runs), setup);
}

/// GLUE of a series of 365 values that differ from run to run, every run behavioural; then the same results with other
/// weights, for which no model is run.
void glue(const std::string& folder, int count) {
  constexpr int kValues = 365;
  const int runs = count > 0 ? count : 10'000;
  const std::string measure =
      itemCount(1) +
      section("MEASURE_1", {"Name = 'm'\nStatistic_Type = 1\nFunction_Name = 'all'\n",
                            section("SIMULATION_FILE", {"File_Name = 'base/simulated.csv'\nItem_No = 1\n"}),
                            section("OBSERVATION_FILE", {"File_Name = 'observed.csv'\nItem_No = 1\n"})});
  for (const int restart : {0, 1}) {
    const std::string weights = fmt::format("Behavioural_Share = 1.0\nShape_Factor = {}\n", restart + 1);
    const std::string setup = writeSetup(
        folder, {.option = 3,
                 .simulation = fmt::format("Report = 0\nRestart = {}\n", restart),
                 .measures = measure,
                 .task = section("UNCERTAINTY_ESTIMATION",
                                 {fmt::format("Uncertainty_Type = 'GLUE'\nSample_Size = {}\nRandom_Seed = 1\n", runs),
                                  section("GLUE", {weights})}),
                 .model = "awk -F, 'NR == FNR { p[FNR] = $1; next } FNR == 1 { print; next } "
                          "{ print $1 \",\" p[1] + $2 * p[2] }' parameters.txt input.csv > simulated.csv\n"});
    if (restart == 0) {
      for (const std::string file : {"/base/input.csv", "/base/simulated.csv", "/observed.csv"}) {
        writeHourlySeries(folder + file, 1, kValues);
      }
    }
    measureProgram(fmt::format("GLUE of 4 parameters, {} runs of {} values{}", runs, kValues,
                               restart == 0 ? "" : ", weighed again from their results"),
                   setup);
  }
}

/// A sensitivity analysis with covariance: every value depends on two of the parameters.
void sensitivity(const std::string& folder, int count) {
  const int parameters = count > 0 ? count : 2000;
  const std::string measure =
      itemCount(1) +
      section("MEASURE_1", {"Name = 'm'\nStatistic_Type = 1\nFunction_Name = 'all'\n",
                            section("SIMULATION_FILE", {"File_Name = 'base/simulated.csv'\nItem_No = 1\n"}),
                            section("OBSERVATION_FILE", {"File_Name = 'observed.csv'\nItem_No = 1\n"})});
  const std::string setup = writeSetup(
      folder, {.option = 1,
               .parameters = parameters,
               .simulation = "Report = 0\n",
               .measures = measure,
               .task = section("SENSITIVITY_ANALYSIS",
                               {"Sensitivity_Type = 0\n",
                                section("LOCAL_SA", {"Perturbation_Fraction = 0.01\nCalculate_Covmatrix = 1\n"})}),
               .model = "awk -F, 'NR == FNR { p[FNR] = $1; n = FNR; next } FNR == 1 { print; next } "
                        "{ print $1 \",\" p[FNR % n + 1] * (1 + FNR % 7) + p[FNR * FNR % n + 1] }' "
                        "parameters.txt input.csv > simulated.csv\n"});
  for (const std::string file : {"/base/input.csv", "/base/simulated.csv", "/observed.csv"}) {
    writeHourlySeries(folder + file, 1, 5000);
  }
  measureProgram(fmt::format("sensitivity analysis with covariance of {} parameters, 5,000 values", parameters), setup);
}

/// A search by GLM of 200 parameters, or `count`, by 10,000 observations: every value depends on two of the parameters,
/// on one of them by its square.
void glm(const std::string& folder, int count) {
  constexpr int kObservations = 10'000;
  const int parameters = count > 0 ? count : 200;
  const std::string measure =
      itemCount(1) +
      section("MEASURE_1", {"Name = 'm'\nStatistic_Type = 1\nFunction_Name = 'all'\n",
                            section("SIMULATION_FILE", {"File_Name = 'base/simulated.csv'\nItem_No = 1\n"}),
                            section("OBSERVATION_FILE", {"File_Name = 'observed.csv'\nItem_No = 1\n"})});
  const std::string setup = writeSetup(
      folder,
      {.parameters = parameters,
       .simulation = "Report = 0\n",
       .measures = measure,
       .task = section("OPTIMISATION_ALGORITHM", {"Algorithm_Type = 'GLM'\n", section("GLM_CONTROL_PARAMETERS", {}),
                                                  section("INITIAL_SAMPLE", {"Include_Initial_Parameters = 1\n"}),
                                                  section("STOPPING_CRITERIA", {"Max_No_Evaluations = 3000\n"})}),
       .model = "awk -F, 'NR == FNR { p[FNR] = $1; n = FNR; next } FNR == 1 { print; next } "
                "{ q = p[FNR * FNR % n + 1]; printf \"%s,%.9g\\n\", $1, p[FNR % n + 1] * (1 + FNR % 7) + q * q }' "
                "parameters.txt input.csv > simulated.csv\n"});
  for (const std::string file : {"/base/input.csv", "/base/simulated.csv", "/observed.csv"}) {
    writeHourlySeries(folder + file, 1, kObservations);
  }
  measureProgram(fmt::format("GLM of {} parameters and {} observations", parameters, kObservations), setup);
  std::ifstream log(folder + "/scale.log");
  for (std::string line; std::getline(log, line);) {
    if (line.find("of GLM") != std::string::npos || line.find(" model evaluations, ") != std::string::npos)
      fmt::print("   {}\n", line);
  }
}

void surrogate(const std::string& /*folder*/, int /*count*/) {
  measureQuadraticSurrogate();
}
void covariance(const std::string& /*folder*/, int /*count*/) {
  measureCovariance();
  measureGlm();
}

struct Figure {
  std::string_view name;
  void (*measure)(const std::string& folder, int count);
};

constexpr Figure kFigures[] = {{"restart", restart},
                               {"uncertainty", uncertainty},
                               {"series", series},
                               {"report", report},
                               {"bands", bands},
                               {"glue", glue},
                               {"sensitivity", sensitivity},
                               {"glm", glm},
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
      figure.measure(folder, argc > 3 ? std::atoi(argv[3]) : 0);
    } catch (const mirevo::FatalError& error) {
      fmt::print(stderr, "{}\n{}\n", error.message(), error.detail());
      code = 1;
    }
    std::filesystem::remove_all(folder);
    return code;
  }
  return argc < 2 ? 0 : 2;
}
