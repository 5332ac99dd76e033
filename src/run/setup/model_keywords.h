#pragma once

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

const SettingSection<BatchItem>& batchItemSection();
const SettingSection<ParameterFileItem>& parameterFileSection();
const SettingSection<ModelParameter>& keyLinesSection();
const SettingSection<ModelParameter>& parameterSection();
const SettingSection<InternalConstraint>& constraintSection();
const SettingSection<RunConfig>& judgementSection();
const SettingSection<ValidationPeriod>& validationPeriodSection();
const SettingSection<OutputMeasure>& measureSection();
const SettingSection<SeriesReference>& simulationFileSection();
const SettingSection<SeriesReference>& observationFileSection();
const SettingSection<ObjectiveSection>& objectiveSection();
const SettingSection<SavedOutputFile>& savedFileSection();
const SettingSection<RunConfig>& measureFileSection();

/// The section of a list, which has only its count. `path` is below the target.
const SectionRow& listSection(std::string_view path);

}  // namespace mirevo
