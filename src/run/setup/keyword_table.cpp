#include "run/setup/keyword_table.h"

#include <cmath>
#include <optional>
#include <type_traits>
#include <unordered_map>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

using Type = KeywordType;

constexpr ValueRange kAny{};
constexpr ValueRange kNonNegative{.lowest = 0};
constexpr ValueRange kPositive{.lowest = 0, .lowestExcluded = true};
constexpr ValueRange kFraction{.lowest = 0, .highest = 1};

constexpr ValueRange from(double lowest) {
  return {.lowest = lowest};
}
constexpr ValueRange between(double lowest, double highest) {
  return {.lowest = lowest, .highest = highest};
}

/// What a value of the setup is put into, by the field's own type.
template <class Field>
void assign(Field& field, const SetupValue& value) {
  if constexpr (std::is_enum_v<Field>) {
    field = static_cast<Field>(std::get<std::int32_t>(value));
  } else if constexpr (std::is_same_v<Field, bool>) {
    field = (std::get<std::int32_t>(value) & 1) != 0;  // the lowest bit: -1 is a yes, too
  } else if constexpr (std::is_same_v<Field, std::optional<double>>) {
    field = std::get<double>(value);
  } else if constexpr (std::is_same_v<Field, std::vector<std::string>>) {
    field.push_back(std::get<std::string>(value));
  } else {
    field = std::get<Field>(value);
  }
}

/// The `store` of a row from a lambda that names the field.
template <class FieldOf>
constexpr auto into(FieldOf) {
  return [](RunConfig& config, std::size_t item, const SetupValue& value) { assign(FieldOf{}(config, item), value); };
}

/// As KeywordRow::bearsOnResults.
constexpr bool kNotOfResults = false;

/// A lambda that names a field of the configuration (`c`) or of the item (`i`) that is being read.
#define MIREVO_FIELD(expression) \
  into([]([[maybe_unused]] RunConfig & c, [[maybe_unused]] std::size_t i) -> auto& { return expression; })

constexpr std::string_view kCountMeaning = "Number of item sections; exactly so many are read.";

KeywordRow countOf(std::string_view section) {
  return {section, kItemCountKeyword, Type::integer, "0", kNonNegative, "", kCountMeaning};
}

