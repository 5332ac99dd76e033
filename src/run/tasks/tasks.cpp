#include "run/tasks/tasks.h"

#include "run/tasks/dream_task.h"
#include "run/tasks/glue_task.h"
#include "run/tasks/morris_task.h"
#include "run/tasks/optimisation_task.h"
#include "run/tasks/scenario_task.h"
#include "run/tasks/sensitivity_task.h"
#include "run/tasks/sobol_task.h"
#include "run/tasks/uncertainty_task.h"

namespace mirevo {
namespace {

template <class... Forms>
std::vector<std::unique_ptr<Task>> oneOfEach() {
  std::vector<std::unique_ptr<Task>> all;
  (all.push_back(std::make_unique<Forms>()), ...);
  return all;
}

}  // namespace

const ChoiceTable<Task>& tasks() {
  /// A new task is added here.
  static const auto all = ChoiceTable<Task>::of<ScenarioTask, SensitivityTask, OptimisationTask, UncertaintyTask>();
  return all;
}

std::vector<std::unique_ptr<Task>> furtherTaskForms() {
  /// A new form of a task is added here, and its name to the codes of the keyword that selects it.
  return oneOfEach<MorrisTask, SobolTask, GlueTask, DreamTask>();
}

std::unique_ptr<Task> selectedForm(const Task& task, const SetupSection& target) {
  const TaskForm& first = task.facts().form;
  if (first.section.empty()) return nullptr;
  const auto selected = target.peek(first.section, first.keyword);
  if (!selected) return nullptr;
  for (std::unique_ptr<Task>& other : furtherTaskForms()) {
    const TaskFacts& facts = other->facts();
    if (facts.name.name == task.facts().name.name && isCode(facts.form.name, *selected)) return std::move(other);
  }
  return nullptr;
}

}  // namespace mirevo
