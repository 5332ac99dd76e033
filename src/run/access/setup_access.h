#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "common/settings/keyword_row.h"
#include "platform/kdx/kdx.h"
#include "run/access/setup_schema.h"
#include "run/progress/run_log.h"

namespace mirevo {

class SetupSection;

/// A setting that affects the results, as written in the setup.
struct ResultSetting {
  std::string section;  ///< names below the target, `/` between them
  std::string keyword;
  std::string value;  ///< that of a coded keyword is its number, if it has one; file names are relative to the setup
  bool isDefault = false;  ///< absent, or written with the value that it has then
};

/// A parsed setup file and the log to which everything read from it is echoed.
class SetupFile final {
 public:
  /// `fileName` is the name in messages, `folder` the absolute folder to which file names are relative. Throws
  /// FatalError with "Error: Unable to open " and the name if `text` is not valid KDX. `schema` and `log` must outlive
  /// the object.
  SetupFile(const std::string& fileName, std::string folder, std::string_view text, const SetupSchema& schema,
            RunLog& log);

  /// The target MIREVO_PARAMETERS. This object must outlive its sections.
  SetupSection target();

  const KdxDocument& document() const { return document_; }
  const SetupSchema& schema() const { return schema_; }
  RunLog& log() { return log_; }
  /// "setup.kdx:14:9"
  std::string location(KdxPosition position) const;
  /// The absolute path, in normal form, of a file named in the setup; a blank name stays blank.
  std::string resolve(std::string_view fileName) const;
  /// The inverse of resolve() for a file in or below the setup's folder, so that the folder can be moved; other paths
  /// are unchanged.
  std::string relative(const std::string& path) const;

  /// The run needs the sections with these paths, too, and not only those that are always read.
  void need(const std::vector<std::string>& paths);
  /// The needed sections that the setup lacks, the first of them, as lines to add to it: those of `opened`, a section
  /// that is missing in `parent`, come first. `isOpenedListed`: false if it is there under another name. Others that
  /// seem to be there under another name are named as misspelt.
  std::string linesToAdd(std::string_view parent, std::string_view opened, bool isOpenedListed) const;

  /// Every setting that affects the results, in reading order.
  std::vector<ResultSetting>& resultSettings() { return resultSettings_; }

 private:
  KdxDocument document_;
  std::string folder_;
  const SetupSchema& schema_;
  RunLog& log_;
  std::vector<std::string> needed_;  ///< paths
  std::vector<ResultSetting> resultSettings_;
};

/// An open section of the setup: reads its keywords as their rows say, echoes and checks them, and knows their
/// positions in the file, so that a wrong value is reported with its location.
class SetupSection final {
 public:
  SetupSection(SetupFile& file, const KdxSection& node, std::string path, std::string pattern);

  /// Opens a section inside this one and echoes its name. Throws FatalError with "Error: Unable to open section ...".
  SetupSection open(std::string_view name) const;
  std::optional<SetupSection> openIfPresent(std::string_view name) const;
  /// Whether there is a section with this path, names with `/` between them, in this one; echoes nothing.
  bool holds(std::string_view path) const;
  /// The value, or default, of a keyword in the section with this path, before it is read: it is neither echoed nor
  /// refused. Empty if the section or a valid value is not there.
  std::optional<SetupValue> peek(std::string_view path, std::string_view keyword) const;
  /// `PARAMETER_12` for the prefix `PARAMETER_`.
  SetupSection openItem(std::string_view prefix, std::size_t number) const;

  /// The first item section in the file whose number is above `count`, without an echo in the log.
  std::optional<SetupSection> itemBeyond(std::string_view prefix, std::size_t count) const;

  /// Writes the section's name to the log, for a section of which more is read after other sections.
  void echoName() const;

  /// Reads every keyword into its field, then checks each value against its row. Throws FatalError with "Error: Unable
  /// to read keyword ..." or the row's own refusal.
  template <class Settings>
  void read(const SettingSection<Settings>& section, Settings& settings) const {
    read(BoundSection(section, settings));
  }
  void read(const BoundSection& section) const;
  /// The two halves of read().
  void take(const BoundSection& section) const;
  void check(const BoundSection& section) const;

  /// Reads the count of a list whose item names begin with `itemPrefix`.
  std::size_t readCount(std::string_view itemPrefix) const;

