#pragma once

#include "common/settings/choice_table.h"
#include "run/tasks/task.h"

namespace mirevo {

/// All tasks.
const ChoiceTable<Task>& tasks();

}  // namespace mirevo
