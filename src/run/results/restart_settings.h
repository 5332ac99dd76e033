#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "run/setup/run_config.h"

namespace mirevo {

/// What a file that bears on the results held.
struct FileMark {
  std::string section;  ///< of the keyword that names it
  std::string keyword;
  std::string name;         ///< as in ResultSetting::value
  std::uint64_t size = 0;   ///< bytes
  std::uint64_t check = 0;  ///< checksum of the content; 0, with a size of 0, for one that is not there
};

/// All that the results of a run depend on, the model itself apart: it stands beside the results, so that a run is not
/// taken up again with other settings.
struct RestartSettings {
  std::vector<ResultSetting> settings;
  std::vector<FileMark> files;
  std::vector<EarlierSearch> searches;
};

/// The settings of this run. Reads the files that the setup names as batch, template, observation and initial sample.
RestartSettings restartSettings(const RunConfig& config);

std::string formatRestartSettings(const RestartSettings& settings);
/// Nothing for a text that is no such file, or was cut off.
std::optional<RestartSettings> parseRestartSettings(std::string_view text);

/// What has changed, one line each, "Upper_Bound of PARAMETER_3 (X3): 1200 then, 1000 now"; the budget of a search
/// (`Max_No_Evaluations`) apart where it was raised.
std::vector<std::string> changedSettings(const RestartSettings& then, const RestartSettings& now);

/// The budget of a search; nothing for another task.
std::optional<int> searchBudget(const RestartSettings& settings);

}  // namespace mirevo