  /// Reads a list's count and its items: for each, an element is appended to `items` and filled from the keywords of
  /// `section`; `readItem(section, item)` then reads the sections inside the item.
  template <class Item, class ReadItem>
  void readItems(std::string_view prefix, const SettingSection<Item>& section, std::vector<Item>& items,
                 ReadItem readItem) const {
    readEachItem(prefix, section, items, readItem, std::identity());
  }
  /// The same for a list that must not be empty. Where the settings that `section` fills are more than the item,
  /// `settingsOf(item)` makes them.
  template <class Settings, class Item, class ReadItem, class SettingsOf = std::identity>
  void readItems(std::string_view prefix, const SettingSection<Settings>& section, std::vector<Item>& items,
                 std::string_view emptyMessage, ReadItem readItem, SettingsOf settingsOf = {}) const {
    readEachItem(prefix, section, items, readItem, settingsOf);
    if (items.empty()) refuse(emptyMessage, kItemCountKeyword, "expected 1 or more, found 0");
  }

  /// Throws FatalError with `message`; `explanation` follows the keyword's location.
  [[noreturn]] void refuse(std::string_view message, std::string_view keyword, std::string_view explanation) const;
  [[noreturn]] void refuse(const SettingRefusal& refusal) const;
  /// The same for the n-th value, from 1, of a keyword that may be repeated.
  [[noreturn]] void refuse(std::string_view message, std::string_view keyword, int instance,
                           std::string_view explanation) const;
  /// Refuses if there is a refusal.
  void require(const std::optional<SettingRefusal>& refusal) const {
    if (refusal) refuse(*refusal);
  }
  /// Runs `check`; the keyword's location goes before the detail of a FatalError that it throws.
  void checkAt(std::string_view keyword, const std::function<void()>& check) const;
  /// The location of the keyword's first value, or of the section if the keyword is absent: "setup.kdx:14:9".
  std::string location(std::string_view keyword) const;
  /// A warning in the log with the keyword's location.
  void warn(std::string_view keyword, std::string_view text) const;
  /// A line below the keyword's echo in the log.
  void note(std::string_view keyword, std::string_view text) const;

  /// The name without its path.
  std::string name() const;
  const std::string& path() const { return path_; }
  /// The keyword's text as written in the setup, without trailing blanks; empty if it is absent.
  std::string written(std::string_view keyword) const;
  /// Whether there is a section of this name inside this one.
  bool has(std::string_view name) const { return node_->section(name) != nullptr; }
  bool isWritten(std::string_view keyword) const { return node_->keyword(keyword) != nullptr; }

 private:
  template <class Settings, class Item, class ReadItem, class SettingsOf>
  void readEachItem(std::string_view prefix, const SettingSection<Settings>& section, std::vector<Item>& items,
                    ReadItem readItem, SettingsOf settingsOf) const {
    const std::size_t count = readCount(prefix);
    for (std::size_t i = 0; i < count; ++i) {
      const SetupSection opened = openItem(prefix, i + 1);
      auto&& settings = settingsOf(items.emplace_back());
      opened.read(section, settings);
      readItem(opened, items.back());
    }
  }
  /// Throws FatalError with "Error: Unable to open section ..."; `addition` ends its detail.
  [[noreturn]] void failMissing(std::string_view name, std::string_view addition) const;
  void takeRow(const KeywordRow& row, void* settings) const;
  void takeValue(const KeywordRow& row, const SetupValue& value, bool isDefault, void* settings) const;
  SetupValue convert(const KeywordRow& row, const KdxKeyword& keyword) const;
  /// Refuses the value of the row unless it is within its range.
  void checkRange(const KeywordRow& row, const BoundSection& section) const;
  /// The unknown keywords of the section.
  std::vector<std::string> unknownKeywords() const;
  /// Refuses a keyword that is absent, and would have its default, if an unknown one differs from it by one edit.
  void refuseMisspelt(const KeywordRow& row, std::string_view meantByNone) const;
  [[noreturn]] void refuseMissing(const KeywordRow& row) const;
  [[noreturn]] void refuseToRead(KdxPosition position, std::string_view keyword, std::string_view explanation) const;
  void echo(const KeywordRow& row, const SetupValue& value, bool isDefault) const;

  SetupFile* file_;
  const KdxSection* node_;
  std::string path_;     ///< names below the target, `/` between them
  std::string pattern_;  ///< the same with item numbers as `n`, as in the schema
};

}  // namespace mirevo
