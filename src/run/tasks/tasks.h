#pragma once

#include <memory>
#include <span>
#include <vector>

#include "run/tasks/task.h"

namespace mirevo {

/// The names of all tasks, those with a number first.
std::span<const CodeName> taskNames();
/// The task with this number or name, with the default settings; nullptr when there is none.
std::unique_ptr<Task> makeTask(const SetupValue& value);
/// One of each task, for the manual.
std::vector<std::unique_ptr<Task>> allTasks();

}  // namespace mirevo