constexpr std::string_view kOption = "MIREVO_SIMULATION_OPTION";
constexpr std::string_view kBatch = "MIREVO_SIMULATION_OPTION/SIMBATCH";
constexpr std::string_view kBatchItem = "MIREVO_SIMULATION_OPTION/SIMBATCH/SIMBATCHITEM_n";
constexpr std::string_view kFiles = "MIREVO_SIMULATION_OPTION/SIMPARAM";
constexpr std::string_view kFile = "MIREVO_SIMULATION_OPTION/SIMPARAM/SIMPARAMITEM_n";
constexpr std::string_view kParameters = "MODEL_PARAMETERS";
constexpr std::string_view kKeyLines = "MODEL_PARAMETERS/PARAMETER_n/Keywords";
constexpr std::string_view kParameter = "MODEL_PARAMETERS/PARAMETER_n";
constexpr std::string_view kConstraints = "MODEL_PARAMETERS/INTERNAL_CONSTRAINTS";
constexpr std::string_view kConstraint = "MODEL_PARAMETERS/INTERNAL_CONSTRAINTS/CONSTRAINT_n";
constexpr std::string_view kFunctions = "ObjectiveFunctions";
constexpr std::string_view kMeasures = "ObjectiveFunctions/OUTPUT_MEASURES";
constexpr std::string_view kMeasure = "ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_n";
constexpr std::string_view kSimulated = "ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_n/SIMULATION_FILE";
constexpr std::string_view kObserved = "ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_n/OBSERVATION_FILE";
constexpr std::string_view kObjectives = "ObjectiveFunctions/OBJECTIVE_FUNCTIONS";
constexpr std::string_view kObjective = "ObjectiveFunctions/OBJECTIVE_FUNCTIONS/OBJECTIVE_n";
constexpr std::string_view kSaved = "SAVE_OUTPUT_FILES";
constexpr std::string_view kSavedFile = "SAVE_OUTPUT_FILES/OUTPUT_FILE_n";
constexpr std::string_view kScenarios = "SCENARIOS";
constexpr std::string_view kScenarioRuns = "SCENARIOS/SCENARIO_RUNS";
constexpr std::string_view kScenario = "SCENARIOS/SCENARIO_RUNS/SCENARIO_n";
constexpr std::string_view kSensitivity = "SENSITIVITY_ANALYSIS";
constexpr std::string_view kLocal = "SENSITIVITY_ANALYSIS/LOCAL_SA";
constexpr std::string_view kSearch = "OPTIMISATION_ALGORITHM";
constexpr std::string_view kSce = "OPTIMISATION_ALGORITHM/SCE_CONTROL_PARAMETERS";
constexpr std::string_view kPse = "OPTIMISATION_ALGORITHM/PSE_CONTROL_PARAMETERS";
constexpr std::string_view kDds = "OPTIMISATION_ALGORITHM/DDS_CONTROL_PARAMETERS";
constexpr std::string_view kSample = "OPTIMISATION_ALGORITHM/INITIAL_SAMPLE";
constexpr std::string_view kStopping = "OPTIMISATION_ALGORITHM/STOPPING_CRITERIA";
constexpr std::string_view kSurrogate = "OPTIMISATION_ALGORITHM/SURROGATE_MODEL_PARAMETERS";
constexpr std::string_view kUncertainty = "UNCERTAINTY_ESTIMATION";
constexpr std::string_view kUncertain = "UNCERTAINTY_ESTIMATION/PARAMETER_n";
constexpr std::string_view kSlots = "SimultaneousSimulations";
constexpr std::string_view kMeasureFile = "ObjectiveFunctions/OUTPUT_MEASURES/OUTPUT_MEASURE_FILE";
constexpr std::string_view kReserved = "TMEMPARAM";

constexpr SectionRow kSections[] = {
    {kOption, "always", "The task of the run and the model that it runs."},
    {kBatch, "always", "What one model run starts, one item after another. At least one item."},
    {kBatchItem, "for each item", "A batch file."},
    {kFiles, "always", "The model's own input files into which parameter values are written. At least one item."},
    {kFile, "for each item", "A model parameter file and its template."},
    {kParameters, "always", "The parameters of the model. At least one, and at least one variable."},
    {kKeyLines, "for each parameter that has it",
     "Lines that tell where the parameter stands in a model file. Kept with the parameter, not interpreted."},
    {kParameter, "for each item", "A parameter, on the model scale."},
    {kConstraints, "always", "Comparisons that every parameter set must satisfy; one that does not is not run."},
    {kConstraint, "for each item",
     "A constraint: left equation, operator, right equation, over the parameters' names."},
    {kFunctions, "always", "How a model run is judged."},
    {kMeasures, "always", "The output measures. At least one."},
    {kMeasure, "for each item",
     "A comparison of a simulated with an observed series reduced to one number, or a number "
     "that the model wrote."},
    {kSimulated, "for each measure of interface type 0", "The simulated series."},
    {kObserved, "for each measure of interface type 0", "The observed series."},
    {kObjectives, "always", "The objective functions. At least one."},
    {kObjective, "for each item", "An objective function over the output measures that name it."},
    {kSaved, "always", "Model output files that are kept for each evaluation. A count of 0 keeps none."},
    {kSavedFile, "for each item", "A file to keep."},
    {kScenarios, "when `Option` is 0", "Scenario runs."},
    {kScenarioRuns, "when `Scenario_Type` is 1", "The parameter sets of the runs. At least one."},
    {kScenario, "for each item", "A run."},
    {kSensitivity, "when `Option` is 1", "Sensitivity analysis."},
    {kLocal, "when `Sensitivity_Type` is 0", "Local sensitivity analysis by differences around the initial values."},
    {kSearch, "when `Option` is 2", "Parameter optimisation."},
    {kSce, "when `Algorithm_Type` is 0", "Shuffled Complex Evolution."},
    {kPse, "when `Algorithm_Type` is 1", "Population Simplex Evolution."},
    {kDds, "when `Algorithm_Type` is 2", "Dynamically Dimensioned Search."},
    {kSample, "when `Option` is 2", "Where the search starts."},
    {kStopping, "when `Option` is 2", "When the search stops; the first criterion that is met."},
    {kSurrogate, "when `Use_Surrogate_Model` is 1",
     "The surrogate model that SCE and PSE may use to save model runs. May be empty."},
    {kUncertainty, "when `Option` is 3", "Uncertainty analysis by sampling."},
    {kUncertain, "for each variable parameter",
     "The normal distribution of the n-th *variable* parameter, counted in the order of `MODEL_PARAMETERS`."},
    {kSlots, "always", "How many model runs are made at once."},
    {kMeasureFile, "always", "The file from which measures of interface type 1 take their numbers."},
    {kReserved, "never", "Accepted and not used."},
};

