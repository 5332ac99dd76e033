#include "import/imported_case.h"

#include <algorithm>

#include <fmt/format.h>

#include "common/text.h"

namespace mirevo {

const ModelParameter* ImportedCase::parameter(std::string_view wanted) const {
  const auto isIt = [wanted](const ModelParameter& parameter) { return equalIgnoringCase(parameter.name, wanted); };
  const auto found = std::find_if(parameters.begin(), parameters.end(), isIt);
  return found == parameters.end() ? nullptr : &*found;
}

void ImportedCase::addObjective(const std::string& wanted, FunctionType type) {
  const auto isIt = [&](const ImportedObjective& objective) { return objective.name == wanted; };
  if (std::none_of(objectives.begin(), objectives.end(), isIt)) objectives.push_back({wanted, type});
}

std::string nameInEquation(std::string_view name) {
  std::string text = "[";
  for (const char c : name) text += c == ']' ? std::string("]]") : std::string(1, c);
  return text + "]";
}

namespace {

/// A KDX text, section by section.
class SetupWriter final {
 public:
  void open(const std::string& section) {
    line(fmt::format("[{}]", section));
    open_.push_back(section);
  }
  void close() {
    const std::string section = open_.back();
    open_.pop_back();
    line(fmt::format("[/{}]", section));
  }
  void number(std::string_view keyword, double value) { line(fmt::format("{} = {}", keyword, formatReal(value))); }
  void count(std::size_t value) { line(fmt::format("TqSEKdxListItemCount = {}", value)); }
  void plain(std::string_view keyword, std::string_view value) { line(fmt::format("{} = {}", keyword, value)); }
  void text(std::string_view keyword, std::string_view value) {
    std::string quoted;
    for (const char c : onOneLine(value)) quoted += c == '\'' ? std::string("''") : std::string(1, c);
    line(fmt::format("{} = '{}'", keyword, quoted));
  }
  void line(std::string_view content) { text_ += fmt::format("{:{}}{}\n", "", 2 * open_.size(), content); }
  std::string take() { return std::move(text_); }

