#include "run/results/restart.h"

#include <algorithm>
#include <cerrno>
#include <iterator>
#include <set>
#include <sys/stat.h>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "common/version.h"
#include "run/results/restart_settings.h"
#include "run/results/row_check.h"
#include "run/results/row_checksums.h"
#include "run/results/shared_files.h"

namespace mirevo {
namespace {

constexpr std::string_view kRefusal = "Error: Unable to continue the earlier run";
constexpr std::string_view kRemedy = "Restart = 0 starts afresh and keeps the earlier results under a numbered name.";
constexpr std::size_t kMostChangesShown = 20;
constexpr std::size_t kMostRowsShown = 20;
constexpr double kSettingsSeconds = 1.0;  ///< between looks whether their file is there

[[noreturn]] void refuse(std::string_view detail) {
  fatalError(kRefusal, fmt::format("{}\n{}", detail, kRemedy));
}

}  // namespace

void refuseToGoOn(std::string_view detail) {
  refuse(detail);
}

namespace {

/// Because of a file, which may be none of a run's: then a fresh start would be refused, too.
[[noreturn]] void refuse(std::string_view detail, const std::string& path, const RunFile& file) {
  const std::string why = whyNotReplaceable(path, file);
  if (why.empty()) refuse(detail);
  fatalError(kRefusal, fmt::format("{}\n{}: {}", detail, path, why));
}

RestartSettings readSettings(const std::string& path) {
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (!text)
    refuse(fmt::format("{}: {}: with what settings the earlier results were computed is not known", path, reason), path,
           run_files::kPlain.restart);
  auto settings = parseRestartSettings(*text);
  if (!settings) {
    refuse(fmt::format("{} is damaged: with what settings the results were computed is not known", path), path,
           run_files::kPlain.restart);
  }
  return *std::move(settings);
}

/// First of all: what else is said of the files might be for want of knowing them.
void refuseLaterVersion(const std::string& settingsFile, const std::optional<RunRecord>& record) {
  const auto settings = parseRestartSettings(readFileIfThere(settingsFile).value_or(""));
  for (const std::string& version : {settings ? settings->program : std::string(), record ? record->program : ""}) {
    if (!isLaterVersion(version)) continue;
    refuse(
        fmt::format("its results are of Mirevo {0}, and this is Mirevo {1}, which may not know all that they depend "
                    "on. Mirevo {0} or a later version continues the run.",
                    version, programVersion()));
  }
}

void requireSameSettings(const RestartSettings& then, const RestartSettings& now) {
  const std::vector<std::string> changes = changedSettings(then, now);
  if (changes.empty()) return;
  std::string detail = "the setup is another one than that of the earlier run:";
  for (std::size_t i = 0; i < std::min(changes.size(), kMostChangesShown); ++i) detail += "\n   " + changes[i];
  if (changes.size() > kMostChangesShown) detail += fmt::format("\n   and {} more", changes.size() - kMostChangesShown);
  if (const std::string remedy = repetitionsRemedy(then, now); !remedy.empty()) detail += "\n" + remedy;
  refuse(detail);
}

/// Evaluations of which no row is left.
struct LostRows {
  std::size_t damaged =
      0;  ///< lines that were their rows, as far as can be told; the other lines are none of the run's
  std::size_t missing = 0;  ///< without such a line, though there is a checksum
};

/// `rows` in order.
LostRows countLostRows(const ResultTable& table, const ResultRows& rows, const RowChecksums& checksums, int planned) {
  const auto isLost = [&](int number) { return number >= 1 && number <= planned && !rows.has(number); };
  const std::set<int>& damaged = table.numbersOfUnusable;
  std::set<int> missing;
  for (const auto& [number, checksum] : checksums) {
    if (isLost(number) && damaged.count(number) == 0) missing.insert(number);
  }
  // Its number may be cut, too. Where no row is missing it is none of the run's.
  const std::size_t cut = table.hasCutRow && std::ssize(rows) < planned ? 1 : 0;
  return {static_cast<std::size_t>(std::count_if(damaged.begin(), damaged.end(), isLost)) + cut,
          missing.size() - std::min(missing.size(), cut)};
}

/// Rows that cannot be read are made again; one that can be read and does not hold would have been believed, and only
/// the user can tell what it was. Returns how many rows have no checksum.
std::size_t requireRowsThatHold(const ResultRows& rows, const RowChecksums& checksums, const RestartFiles& files,
                                const RunConfig& config) {
  const CheckedRows checked = checkRows(rows, checksums, config, RowOrigin::thisSetup);
  if (checked.faults.empty()) return checked.withoutChecksum;
  std::string detail = fmt::format("{} has rows that do not hold:", files.results);
  for (std::size_t i = 0; i < std::min(checked.faults.size(), kMostRowsShown); ++i) {
    detail += "\n   " + rowFaultText(checked.faults[i]);
  }
  if (checked.faults.size() > kMostRowsShown) {
    detail += fmt::format("\n   and {} more", checked.faults.size() - kMostRowsShown);
  }
  detail += "\nRestore these lines from a copy, or delete them: their evaluations are then made again.";
  if (!checksums.empty()) {
    detail += fmt::format("\nIf the rows are right and {} is not, remove that file.", files.checksums);
  }
  refuse(detail);
}

/// The number of the last evaluation before which none is missing.
int lastWithoutGap(const ResultRows& rows) {
  int last = 0;
  while (last < std::ssize(rows) && rows.number(static_cast<std::size_t>(last)) == last + 1) ++last;
  return last;
}

/// Applies what the search does with an earlier one that had a smaller budget.
void raiseBudget(const Task& task, int earlierBudget, int repetitions, EarlierRun& run) {
  const int lastRow = run.rows.empty() ? 0 : run.rows.number(run.rows.size() - 1);
  const auto raised = task.raisedBudget({earlierBudget, lastWithoutGap(run.rows), run.searches, repetitions, lastRow});
  if (!raised) return;
  if (!raised->refusal.empty()) refuse(raised->refusal);
  run.rows.keepIf([&](std::size_t i) { return run.rows.number(i) <= raised->keptEvaluations; });
  if (raised->earlier) run.searches.push_back(*raised->earlier);
  if (!raised->note.empty()) run.notes.push_back(raised->note);
}

/// Drops the failed evaluations after the last successful one: their cause may have been removed since.
void dropFailuresAtEnd(EarlierRun& run) {
  // A row that repeats another is no sign of a model that works again.
  std::size_t kept = run.rows.size();
  const auto isSuccess = [&run](std::size_t i) { return run.rows.isOk(i) && run.rows.repeats(i).value_or(0) == 0; };
  while (kept > 0 && !isSuccess(kept - 1)) --kept;
  while (kept < run.rows.size() && run.rows.isOk(kept)) ++kept;
  std::size_t count = 0;
  for (std::size_t i = kept; i < run.rows.size(); ++i) count += run.rows.isOk(i) ? 0 : 1;
  run.rows.keepIf([kept](std::size_t i) { return i < kept; });
  run.notes.push_back(fmt::format("Restart = 2: {} failed evaluations at the end are made again", count));
}

/// findEarlierRun() of a result file with this text.
std::optional<EarlierRun> earlierRunIn(std::string text, const RestartFiles& files, const RunConfig& config,
                                       const ResultColumns& columns, std::optional<RunRecord> record) {
  if (text.empty()) return std::nullopt;
  refuseLaterVersion(files.settings, record);
  ResultRows rows;
  const ResultTable table = readResultTable(text, columns, rows);
  text = {};
  // Not just a cut-off beginning: there may be days of work below a damaged header row.
  if (!table.hasHeader && table.unusableLines > 1) {
    refuse(files.results + " has no header row that can be read", files.results, run_files::kPlain.results);
  }
  if (rows.empty() && table.rowsOfOtherColumns == 0) return std::nullopt;
  const RestartSettings then = readSettings(files.settings);
  const RestartSettings now = restartSettings(config);
  requireSameSettings(then, now);
  if (!table.hasExpectedCount) {
    refuse(files.results + " has other columns than the setup asks for", files.results, run_files::kPlain.results);
  }

  const RowChecksums checksums = readRowChecksums(readFileIfThere(files.checksums).value_or(""));
  const std::size_t withoutChecksum = requireRowsThatHold(rows, checksums, files, config);
  rows.putInOrder();
  const LostRows lost = countLostRows(table, rows, checksums, config.plannedModelRuns());
  if (!record) record = recordOfEarlierVersion(table);
  EarlierRun run{std::move(rows), std::move(record->started), std::move(record->restarted), then.searches, {}};
  if (lost.damaged > 0) {
    run.notes.push_back(
        fmt::format("Rows of {} that were cut off or damaged are made again: {}", files.results, lost.damaged));
  }
  if (lost.missing > 0) {
    run.notes.push_back(fmt::format("Rows of {} that are missing, though {} has their checksums, are made again: {}",
                                    files.results, fileNameOf(files.checksums), lost.missing));
  }
  if (table.unusableLines > lost.damaged) {
    run.notes.push_back(fmt::format("Lines of {} that are no rows of this run are passed over: {}", files.results,
                                    table.unusableLines - lost.damaged));
  }
  if (withoutChecksum > 0) {
    run.notes.push_back(
        fmt::format("Rows of {} that are checked by their own values alone, as {} has no checksum of them: {}",
                    files.results, fileNameOf(files.checksums), withoutChecksum));
  }
  if (config.restart == RestartMode::goOnAndRepeatFailed) dropFailuresAtEnd(run);
  const auto earlierBudget = searchBudget(then);
  if (earlierBudget && config.task) raiseBudget(*config.task, *earlierBudget, searchRepetitions(then), run);
  return run;
}

/// Makes each record when it is asked for.
class RecordsOfRows final : public EarlierRecords {
 public:
  RecordsOfRows(ResultRows rows, BesideRows beside)
      : rows_(std::move(rows)), beside_(std::move(beside)), isTaken_(rows_.size()) {}

