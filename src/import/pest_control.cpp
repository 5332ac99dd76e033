#include "import/pest_control.h"

#include <algorithm>
#include <array>
#include <span>
#include <utility>

#include <fmt/format.h>

#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "import/pest_prior.h"
#include "import/source_words.h"

namespace mirevo {

namespace {

/// A keyword as the manuals write it.
std::string upper(std::string_view text) {
  std::string made(text);
  for (char& c : made) {
    if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 'a' + 'A');
  }
  return made;
}

}  // namespace

bool PestRow::has(std::string_view column) const {
  const auto found = values.find(column);
  return found != values.end() && !found->second.empty();
}

const std::string& PestRow::text(std::string_view column) const {
  const auto found = values.find(column);
  if (found == values.end() || found->second.empty()) {
    failImport(place, fmt::format("expected {}, found no value of that name", upper(column)));
  }
  return found->second;
}

double PestRow::number(std::string_view column) const {
  const std::string& word = text(column);
  const auto value = parseReal(word);
  if (!value)
    failImport(place, fmt::format("expected a number for {}, found {}", upper(column), quotedForMessage(word)));
  return *value;
}

std::string PestRow::textOr(std::string_view column, std::string_view otherwise) const {
  return has(column) ? text(column) : std::string(otherwise);
}

double PestRow::numberOr(std::string_view column, double otherwise) const {
  return has(column) ? number(column) : otherwise;
}

namespace {

const PestSetting* findSetting(const std::vector<PestSetting>& settings, std::string_view name) {
  const auto isIt = [name](const PestSetting& setting) { return setting.name == name; };
  const auto found = std::find_if(settings.begin(), settings.end(), isIt);
  return found == settings.end() ? nullptr : &*found;
}

using Columns = std::span<const std::string_view>;

constexpr std::string_view kGroupColumns[] = {"pargpnme",  "inctyp",  "derinc",      "derinclb",     "forcen",
                                              "derincmul", "dermthd", "splitthresh", "splitreldiff", "splitaction"};
constexpr std::string_view kParameterColumns[] = {"parnme",  "partrans", "parchglim", "parval1", "parlbnd",
                                                  "parubnd", "pargp",    "scale",     "offset",  "dercom"};
constexpr std::string_view kTieColumns[] = {"parnme", "partied"};
constexpr std::string_view kObservationGroupColumns[] = {"obgnme", "gtarg", "covfle"};
constexpr std::string_view kObservationColumns[] = {"obsnme", "obsval", "weight", "obgnme"};
constexpr std::string_view kFileColumns[] = {"pest_file", "model_file"};

/// The numbers and words of the control data of version 1, line by line. The words behind them may stand in any order.
constexpr std::array<std::array<std::string_view, 9>, 8> kControlData{{
    {"rstfle", "pestmode"},
    {"npar", "nobs", "npargp", "nprior", "nobsgp", "maxcompdim", "derzerolim"},
    {"ntplfle", "ninsfle", "precis", "dpoint", "numcom", "jacfile", "messfile", "obsreref"},
    {"rlambda1", "rlamfac", "phiratsuf", "phiredlam", "numlam", "jacupdate", "lamforgive", "derforgive"},
    {"relparmax", "facparmax", "facorig", "iboundstick", "upvecbend", "absparmax"},
    {"phiredswh", "noptswitch", "splitswh", "doaui", "dosenreuse", "boundscale"},
    {"noptmax", "phiredstp", "nphistp", "nphinored", "relparstp", "nrelpar", "phistopthresh", "lastrun", "phiabandon"},
    {"icov", "icor", "ieig", "ires", "jcosave", "verboserec", "jcosaveitn", "reisaveitn", "parsaveitn"},
}};

/// Whether a word of the control data is a switch, such as lamforgive or noaui, that may stand behind the numbers.
bool isSwitch(std::string_view word) {
  constexpr std::string_view kSwitches[] = {"lamforgive", "derforgive", "aui",        "auid",
                                            "senreuse",   "boundscale", "jcosave",    "verboserec",
                                            "jcosaveitn", "reisaveitn", "parsaveitn", "parsaverun"};
  const std::string lower = toLowerAscii(word);
  std::string_view name = lower;
  takeText(name, "no");
  return std::find(std::begin(kSwitches), std::end(kSwitches), name) != std::end(kSwitches);
}

class PestControlParser final {
 public:
  PestControlParser(const std::string& sourceName, const PestFileReader& open, ImportNotes& notes)
      : sourceName_(sourceName), open_(open), notes_(notes) {}

