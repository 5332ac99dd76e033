#include <algorithm>
#include <cctype>
#include <sstream>
#include <utility>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/checksum.h"
#include "integration/program_runner.h"
#include "matchers.h"

// Results of released versions, made by tests/compatibility/make: a run that ended and one that was killed of each task
// and search.
namespace mirevo::testing {
namespace {

namespace fs = std::filesystem;

const fs::path kReleased = MIREVO_SOURCE_DIR "/tests/compatibility";

/// "0.2.0/DDS" and the like.
std::vector<std::string> keptCases() {
  std::vector<std::string> cases;
  for (const auto& entry : fs::recursive_directory_iterator(kReleased)) {
    if (entry.path().filename() == "killed") cases.push_back(fs::relative(entry.path().parent_path(), kReleased));
  }
  std::sort(cases.begin(), cases.end());
  return cases;
}

class Compatibility : public ::testing::TestWithParam<std::string> {
 protected:
  Compatibility() {
    for (const char* name : {"model", "observed.csv"}) {
      fs::copy(kept_.parent_path() / name, folder_ / name, fs::copy_options::recursive);
    }
    fs::create_symlink(MIREVO_TEST_MODEL, folder_ / "test_model");
    take(kept_);
  }
  /// Puts kept files beside the setup, as the version left them.
  void take(const fs::path& from) const {
    for (const auto& entry : fs::directory_iterator(from)) {
      if (entry.is_regular_file()) fs::copy(entry, folder_.path(), fs::copy_options::overwrite_existing);
    }
  }
  /// The lines on which programs may rely: without times, the version and warnings, and with the folder's kept name.
  using Line = std::pair<int, std::string>;  ///< with its number in the file
  std::vector<Line> lines(std::string text) const {
    const std::string keptFolder = "/models/" + kept_.filename().string();
    for (std::size_t at = 0; (at = text.find(folder_.path(), at)) != std::string::npos;) {
      text.replace(at, folder_.path().size(), keptFolder);
    }
    std::vector<Line> lines;
    std::istringstream stream(text);
    int number = 0;
    for (std::string line; std::getline(stream, line);) {
      ++number;
      const bool isOfTheRun = std::ranges::any_of(
          std::initializer_list<const char*>{"# Mirevo ", "# What the results ",
                                             "# Started: ", "# Restarted: ", "# Ended: ", "program\t", "Program\t",
                                             "started\t", "restarted\t", "ended\t", "warning"},
          [&line](const char* beginning) { return line.starts_with(beginning); });
      if (!isOfTheRun) lines.emplace_back(number, line);
    }
    return lines;
  }

  /// The table of checksums that is there now, with those that its rows would have without columns that the kept file
  /// of results does not have.
  std::string checksumsOfThen(const fs::path& file) const {
    const auto cellCount = [](const std::string& line) { return std::count(line.begin(), line.end(), '\t') + 1; };
    std::string results = file.filename();
    results.erase(results.find("_Checksums"), std::string_view("_Checksums").size());
    std::istringstream then(TemporaryFolder::readFile(file.parent_path() / results));
    std::istringstream now(folder_.read(results));
    std::string line;
    while (std::getline(then, line) && line.starts_with('#')) {
    }
    const auto count = cellCount(line);
    std::string table = folder_.read(file.filename());
    while (std::getline(now, line)) {
      if (line.starts_with('#') || cellCount(line) <= count) continue;
      const auto rowOf = [&line] {
        return fmt::format("\n{}\t{:016x}\n", line.substr(0, line.find('\t')), checksumOf(line));
      };
      const std::string row = rowOf();
      while (cellCount(line) > count) line.resize(line.rfind('\t'));
      if (const auto at = table.find(row); at != std::string::npos) table.replace(at, row.size(), rowOf());
    }
    return table;
  }

  /// Where what is there now differs from a kept file; empty if nowhere. A later version may add settings and keys,
  /// columns behind the last one, pairs of further evaluations, and lines for people.
  std::string difference(const fs::path& file) const {
    const std::string name = file.filename();
    const bool mayHaveMore =
        name.ends_with("_Restart.dat") || name.ends_with("_Run.dat") || name.ends_with("_Pairs.dat");
    const std::vector<Line> found =
        lines(name.ends_with("_Checksums.dat") ? checksumsOfThen(file) : folder_.read(name));
    std::size_t next = 0;
    const auto isAdded = [&](const std::string& line) { return mayHaveMore || line.starts_with('#'); };
    const auto holds = [](const std::string& line, const std::string& expected) {
      return line == expected || (!line.starts_with('#') && line.starts_with(expected + '\t'));
    };
    for (const auto& [number, expected] : lines(TemporaryFolder::readFile(file))) {
      const std::size_t at = next;
      while (next < found.size() && !holds(found[next].second, expected) && isAdded(found[next].second)) ++next;
      if (next >= found.size() || !holds(found[next].second, expected)) {
        return fmt::format("{}:{}:\n   {}\n   {}\n", file.string(), number, expected,
                           at < found.size() ? found[at].second : "(no line)");
      }
      ++next;
    }
    while (next < found.size() && isAdded(found[next].second)) ++next;
    if (next == found.size()) return {};
    return fmt::format("{}: more lines than then:\n   {}\n", file.string(), found[next].second);
  }

