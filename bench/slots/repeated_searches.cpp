// How long repetitions of a search take one after the other and side by side, on four slots where the search can
// use them. The program itself runs a model that sleeps, with ten parameters, for equal times or for ones that are
// exponentially distributed; they depend on the parameters alone. Both ways must find the same.
//
//   repeated_searches [EVALUATIONS [SECONDS [REPETITIONS]]]   of each repetition, 60; mean time of a model run, 0.5; 4
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <spawn.h>
#include <sstream>
#include <stdexcept>
#include <string>
#include <sys/wait.h>
#include <unistd.h>

#include <fmt/format.h>

#include "program_case.h"

namespace {

namespace fs = std::filesystem;
using namespace mirevo::bench;

constexpr int kSlots = 4;

struct Search {
  std::string name;
  std::string settings;
  bool fillsSlots = false;  ///< by itself
};

std::string taskText(const Search& search, bool isSideBySide, int evaluations, int repetitions) {
  return fmt::format(
      "[OPTIMISATION_ALGORITHM]\nAlgorithm_Type = '{0}'\nRepetitions = {1}\nRepetition_Order = '{2}'\n"
      "[{0}_CONTROL_PARAMETERS]\n{3}[/{0}_CONTROL_PARAMETERS]\n"
      "[INITIAL_SAMPLE]\nInclude_Initial_Parameters = 0\nRandom_Seed = 1\n"
      "[/INITIAL_SAMPLE]\n[STOPPING_CRITERIA]\nMax_No_Evaluations = {4}\nNo_Loops_Convergence = 1000\n"
      "Min_Change = 0.0\n[/STOPPING_CRITERIA]\n[/OPTIMISATION_ALGORITHM]\n",
      search.name, repetitions, isSideBySide ? "side by side" : "consecutive", search.settings, evaluations);
}

double secondsOf(const std::string& setup) {
  std::string program = MIREVO_PROGRAM;
  std::string argument = setup;
  char* const arguments[] = {program.data(), argument.data(), nullptr};
  pid_t process = 0;
  int status = 0;
  const auto start = std::chrono::steady_clock::now();
  if (posix_spawn(&process, program.c_str(), nullptr, nullptr, arguments, environ) != 0 ||
      waitpid(process, &status, 0) != process || status != 0) {
    throw std::runtime_error("the program failed, see the log beside " + setup);
  }
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

/// The best values of the repetitions, without the numbers of their evaluations.
std::string bestOf(const fs::path& table) {
  std::ifstream file(table);
  std::string found;
  for (std::string line; std::getline(file, line);) {
    if (line.starts_with('#')) continue;
    std::istringstream cells(line);
    int column = 0;
    for (std::string cell; std::getline(cells, cell, '\t'); ++column) {
      if (column != 3) found += cell + "\t";
    }
  }
  return found;
}

struct Measured {
  double seconds = 0.0;
  std::string best;
};

Measured measure(const fs::path& folder, const Search& search, bool isSideBySide, const std::string& times,
                 int evaluations, double meanSeconds, int repetitions) {
  fs::remove_all(folder);
  ProgramCase one{.option = "2\nReport = 0", .title = "Repeated searches", .endDate = "2001-01-03", .name = "all"};
  for (int j = 1; j <= 10; ++j) one.parameters.push_back({fmt::format("p{}", j), 0.0, -20.0, 30.0});
  one.seriesFiles =
      "[SIMULATION_FILE]\nFile_Name = 'model/simulated.csv'\nItem_No = 1\n[/SIMULATION_FILE]\n"
      "[OBSERVATION_FILE]\nFile_Name = 'observed.csv'\nItem_No = 1\n[/OBSERVATION_FILE]\n";
  one.task = taskText(search, isSideBySide, evaluations, repetitions);
  one.slots = isSideBySide || search.fillsSlots ? kSlots : 1;
  one.modelCommand = fmt::format("{} {} {} {}", MIREVO_SLEEPING_MODEL, times, meanSeconds, (folder / "runs").string());
  writeCase(folder, one);
  constexpr const char* kSeries = "time,value\n2001-01-01,0\n2001-01-02,0\n2001-01-03,0\n";
  writeText(folder / "model/simulated.csv", kSeries);
  writeText(folder / "observed.csv", kSeries);
  const double seconds = secondsOf(folder / "case.kdx");
  return {seconds, bestOf(folder / "case_Optimisation_Repetitions.dat")};
}

}  // namespace

int main(int argc, char** argv) {
  const int evaluations = argc > 1 ? std::atoi(argv[1]) : 60;
  const double meanSeconds = argc > 2 ? std::atof(argv[2]) : 0.5;
  const int repetitions = argc > 3 ? std::atoi(argv[3]) : 4;
  const auto folder = fs::temp_directory_path() / fmt::format("mirevo_repeated_searches_{}", ::getpid());
  const Search searches[] = {
      {"DDS", "Perturbation_Parameter = 0.2\n"},
      {"SCE", "No_Complexes = 2\nNo_Points_Complex = 5\nNo_Points_Subcomplex = 3\nNo_Evaluation_Steps = 5\n"},
      {"PSE", "Population_Size = 12\nNo_Points_Simplex = 11\n", true}};
  try {
    fmt::print("{} repetitions of {} evaluations, model runs of {} s in the mean\n\n", repetitions, evaluations,
               meanSeconds);
    fmt::print("| search | run times | one after the other, s | side by side, s | times as fast |\n");
    fmt::print("|---|---|---|---|---|\n");
    for (const Search& search : searches) {
      for (const std::string times : {"equal", "exponential"}) {
        const Measured consecutive = measure(folder, search, false, times, evaluations, meanSeconds, repetitions);
        const Measured sideBySide = measure(folder, search, true, times, evaluations, meanSeconds, repetitions);
        if (consecutive.best != sideBySide.best || consecutive.best.empty()) {
          throw std::runtime_error("the two have found different sets");
        }
        fmt::print("| {} | {} | {:.0f} | {:.0f} | {:.2f} |\n", search.name, times, consecutive.seconds,
                   sideBySide.seconds, consecutive.seconds / sideBySide.seconds);
        std::fflush(stdout);
      }
    }
  } catch (const std::exception& error) {
    fmt::print(stderr, "{}\n", error.what());
    return 1;
  }
  fs::remove_all(folder);
  return 0;
}
