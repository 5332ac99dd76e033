#include "setups.h"

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <spawn.h>
#include <sstream>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "common/fatal_error.h"

namespace mirevo::bench {
namespace {

using Clock = std::chrono::steady_clock;

std::string parametersText(const ScaleSetup& setup) {
  std::string text = itemCount(setup.parameters);
  for (int i = 1; i <= setup.parameters; ++i) {
    text += section(fmt::format("PARAMETER_{}", i),
                    {fmt::format("Parameter_Name = 'p{}'\n", i), "Initial_Value = 4.0\nLower_Bound = 0.0\n",
                     "Upper_Bound = 10.0\nTransformation_Type = 0\nParameter_Type = 0\n", setup.parameterLines});
  }
  return text + section("INTERNAL_CONSTRAINTS", {itemCount(0)});
}

std::string measuresText(const ScaleSetup& setup) {
  const std::string one = itemCount(1) + section("MEASURE_1", {"Name = 'result'\nInterface_Type = 1\n",
                                                               "MeasurementNo = 1\nFunction_Name = 'all'\n"});
  return section("OUTPUT_MEASURES", {setup.measures.empty() ? one : setup.measures,
                                     section("OUTPUT_MEASURE_FILE", {"File_Name = 'base/result.txt'\n"})});
}

/// Of what is not in folders.
void printLargestFiles(const std::filesystem::path& folder) {
  constexpr std::size_t kMost = 5;
  std::vector<std::pair<std::uintmax_t, std::string>> files;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) {
    if (entry.is_regular_file()) files.emplace_back(entry.file_size(), entry.path().filename().string());
  }
  std::sort(files.rbegin(), files.rend());
  if (files.size() > kMost) files.resize(kMost);
  for (const auto& [bytes, name] : files) fmt::print("   {:10.1f} MB  {}\n", static_cast<double>(bytes) / 1e6, name);
}

/// Processor time of a process that has ended and is not waited for yet, without that of the processes it has run:
/// fields 14 and 15 of /proc/<pid>/stat, counted behind its name in parentheses. The system rounds to ticks.
double ownSeconds(pid_t process) {
  std::ifstream file(fmt::format("/proc/{}/stat", process));
  std::string text;
  std::getline(file, text);
  std::istringstream fields(text.substr(text.rfind(')') + 1));
  std::string skipped;
  for (int field = 3; field < 14; ++field) fields >> skipped;
  double user = 0.0;
  double system = 0.0;
  fields >> user >> system;
  return (user + system) / static_cast<double>(::sysconf(_SC_CLK_TCK));
}

double secondsOf(const timeval& time) {
  return static_cast<double>(time.tv_sec) + 1e-6 * static_cast<double>(time.tv_usec);
}

}  // namespace

std::string section(std::string_view name, std::initializer_list<std::string_view> parts) {
  return fmt::format("[{0}]\n{1}[/{0}]\n", name, fmt::join(parts, ""));
}

std::string itemCount(int count) {
  return fmt::format("TqSEKdxListItemCount = {}\n", count);
}

std::string writeSetup(const std::string& folder, const ScaleSetup& setup) {
  std::filesystem::create_directories(folder + "/base");
  const std::string model = folder + "/base/model";
  std::ofstream(model) << "#!/bin/sh\n" << setup.model;
  std::filesystem::permissions(model, std::filesystem::perms::owner_all);
  std::ofstream parameterTemplate(folder + "/base/parameters.tpl");
  std::ofstream parameterFile(folder + "/base/parameters.txt");
  parameterTemplate << "!\n";
  for (int i = 1; i <= setup.parameters; ++i) {
    parameterTemplate << fmt::format("!p{:<20}!\n", i);
    parameterFile << "1\n";
  }
  const std::string batch = section("SIMBATCHITEM_1", {"BatchFileName = 'base/model'\nArguments = ''\n"});
  const std::string file = section("SIMPARAMITEM_1", {"FileType = 0\nParamFileName = 'base/parameters.txt'\n",
                                                      "TemplateFileName = 'base/parameters.tpl'\n"});
  const std::string objective = section("OBJECTIVE_1", {"Name = 'all'\nFunction_Type = 0\nWeight = 1.0\n"});
  const std::string path = folder + "/scale.kdx";
  std::ofstream(path) << section(
      "MIREVO_PARAMETERS",
      {section("MIREVO_SIMULATION_OPTION",
               {fmt::format("Option = {}\nTitle = 'Scale'\n", setup.option), setup.simulation,
                section("SIMBATCH", {itemCount(1), batch}), section("SIMPARAM", {itemCount(1), file})}),
       section("MODEL_PARAMETERS", {parametersText(setup)}),
       section("ObjectiveFunctions", {"Start_Date = 2001-01-01\nEnd_Date = 2010-12-31\nAggregation_Method = 0\n",
                                      measuresText(setup), section("OBJECTIVE_FUNCTIONS", {itemCount(1), objective})}),
       section("SAVE_OUTPUT_FILES", {itemCount(0)}), setup.task,
       section("SimultaneousSimulations", {"NoSimultaneousSim = 1\nUseSingleThread = 0\n"})});
  return path;
}

