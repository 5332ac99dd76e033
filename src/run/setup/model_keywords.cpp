#include "run/setup/model_keywords.h"

#include <algorithm>
#include <iterator>
#include <map>
#include <span>
#include <tuple>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "algorithms/searches/search_methods.h"
#include "measures/statistics.h"
#include "measures/text_form_keywords.h"
#include "run/setup/validation.h"

namespace mirevo {
namespace {

constexpr std::string_view kItemNameMeaning =
    "Its name in the file, in upper or lower case, with or without a unit in brackets behind it, in place of the "
    "number or beside it: they must then agree.";

/// The keywords of the series that `seriesOf(measure)` returns.
template <class SeriesOf>
std::vector<KeywordRow> seriesKeywords(SeriesOf, std::string_view fileMeaning) {
  using Measure = OutputMeasure;
  std::vector<KeywordRow> rows = {
      setting<Measure>([](auto& m) -> auto& { return SeriesOf{}(m).fileName; },
                       {.name = "File_Name", .type = KeywordType::fileName, .meaning = std::string(fileMeaning)}),
      setting<Measure>([](auto& m) -> auto& { return SeriesOf{}(m).itemNo; },
                       {.name = "Item_No", .defaultValue = "1", .meaning = "Which item of the file, from 1."}),
      setting<Measure>([](auto& m) -> auto& { return SeriesOf{}(m).itemName; },
                       {.name = "Item_Name", .defaultValue = kNoDefault, .meaning = std::string(kItemNameMeaning)})};
  std::vector<KeywordRow> ofForm = textFormRows<Measure>([](auto& m) -> auto& { return SeriesOf{}(m).form; });
  std::move(ofForm.begin(), ofForm.end(), std::back_inserter(rows));
  return rows;
}

/// Where in a listing the simulated series is.
std::vector<KeywordRow> listingKeywords() {
  using Measure = OutputMeasure;
  return {setting<Measure>([](auto& m) -> auto& { return m.simulation.listingSettings.instructionFile; },
                           {.name = kInstructionFileKeyword,
                            .type = KeywordType::fileName,
                            .defaultValue = kNoDefault,
                            .meaning = "A file (`pif`) that says where in `File_Name`, which is then a listing of any "
                                       "form, the numbers of series are. It needs one of the three ways below to tell "
                                       "their times."}),
          setting<Measure>([](auto& m) -> auto& { return m.simulation.listingSettings.timesFile; },
                           {.name = kInstructionTimesKeyword,
                            .type = KeywordType::fileName,
                            .defaultValue = kNoDefault,
                            .meaning = "A CSV table with the columns `name` and `time`, a row for each name in the "
                                       "instruction file; a column `series` may name the series of each."}),
          setting<Measure>([](auto& m) -> auto& { return m.simulation.listingSettings.dates; },
                           {.name = kInstructionDatesKeyword,
                            .defaultValue = kNoDefault,
                            .meaning = "The form of the dates in which the names end, of `YYYY`, `MM`, `DD`, `hh`, "
                                       "`mm` and `ss`: `'YYYYMMDD'` for `flow_19900101`."}),
          setting<Measure>([](auto& m) -> auto& { return m.simulation.listingSettings.start; },
                           {.name = kInstructionStartKeyword,
                            .defaultValue = kNoDefault,
                            .meaning = "Time of the first number of each series, where the names end in the number of "
                                       "the step: `h1_1`, `h1_2`."}),
          setting<Measure>([](auto& m) -> auto& { return m.simulation.listingSettings.stepHours; },
                           {.name = kInstructionStepKeyword,
                            .defaultValue = kNoDefault,
                            .range = {.lowest = 0, .highest = 1e6, .lowestExcluded = true},
                            .refusal = "Error: Step of the numbers in a listing invalid for output measure ",
                            .unit = "h",
                            .meaning = "From one number of a series to the next."})};
}

/// Which other item of the observation file is meant: `itemOf(weighting)`.
template <class ItemOf>
KeywordRow weightingItem(ItemOf, std::string_view keyword, std::string_view meaning) {
  return setting<OutputMeasure>([](auto& m) -> auto& { return ItemOf{}(m.weighting); },
                                {.name = keyword,
                                 .defaultValue = kNoDefault,
                                 .range = from(1),
                                 .refusal = "Error: Item number invalid for output measure ",
                                 .meaning = std::string(meaning)});
}

/// The same by its name.
template <class NameOf>
KeywordRow weightingItemName(NameOf, std::string_view keyword, std::string_view number) {
  return setting<OutputMeasure>([](auto& m) -> auto& { return NameOf{}(m.weighting); },
                                {.name = keyword,
                                 .defaultValue = kNoDefault,
                                 .meaning = fmt::format("Its name, in place of `{}` or beside it.", number)});
}

/// The enumerator of a code that has a name only.
template <class Enum>
Enum enumeratorNamed(std::span<const CodeName> codes, const std::string& name) {
  const auto found = std::ranges::find(codes, std::string_view(name), &CodeName::name);
  return static_cast<Enum>(found - codes.begin());
}

/// The section with more keywords behind its own.
SectionRow withRows(SectionRow section, std::vector<KeywordRow> rows) {
  section.keywords.insert(section.keywords.end(), std::make_move_iterator(rows.begin()),
                          std::make_move_iterator(rows.end()));
  return section;
}

/// Which observations count for a measure, and what they are compared with.
std::vector<KeywordRow> pairingRows() {
  using Measure = OutputMeasure;
  return {
      setting<Measure>([](auto& m) -> auto& { return m.selection.start; },
                       {.name = "Start_Date",
                        .defaultValue = kNoDefault,
                        .meaning = "Start of a period of the measure's own, inclusive, inside the evaluation period. "
                                   "Without it, that of the evaluation period."}),
      setting<Measure>([](auto& m) -> auto& { return m.selection.end; },
                       {.name = "End_Date",
                        .defaultValue = kNoDefault,
                        .meaning = "Its end, likewise; a date alone means its 00:00."}),
      setting<Measure>([](auto& m) -> auto& { return m.selection.months; },
                       {.name = "Months",
                        .defaultValue = kNoDefault,
                        .meaning = "Numbers, 1 to 12, of the months whose observations count. Without it, all."}),
      setting<Measure>([](auto& m) -> auto& { return m.selection.lowestObserved; },
                       {.name = "Lowest_Observed",
                        .defaultValue = kNoDefault,
                        .unit = "of the series",
                        .meaning = "Observations below this value do not count."}),
      checked<Measure>(setting<Measure>([](auto& m) -> auto& { return m.selection.highestObserved; },
                                        {.name = "Highest_Observed",
                                         .defaultValue = kNoDefault,
                                         .unit = "of the series",
                                         .meaning = "Observations above this value do not count."}),
                       [](const Measure& measure) { return validateSelection(measure); }),
      choice<Measure>(
          [](Measure& measure, const SetupValue& value) {
            measure.timeMatch.kind = enumeratorNamed<TimeMatch>(kTimeMatchNames, std::get<std::string>(value));
          },
          {.name = "Time_Match",
           .defaultValue = "'interpolate'",
           .codes = kTimeMatchNames,
           .meaning = "What an observation is compared with: the simulated value at its time, interpolated between "
                      "two steps; only a simulated step at its time; the mean of the simulated steps of its day."}),
      setting<Measure>([](auto& m) -> auto& { return m.timeMatch.offsetHours; },
                       {.name = "Time_Offset",
                        .defaultValue = "0.0",
                        .range = between(-8784, 8784),
                        .refusal = "Error: Time offset invalid for output measure ",
                        .unit = "h",
                        .meaning = "Simulated time is observed time plus this: -1 for a gauge in UTC+1 and a model in "
                                   "UTC."}),
      setting<Measure>([](auto& m) -> auto& { return m.timeMatch.dayBeginsHours; },
                       {.name = "Day_Begins",
                        .defaultValue = "0.0",
                        .range = between(0, 24),
                        .refusal = "Error: Beginning of the day invalid for output measure ",
                        .unit = "h",
                        .meaning = "Observed time of day at which the days of `Time_Match = 'mean'` begin and end."}),
      choice<Measure>(
          [](Measure& measure, const SetupValue& value) {
            measure.timeMatch.dayStamp = enumeratorNamed<DayStamp>(kDayStampNames, std::get<std::string>(value));
          },
          {.name = "Day_Stamp",
           .defaultValue = "'start'",
           .codes = kDayStampNames,
           .meaning = "Whether the date of a daily observation is that on which its day begins, at `Day_Begins`, or "
                      "that on which it ends."})};
}

}  // namespace

const SectionRow& listSection(std::string_view path) {
  static const std::map<std::string_view, SectionRow> rows = [] {
    std::map<std::string_view, SectionRow> lists;
    for (const auto& [list, least, meaning] : {
             std::tuple{"MIREVO_SIMULATION_OPTION/SIMBATCH", 1,
                        "What one model run starts, one item after another. At least one item."},
             std::tuple{"MIREVO_SIMULATION_OPTION/SIMPARAM", 1,
                        "The model's own input files into which parameter values are written. At least one item."},
             std::tuple{"MODEL_PARAMETERS", 1, "The parameters of the model. At least one, and at least one variable."},
             std::tuple{"MODEL_PARAMETERS/INTERNAL_CONSTRAINTS", 0,
                        "Comparisons that every parameter set must satisfy; one that does not is not run."},
             std::tuple{"ObjectiveFunctions/OUTPUT_MEASURES", 1, "The output measures. At least one."},
             std::tuple{"ObjectiveFunctions/OBJECTIVE_FUNCTIONS", 1, "The objective functions. At least one."},
             std::tuple{"SAVE_OUTPUT_FILES", 0,
                        "Model output files that are kept for each evaluation. A count of 0 keeps none."},
         }) {
      lists.emplace(list, SectionRow{list, "always", meaning, {itemCount(least)}});
    }
    constexpr std::string_view kValidation = "ObjectiveFunctions/VALIDATION_PERIODS";
    lists.emplace(kValidation,
                  SectionRow{kValidation,
                             "if the setup has it",
                             "Periods in which the measures that compare series are computed as well, for every "
                             "evaluation, without bearing on the objective functions or the search.",
                             {itemCount(0)}});
    constexpr std::string_view kFurther = "ObjectiveFunctions/OUTPUT_MEASURES/FURTHER_FILES";
    lists.emplace(kFurther, SectionRow{kFurther,
                                       "if the setup has it",
                                       "Output-measure files behind the one of `OUTPUT_MEASURE_FILE`, which then has "
                                       "an `Instruction_File`, too.",
                                       {itemCount(0)}});
    return lists;
  }();
  return rows.at(path);
}

const SettingSection<BatchItem>& batchItemSection() {
  static const SettingSection<BatchItem> section{
      {"MIREVO_SIMULATION_OPTION/SIMBATCH/SIMBATCHITEM_n",
       "for each item",
       "A batch file.",
       {setting<&BatchItem::batchFileName>(
            {.name = "BatchFileName",
             .type = KeywordType::fileName,
             .meaning =
                 "Runs the model. Its folder in the first item is the base folder, in or below which all files of "
                 "the model are. Executed if its execute permission is set, otherwise passed to `/bin/sh`."}),
        setting<&BatchItem::arguments>(
            {.name = "Arguments", .defaultValue = "''", .meaning = "Its arguments, split as a shell splits words."})}}};
  return section;
}

const SettingSection<ParameterFileItem>& parameterFileSection() {
  using Item = ParameterFileItem;
  static const SettingSection<ParameterFileItem> section{
      {"MIREVO_SIMULATION_OPTION/SIMPARAM/SIMPARAMITEM_n",
       "for each item",
       "A model parameter file and its template.",
       {setting<&Item::templateType>(
            {.name = "FileType",
             .defaultValue = "0",
             .codes = kTemplateTypeNames,
             .meaning = "1: the template marks values by numeric IDs (`Parameter_IDValue`). Any other number: by names "
                        "between delimiters, the delimiter being the template's first line."}),
        setting<&Item::paramFileName>({.name = "ParamFileName",
                                       .type = KeywordType::fileName,
                                       .meaning = "The model's input file that is written before each run. It must "
                                                  "exist, in or below the base folder."}),
        setting<&Item::templateFileName>({.name = "TemplateFileName",
                                          .type = KeywordType::fileName,
                                          .meaning = "Its template, in or below the base folder."})}}};
  return section;
}

const SettingSection<ModelParameter>& keyLinesSection() {
  static const SettingSection<ModelParameter> section{
      {"MODEL_PARAMETERS/PARAMETER_n/Keywords",
       "for each parameter that has it",
       "Lines that describe the location of the parameter in a model file. Kept with the parameter, not interpreted.",
       {setting<&ModelParameter::keyLines>({.name = "KeyLine",
                                            .defaultValue = "''",
                                            .meaning = "A line; the keyword may be repeated.",
                                            .bearsOnResults = kNotOfResults})}}};
  return section;
}

const SettingSection<ModelParameter>& parameterSection() {
  using Parameter = ModelParameter;
  static const SettingSection<ModelParameter> section{
      {"MODEL_PARAMETERS/PARAMETER_n",
       "for each item",
       "A parameter, on the model scale.",
       {checked<Parameter>(
            setting<&Parameter::initialValue>({.name = "Initial_Value",
                                               .unit = "of the parameter",
                                               .meaning = "Value of a fixed parameter, starting point of a variable "
                                                          "one. Within the bounds, whatever the type."}),
            [](const Parameter& parameter) { return validateParameterBounds(parameter); }),
        setting<&Parameter::lowerBound>(
            {.name = "Lower_Bound",
             .unit = "of the parameter",
             .meaning = "Lowest value. Greater than 0 for a logarithmic variable parameter."}),
        setting<&Parameter::upperBound>({.name = "Upper_Bound",
                                         .unit = "of the parameter",
                                         .meaning = fmt::format("Highest value, not below the lowest; above it for a "
                                                                "variable parameter that {} searches.",
                                                                searchesWith(&SearchFacts::needsRanges, "or"))}),
        setting<&Parameter::transformationType>(
            {.name = "Transformation_Type",
             .defaultValue = "0",
             .range = between(0, 2),
             .codes = kTransformationTypeNames,
             .refusal = "Error: Transformation type invalid for parameter ",
             .meaning = "Scale of the search: 0 the value itself, 1 its natural logarithm, 2 steps of 1 from the lower "
                        "bound."}),
        setting<&Parameter::parameterType>(
            {.name = "Parameter_Type",
             .defaultValue = "0",
             .range = between(0, 2),
             .codes = kParameterTypeNames,
             .refusal = "Error: Parameter type invalid for parameter ",
             .meaning = "0 variable, 1 fixed at the initial value, 2 dependent: the value of its equation."}),
        setting<&Parameter::idValue>(
            {.name = "Parameter_IDValue",
             .defaultValue = "0.0",
             .meaning = "A tiny number such as 1.5E-035 that stands for the parameter in numeric-ID templates."}),
        setting<&Parameter::name>({.name = "Parameter_Name",
                                   .type = KeywordType::name,
                                   .meaning = "Unique name, used in templates, equations, messages and result files."}),
        setting<&Parameter::equation>({.name = "Parameter_Equation",
                                       .type = KeywordType::freeText,
                                       .defaultValue = "''",
                                       .meaning = "Equation of a dependent parameter over the names of others."}),
        setting<&Parameter::comment>({.name = "Comment",
                                      .type = KeywordType::freeText,
                                      .defaultValue = "''",
                                      .meaning = "Free text.",
                                      .bearsOnResults = kNotOfResults})},
       itemName<Parameter>([](const Parameter& parameter) { return parameter.name; })}};
  return section;
}

const SettingSection<InternalConstraint>& constraintSection() {
  using Constraint = InternalConstraint;
  static const SettingSection<InternalConstraint> section{
      {"MODEL_PARAMETERS/INTERNAL_CONSTRAINTS/CONSTRAINT_n",
       "for each item",
       "A constraint: left equation, operator, right equation, over the parameters' names.",
       {setting<&Constraint::leftEquation>(
            {.name = "Left_Equation", .type = KeywordType::freeText, .meaning = "Left side."}),
        setting<&Constraint::rightEquation>(
            {.name = "Right_Equation", .type = KeywordType::freeText, .meaning = "Right side."}),
        checked<Constraint>(
            setting<&Constraint::logicalOperator>(
                {.name = "Logical_Operator",
                 .range = between(0, 3),
                 .codes = kLogicalOperatorNames,
                 .refusal = "Error: Invalid logical operator in ",
                 .meaning =
                     "The left side must be 0 less than, 1 at most, 2 greater than, 3 at least the right side."}),
            [](const Constraint& constraint) { return validateEquations(constraint); })}}};
  return section;
}

const SettingSection<RunConfig>& judgementSection() {
  static const SettingSection<RunConfig> section{
      {"ObjectiveFunctions",
       "always",
       "How a model run is judged.",
       {setting<RunConfig>([](auto& c) -> auto& { return c.period.start; },
                           {.name = "Start_Date", .meaning = "Start of the evaluation period, inclusive."}),
        checked<RunConfig>(setting<RunConfig>([](auto& c) -> auto& { return c.period.end; },
                                              {.name = "End_Date",
                                               .meaning = "End of the evaluation period, inclusive; a date "
                                                          "alone means its 00:00. Not before the start."}),
                           [](const RunConfig& config) { return validateEvaluationPeriod(config.period); }),
        setting<&RunConfig::aggregationMethod>(
            {.name = "Aggregation_Method",
             .defaultValue = "0",
             .range = between(0, 3),
             .codes = kAggregationMethodNames,
             .refusal = "Error: Objective function aggregation method invalid",
             .meaning = "How objective functions are put on one scale before they are added up: 0 not at all, 1 common "
                        "distance scale, 2 common probability scale; 3 makes every aggregate 0."}),
        setting<&RunConfig::minimumCoverage>(
            {.name = "Minimum_Coverage",
             .defaultValue = "0",
             .range = kFraction,
             .refusal = "Error: Minimum coverage invalid",
             .meaning =
                 "Least share, of the pairs of simulated and observed values that the first successful run has of a "
                 "measure, with which a model run counts; with a smaller share it is a failed run. 0: no run "
                 "fails for lack of pairs, as long as it has any."}),
        setting<RunConfig>([](auto& c) -> auto& { return c.period.largestGapHours; },
                           {.name = "Largest_Gap",
                            .defaultValue = "0.0",
                            .range = kNonNegative,
                            .refusal = "Error: Largest gap invalid",
                            .unit = "h",
                            .meaning = "Longest time between two simulated steps over which is interpolated; an "
                                       "observation in a longer gap has no simulated value. 0: interpolated over any "
                                       "gap."}),
        checked<RunConfig>(setting<RunConfig>([](auto& c) -> auto& { return c.period.warmUpDays; },
                                              {.name = "Warm_Up_Days",
                                               .defaultValue = "0.0",
                                               .range = kNonNegative,
                                               .refusal = "Error: Warm-up invalid",
                                               .unit = "d",
                                               .meaning = "Time from the start of the evaluation period in which "
                                                          "observations count for no output measure. Shorter than "
                                                          "the period."}),
                           [](const RunConfig& config) { return validateWarmUp(config.period); })}}};
  return section;
}

const SettingSection<ValidationPeriod>& validationPeriodSection() {
  using Period = ValidationPeriod;
  static const SettingSection<ValidationPeriod> section{
      {"ObjectiveFunctions/VALIDATION_PERIODS/VALIDATION_n",
       "for each item",
       "A period that tests the calibration.",
       {setting<&Period::name>({.name = "Name",
                                .defaultValue = "''",
                                .meaning = "Unique name, in the columns of the result file, the log and the report; "
                                           "blank: its dates."}),
        setting<&Period::start>({.name = "Start_Date", .meaning = "Start of the period, inclusive."}),
        checked<Period>(setting<&Period::end>({.name = "End_Date",
                                               .meaning = "End of the period, inclusive; a date alone means its "
                                                          "00:00. Not before the start."}),
                        [](const Period& period) { return validateValidationPeriod(period); })}}};
  return section;
}

const SettingSection<OutputMeasure>& measureSection() {
  using Measure = OutputMeasure;
  static const SettingSection<OutputMeasure> section{withRows(
      {"ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_n",
       "for each item",
       "A comparison of a simulated with an observed series reduced to one number, or a number that the model wrote.",
       {setting<&Measure::name>(
            {.name = "Name", .type = KeywordType::name, .meaning = "Name, in messages and result files."}),
        setting<&Measure::displayName>({.name = "Display_Name",
                                        .type = KeywordType::freeText,
                                        .defaultValue = "''",
                                        .meaning = "What the values are, at the axes of the report. Without it, the "
                                                   "name of the item in the observed file.",
                                        .bearsOnResults = kNotOfResults}),
        setting<&Measure::unit>({.name = "Unit",
                                 .type = KeywordType::freeText,
                                 .defaultValue = "''",
                                 .meaning = "Unit of the values, in the report. Without it, the one that the observed "
                                            "file has for the item: behind its name in brackets, or as its `units`.",
                                 .bearsOnResults = kNotOfResults}),
        setting<&Measure::interfaceType>(
            {.name = "Interface_Type",
             .defaultValue = "0",
             .range = between(0, 1),
             .codes = kInterfaceTypeNames,
             .refusal = "Error: Interface type invalid for output measure ",
             .meaning = "0: a statistic of two time series. 1: a number that the model wrote to the output-measure "
                        "file."}),
        checked<Measure>(setting<&Measure::measurementNo>(
                             {.name = "MeasurementNo",
                              .defaultValue = "1",
                              .range = from(1),
                              .meaning = "Which number of the output-measure file; used with interface type 1.",
                              .checkOrder = 1}),
                         [](const Measure& measure) { return validateMeasurementNumber(measure); }),
        setting<&Measure::measurementName>({.name = "Measurement_Name",
                                            .defaultValue = "''",
                                            .meaning = "The name of the number in the instruction file of the "
                                                       "output-measure file, in place of its number."}),
        setting<&Measure::observedValue>(
            {.name = "Observed_Value",
             .defaultValue = "none",
             .meaning = "With interface type 1: the measure is the difference of the model's number to this, times "
                        "`Weight` or, if it is above 0, `Weight_Above`. Without it, the number itself."}),
        choice<Measure>(
            [](Measure& measure, const SetupValue& value) {
              const auto* code = std::get_if<std::int32_t>(&value);
              measure.statisticType =
                  code != nullptr ? StatisticType{*code} : findStatistic(std::get<std::string>(value)).value();
            },
            {.name = "Statistic_Type",
             .defaultValue = "0",
             .range = between(0, 4),
             .codes = statisticNames(),
             .refusal = "Error: Statistic type invalid for output measure ",
             .meaning = "Of the weighted differences simulated minus observed: 0 mean, 1 root mean square, 2 standard "
                        "deviation; weighted difference of 3 the largest, 4 the smallest values. Without a number: a "
                        "criterion of the pairs, of which the objective function gets what it lacks to its best "
                        "value, such as 1 - NSE."}),
        checked<Measure>(choice<Measure>(
                             [](Measure& measure, const SetupValue& value) {
                               measure.transformation = findTransformation(std::get<std::string>(value)).value();
                             },
                             {.name = "Transformation",
                              .defaultValue = "'none'",
                              .codes = kValueTransformationNames,
                              .meaning = "Of simulated and observed values before the statistic is computed."}),
                         [](const Measure& measure) { return validateValueTransformation(measure); }),
        setting<&Measure::epsilon>({.name = "Epsilon",
                                    .defaultValue = kNoDefault,
                                    .range = kNonNegative,
                                    .refusal = "Error: Epsilon invalid for output measure ",
                                    .unit = "of the series",
                                    .meaning = "Added to the values before a logarithm, an inverse or a power is "
                                               "taken. Without it, a hundredth of the mean of the observations."}),
        setting<&Measure::boxCoxLambda>({.name = "Box_Cox_Lambda",
                                         .defaultValue = "0.25",
                                         .meaning = "Exponent of the Box-Cox transformation; 0: the logarithm."}),
        // Deliberately the same text for both weights; the location below it shows which one is meant.
        setting<&Measure::weight>({.name = "Weight",
                                   .defaultValue = "1.0",
                                   .range = kNonNegative,
                                   .refusal = "Error: Weight invalid for output measure ",
                                   .meaning = "Weight of differences at or below 0; of what a statistic without a "
                                              "number contributes to the objective function."}),
        setting<&Measure::weightAbove>({.name = "Weight_Above",
                                        .defaultValue = "1.0",
                                        .range = kNonNegative,
                                        .refusal = "Error: Weight invalid for output measure ",
                                        .meaning = "Weight of differences above 0."}),
        setting<&Measure::functionName>({.name = "Function_Name",
                                         .defaultValue = "''",
                                         .meaning = "The objective function that the measure belongs to; if blank, the "
                                                    "measure is only reported."})},
       itemName<Measure>([](const Measure& measure) { return measure.name; })},
      pairingRows())};
  return section;
}

const SettingSection<OutputMeasure>& simulationFileSection() {
  static const SettingSection<OutputMeasure> section{
      withRows({"ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_n/SIMULATION_FILE", "for each measure of interface type 0",
                "The simulated series.",
                seriesKeywords(
                    [](auto& m) -> auto& { return m.simulation; },
                    "The simulated time-series file, in or below the base folder."),
                itemName<OutputMeasure>([](const OutputMeasure& measure) { return measure.name; })},
               listingKeywords())};
  return section;
}

const SettingSection<OutputMeasure>& observationFileSection() {
  using Measure = OutputMeasure;
  static const SettingSection<OutputMeasure> section = [] {
    std::vector<KeywordRow> keywords = seriesKeywords(
        [](auto& m) -> auto& { return m.observation; }, "The observed time-series file.");
    keywords.push_back(weightingItem(
        [](auto& w) -> auto& { return w.weightItem; }, "Weight_Item_No",
        "Item of the file with a weight for each observation, which multiplies its "
        "difference. One with the weight 0 or a missing one does not count."));
    keywords.push_back(weightingItemName(
        [](auto& w) -> auto& { return w.weightName; }, "Weight_Item_Name", "Weight_Item_No"));
    keywords.push_back(weightingItem(
        [](auto& w) -> auto& { return w.errorItem; }, "Error_Item_No",
        "Item with a standard error for each observation: its weight is 1 over that. Not "
        "with `Weight_Item_No`."));
    keywords.push_back(weightingItemName(
        [](auto& w) -> auto& { return w.errorName; }, "Error_Item_Name", "Error_Item_No"));
    keywords.push_back(weightingItem(
        [](auto& w) -> auto& { return w.qualityItem; }, "Quality_Item_No",
        "Item with a quality code, a number, for each observation; those without one count in full."));
    keywords.push_back(weightingItemName(
        [](auto& w) -> auto& { return w.qualityName; }, "Quality_Item_Name", "Quality_Item_No"));
    keywords.push_back(setting<Measure>([](auto& m) -> auto& { return m.weighting.leftOut; },
                                        {.name = "Quality_Left_Out",
                                         .defaultValue = kNoDefault,
                                         .meaning = "Codes of observations that do not count."}));
    keywords.push_back(setting<Measure>([](auto& m) -> auto& { return m.weighting.downWeighted; },
                                        {.name = "Quality_Down_Weighted",
                                         .defaultValue = kNoDefault,
                                         .meaning = "Codes of observations whose weight is multiplied by "
                                                    "`Quality_Weight`."}));
    keywords.push_back(checked<Measure>(
        setting<Measure>([](auto& m) -> auto& { return m.weighting.qualityWeight; },
                         {.name = "Quality_Weight",
                          .defaultValue = "0.5",
                          .range = kPositive,
                          .refusal = "Error: Weight invalid for output measure ",
                          .meaning = "The factor of these, greater than 0 and less than 1. Differences are multiplied "
                                     "by it, squares by its square."}),
        [](const Measure& measure) { return validateWeighting(measure); }));
    return SettingSection<OutputMeasure>{{"ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_n/OBSERVATION_FILE",
                                          "for each measure of interface type 0", "The observed series.",
                                          std::move(keywords),
                                          itemName<Measure>([](const Measure& measure) { return measure.name; })}};
  }();
  return section;
}

const SettingSection<SeriesReference>& shownAboveSection() {
  static const SettingSection<SeriesReference> section{withRows(
      {"ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_n/SHOWN_ABOVE",
       "for each measure that has it",
       "A series, such as precipitation, that the report draws above the hydrograph, from the top down. It is not "
       "compared with anything.",
       {setting<&SeriesReference::fileName>({.name = "File_Name",
                                             .type = KeywordType::fileName,
                                             .defaultValue = "''",
                                             .meaning = "Its time-series file; blank: none.",
                                             .bearsOnResults = kNotOfResults}),
        setting<&SeriesReference::itemNo>({.name = "Item_No",
                                           .defaultValue = "1",
                                           .meaning = "Which item of the file, from 1.",
                                           .bearsOnResults = kNotOfResults}),
        setting<&SeriesReference::itemName>({.name = "Item_Name",
                                             .defaultValue = kNoDefault,
                                             .meaning = std::string(kItemNameMeaning),
                                             .bearsOnResults = kNotOfResults})}},
      textFormRows<SeriesReference>(
          [](auto& s) -> auto& { return s.form; }, kNotOfResults))};
  return section;
}

const SettingSection<ObjectiveSection>& objectiveSection() {
  using Section = ObjectiveSection;
  static const SettingSection<Section> section{
      {"ObjectiveFunctions/OBJECTIVE_FUNCTIONS/OBJECTIVE_n",
       "for each item",
       "An objective function over the output measures that name it.",
       {checked<Section>(setting<Section>([](auto& s) -> auto& { return s.function.name; },
                                          {.name = "Name",
                                           .type = KeywordType::name,
                                           .meaning = "Unique name, by which output measures refer to it.",
                                           .checkOrder = 1}),
                         [](const Section& s) { return validateObjectiveFunction(s.function, s.names); }),
        setting<Section>(
            [](auto& s) -> auto& { return s.function.functionType; },
            {.name = "Function_Type",
             .defaultValue = "0",
             .range = between(0, 2),
             .codes = kFunctionTypeNames,
             .refusal = "Error: Function type invalid for objective function ",
             .meaning = "Over its output measures: 0 sum of the values, 1 of the absolute values, 2 of the squares."}),
        setting<Section>([](auto& s) -> auto& { return s.function.weight; },
                         {.name = "Weight",
                          .defaultValue = "1.0",
                          .range = kNonNegative,
                          .refusal = "Error: Weight invalid for objective function ",
                          .meaning = "Weight in the aggregate."}),
        setting<Section>(
            [](auto& s) -> auto& { return s.function.standardDeviation; },
            {.name = "Standard_Deviation",
             .defaultValue = kNoDefault,
             .range = kPositive,
             .refusal = "Error: Standard deviation invalid for objective function ",
             .unit = "of the function",
             .meaning = "Scale of the transformation of aggregation methods 1 and 2. Without it, that of the search's "
                        "initial sample.",
             .checkOrder = 2}),
        setting<Section>(
            [](auto& s) -> auto& { return s.function.location; },
            {.name = "Location",
             .defaultValue = kNoDefault,
             .unit = "of the function",
             .meaning =
                 "Location of the transformation: added after the division by the standard deviation (method 1), "
                 "or the mean (method 2). Without it, from the search's initial sample."})},
       itemName<Section>([](const Section& s) { return s.function.name; })}};
  return section;
}

const SettingSection<SavedOutputFile>& savedFileSection() {
  static const SettingSection<SavedOutputFile> section{
      {"SAVE_OUTPUT_FILES/OUTPUT_FILE_n",
       "for each item",
       "A file to keep.",
       {setting<&SavedOutputFile::fileName>({.name = "File_name",
                                             .type = KeywordType::fileName,
                                             .meaning = "A file that the model writes, in or below the base folder.",
                                             .bearsOnResults = kNotOfResults})}}};
  return section;
}

const SettingSection<RunConfig>& measureFileSection() {
  static const SettingSection<RunConfig> section{
      {"ObjectiveFunctions/OUTPUT_MEASURES/OUTPUT_MEASURE_FILE",
       "always",
       "The file from which measures of interface type 1 take their numbers, and the first of several.",
       {setting<&RunConfig::measureFile>(
            {.name = "File_Name",
             .type = KeywordType::fileName,
             .defaultValue = "''",
             .meaning = "In or below the base folder; required where a measure has interface type 1, otherwise "
                        "without effect."}),
        setting<&RunConfig::instructionFile>(
            {.name = "Instruction_File",
             .type = KeywordType::fileName,
             .defaultValue = "''",
             .meaning = "A file (`pif`) that says where in the output-measure file the numbers are. Without it, the "
                        "file has numbers alone. Read if a measure has interface type 1."})}}};
  return section;
}

const SettingSection<MeasureFileSource>& furtherMeasureFileSection() {
  static const SettingSection<MeasureFileSource> section{
      {"ObjectiveFunctions/OUTPUT_MEASURES/FURTHER_FILES/FURTHER_FILE_n",
       "for each item",
       "A file that the model writes, or another reading of one. Its numbers are counted on behind those of the files "
       "before it, and its names differ from theirs.",
       {setting<&MeasureFileSource::fileName>(
            {.name = "File_Name", .type = KeywordType::fileName, .meaning = "In or below the base folder."}),
        setting<&MeasureFileSource::instructionFile>(
            {.name = "Instruction_File",
             .type = KeywordType::fileName,
             .meaning = "A file (`pif`) that says where in the file the numbers are."})}}};
  return section;
}

}  // namespace mirevo
