#pragma once

#include <string_view>
#include <vector>

#include "common/settings/keyword_row.h"
#include "run/setup/run_config.h"
#include "run/setup/validation.h"

namespace mirevo {

// The sections that describe the model, its parameters and the assessment of its runs, with their keywords.

/// An objective function, and the names of the previous ones.
struct ObjectiveSection {
  ObjectiveFunction& function;
  NamesUsed& names;
};

/// Keywords of an output measure that leave observations out, and those that say what the others are compared with.
inline constexpr std::string_view kSelectionKeywords[] = {"Start_Date", "End_Date", "Months", "Lowest_Observed",
                                                          "Highest_Observed"};
inline constexpr std::string_view kMatchingKeywords[] = {"Time_Match", "Time_Offset", "Day_Begins", "Day_Stamp"};

const SettingSection<BatchItem>& batchItemSection();
const SettingSection<ParameterFileItem>& parameterFileSection();
const SettingSection<ModelParameter>& keyLinesSection();
const SettingSection<ModelParameter>& parameterSection();
const SettingSection<InternalConstraint>& constraintSection();
const SettingSection<RunConfig>& judgementSection();
const SettingSection<ValidationPeriod>& validationPeriodSection();
const SettingSection<OutputMeasure>& measureSection();
const SettingSection<OutputMeasure>& simulationFileSection();
const SettingSection<OutputMeasure>& observationFileSection();
const SettingSection<SeriesReference>& shownAboveSection();
const SettingSection<ObjectiveSection>& objectiveSection();
const SettingSection<SavedOutputFile>& savedFileSection();
const SettingSection<RunConfig>& measureFileSection();
const SettingSection<MeasureFileSource>& furtherMeasureFileSection();

/// The section of a list, which has only its count. `path` is below the target.
const SectionRow& listSection(std::string_view path);

}  // namespace mirevo