  PestControl parse(std::string_view text) {
    takeText(text, kByteOrderMark);
    const std::vector<std::string_view> lines = splitLines(text);
    std::size_t first = 0;
    while (first < lines.size() && isLeftOut(lines[first])) ++first;
    place_ = {sourceName_, first + 1};
    readHead(first < lines.size() ? trim(lines[first]) : std::string_view());
    for (std::size_t i = first + 1; i < lines.size(); ++i) {
      place_.line = i + 1;
      const std::string_view line = trim(lines[i]);
      if (isLeftOut(line)) continue;
      if (line.starts_with("++")) {
        readOptions(line.substr(2));
      } else if (line.front() == '*') {
        beginSection(line.substr(1));
      } else {
        readLine(line);
      }
    }
    endSection();
    if (!isVersion1Complete()) failImport(place_, "expected the section \"* control data\", found the end of the file");
    if (!made_.isVersion2) checkCounts();
    return std::move(made_);
  }

 private:
  static bool isLeftOut(std::string_view line) {
    line = trim(line);
    return line.empty() || line.front() == '#';
  }
  bool isVersion1Complete() const { return made_.isVersion2 || made_.setting("npar") != nullptr; }

  void readHead(std::string_view line) {
    const std::vector<std::string> words = wordsOf(line);
    if (words.empty() || !equalIgnoringCase(words.front(), "pcf")) {
      failImport(place_, "expected \"pcf\" in the first line of a control file, found " + quotedForMessage(line));
    }
    std::string rest = toLowerAscii(trim(line.substr(3)));
    std::erase(rest, ' ');
    if (rest.empty()) return;
    if (rest != "version=2") {
      failImport(place_, "expected \"pcf\" or \"pcf version=2\", found " + quotedForMessage(line));
    }
    made_.isVersion2 = true;
  }

  /// `++name(value)  name2(value)`, or `++ name value`.
  void readOptions(std::string_view line) {
    while (true) {
      line = trim(line);
      takeText(line, "++");
      line = trim(line);
      if (line.empty() || line.front() == '#') return;
      const std::size_t open = line.find('(');
      if (open == std::string_view::npos) {
        const std::size_t blank = line.find_first_of(" \t");
        made_.options.push_back({place_, toLowerAscii(line.substr(0, blank)),
                                 blank == std::string_view::npos ? "" : std::string(trim(line.substr(blank)))});
        return;
      }
      const std::size_t close = line.find(')', open);
      if (close == std::string_view::npos || line.find('(', open + 1) < close) {
        failImport(place_, "expected ) at the end of the option " + quotedForMessage(line.substr(0, open)));
      }
      made_.options.push_back({place_, toLowerAscii(trim(line.substr(0, open))),
                               std::string(trim(line.substr(open + 1, close - open - 1)))});
      line.remove_prefix(close + 1);
    }
  }

  void beginSection(std::string_view heading) {
    endSection();
    section_.clear();
    for (const std::string& word : wordsOf(heading)) section_ += (section_.empty() ? "" : " ") + toLowerAscii(word);
    isExternal_ = section_.ends_with(" external");
    if (isExternal_) section_.resize(section_.size() - std::string_view(" external").size());
    lineOfSection_ = 0;
    if (rowsOf(section_).first == nullptr && !isReadOtherwise(section_)) {
      made_.others.push_back({place_, section_, "all of it"});
    }
  }

  void endSection() {
    if (!prior_.empty()) made_.priors.push_back(parsePestPrior(priorPlace_, std::exchange(prior_, {})));
  }

  static bool isReadOtherwise(std::string_view section) {
    constexpr std::string_view kOthers[] = {"control data", "control data keyword", "prior information",
                                            "model command line", "model input/output"};
    return std::find(std::begin(kOthers), std::end(kOthers), section) != std::end(kOthers);
  }