  std::optional<EarlierRecord> take(int number) override {
    const std::size_t index = rows_.find(number);
    if (index == rows_.size() || isTaken_[index]) return std::nullopt;
    isTaken_[index] = true;
    rows_.read(index, row_);
    EarlierRecord record;
    record.parameterValues = row_.parameters;
    record.result.number = number;
    record.result.measureValues = row_.measures;
    record.result.objectiveValues = row_.objectives;
    record.result.validationValues = row_.validation;
    if (const auto found = beside_.pairs.find(number); found != beside_.pairs.end()) {
      record.result.pairs = std::move(found->second);
    }
    if (!row_.ok) {
      record.result.failure = beside_.failures.at(number);
    } else if (const auto kept = beside_.keptValues.find(number); kept != beside_.keptValues.end()) {
      record.result.simulatedValues = std::move(kept->second.simulatedValues);
      record.result.exactMeasures = std::move(kept->second.exactMeasures);
    }
    return record;
  }
  std::vector<double> measuresOf(int number) const override {
    const std::size_t index = rows_.find(number);
    return index == rows_.size() || isTaken_[index] ? std::vector<double>() : rows_[index].measures;
  }
  bool isRepeat(int number) const override {
    const std::size_t index = rows_.find(number);
    return index < rows_.size() && !isTaken_[index] && rows_.repeats(index).value_or(0) > 0;
  }

