#pragma once

#include <cstdlib>
#include <string>
#include <sys/stat.h>
#include <vector>

#include <fmt/format.h>

#include "integration/program_runner.h"

namespace mirevo::testing {

/// The settings of a run with the small test model; what a test does not name is a short, sound calibration.
struct RunSettings {
  int option = 2;
  int algorithm = 2;
  std::string search = {};  ///< by its name, instead of `algorithm`
  bool usesSurrogate = false;
  bool includesInitial = true;  ///< the initial set in a search's sample
  int aggregation = 0;
  int maxEvaluations = 40;                  ///< also the sample size of an uncertainty analysis
  std::vector<std::string> scenarios = {};  ///< values of a, b and c, "1, 2, 3"; none: a single run
  int slots = 1;
  int restart = 0;
  std::string modelArguments = {};
  std::string batchFile = "model/run.sh";
  std::string savedFile = {};  ///< an output file that is kept of every evaluation; none when empty
  std::string processFolder = {};

  const char* resultFile() const {
    return option == 2 ? "basin_Optimisation.dat" : option == 1 ? "basin_Sensitivity.dat" : "basin.dat";
  }
};

/// Scenarios with a from 0 to 9 and b from 0 to 4.
inline std::vector<std::string> scenarios(int count) {
  std::vector<std::string> values;
  for (int i = 0; i < count; ++i) values.push_back(fmt::format("{}, {}, 1", 9.0 * i / count, 4.0 * i / count));
  return values;
}

/// A folder with the model, its observations (made with a = 5, b = 2, c = 1) and a setup file `basin.kdx`. Parameters:
/// `a` in [0, 10] from 4, `b` in [0, 5] from 1, `c` fixed at 1; one measure, the root mean square error.
class ModelFolder : public TemporaryFolder {
 public:
  ModelFolder() {
    useScript("");
    write("model/parameters.txt", "a = 5\nb = 2\nc = 1\n");
    write("model/parameters.tpl", "!\na = !a              !\nb = !b              !\nc = !c              !\n");
    const std::string command = fmt::format("cd '{}/model' && ./run.sh && cp simulated.csv ..", path());
    if (std::system(command.c_str()) != 0) throw std::runtime_error("the test model does not run");
    std::filesystem::rename(*this / "simulated.csv", *this / "observed.csv");
  }

  /// Writes `basin.kdx` and returns its path.
  std::string writeSetup(const RunSettings& settings) const { return write("basin.kdx", setupText(settings)); }
  /// Waits until the file holds a process id, and returns that.
  int waitForProcess(const std::string& name) const {
    EXPECT_TRUE(waitUntil([&] { return exists(name) && read(name).ends_with("\n"); })) << read("basin.log");
    return std::atoi(read(name).c_str());
  }
  /// Waits until the file holds the text.
  bool reaches(const std::string& file, const std::string& text) const {
    return waitUntil([&] { return read(file).find(text) != std::string::npos; });
  }
  /// The process of the run, as its message file tells it.
  int runsProcess() const {
    const std::string records = read("basin._spi_");
    return std::atoi(records.c_str() + records.find(", process ") + 10);
  }
  /// The process folder with that number in a folder, relative to this one; empty when there is none.
  std::string processFolder(const std::string& parent, int number) const {
    for (const auto& entry : std::filesystem::directory_iterator(*this / parent)) {
      const std::string name = entry.path().filename().string();
      if (name.starts_with("basin") && name.ends_with(fmt::format("_Process{}", number))) return parent + "/" + name;
    }
    return {};
  }
  /// The model's script, with `lines` before the model proper.
  void useScript(const std::string& lines) const {
    write("model/run.sh", fmt::format("#!/bin/sh\n{}\nexec {} \"$@\"\n", lines, MIREVO_TEST_MODEL), 0755);
  }
  /// Replaces a text in `basin.kdx`, which must hold it.
  void editSetup(const std::string& from, const std::string& to) const {
    std::string text = read("basin.kdx");
    const auto at = text.find(from);
    ASSERT_NE(at, std::string::npos) << from;
    write("basin.kdx", text.replace(at, from.size(), to));
  }

