#include "calibration.h"

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <initializer_list>
#include <map>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "common/fatal_error.h"

namespace mirevo::bench {
namespace {

using Clock = std::chrono::steady_clock;

double secondsSince(Clock::time_point start) {
  return std::chrono::duration<double>(Clock::now() - start).count();
}

class SilentObserver final : public EvaluationObserver {
 public:
  void message(std::string_view) override {}
  void warning(std::string_view text) override { fmt::print("warning: {}\n", text); }
  void evaluationFinished(std::span<const double>, const EvaluationResult& result) override {
    if (!result.ok()) fatalError("a model run failed", result.failure->reason);
  }
  bool isCancelled() override { return false; }
};

std::string constantSeries() {
  std::string text = "time,flow\n";
  for (int day = 1; day <= 28; ++day) text += fmt::format("2001-01-{:02},1\n", day);
  return text;
}

/// A section of a setup with the parts of its content.
std::string section(std::string_view name, std::initializer_list<std::string_view> parts) {
  return fmt::format("[{0}]\n{1}[/{0}]\n", name, fmt::join(parts, ""));
}

std::string parameterSection(int number, std::string_view name) {
  return section(fmt::format("PARAMETER_{}", number), {fmt::format("Parameter_Name = '{}'\n", name),
                                                       "Initial_Value = 1.0\nLower_Bound = 0.0\nUpper_Bound = 10.0\n",
                                                       "Transformation_Type = 0\nParameter_Type = 0\n"});
}

constexpr std::string_view kNoItem = "TqSEKdxListItemCount = 0\n";
constexpr std::string_view kOneItem = "TqSEKdxListItemCount = 1\n";
constexpr std::string_view kTwoItems = "TqSEKdxListItemCount = 2\n";

std::string objectivesText() {
  const std::string measure =
      section("MEASURE_1", {"Name = 'rms'\nInterface_Type = 0\nMeasurementNo = 1\nStatistic_Type = 1\n",
                            "Weight = 1.0\nWeight_Above = 1.0\nFunction_Name = 'all'\n",
                            section("SIMULATION_FILE", {"File_Name = 'base/simulated.csv'\nItem_No = 1\n"}),
                            section("OBSERVATION_FILE", {"File_Name = 'observed.csv'\nItem_No = 1\n"})});
  return section("ObjectiveFunctions",
                 {"Start_Date = 2001-01-01\nEnd_Date = 2001-12-31\nAggregation_Method = 0\n",
                  section("OUTPUT_MEASURES", {kOneItem, measure, section("OUTPUT_MEASURE_FILE", {"File_Name = ''\n"})}),
                  section("OBJECTIVE_FUNCTIONS",
                          {kOneItem, section("OBJECTIVE_1", {"Name = 'all'\nFunction_Type = 0\nWeight = 1.0\n"})})});
}

/// A search of `count` evaluations, including its final run.
std::string searchText(int count) {
  return section("OPTIMISATION_ALGORITHM",
                 {"Algorithm_Type = 2\nUse_Surrogate_Model = 0\n",
                  section("DDS_CONTROL_PARAMETERS", {"Perturbation_Parameter = 0.2\n"}),
                  section("INITIAL_SAMPLE", {"Include_Initial_Parameters = 1\nRandom_Seed = 1\n"}),
                  section("STOPPING_CRITERIA", {fmt::format("Max_No_Evaluations = {}\n", count - 1)})});
}

std::string uncertaintyText(int count) {
  constexpr std::string_view kDistribution = "Mean_Value = 5.0\nStandard_Deviation = 1.0\n";
  return section("UNCERTAINTY_ESTIMATION",
                 {fmt::format("Uncertainty_Type = 0\nSample_Size = {}\nRandom_Seed = 1\n", count),
                  section("PARAMETER_1", {kDistribution}), section("PARAMETER_2", {kDistribution})});
}

std::string setupText(int slotCount, int count) {
  const std::string batch = section("SIMBATCHITEM_1", {"BatchFileName = 'base/model'\nArguments = ''\n"});
  const std::string file = section("SIMPARAMITEM_1", {"FileType = 0\nParamFileName = 'base/parameters.txt'\n",
                                                      "TemplateFileName = 'base/parameters.tpl'\n"});
  return section(
      "MIREVO_PARAMETERS",
      {section("MIREVO_SIMULATION_OPTION",
               {fmt::format("Option = {}\nTitle = 'Overhead'\n", slotCount == 1 ? 2 : 3),
                section("SIMBATCH", {kOneItem, batch}), section("SIMPARAM", {kOneItem, file})}),
       section("MODEL_PARAMETERS", {kTwoItems, parameterSection(1, "a"), parameterSection(2, "b"),
                                    section("INTERNAL_CONSTRAINTS", {kNoItem})}),
       objectivesText(), section("SAVE_OUTPUT_FILES", {kNoItem}),
       slotCount == 1 ? searchText(count) : uncertaintyText(count),
       section("SimultaneousSimulations", {fmt::format("NoSimultaneousSim = {}\nUseSingleThread = 0\n", slotCount)})});
}

}  // namespace

Calibration::Calibration(std::string folder, int slotCount, const std::string& fixedParameters)
    : folder_(std::move(folder)), slotCount_(slotCount), observer_(std::make_unique<SilentObserver>()) {
  writeModel(fixedParameters);
  LauncherSettings settings;
  settings.baseFolder = folder_ + "/base";
  settings.processFolderPrefix = folder_ + "/loop_Process";
  settings.batchItems = {{settings.baseFolder + "/model", ""}};
  settings.slotCount = slotCount;

  std::vector<ModelParameter> parameters;
  for (const std::string_view name : {"a", "b"}) {
    ModelParameter& parameter = parameters.emplace_back();
    parameter.name = std::string(name);
    parameter.upperBound = 10.0;
  }
  const ModelDescription description = describe();
  parameters_ = std::make_unique<ParameterModel>(parameters, std::vector<InternalConstraint>{});
  aggregator_ = std::make_unique<ObjectiveAggregator>(description.objectives, AggregationMethod::none);
  runner_ = std::make_unique<ModelRunner>(description, *parameters_, *aggregator_, launcher_, settings);
  evaluator_ = std::make_unique<LocalEvaluator>(*runner_, *observer_, failedRuns_, slotCount);
}

Calibration::~Calibration() {
  std::error_code ignored;
  std::filesystem::remove_all(folder_, ignored);
}

void Calibration::writeModel(const std::string& fixedParameters) const {
  const std::string base = folder_ + "/base";
  std::filesystem::remove_all(folder_);
  std::filesystem::create_directories(base);
  std::filesystem::copy_file(MIREVO_TEST_MODEL, base + "/model");
  std::ofstream(base + "/parameters.tpl") << "!\na = !a             !\nb = !b             !\n" << fixedParameters;
  std::ofstream(base + "/parameters.txt") << "a = 1\n" << fixedParameters;
  std::ofstream(base + "/simulated.csv") << constantSeries();
  std::ofstream(folder_ + "/observed.csv") << constantSeries();
}

ModelDescription Calibration::describe() const {
  ModelDescription description;
  description.baseFolder = folder_ + "/base";
  description.parameterFiles = {{TemplateType::delimiter, description.baseFolder + "/parameters.txt",
                                 description.baseFolder + "/parameters.tpl"}};
  OutputMeasure measure;
  measure.name = "rms";
  measure.statisticType = StatisticType::rootMeanSquare;
  measure.simulation = {description.baseFolder + "/simulated.csv", 1};
  measure.observation = {folder_ + "/observed.csv", 1};
  description.measures = {measure};
  description.period = {{2001, 1, 1}, {2001, 12, 31}};
  ObjectiveFunction objective;
  objective.name = "all";
  objective.measures = {0};
  description.objectives = {objective};
  return description;
}

double Calibration::evaluate(int count) {
  std::vector<ParameterSet> sets;
  for (int i = 0; i < count; ++i) sets.push_back({1.0 + 8.0 * i / count, 2.0});
  const auto start = Clock::now();
  evaluator_->evaluateParameterSets(sets, DispatchMode::task);
  return secondsSince(start);
}

double Calibration::runBare(int count) {
  std::map<pid_t, std::size_t> running;  // the slot of each, from 0
  std::vector<std::string> models;
  std::vector<posix_spawn_file_actions_t> actions(static_cast<std::size_t>(slotCount_));
  for (std::size_t slot = 0; slot < actions.size(); ++slot) {
    const std::string folder = launcher_.getProcessFolder(static_cast<int>(slot) + 1);
    models.push_back(folder + "/model");
    posix_spawn_file_actions_init(&actions[slot]);
    posix_spawn_file_actions_addchdir_np(&actions[slot], folder.c_str());
  }
  const auto spawn = [&](std::size_t slot) {
    char* const arguments[] = {models[slot].data(), nullptr};
    pid_t process = 0;
    const int error = posix_spawn(&process, models[slot].c_str(), &actions[slot], nullptr, arguments, environ);
    if (error != 0) fatalError("posix_spawn failed");
    running[process] = slot;
  };
  const auto start = Clock::now();
  int started = 0;
  for (; started < std::min(slotCount_, count); ++started) spawn(static_cast<std::size_t>(started));
  while (!running.empty()) {
    int status = 0;
    const auto ended = running.find(waitpid(-1, &status, 0));
    if (ended == running.end()) continue;
    if (status != 0) fatalError("a model run failed");
    const std::size_t slot = ended->second;
    running.erase(ended);
    if (started < count) {
      spawn(slot);
      ++started;
    }
  }
  const double seconds = secondsSince(start);
  for (auto& action : actions) posix_spawn_file_actions_destroy(&action);
  return seconds;
}

double Calibration::runProgram(int count) {
  const std::string setup = folder_ + "/program.kdx";
  std::ofstream(setup) << setupText(slotCount_, count);
  std::string program = MIREVO_PROGRAM;
  std::string argument = setup;
  char* const arguments[] = {program.data(), argument.data(), nullptr};
  const auto start = Clock::now();
  pid_t process = 0;
  int status = 0;
  if (posix_spawn(&process, program.c_str(), nullptr, nullptr, arguments, environ) != 0)
    fatalError("the program could not be started", program);
  if (waitpid(process, &status, 0) != process || status != 0) fatalError("the program failed: see its log");
  return secondsSince(start) / count;
}

}  // namespace mirevo::bench