const std::vector<KeywordRow>& rows() {
  static const std::vector<KeywordRow> table = {
      {kOption, "Option", Type::integer, "", kAny, "",
       "The task: 0 scenario runs, 1 sensitivity analysis, 2 parameter optimisation, 3 uncertainty analysis. Any other "
       "number runs nothing and ends normally.",
       MIREVO_FIELD(c.simulationOption)},
      {kOption, "Title", Type::text, "''", kAny, "", "Title of the run, in the log and the result files.",
       MIREVO_FIELD(c.title), kNotOfResults},
      {kOption, "Restart", Type::integer, "0", between(0, 2), "",
       "1: an interrupted run goes on where it was cut off. 2: the same, and failed model runs at its end are made "
       "again. "
       "0: earlier results are kept under a numbered name and the run begins anew.",
       MIREVO_FIELD(c.restart), kNotOfResults},
      {kOption, "FailedRunFolders", Type::integer, "3", kNonNegative, "model runs",
       "Of so many failed model runs, the first ones, the process folder is kept as `<setup>_Failed<evaluation "
       "number>`.",
       MIREVO_FIELD(c.failedRunFolders), kNotOfResults},
      {kOption, "Report", Type::integer, "1", kAny, "",
       "1: a report for the browser is written at the end of the run, as `<setup>_Report.html`. 0: none.",
       MIREVO_FIELD(c.writesReport), kNotOfResults},
      countOf(kBatch),
      {kBatchItem, "BatchFileName", Type::fileName, "", kAny, "",
       "Runs the model. Its folder in the first item is the base folder, in or below which all files of the model lie. "
       "Executed where its run bit is set, else given to `/bin/sh`.",
       MIREVO_FIELD(c.batchItems[i].batchFileName)},
      {kBatchItem, "Arguments", Type::text, "''", kAny, "", "Its arguments, split as a shell splits words.",
       MIREVO_FIELD(c.batchItems[i].arguments)},
      countOf(kFiles),
      {kFile, "FileType", Type::integer, "0", kAny, "",
       "1: the template marks values by numeric IDs (`Parameter_IDValue`). Any other number: by names between "
       "delimiters, the delimiter being the template's first line.",
       MIREVO_FIELD(c.parameterFiles[i].fileType)},
      {kFile, "ParamFileName", Type::fileName, "", kAny, "",
       "The model's input file that is written before each run. It must exist, in or below the base folder.",
       MIREVO_FIELD(c.parameterFiles[i].paramFileName)},
      {kFile, "TemplateFileName", Type::fileName, "", kAny, "", "Its template, in or below the base folder.",
       MIREVO_FIELD(c.parameterFiles[i].templateFileName)},
      countOf(kParameters),
      {kKeyLines, "KeyLine", Type::textLines, "''", kAny, "", "A line; the keyword may be repeated.",
       MIREVO_FIELD(c.parameters[i].keyLines), kNotOfResults},
      {kParameter, "Initial_Value", Type::real, "", kAny, "of the parameter",
       "Value of a fixed parameter, starting point of a variable one, which must lie within its bounds.",
       MIREVO_FIELD(c.parameters[i].initialValue)},
      {kParameter, "Lower_Bound", Type::real, "", kAny, "of the parameter",
       "Lowest value. Greater than 0 for a logarithmic variable parameter.", MIREVO_FIELD(c.parameters[i].lowerBound)},
      {kParameter, "Upper_Bound", Type::real, "", kAny, "of the parameter",
       "Highest value, not below the lowest; above it for a variable parameter that SCE or PSE searches.",
       MIREVO_FIELD(c.parameters[i].upperBound)},
      {kParameter, "Transformation_Type", Type::integer, "0", between(0, 2), "",
       "Scale of the search: 0 the value itself, 1 its natural logarithm, 2 steps of 1 from the lower bound.",
       MIREVO_FIELD(c.parameters[i].transformationType)},
      {kParameter, "Parameter_Type", Type::integer, "0", between(0, 2), "",
       "0 variable, 1 fixed at the initial value, 2 dependent: the value of its equation.",
       MIREVO_FIELD(c.parameters[i].parameterType)},
      {kParameter, "Parameter_IDValue", Type::real, "0.0", kAny, "",
       "A tiny number such as 1.5E-035 that stands for the parameter in numeric-ID templates.",
       MIREVO_FIELD(c.parameters[i].idValue)},
      {kParameter, "Parameter_Name", Type::name, "", kAny, "",
       "Unique name, used in templates, equations, messages and result files.", MIREVO_FIELD(c.parameters[i].name)},
      {kParameter, "Parameter_Equation", Type::freeText, "''", kAny, "",
       "Equation of a dependent parameter over the names of others.", MIREVO_FIELD(c.parameters[i].equation)},
      {kParameter, "Comment", Type::freeText, "''", kAny, "", "Free text.", MIREVO_FIELD(c.parameters[i].comment),
       kNotOfResults},
      countOf(kConstraints),
      {kConstraint, "Left_Equation", Type::freeText, "", kAny, "", "Left side.",
       MIREVO_FIELD(c.constraints[i].leftEquation)},
      {kConstraint, "Right_Equation", Type::freeText, "", kAny, "", "Right side.",
       MIREVO_FIELD(c.constraints[i].rightEquation)},
      {kConstraint, "Logical_Operator", Type::integer, "", between(0, 3), "",
       "The left side must be 0 less than, 1 at most, 2 greater than, 3 at least the right side.",
       MIREVO_FIELD(c.constraints[i].logicalOperator)},
      {kFunctions, "Start_Date", Type::date, "", kAny, "", "First time of the evaluation period; it belongs to it.",
       MIREVO_FIELD(c.period.start)},
      {kFunctions, "End_Date", Type::date, "", kAny, "",
       "Last time of the evaluation period; it belongs to it. Not before the first.", MIREVO_FIELD(c.period.end)},
      {kFunctions, "Aggregation_Method", Type::integer, "0", between(0, 3), "",
       "How objective functions are put on one scale before they are added up: 0 not at all, 1 common distance scale, "
       "2 common probability scale; 3 makes every aggregate 0.",
       MIREVO_FIELD(c.aggregationMethod)},
      countOf(kMeasures),
      {kMeasure, "Name", Type::name, "", kAny, "", "Name, in messages and result files.",
       MIREVO_FIELD(c.measures[i].name)},
      {kMeasure, "Interface_Type", Type::integer, "0", between(0, 1), "",
       "0: a statistic of two time series. 1: a number that the model wrote to the output-measure file.",
       MIREVO_FIELD(c.measures[i].interfaceType)},
      {kMeasure, "MeasurementNo", Type::integer, "1", from(1), "",
       "Which number of the output-measure file; used with interface type 1.",
       MIREVO_FIELD(c.measures[i].measurementNo)},
      {kMeasure, "Statistic_Type", Type::integer, "0", between(0, 4), "",
       "Of the weighted differences simulated minus observed: 0 mean, 1 root mean square, 2 standard deviation; "
       "weighted difference of 3 the largest, 4 the smallest values.",
       MIREVO_FIELD(c.measures[i].statisticType)},
      {kMeasure, "Weight", Type::real, "1.0", kNonNegative, "", "Weight of differences at or below 0.",
       MIREVO_FIELD(c.measures[i].weight)},
      {kMeasure, "Weight_Above", Type::real, "1.0", kNonNegative, "", "Weight of differences above 0.",
       MIREVO_FIELD(c.measures[i].weightAbove)},
      {kMeasure, "Function_Name", Type::text, "''", kAny, "",
       "The objective function that the measure belongs to; blank: to none, it is reported only.",
       MIREVO_FIELD(c.measures[i].functionName)},
      {kSimulated, "File_Name", Type::fileName, "", kAny, "",
       "The simulated time-series file, in or below the base folder.", MIREVO_FIELD(c.measures[i].simulation.fileName)},
      {kSimulated, "Item_No", Type::integer, "1", kAny, "", "Which item of the file, from 1.",
       MIREVO_FIELD(c.measures[i].simulation.itemNo)},
      {kObserved, "File_Name", Type::fileName, "", kAny, "", "The observed time-series file.",
       MIREVO_FIELD(c.measures[i].observation.fileName)},
      {kObserved, "Item_No", Type::integer, "1", kAny, "", "Which item of the file, from 1.",
       MIREVO_FIELD(c.measures[i].observation.itemNo)},
      countOf(kObjectives),
      {kObjective, "Name", Type::name, "", kAny, "", "Unique name, by which output measures refer to it.",
       MIREVO_FIELD(c.objectives[i].name)},
      {kObjective, "Function_Type", Type::integer, "0", between(0, 2), "",
       "Over its output measures: 0 sum of the values, 1 of the absolute values, 2 of the squares.",
       MIREVO_FIELD(c.objectives[i].functionType)},
      {kObjective, "Weight", Type::real, "1.0", kNonNegative, "", "Weight in the aggregate.",
       MIREVO_FIELD(c.objectives[i].weight)},
      {kObjective, "Standard_Deviation", Type::real, kNoDefault, kPositive, "of the function",
       "Scale of the transformation of aggregation methods 1 and 2. Without it, that of the search's initial sample.",
       MIREVO_FIELD(c.objectives[i].standardDeviation)},
      {kObjective, "Location", Type::real, kNoDefault, kAny, "of the function",
       "Location of the transformation: added after the division by the standard deviation (method 1), or the mean "
       "(method 2). Without it, from the search's initial sample.",
       MIREVO_FIELD(c.objectives[i].location)},
      countOf(kSaved),
      {kSavedFile, "File_name", Type::fileName, "", kAny, "",
       "A file that the model writes, in or below the base folder.", MIREVO_FIELD(c.savedOutputFiles[i]),
       kNotOfResults},
      {kScenarios, "Scenario_Type", Type::integer, "", between(0, 1), "",
       "0 a single run with the initial values, 1 multiple runs.", MIREVO_FIELD(c.scenario.scenarioType)},
      countOf(kScenarioRuns),
      {kScenario, "Parameters", Type::realList, "", kAny, "of the parameters",
       "One value a parameter in the order of `MODEL_PARAMETERS`, those of variable parameters within their bounds; "
       "those of fixed and dependent ones are read and not used.",
       MIREVO_FIELD(c.scenario.runs[i])},
      {kSensitivity, "Sensitivity_Type", Type::integer, "", between(0, 0), "", "0 local sensitivity analysis.",
       MIREVO_FIELD(c.sensitivity.sensitivityType)},
      {kLocal, "Differencing", Type::integer, "0", between(0, 1), "", "0 forward, 1 central differences.",
       MIREVO_FIELD(c.sensitivity.local.differencing)},
      {kLocal, "Perturbation_Option", Type::integer, "0", between(0, 1), "",
       "The perturbation is a fraction of 0 the parameter's range, 1 its value.",
       MIREVO_FIELD(c.sensitivity.local.perturbationOption)},
      {kLocal,
       "Perturbation_Fraction",
       Type::real,
       "0.01",
       {.lowest = 0, .highest = 1, .lowestExcluded = true},
       "",
       "That fraction.",
       MIREVO_FIELD(c.sensitivity.local.perturbationFraction)},
      {kLocal, "Calculate_Covmatrix", Type::integer, "0", kAny, "",
       "1: the covariance and correlation matrix of the parameters, too.",
       MIREVO_FIELD(c.sensitivity.calculateCovarianceMatrix)},
      {kSearch, "Algorithm_Type", Type::integer, "", between(0, 2), "",
       "0 Shuffled Complex Evolution, 1 Population Simplex Evolution, 2 Dynamically Dimensioned Search.",
       MIREVO_FIELD(c.optimisation.algorithmType)},
      {kSearch, "Use_Surrogate_Model", Type::integer, "0", kAny, "",
       "0 no, 1 yes; for SCE and PSE. Any other number runs no search.",
       MIREVO_FIELD(c.optimisation.useSurrogateModel)},
      {kSce, "No_Complexes", Type::integer, "", from(1), "", "Complexes, p.",
       MIREVO_FIELD(c.optimisation.sce.complexCount)},
      {kSce, "No_Points_Complex", Type::integer, "", from(2), "",
       "Points in a complex, m; 2n + 1 for n variable parameters is usual.",
       MIREVO_FIELD(c.optimisation.sce.pointsPerComplex)},
      {kSce, "No_Points_Subcomplex", Type::integer, "", from(2), "",
       "Points in a subcomplex, q, at most those of a complex; n + 1 is usual.",
       MIREVO_FIELD(c.optimisation.simplex.pointCount)},
      {kSce, "No_Evaluation_Steps", Type::integer, "", from(1), "",
       "Evolution steps of a complex between two shuffles; 2n + 1 is usual.",
       MIREVO_FIELD(c.optimisation.sce.evolutionSteps)},
      {kPse, "Population_Size", Type::integer, "", from(1), "",
       "Points of the population and model runs of a generation.", MIREVO_FIELD(c.optimisation.pse.populationSize)},
      {kPse, "No_Points_Simplex", Type::integer, "", from(2), "",
       "Points in a simplex, at most those of the population. The same setting as SCE's `No_Points_Subcomplex`.",
       MIREVO_FIELD(c.optimisation.simplex.pointCount)},
      {kPse, "Prob_Reflection", Type::real, "0.7", kFraction, "",
       "Probability of the move that is due: a reflection, after it a contraction.",
       MIREVO_FIELD(c.optimisation.pse.reflectionProbability)},
      {kPse, "Prob_Contraction", Type::real, "0", kFraction, "",
       "Probability of a contraction at once; what both leave of 1 is that of a mutation at once.",
       MIREVO_FIELD(c.optimisation.pse.contractionProbability)},
      {kDds, "Perturbation_Parameter", Type::real, "0.2", kFraction, "",
       "Neighbourhood size r: standard deviation of a perturbation as a fraction of the parameter's range.",
       MIREVO_FIELD(c.optimisation.dds.perturbation)},
      {kSample, "Include_Initial_Parameters", Type::integer, "1", kAny, "",
       "1: the initial values are the first set of the sample; DDS then starts from them alone. 0: they are not.",
       MIREVO_FIELD(c.optimisation.initialSample.includeInitialParameters)},
      {kSample, "Random_Seed", Type::integer, "1", kAny, "",
       "Seed of the run; the same seed gives the same results. The same setting as the uncertainty analysis's.",
       MIREVO_FIELD(c.randomSeed)},
      {kSample, "Initial_Sample_Generation", Type::integer, "1", between(0, 4), "",
       "0 uniform random, 1 Latin hypercube, 2 scrambled Sobol sequence, 3 Latin hypercube with maximin distance, 4 "
       "read from the file.",
       MIREVO_FIELD(c.optimisation.initialSample.generation)},
      {kSample, "Initial_Sample_File_Name", Type::fileName, "''", kAny, "", "The file of generation 4.",
       MIREVO_FIELD(c.optimisation.initialSample.fileName)},
      {kStopping, "Max_No_Evaluations", Type::integer, "", from(1), "model runs", "Budget of the search.",
       MIREVO_FIELD(c.optimisation.stopping.maxEvaluations)},
      {kStopping, "No_Loops_Convergence", Type::integer, "10", from(1), "loops",
       "Loops over which the change of the best objective value is looked at.",
       MIREVO_FIELD(c.optimisation.stopping.loopsConvergence)},
      {kStopping, "Min_Change", Type::real, "0.001", kNonNegative, "",
       "Relative change of the best objective value below which the search has converged.",
       MIREVO_FIELD(c.optimisation.stopping.minChange)},
      {kSurrogate, "Sampling_rate", Type::integer, "25", between(1, 100), "per cent",
       "Share of the proposals that the model evaluates: those that the surrogate predicts best.",
       MIREVO_FIELD(c.optimisation.surrogate.samplingRate)},
      {kSurrogate, "Neighbourhood_Size", Type::integer, "0", from(0), "evaluated sets",
       "Nearest evaluated sets to which the surrogate is fitted; model type 0 needs (n+1)(n+2)/2 of them for n "
       "variable parameters. 0: one and a half times as many for model type 0, thrice as many but at most 100 for 1.",
       MIREVO_FIELD(c.optimisation.surrogate.neighbourhoodSize)},
      {kSurrogate, "Model_Type", Type::integer, "1", between(0, 1), "",
       "0 full quadratic polynomial, 1 Gaussian process: fewer model runs, milliseconds of computation for each.",
       MIREVO_FIELD(c.optimisation.surrogate.modelType)},
      {kSurrogate, "No_Initial_Generations", Type::integer, "1", from(1), "loops",
       "First loops that the model alone evaluates; with the initial sample they must fill a `Neighbourhood_Size` that "
       "is given.",
       MIREVO_FIELD(c.optimisation.surrogate.initialGenerations)},
      {kUncertainty, "Uncertainty_Type", Type::integer, "", between(0, 1), "",
       "0 simple random, 1 Latin hypercube sampling.", MIREVO_FIELD(c.uncertainty.uncertaintyType)},
      {kUncertainty, "Sample_Size", Type::integer, "", from(2), "model runs", "Parameter sets that are drawn.",
       MIREVO_FIELD(c.uncertainty.sampleSize)},
      {kUncertainty, "Random_Seed", Type::integer, "1", kAny, "", "Seed of the run; its sign does not matter.",
       MIREVO_FIELD(c.randomSeed)},
      {kUncertain, "Mean_Value", Type::real, "", kAny, "search scale",
       "Mean; that of the logarithm for a logarithmic parameter.", MIREVO_FIELD(c.uncertainty.parameters[i].mean)},
      {kUncertain, "Standard_Deviation", Type::real, "", kPositive, "search scale", "Standard deviation.",
       MIREVO_FIELD(c.uncertainty.parameters[i].standardDeviation)},
      {kSlots, "NoSimultaneousSim", Type::integer, "1", from(1), "model runs",
       "Model runs at once, each in a process folder of its own; no more than the run has evaluations. In an "
       "optimisation more than 1 needs PSE. In an MPI job: 1 on each worker.",
       MIREVO_FIELD(c.simultaneousSimulations), kNotOfResults},
      {kSlots, "UseSingleThread", Type::integer, "0", kAny, "", "1: tells each model run to use one thread.",
       MIREVO_FIELD(c.useSingleThread), kNotOfResults},
      {kSlots, "ProcessFolder", Type::fileName, "''", kAny, "",
       "Folder in which the process folders are made, such as a disk of the computing node; blank: beside the setup.",
       MIREVO_FIELD(c.processFolder), kNotOfResults},
      {kSlots, "MaxSimulationTime", Type::real, "0.0", kNonNegative, "s",
       "Longest time of a model run; one that takes longer is ended and has failed. 0: no limit.",
       MIREVO_FIELD(c.maxSimulationTime), kNotOfResults},
      {kMeasureFile, "File_Name", Type::fileName, "''", kAny, "",
       "In or below the base folder; required where a measure has interface type 1.", MIREVO_FIELD(c.measureFile)},
      {kReserved, "TmemOption", Type::integer, "0", kAny, "", "Not used."},
      {kReserved, "TmemClient", Type::integer, "0", kAny, "", "Not used."},
      {kReserved, "MaxSimTime", Type::real, "0.0", kAny, "", "Not used."},
  };
  return table;
}

