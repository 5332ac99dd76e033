#include "run/tasks/tasks.h"

#include "run/tasks/optimisation_task.h"
#include "run/tasks/scenario_task.h"
#include "run/tasks/sensitivity_task.h"
#include "run/tasks/uncertainty_task.h"

namespace mirevo {

const ChoiceTable<Task>& tasks() {
  /// A new task is added here.
  static const auto all = ChoiceTable<Task>::of<ScenarioTask, SensitivityTask, OptimisationTask, UncertaintyTask>();
  return all;
}

}  // namespace mirevo
