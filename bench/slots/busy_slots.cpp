// How busy the slots of a run are between the start of its first model and the end of its last one: the time that
// models ran, divided by the number of slots and that time. The program itself runs a model that sleeps, with ten
// parameters.
//
//   busy_slots [CASE]...        the cases to measure, by the beginning of their names; all without one
//   MIREVO=PROGRAM busy_slots   with another program than the one that was built
//
// A case is measured with run times that are exponentially distributed, whatever the parameters are, with times that
// grow with three parameters, and with equal ones. Run times depend on the parameters alone, so that a case makes the
// same model runs every time. The case "output" is of models of 0.5 s that write much, one number of slots after the
// other; TMPDIR=/dev/shm keeps the disk out of it.
#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <future>
#include <spawn.h>
#include <stdexcept>
#include <string>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

#include <fmt/format.h>
#include <fmt/ranges.h>

namespace {

constexpr int kParameters = 10;
constexpr int kPopulation = 84;  // 4(2n + 1)
constexpr int kRuns = 2000;

struct Case {
  std::string name;
  std::string task;  ///< the sections of the setup that say what is run
  int runs = kRuns;
  int option = 2;
  int rows = 0;  ///< that a model run writes; 0: a few
};

std::string search(const std::string& algorithm, const std::string& settings) {
  return fmt::format(
      "[OPTIMISATION_ALGORITHM]\nAlgorithm_Type = '{0}'\n[{0}_CONTROL_PARAMETERS]\n{1}[/{0}_CONTROL_PARAMETERS]\n"
      "[INITIAL_SAMPLE]\nInclude_Initial_Parameters = 0\nRandom_Seed = 1\nInitial_Sample_Generation = 1\n"
      "[/INITIAL_SAMPLE]\n[STOPPING_CRITERIA]\nMax_No_Evaluations = {2}\nNo_Loops_Convergence = 1000\n"
      "Min_Change = 0.0\n[/STOPPING_CRITERIA]\n[/OPTIMISATION_ALGORITHM]\n",
      algorithm, settings, kRuns);
}

std::string populationText(int population) {
  return fmt::format("Population_Size = {}\nNo_Points_Simplex = {}\n", population, kParameters + 1);
}

Case pse() {
  return {"PSE", search("PSE", populationText(kPopulation))};
}

Case opse(int setsInFlight) {
  return {fmt::format("OPSE {}", setsInFlight),
          search("OPSE", populationText(kPopulation) + fmt::format("Sets_In_Flight = {}\n", setsInFlight))};
}

Case uncertainty(int runs) {
  std::string text = fmt::format("[UNCERTAINTY_ESTIMATION]\nUncertainty_Type = 1\nSample_Size = {}\n", runs);
  for (int j = 1; j <= kParameters; ++j) {
    text += fmt::format("[PARAMETER_{0}]\nMean_Value = 5.0\nStandard_Deviation = 12.0\n[/PARAMETER_{0}]\n", j);
  }
  return {fmt::format("uncertainty {}", runs), text + "[/UNCERTAINTY_ESTIMATION]\n", runs, 3};
}

std::string parametersText() {
  std::string text = fmt::format("[MODEL_PARAMETERS]\nTqSEKdxListItemCount = {}\n", kParameters);
  for (int j = 1; j <= kParameters; ++j) {
    text += fmt::format(
        "[PARAMETER_{0}]\nParameter_Name = 'p{0}'\nInitial_Value = 0.0\nLower_Bound = -20.0\nUpper_Bound = 30.0\n"
        "[/PARAMETER_{0}]\n",
        j);
  }
  return text + "[INTERNAL_CONSTRAINTS]\nTqSEKdxListItemCount = 0\n[/INTERNAL_CONSTRAINTS]\n[/MODEL_PARAMETERS]\n";
}

std::string setupText(const Case& measured, int slots, const std::string& modelArguments) {
  return fmt::format(
      "[MIREVO_PARAMETERS]\n[MIREVO_SIMULATION_OPTION]\nOption = {}\nReport = 0\nTitle = 'Busy slots'\n"
      "[SIMBATCH]\nTqSEKdxListItemCount = 1\n[SIMBATCHITEM_1]\nBatchFileName = 'base/model'\nArguments = '{}'\n"
      "[/SIMBATCHITEM_1]\n[/SIMBATCH]\n"
      "[SIMPARAM]\nTqSEKdxListItemCount = 1\n[SIMPARAMITEM_1]\nFileType = 0\nParamFileName = 'base/parameters.txt'\n"
      "TemplateFileName = 'base/parameters.tpl'\n[/SIMPARAMITEM_1]\n[/SIMPARAM]\n[/MIREVO_SIMULATION_OPTION]\n{}"
      "[ObjectiveFunctions]\nStart_Date = 2001-01-01\nEnd_Date = 2001-01-03\n"
      "[OUTPUT_MEASURES]\nTqSEKdxListItemCount = 1\n[MEASURE_1]\nName = 'rms'\nStatistic_Type = 1\n"
      "Function_Name = 'all'\n[SIMULATION_FILE]\nFile_Name = 'base/simulated.csv'\nItem_No = 1\n[/SIMULATION_FILE]\n"
      "[OBSERVATION_FILE]\nFile_Name = 'observed.csv'\nItem_No = 1\n[/OBSERVATION_FILE]\n[/MEASURE_1]\n"
      "[OUTPUT_MEASURE_FILE]\nFile_Name = ''\n[/OUTPUT_MEASURE_FILE]\n[/OUTPUT_MEASURES]\n"
      "[OBJECTIVE_FUNCTIONS]\nTqSEKdxListItemCount = 1\n[OBJECTIVE_1]\nName = 'all'\nFunction_Type = 0\n"
      "Weight = 1.0\n[/OBJECTIVE_1]\n[/OBJECTIVE_FUNCTIONS]\n[/ObjectiveFunctions]\n{}"
      "[SAVE_OUTPUT_FILES]\nTqSEKdxListItemCount = 0\n[/SAVE_OUTPUT_FILES]\n"
      "[SimultaneousSimulations]\nNoSimultaneousSim = {}\n[/SimultaneousSimulations]\n[/MIREVO_PARAMETERS]\n",
      measured.option, modelArguments, parametersText(), measured.task, slots);
}

void writeModel(const std::filesystem::path& folder) {
  std::filesystem::create_directories(folder / "base");
  std::filesystem::copy_file(MIREVO_SLEEPING_MODEL, folder / "base/model");
  std::ofstream form(folder / "base/parameters.tpl");
  form << "!\n";
  for (int j = 1; j <= kParameters; ++j) {
    form << fmt::format("!p{:<20}!\n", j);
    std::ofstream(folder / "base/parameters.txt", std::ios::app) << "0\n";
  }
  constexpr const char* kSeries = "time,value\n2001-01-01,0\n2001-01-02,0\n2001-01-03,0\n";
  std::ofstream(folder / "base/simulated.csv") << kSeries;
  std::ofstream(folder / "observed.csv") << kSeries;
}

void run(const std::string& setup) {
  const char* const other = std::getenv("MIREVO");
  std::string program = other != nullptr ? other : MIREVO_PROGRAM;
  std::string argument = setup;
  char* const arguments[] = {program.data(), argument.data(), nullptr};
  pid_t process = 0;
  int status = 0;
  if (posix_spawn(&process, program.c_str(), nullptr, nullptr, arguments, environ) != 0 ||
      waitpid(process, &status, 0) != process || status != 0) {
    throw std::runtime_error("the program failed, see the log beside " + setup);
  }
}

/// Without the final run of a search, which is made alone.
double measure(const std::filesystem::path& folder, const Case& measured, int slots, const std::string& times,
               double meanSeconds) {
  std::filesystem::remove_all(folder);
  writeModel(folder);
  const std::string log = folder / "runs";
  const std::string setup = folder / "busy.kdx";
  const std::string rows = measured.rows > 0 ? fmt::format(" {}", measured.rows) : "";
  std::ofstream(setup) << setupText(measured, slots, fmt::format("{} {} {}{}", times, meanSeconds, log, rows));
  run(setup);
  std::vector<std::pair<double, double>> runs;  // start and end
  std::ifstream file(log);
  for (double start = 0.0, end = 0.0; file >> start >> end;) runs.emplace_back(start, end);
  if (std::ssize(runs) < measured.runs) throw std::runtime_error("too few model runs: see " + setup);
  std::ranges::sort(runs);
  runs.resize(static_cast<std::size_t>(measured.runs));
  double busy = 0.0;
  double last = 0.0;
  for (const auto& [start, end] : runs) {
    busy += end - start;
    last = std::max(last, end);
  }
  return busy / slots / (last - runs.front().first);
}

bool isWanted(const std::string& name, const std::vector<std::string>& wanted) {
  return wanted.empty() || std::ranges::any_of(wanted, [&](const std::string& each) { return name.starts_with(each); });
}

void measureLargeOutput(const std::filesystem::path& folder, const std::vector<std::string>& wanted) {
  constexpr double kSeconds = 0.5;
  constexpr int kRounds = 16;
  constexpr std::pair<int, int> kSizes[] = {{0, 0}, {1, 40'000}, {12, 480'000}, {60, 2'400'000}};  // MB and rows
  fmt::print("\nModel runs of {} s, {} for each slot, that write so much\n\n", kSeconds, kRounds);
  fmt::print("| | 4 slots | 16 slots |\n|---|---|---|\n");
  for (const auto& [megabytes, rows] : kSizes) {
    const std::string name = fmt::format("output {} MB", megabytes);
    if (!isWanted(name, wanted)) continue;
    fmt::print("| {} |", name);
    for (const int slots : {4, 16}) {
      Case measured = uncertainty(kRounds * slots);
      measured.rows = rows;
      fmt::print(" {:.2f} |", measure(folder, measured, slots, "equal", kSeconds));
      std::fflush(stdout);
    }
    fmt::print("\n");
  }
}

}  // namespace