  /// Adds to `basin.kdx` a second measure, like the first one but for its name and with `keywords`.
  void addMeasure(const std::string& name, const std::string& keywords) const {
    const std::string text = read("basin.kdx");
    const std::string end = "[/MEASURE_1]\n";
    const std::size_t begin = text.find("[MEASURE_1]");
    const std::size_t behind = text.find(end) + end.size();
    std::string added = text.substr(begin, behind - begin);
    for (const auto at : {added.rfind('1'), added.find('1')}) added[at] = '2';
    added.replace(added.find("'flow'"), 6, fmt::format("'{}'\n{}", name, keywords));
    write("basin.kdx", text.substr(0, behind) + added + text.substr(behind));
    editSetup("[OUTPUT_MEASURES]\n      TqSEKdxListItemCount = 1", "[OUTPUT_MEASURES]\n      TqSEKdxListItemCount = 2");
  }
  /// Adds to `basin.kdx` a second objective function, 'other', that judges the same series by observations of another
  /// set, a = 7 and b = 1: what is gained at one is lost at the other.
  void addOtherObjective() const {
    if (!exists("other.csv")) {
      const std::string before = read("model/parameters.txt");
      write("model/parameters.txt", "a = 7\nb = 1\nc = 1\n");
      EXPECT_EQ(
          std::system(
              fmt::format("cd '{}/model' && {} && cp simulated.csv ../other.csv", path(), MIREVO_TEST_MODEL).c_str()),
          0);
      write("model/parameters.txt", before);
    }
    addMeasure("flow of another", "");
    std::string text = read("basin.kdx");
    const auto second = text.find("[MEASURE_2]");
    text.replace(text.find("'fit'", second), 5, "'other'");
    text.replace(text.find("observed.csv", second), 12, "other.csv");
    write("basin.kdx", text);
    editSetup("[OBJECTIVE_FUNCTIONS]\n      TqSEKdxListItemCount = 1",
              "[OBJECTIVE_FUNCTIONS]\n      TqSEKdxListItemCount = 2\n      [OBJECTIVE_2]\n        Name = 'other'\n"
              "        Function_Type = 0\n        Weight = 1.0\n      [/OBJECTIVE_2]");
  }

 private:
  /// tests/integration/basin.kdx, where the fields stand in braces by their names here.
  static std::string setupText(const RunSettings& settings) {
    std::ifstream file(MIREVO_SOURCE_DIR "/tests/integration/basin.kdx");
    const std::string form(std::istreambuf_iterator<char>(file), {});
    std::string scenarios;
    for (std::size_t i = 0; i < settings.scenarios.size(); ++i) {
      scenarios += fmt::format("      [SCENARIO_{0}]\n        Parameters = {1}\n      [/SCENARIO_{0}]\n", i + 1,
                               settings.scenarios[i]);
    }
    const std::string surrogate =
        settings.usesSurrogate
            ? "    Use_Surrogate_Model = 1\n    [SURROGATE_MODEL_PARAMETERS]\n      Neighbourhood_Size = "
              "18\n      No_Initial_Generations = 2\n    [/SURROGATE_MODEL_PARAMETERS]\n"
            : "    Use_Surrogate_Model = 0\n";
    const std::string search =
        settings.search.empty() ? fmt::format("{}", settings.algorithm) : fmt::format("'{}'", settings.search);
    const bool saves = !settings.savedFile.empty();
    const std::string savedFiles =
        fmt::format("    [OUTPUT_FILE_1]\n      File_name = '{}'\n    [/OUTPUT_FILE_1]\n", settings.savedFile);
    return fmt::format(fmt::runtime(form), fmt::arg("option", settings.option), fmt::arg("algorithm", search),
                       fmt::arg("surrogate", surrogate), fmt::arg("includesInitial", settings.includesInitial),
                       fmt::arg("aggregation", settings.aggregation),
                       fmt::arg("maxEvaluations", settings.maxEvaluations), fmt::arg("slots", settings.slots),
                       fmt::arg("restart", settings.restart), fmt::arg("modelArguments", settings.modelArguments),
                       fmt::arg("batchFile", settings.batchFile), fmt::arg("processFolder", settings.processFolder),
                       fmt::arg("savedCount", saves ? 1 : 0), fmt::arg("savedFiles", saves ? savedFiles : ""),
                       fmt::arg("scenarioType", scenarios.empty() ? 0 : 1),
                       fmt::arg("scenarioCount", settings.scenarios.size()), fmt::arg("scenarios", scenarios));
  }
};

/// A line of a model script that takes 0 to 30 ms, told by the parameter values alone: model runs side by side end in
/// another order than they began.
inline constexpr const char* kSleepByParameters = "sleep 0.0$(($(cksum <parameters.txt | cut -d ' ' -f 1) % 4))";

inline int occurrences(const std::string& text, const std::string& wanted) {
  int count = 0;
  for (auto at = text.find(wanted); at != std::string::npos; at = text.find(wanted, at + 1)) ++count;
  return count;
}

/// Everything in a result file but when the run was started and ended.
inline std::string withoutDates(const std::string& results) {
  std::string kept;
  std::istringstream lines(results);
  for (std::string line; std::getline(lines, line);) {
    const bool isDate =
        line.starts_with("# Started: ") || line.starts_with("# Restarted: ") || line.starts_with("# Ended: ");
    if (!isDate) kept += line + "\n";
  }
  return kept;
}

}  // namespace mirevo::testing
