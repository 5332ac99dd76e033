#pragma once

#include <string>

namespace mirevo::bench {

/// Writes beside the setup what its search would leave if it were killed after `evaluations` of them: an analytic
/// function stands for the model.
void leaveInterruptedSearch(const std::string& setup, int evaluations);

}  // namespace mirevo::bench