int main(int argc, char** argv) {
  const std::vector<std::string> wanted(argv + 1, argv + argc);
  const auto folder = std::filesystem::temp_directory_path() / fmt::format("mirevo_busy_slots_{}", ::getpid());
  const std::vector<Case> cases{pse(),     opse(42),         opse(84),         opse(126),         opse(168),
                                opse(210), uncertainty(100), uncertainty(400), uncertainty(kRuns)};
  try {
    fmt::print("Share of the time that slots are busy; {} parameters, {} points, {} runs\n\n", kParameters, kPopulation,
               kRuns);
    fmt::print(
        "| | 8 slots, exponential | 8 slots, by parameters | 8 slots, equal | 32 slots, exponential | "
        "32 slots, by parameters | 32 slots, equal |\n|---|---|---|---|---|---|---|\n");
    for (const Case& measured : cases) {
      if (!isWanted(measured.name, wanted)) continue;
      std::vector<std::future<double>> columns;  // side by side: these models need no processor
      for (const auto& [slots, mean] : {std::pair{8, 0.5}, {32, 2.0}}) {
        for (const std::string times : {"exponential", "smooth", "equal"}) {
          columns.push_back(std::async(std::launch::async, measure, folder / fmt::format("{}{}", times, slots),
                                       std::cref(measured), slots, times, mean));
        }
      }
      fmt::print("| {} |", measured.name);
      for (auto& column : columns) fmt::print(" {:.2f} |", column.get());
      fmt::print("\n");
      std::fflush(stdout);
    }
    measureLargeOutput(folder / "output", wanted);
  } catch (const std::exception& error) {
    fmt::print(stderr, "{}\n", error.what());
    return 1;
  }
  std::filesystem::remove_all(folder);
  return 0;
}