#undef MIREVO_FIELD

}  // namespace

bool ValueRange::contains(double value) const {
  return std::isfinite(value) && value >= lowest && value <= highest && !(lowestExcluded && value == lowest);
}

std::string ValueRange::text() const {
  const bool hasHighest = std::isfinite(highest);
  if (!std::isfinite(lowest)) return {};
  if (lowestExcluded)
    return fmt::format("greater than {}", lowest) + (hasHighest ? fmt::format(" and at most {}", highest) : "");
  if (!hasHighest) return fmt::format("{} or more", lowest);
  return lowest == highest ? fmt::format("{}", lowest) : fmt::format("{} to {}", lowest, highest);
}

std::span<const SectionRow> sectionTable() {
  return kSections;
}

std::span<const KeywordRow> keywordTable() {
  return rows();
}

std::span<const KeywordRow> keywordsOf(std::string_view section) {
  static const auto index = [] {
    std::unordered_map<std::string_view, std::span<const KeywordRow>> bySection;
    const auto& table = rows();
    for (std::size_t first = 0, last = 0; first < table.size(); first = last) {
      while (last < table.size() && table[last].section == table[first].section) ++last;
      bySection.emplace(table[first].section, std::span(table).subspan(first, last - first));
    }
    return bySection;
  }();
  const auto found = index.find(section);
  return found == index.end() ? std::span<const KeywordRow>{} : found->second;
}

