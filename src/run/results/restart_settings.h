#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "run/setup/run_config.h"

namespace mirevo {

/// The content of a file that affects the results, as a checksum.
struct FileMark {
  std::string section;  ///< section of the keyword that names the file
  std::string keyword;
  std::string name;         ///< as in ResultSetting::value
  std::uint64_t size = 0;   ///< bytes
  std::uint64_t check = 0;  ///< checksum of the content; 0, like the size, for a file that is not there
};

/// All that the results of a run depend on, except the model itself. It is kept beside the results, so that a run is
/// not continued with other settings.
struct RestartSettings {
  std::string program;  ///< the version that wrote them; empty: 0.1.0, which did not say it
  std::vector<ResultSetting> settings;
  std::vector<FileMark> files;
  std::vector<EarlierSearch> searches;
};

/// The settings of this run. Reads the files that the setup names as batch, template, observation, instruction and
/// initial sample.
RestartSettings restartSettings(const RunConfig& config);

std::string formatRestartSettings(const RestartSettings& settings);
/// Empty for a text that is not such a file or is cut off. In one of a later version lines may be unknown.
std::optional<RestartSettings> parseRestartSettings(std::string_view text);

/// Whether the version is a later one than this program's, which may then not know all that is in its files.
bool isLaterVersion(std::string_view version);

/// What has changed, one line each, "Upper_Bound of PARAMETER_3 (X3): 1200 then, 1000 now"; a raised budget of a search
/// (`Max_No_Evaluations`) is not a change.
std::vector<std::string> changedSettings(const RestartSettings& then, const RestartSettings& now);

/// Why repetitions of a search cannot be added where they go on side by side, and what to do instead; empty if none
/// are.
std::string repetitionsRemedy(const RestartSettings& then, const RestartSettings& now);

/// The budget of a search or of Markov chains; empty for another task.
std::optional<int> searchBudget(const RestartSettings& settings);
/// The number of its repetitions; 1 of one that is not repeated.
int searchRepetitions(const RestartSettings& settings);

}  // namespace mirevo
