#include "run/tasks/analysis_names.h"

namespace mirevo {

AnalysisNames analysisNames(const TaskContext& context) {
  AnalysisNames names{context.space.names, {}, {}, validationNames(context.measures, context.validationPeriods)};
  for (const OutputMeasure& measure : context.measures) names.measures.push_back(measure.name);
  for (const ObjectiveFunction& objective : context.objectives) names.objectives.push_back(objective.name);
  return names;
}

void logReport(const TaskContext& context, std::span<const std::string> report) {
  context.log.line("");
  for (const std::string& line : report) context.log.reportLine(line);
}

void addNotes(std::span<const std::string> warnings, std::vector<std::string>& report) {
  if (!warnings.empty()) report.emplace_back();
  for (const std::string& text : warnings) report.push_back("Note: " + text);
}

}  // namespace mirevo
