#pragma once

#include <memory>
#include <vector>

#include "common/settings/choice_table.h"
#include "run/tasks/task.h"

namespace mirevo {

/// All tasks, each in its first form.
const ChoiceTable<Task>& tasks();

/// The further forms of tasks, with the default settings. Task::sections() of one are those that the first form lacks.
std::vector<std::unique_ptr<Task>> furtherTaskForms();

/// The form of `task` that the setup selects; nullptr if it is the first one. `target` holds the sections.
std::unique_ptr<Task> selectedForm(const Task& task, const SetupSection& target);

}  // namespace mirevo
