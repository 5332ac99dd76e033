#include "run/tasks/tasks.h"

#include <array>

#include "run/tasks/optimisation_task.h"
#include "run/tasks/scenario_task.h"
#include "run/tasks/sensitivity_task.h"
#include "run/tasks/uncertainty_task.h"

namespace mirevo {
namespace {

template <class Form>
std::unique_ptr<Task> makeOne() {
  return std::make_unique<Form>();
}

/// All tasks; a new one is added here.
constexpr std::array kTasks = {makeOne<ScenarioTask>, makeOne<SensitivityTask>, makeOne<OptimisationTask>,
                               makeOne<UncertaintyTask>};

}  // namespace

std::vector<std::unique_ptr<Task>> allTasks() {
  std::vector<std::unique_ptr<Task>> tasks;
  tasks.reserve(kTasks.size());
  for (const auto& make : kTasks) tasks.push_back(make());
  return tasks;
}

std::span<const CodeName> taskNames() {
  static const auto names = [] {
    std::array<CodeName, kTasks.size()> all;
    for (std::size_t i = 0; i < all.size(); ++i) all[i] = kTasks[i]()->facts().name;
    return all;
  }();
  return names;
}

std::unique_ptr<Task> makeTask(const SetupValue& value) {
  for (const auto& make : kTasks) {
    auto task = make();
    if (isCode(task->facts().name, value)) return task;
  }
  return nullptr;
}

}  // namespace mirevo