  /// The table that a section fills, with its columns in a control file.
  std::pair<std::vector<PestRow>*, Columns> rowsOf(std::string_view section) {
    if (section == "parameter groups") return {&made_.parameterGroups, kGroupColumns};
    if (section == "parameter data") return {&made_.parameters, kParameterColumns};
    if (section == "observation groups") return {&made_.observationGroups, kObservationGroupColumns};
    if (section == "observation data") return {&made_.observations, kObservationColumns};
    if (section == "model input") return {&made_.inputs, kFileColumns};
    if (section == "model output") return {&made_.outputs, kFileColumns};
    return {nullptr, {}};
  }

  void readLine(std::string_view line) {
    ++lineOfSection_;
    if (section_.empty()) failImport(place_, "expected a section, \"* control data\", found " + quotedForMessage(line));
    if (section_ == "control data" && !isExternal_ && !made_.isVersion2) return readControlData(line);
    if (section_ == "control data keyword" || section_ == "control data") return readKeyword(line);
    if (section_ == "model command line") {
      made_.commands.push_back({place_, section_, std::string(line)});
      return;
    }
    if (isExternal_) return readTable(line);
    if (section_ == "prior information") return readPrior(line);
    auto [rows, columns] = rowsOf(section_);
    if (section_ == "model input/output") {
      const PestSetting* const templates = made_.setting("ntplfle");
      const auto count = templates == nullptr ? std::nullopt : parseInteger(templates->value);
      const bool isInput = count ? std::ssize(made_.inputs) < *count : wordsOf(line).front().ends_with(".tpl");
      rows = isInput ? &made_.inputs : &made_.outputs;
      columns = kFileColumns;
    }
    if (rows == nullptr) {
      made_.others.push_back({place_, section_, std::string(line)});
      return;
    }
    const std::vector<std::string> words = wordsOf(line);
    // Behind the parameters come the tied ones, each with the one that it is tied to.
    const bool isTie = section_ == "parameter data" && words.size() == std::size(kTieColumns);
    addRow(isTie ? made_.ties : *rows, isTie ? Columns(kTieColumns) : columns, words);
  }

  void addRow(std::vector<PestRow>& rows, Columns columns, const std::vector<std::string>& words) {
    PestRow& row = rows.emplace_back();
    row.place = place_;
    for (std::size_t i = 0; i < words.size(); ++i) {
      if (i < columns.size()) {
        row.values.emplace(columns[i], words[i]);
      } else if (words[i].starts_with('#')) {
        break;
      } else {
        notes_.add(NoteKind::noCounterpart, place_,
                   fmt::format("{} behind the last column of \"* {}\"", quotedForMessage(words[i]), section_));
      }
    }
  }

  void readControlData(std::string_view line) {
    const std::vector<std::string> words = wordsOf(line);
    if (lineOfSection_ > kControlData.size()) {
      for (const std::string& word : words) made_.settings.push_back({place_, "", word});
      return;
    }
    const auto& names = kControlData[lineOfSection_ - 1];
    std::size_t next = 0;
    for (const std::string& word : words) {
      if (word.starts_with('#')) break;
      const bool isNamed = !isSwitch(word) && next < names.size() && !names[next].empty();
      made_.settings.push_back({place_, isNamed ? std::string(names[next]) : std::string(), word});
      ++next;
    }
  }

  void readKeyword(std::string_view line) {
    const std::size_t blank = line.find_first_of(" \t");
    std::string value(blank == std::string_view::npos ? std::string_view() : trim(line.substr(blank)));
    value = value.substr(0, value.find('#'));
    made_.settings.push_back({place_, toLowerAscii(line.substr(0, blank)), std::string(trim(value))});
  }

  void readPrior(std::string_view line) {
    if (line.front() == '&') {
      if (prior_.empty()) failImport(place_, "expected a line of prior information before one that goes on with &");
      prior_ += " " + std::string(line.substr(1));
      return;
    }
    endSection();
    priorPlace_ = place_;
    prior_ = std::string(line);
  }