  TemporaryFolder folder_;
  fs::path kept_ = kReleased / GetParam();
  std::string setup_ = folder_ / "basin.kdx";
};

TEST_P(Compatibility, AKilledRunOfAnEarlierVersionGoesOnToTheSameResults) {
  take(kept_ / "killed");
  const ProgramResult result = runProgram({setup_});
  std::string differences = result.exitCode == 0 ? "" : result.error;
  for (const fs::path& part : {kept_, kept_ / "finished"}) {
    for (const auto& entry : fs::directory_iterator(part)) {
      if (entry.path().extension() == ".csv" || (entry.path().extension() == ".dat" && entry.path().stem() != "notes"))
        differences += difference(entry);
    }
  }
  EXPECT_THAT(folder_.read("basin.log"), HasSubstr(" evaluations are taken from " + folder_.path()));
  EXPECT_EQ(differences, "") << "The files were made with "
                             << TemporaryFolder::readFile(kept_.parent_path() / "machine")
                             << "Where another machine or library rounds otherwise, the last digits differ, or the "
                                "restart is refused for other parameter values.";
}

TEST_P(Compatibility, AReportOfResultsOfAnEarlierVersionHasTheSameNotes) {
  take(kept_ / "finished");
  const ProgramResult result = RunningProgram({setup_}, {}, MIREVO_REPORT).wait();
  ASSERT_EQ(result.exitCode, 0) << result.error;
  const std::string page = folder_.read("basin_Report.html");
  const std::size_t notes = page.find("\"notes\":[");
  ASSERT_NE(notes, std::string::npos);
  EXPECT_EQ(lines(page.substr(notes, page.find(']', notes) + 1 - notes)), lines(folder_.read("notes.dat")));
}

/// A keyword that was required may have a default since.
TEST(CompatibilityOfSetups, KeywordsTheirDefaultsAndNamesOfValuesStay) {
  const std::string reference = TemporaryFolder::readFile(MIREVO_SOURCE_DIR "/docs/setup-reference.md");
  for (const auto& version : fs::directory_iterator(kReleased)) {
    if (!version.is_directory()) continue;
    std::ifstream keywords(version.path() / "keywords");
    std::string section;
    for (std::string line; std::getline(keywords, line);) {
      if (line.starts_with("## ")) {
        const std::size_t at = reference.find("\n" + line + "\n");
        ASSERT_NE(at, std::string::npos) << version << ": " << line;
        section = reference.substr(at, reference.find("\n## ", at + 1) - at);
      } else {
        EXPECT_NE(section.find("\n" + line), std::string::npos)
            << version << ": " << section.substr(1, 60) << " ... " << line;
      }
    }
    EXPECT_NE(section, "") << version;
  }
}

class CompatibilityOfLaterVersions : public Compatibility {};

TEST_P(CompatibilityOfLaterVersions, ResultsOfALaterVersionAreRefusedByItsName) {
  take(kept_ / "killed");
  for (const auto& entry : fs::directory_iterator(folder_.path())) {
    const std::string name = entry.path().filename();
    if (!name.ends_with("_Restart.dat") && !name.ends_with("_Run.dat")) continue;
    std::string text = folder_.read(name);
    const std::size_t at = text.find("rogram\t") + 7;
    folder_.write(name, text.replace(at, text.find('\n', at) - at, "99.0.0\nNovelty\tits value"));
  }
  const auto results = [this] { return folder_.read("basin.dat") + folder_.read("basin_Optimisation.dat"); };
  const std::string before = results();
  const ProgramResult result = runProgram({setup_});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.error, HasSubstr("Error: Unable to continue the earlier run\nits results are of Mirevo 99.0.0"));
  EXPECT_EQ(results(), before);
  EXPECT_EQ(RunningProgram({setup_}, {}, MIREVO_REPORT).wait().exitCode, 0);
  EXPECT_THAT(folder_.read("basin_Report.html"), HasSubstr("The results are of Mirevo 99.0.0, a later version"));
}

const auto testName = [](const ::testing::TestParamInfo<std::string>& kept) {
  std::string name = kept.param;
  std::ranges::replace_if(
      name, [](char c) { return std::isalnum(static_cast<unsigned char>(c)) == 0; }, '_');
  return name;
};
INSTANTIATE_TEST_SUITE_P(Kept, Compatibility, ::testing::ValuesIn(keptCases()), testName);
INSTANTIATE_TEST_SUITE_P(Kept, CompatibilityOfLaterVersions, ::testing::Values(keptCases().front()), testName);

}  // namespace
}  // namespace mirevo::testing