void writeHourlySeries(const std::string& path, int series, int rows) {
  std::ofstream file(path);
  file << "time";
  for (int i = 1; i <= series; ++i) file << ",s" << i;
  const auto start = std::chrono::sys_days(std::chrono::January / 1 / 2001);
  for (int row = 0; row < rows; ++row) {
    const std::chrono::year_month_day day = start + std::chrono::days(row / 24);
    std::string line = fmt::format("\n{:04}-{:02}-{:02} {:02}:00", static_cast<int>(day.year()),
                                   static_cast<unsigned>(day.month()), static_cast<unsigned>(day.day()), row % 24);
    for (int i = 0; i < series; ++i) line += fmt::format(",{}.{}", (row + 7 * i) % 97, row % 9 + 1);
    file << line;
  }
  file << '\n';
}

std::string ddsSections(int budget) {
  return section("OPTIMISATION_ALGORITHM",
                 {"Algorithm_Type = 2\nUse_Surrogate_Model = 0\n",
                  section("DDS_CONTROL_PARAMETERS", {"Perturbation_Parameter = 0.2\n"}),
                  section("INITIAL_SAMPLE", {"Include_Initial_Parameters = 1\nRandom_Seed = 1\n"}),
                  section("STOPPING_CRITERIA", {fmt::format("Max_No_Evaluations = {}\n", budget)})});
}

std::string uncertaintySections(int sets, int parameters, std::string_view further) {
  std::string distributions;
  for (int i = 1; i <= parameters; ++i) {
    distributions += section(fmt::format("PARAMETER_{}", i), {"Mean_Value = 5.0\nStandard_Deviation = 1.0\n"});
  }
  return section(
      "UNCERTAINTY_ESTIMATION",
      {fmt::format("Uncertainty_Type = 0\nSample_Size = {}\nRandom_Seed = 1\n", sets), further, distributions});
}

void measureProgram(std::string_view what, const std::string& setup) {
  std::string program = MIREVO_PROGRAM;
  std::string argument = setup;
  char* const arguments[] = {program.data(), argument.data(), nullptr};
  const auto start = Clock::now();
  pid_t process = 0;
  int status = 0;
  rusage used{};
  if (::posix_spawn(&process, program.c_str(), nullptr, nullptr, arguments, environ) != 0) {
    fatalError("the program could not be started", program);
  }
  siginfo_t ended{};
  ::waitid(P_PID, static_cast<id_t>(process), &ended, WEXITED | WNOWAIT);
  const double own = ownSeconds(process);
  if (::wait4(process, &status, 0, &used) != process || status != 0) fatalError("the program failed: see its log");
  fmt::print("{}: {:.2f} s, {:.2f} s of processor time, {:.2f} s of them its own, {:.0f} MB\n", what,
             std::chrono::duration<double>(Clock::now() - start).count(),
             secondsOf(used.ru_utime) + secondsOf(used.ru_stime), own,
             static_cast<double>(used.ru_maxrss) * 1024 / 1e6);
  printLargestFiles(std::filesystem::path(setup).parent_path());
}

}  // namespace mirevo::bench