const SectionRow* findSection(std::string_view path) {
  for (const SectionRow& row : kSections) {
    if (row.path == path) return &row;
  }
  return nullptr;
}

const KeywordRow* findKeyword(std::string_view section, std::string_view name) {
  for (const KeywordRow& row : keywordsOf(section)) {
    if (row.name == name) return &row;
  }
  return nullptr;
}

std::vector<std::string> sectionNamesInside(std::string_view path) {
  std::vector<std::string> names;
  for (const SectionRow& row : kSections) {
    const auto slash = row.path.rfind('/');
    const bool isTop = slash == std::string_view::npos;
    if ((isTop ? std::string_view{} : row.path.substr(0, slash)) == path) {
      names.emplace_back(isTop ? row.path : row.path.substr(slash + 1));
    }
  }
  return names;
}

std::string itemPattern(std::string_view name) {
  const auto underscore = name.rfind('_');
  if (underscore == std::string_view::npos) return std::string(name);
  const std::string_view number = name.substr(underscore + 1);
  const bool isNumber =
      !number.empty() && number.front() != '0' && number.find_first_not_of("0123456789") == std::string_view::npos;
  return std::string(isNumber ? name.substr(0, underscore + 1) : name) + (isNumber ? "n" : "");
}

}  // namespace mirevo