  /// A line of an external section: the name of a table and how it is to be read.
  void readTable(std::string_view line) {
    const std::vector<std::string> words = wordsOf(line);
    char separator = ',';
    for (std::size_t i = 1; i + 1 < words.size(); i += 2) {
      if (equalIgnoringCase(words[i], "sep") && (words[i + 1].size() == 1)) {
        separator = words[i + 1] == "w" || words[i + 1] == "W" ? ' ' : words[i + 1].front();
      } else {
        notes_.add(NoteKind::toCheck, place_, fmt::format("the option {} {} is not used", words[i], words[i + 1]));
      }
    }
    const SourcePlace named = std::exchange(place_, {words.front(), 0});
    const std::string text = open_(words.front(), named);
    std::vector<std::string> columns;
    for (const std::string_view row : splitLines(text)) {
      ++place_.line;
      if (isLeftOut(row)) continue;
      std::vector<std::string> cells = cellsOf(row, separator);
      if (columns.empty()) {
        for (std::string& cell : cells) columns.push_back(toLowerAscii(cell));
        noteColumns(columns);
        continue;
      }
      if (cells.size() != columns.size()) {
        failImport(place_,
                   fmt::format("expected {} cells as in the first line, found {}", columns.size(), cells.size()));
      }
      addCells(columns, std::move(cells));
    }
    place_ = named;
  }

  void addCells(const std::vector<std::string>& columns, std::vector<std::string> cells) {
    PestRow row{place_, {}};
    for (std::size_t i = 0; i < columns.size(); ++i) row.values.emplace(columns[i], std::move(cells[i]));
    if (section_ == "prior information") {
      made_.priors.push_back(parsePestPrior(place_, fmt::format("{} {} {} {}", row.text("pilbl"), row.text("equation"),
                                                                row.text("weight"), row.text("obgnme"))));
      return;
    }
    auto [rows, names] = rowsOf(section_);
    if (rows == nullptr) {
      made_.others.push_back({place_, section_, "a row of the table"});
      return;
    }
    if (section_ == "parameter data" && row.has("partied")) made_.ties.push_back(row);
    rows->push_back(std::move(row));
  }

  void noteColumns(const std::vector<std::string>& columns) {
    const Columns known = rowsOf(section_).second;
    std::string others;
    for (const std::string& column : columns) {
      const bool isKnown = std::find(known.begin(), known.end(), column) != known.end() ||
                           (section_ == "parameter data" && column == "partied");
      if (!isKnown && section_ != "prior information") others += (others.empty() ? "" : ", ") + column;
    }
    if (!others.empty()) notes_.add(NoteKind::noCounterpart, place_, "the columns " + others);
  }

  void checkCounts() const {
    const auto check = [this](std::string_view name, std::size_t found, std::string_view what) {
      const PestSetting* const setting = made_.setting(name);
      if (setting == nullptr) return;
      if (const auto wanted = parseInteger(setting->value);
          wanted && static_cast<std::size_t>(std::max(*wanted, 0)) == found)
        return;
      failImport(setting->place,
                 fmt::format("expected {} to be the number of {}, {}, found {}: the file is cut off, or the number is "
                             "to be put right",
                             upper(name), what, found, quotedForMessage(setting->value)));
    };
    check("npar", made_.parameters.size(), "lines of \"* parameter data\" before those of tied parameters");
    check("nobs", made_.observations.size(), "lines of \"* observation data\"");
    check("nprior", made_.priors.size(), "lines of \"* prior information\"");
    if (made_.setting("ntplfle") == nullptr) return;
    check("ntplfle", made_.inputs.size(), "templates in \"* model input/output\"");
    check("ninsfle", made_.outputs.size(), "instruction files in \"* model input/output\"");
  }

  std::string sourceName_;
  const PestFileReader& open_;
  ImportNotes& notes_;
  PestControl made_;
  SourcePlace place_;
  std::string section_;
  bool isExternal_ = false;
  std::size_t lineOfSection_ = 0;
  std::string prior_;  ///< the line of prior information that is being read
  SourcePlace priorPlace_;
};

}  // namespace

const PestSetting* PestControl::setting(std::string_view name) const {
  return findSetting(settings, name);
}

const PestSetting* PestControl::option(std::string_view name) const {
  return findSetting(options, name);
}

PestControl parsePestControl(const std::string& sourceName, std::string_view text, const PestFileReader& open,
                             ImportNotes& notes) {
  return PestControlParser(sourceName, open, notes).parse(text);
}

}  // namespace mirevo