 private:
  ResultRows rows_;
  BesideRows beside_;
  std::vector<bool> isTaken_;
  ResultRow row_;  ///< whose memory is used again
};

}  // namespace

RestartFiles restartFiles(const std::string& filePrefix, const ResultFileNames& names) {
  return {runFilePath(filePrefix, names.results),         runFilePath(filePrefix, names.restart),
          runFilePath(filePrefix, names.simulatedValues), runFilePath(filePrefix, names.record),
          runFilePath(filePrefix, names.failures),        runFilePath(filePrefix, names.pairs),
          runFilePath(filePrefix, names.checksums),       runFilePath(filePrefix, names.unkept)};
}

std::optional<EarlierRun> findEarlierRun(const RestartFiles& files, const RunConfig& config,
                                         const ResultColumns& columns, std::optional<RunRecord> record) {
  std::string text = readFileIfThere(files.results).value_or("");
  const std::string setup = setupNamedIn(text);
  if (setup.empty() || isSameSetup(setup, config.setupFile))
    return earlierRunIn(std::move(text), files, config, columns, std::move(record));
  try {
    return earlierRunIn(std::move(text), files, config, columns, std::move(record));  // the setup may have been renamed
  } catch (const FatalError& error) {
    fatalError(error.message(),
               fmt::format("{} names another setup, {}. If it is not this one under its earlier name, give one of the "
                           "two another name.\n{}",
                           files.results, setup, error.detail()));
  }
}

std::unique_ptr<EarlierRecords> earlierRecords(ResultRows rows, BesideRows beside) {
  return std::make_unique<RecordsOfRows>(std::move(rows), std::move(beside));
}

int firstWithoutPairs(const ResultRows& rows, const PairsByNumber& pairs, std::size_t count) {
  std::size_t first = 0;
  while (first < rows.size() && !rows.isOk(first)) ++first;
  if (first == rows.size() || count == 0) return 0;
  // The row of an earlier one may be lost, which is then made again.
  const auto isKnown = std::any_of(pairs.begin(), pairs.upper_bound(rows.number(first)),
                                   [count](const auto& entry) { return entry.second.size() >= count; });
  return isKnown ? 0 : rows.number(first);
}

void RestartSettingsFile::write(const RunConfig& config) {
  text_ = formatRestartSettings(restartSettings(config));
  nextLook_ = clock_() + kSettingsSeconds;
  std::string reason;
  if (!writeText(reason)) fatalError("Error: Unable to write to " + path_, reason);
}

std::string RestartSettingsFile::keep() {
  std::string reason;
  if (hasWarned_ || text_.empty() || clock_() < nextLook_) return {};
  nextLook_ = clock_() + kSettingsSeconds;
  const bool isThere = putBack(reason);
  hasWarned_ = !isThere || isAnother();
  if (!hasWarned_) return {};
  if (!isThere) {
    return fmt::format(
        "{} was removed or emptied and cannot be written again: {}. Without it the run cannot be continued if it is "
        "interrupted",
        path_, reason);
  }
  return fmt::format(
      "Another program has replaced or changed {}. If the run is interrupted, a restart takes what is in it for the "
      "settings of the run",
      path_);
}

bool RestartSettingsFile::putBack(std::string& reason) {
  struct stat status {};
  const bool isThere = ::lstat(path_.c_str(), &status) == 0;
  const bool isLost = isThere ? S_ISREG(status.st_mode) && status.st_size == 0 : errno == ENOENT;
  return text_.empty() || !isLost || writeText(reason);
}

bool RestartSettingsFile::writeText(std::string& reason) {
  if (!replaceFile(path_, text_, reason)) return false;
  struct stat status {};
  inode_ = ::lstat(path_.c_str(), &status) == 0 ? status.st_ino : 0;
  return true;
}

/// Whether what is at the path is certainly not what was written.
bool RestartSettingsFile::isAnother() const {
  struct stat status {};
  if (::lstat(path_.c_str(), &status) != 0) return false;
  if (inode_ != 0 && status.st_ino == inode_ && status.st_size == std::ssize(text_)) return false;
  // Some file systems make inode numbers up.
  std::string ignored;
  return readTextFile(path_, ignored) != text_;
}

}  // namespace mirevo