 private:
  std::string text_;
  std::vector<std::string> open_;
};

std::string inModel(const std::string& file) {
  return "model/" + file;
}

void writeModel(const ImportedCase& imported, SetupWriter& out) {
  out.open("MIREVO_SIMULATION_OPTION");
  out.text("Option", imported.task.option);
  if (!imported.title.empty()) out.text("Title", imported.title);
  out.open("SIMBATCH");
  out.count(1);
  out.open("SIMBATCHITEM_1");
  out.text("BatchFileName", inModel("mirevo_run.sh"));
  out.close();
  out.close();
  out.open("SIMPARAM");
  out.count(imported.templates.size());
  for (std::size_t i = 0; i < imported.templates.size(); ++i) {
    out.open(fmt::format("SIMPARAMITEM_{}", i + 1));
    out.text("ParamFileName", inModel(imported.templates[i].parameterFile));
    out.text("TemplateFileName", inModel(imported.templates[i].templateFile));
    out.close();
  }
  out.close();
  out.close();
}

void writeParameters(const ImportedCase& imported, SetupWriter& out) {
  out.open("MODEL_PARAMETERS");
  out.count(imported.parameters.size());
  for (std::size_t i = 0; i < imported.parameters.size(); ++i) {
    const ModelParameter& parameter = imported.parameters[i];
    out.open(fmt::format("PARAMETER_{}", i + 1));
    out.text("Parameter_Name", parameter.name);
    out.number("Initial_Value", parameter.initialValue);
    out.number("Lower_Bound", parameter.lowerBound);
    out.number("Upper_Bound", parameter.upperBound);
    out.text("Transformation_Type", codeName(kTransformationTypeNames, parameter.transformationType));
    out.text("Parameter_Type", codeName(kParameterTypeNames, parameter.parameterType));
    if (!parameter.equation.empty()) out.text("Parameter_Equation", parameter.equation);
    if (!parameter.comment.empty()) out.text("Comment", parameter.comment);
    out.close();
  }
  out.open("INTERNAL_CONSTRAINTS");
  out.count(0);
  out.close();
  out.close();
}

void writeMeasures(const ImportedCase& imported, SetupWriter& out) {
  out.open("OUTPUT_MEASURES");
  out.count(imported.measures.size());
  for (std::size_t i = 0; i < imported.measures.size(); ++i) {
    const ImportedMeasure& measure = imported.measures[i];
    out.open(fmt::format("MEASURE_{}", i + 1));
    out.text("Name", measure.name);
    out.text("Interface_Type", "measure file");
    out.text("Measurement_Name", measure.measurement);
    if (measure.observedValue) {
      out.number("Observed_Value", *measure.observedValue);
      out.number("Weight", measure.weight);
      out.number("Weight_Above", measure.weightAbove);
    }
    out.text("Function_Name", measure.objective);
    out.close();
  }
  for (std::size_t i = 0; i < imported.outputs.size(); ++i) {
    if (i == 1) {
      out.open("FURTHER_FILES");
      out.count(imported.outputs.size() - 1);
    }
    out.open(i == 0 ? std::string("OUTPUT_MEASURE_FILE") : fmt::format("FURTHER_FILE_{}", i));
    out.text("File_Name", inModel(imported.outputs[i].file));
    out.text("Instruction_File", inModel(imported.outputs[i].instructionFile));
    out.close();
  }
  if (imported.outputs.size() > 1) out.close();
  out.close();
}

void writeJudgement(const ImportedCase& imported, SetupWriter& out) {
  out.open("ObjectiveFunctions");
  out.line("// required, and without effect on numbers that have no time");
  out.plain("Start_Date", "2000-01-01");
  out.plain("End_Date", "2000-12-31");
  out.text("Aggregation_Method", "none");
  writeMeasures(imported, out);
  out.open("OBJECTIVE_FUNCTIONS");
  out.count(imported.objectives.size());
  for (std::size_t i = 0; i < imported.objectives.size(); ++i) {
    out.open(fmt::format("OBJECTIVE_{}", i + 1));
    out.text("Name", imported.objectives[i].name);
    out.text("Function_Type", codeName(kFunctionTypeNames, imported.objectives[i].type));
    if (imported.objectives[i].weight != 1.0) out.number("Weight", imported.objectives[i].weight);
    out.close();
  }
  out.close();
  out.close();
}

void writeTasks(const ImportedCase& imported, SetupWriter& out) {
  const ImportedTask& task = imported.task;
  out.open("SAVE_OUTPUT_FILES");
  out.count(0);
  out.close();
  out.open("SCENARIOS");
  out.text("Scenario_Type", "single run");
  out.close();
  out.open("SENSITIVITY_ANALYSIS");
  out.text("Sensitivity_Type", "local");
  out.open("LOCAL_SA");
  out.text("Differencing", task.differencing);
  out.text("Perturbation_Option", task.perturbedPartOfValue ? "value" : "range");
  out.number("Perturbation_Fraction", task.perturbedPartOfValue.value_or(0.01));
  out.close();
  out.close();
  out.open("OPTIMISATION_ALGORITHM");
  out.text("Algorithm_Type", task.algorithm);
  out.open("DDS_CONTROL_PARAMETERS");
  out.number("Perturbation_Parameter", task.perturbation);
  out.close();
  out.open("PDDS_CONTROL_PARAMETERS");
  out.number("Perturbation_Parameter", task.perturbation);
  out.number("Candidates", task.candidates);
  out.close();
  const auto isVariable = [](const ModelParameter& one) { return one.parameterType == ParameterType::variable; };
  const auto n =
      static_cast<std::int32_t>(std::count_if(imported.parameters.begin(), imported.parameters.end(), isVariable));
  const auto given = [](std::int32_t value, std::int32_t usual) { return value > 0 ? value : usual; };
  out.open("SCE_CONTROL_PARAMETERS");
  out.number("No_Complexes", given(task.complexes, 2));
  out.number("No_Points_Complex", given(task.pointsOfComplex, 2 * n + 1));
  out.number("No_Points_Subcomplex", given(task.pointsOfSubcomplex, n + 1));
  out.number("No_Evaluation_Steps", given(task.evolutionSteps, 2 * n + 1));
  out.close();
  out.open("INITIAL_SAMPLE");
  out.plain("Include_Initial_Parameters", task.includesInitial ? "1" : "0");
  out.number("Random_Seed", task.seed);
  out.close();
  out.open("STOPPING_CRITERIA");
  out.number("Max_No_Evaluations", task.evaluations);
  if (task.loopsOfConvergence) out.number("No_Loops_Convergence", *task.loopsOfConvergence);
  if (task.leastChange) out.number("Min_Change", *task.leastChange);
  out.close();
  out.close();
  out.open("SimultaneousSimulations");
  out.number("NoSimultaneousSim", 1);
  if (task.longestModelRun > 0.0) out.number("MaxSimulationTime", task.longestModelRun);
  out.close();
}

}  // namespace

std::string setupText(const ImportedCase& imported) {
  SetupWriter out;
  out.line(fmt::format("// Made by mirevo-import from {}; {}_import.txt lists what is not as it was there.",
                       onOneLine(imported.source), imported.name));
  out.open("MIREVO_PARAMETERS");
  writeModel(imported, out);
  writeParameters(imported, out);
  writeJudgement(imported, out);
  writeTasks(imported, out);
  out.close();
  return out.take();
}

}  // namespace mirevo
