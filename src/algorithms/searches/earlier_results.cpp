#include "algorithms/searches/earlier_results.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <map>
#include <set>
#include <span>
#include <utility>

#include <fmt/format.h>

#include "algorithms/searches/initial_sample.h"
#include "common/column_heading.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {

namespace {

constexpr std::array<std::string_view, 3> kFixedColumns{"Evaluation", "Status", "Aggregate"};
constexpr std::size_t kFirstParameter = 2;  ///< behind the number and the status

/// The headings that parameters in this order have in a result file.
std::vector<std::string> headingsOf(std::span<const std::string> names) {
  std::vector<std::string> taken(kFixedColumns.begin(), kFixedColumns.end());
  for (const std::string& name : names) taken.push_back(columnHeading(name, taken));
  return {taken.begin() + kFixedColumns.size(), taken.end()};
}

std::string listOf(const std::vector<std::string>& names) {
  std::string list;
  for (const std::string& name : names) list += fmt::format("{}{}", list.empty() ? "" : ", ", quotedForMessage(name));
  return list;
}

/// The headings of the variable parameters in the settings of a run; none where they do not tell.
std::vector<std::string> headingsOfRun(std::string_view settings) {
  struct Parameter {
    std::string name;
    bool isVariable = false;
  };
  std::map<std::string, Parameter> parameters;  // by section
  std::vector<std::string_view> order;
  for (const std::string_view line : splitLines(settings)) {
    const std::vector<std::string_view> cells = splitAt(line, '\t', 4);
    if (cells.size() != 4 || cells[0] != "Setting" || !cells[1].starts_with("MODEL_PARAMETERS/PARAMETER_")) continue;
    const auto [entry, isNew] = parameters.try_emplace(std::string(cells[1]));
    if (isNew) order.push_back(cells[1]);
    if (cells[2] == "Parameter_Type") entry->second.isVariable = cells[3] == "0" || cells[3] == "'variable'";
    if (cells[2] == "Parameter_Name" && cells[3].size() > 2) {
      entry->second.name = std::string(cells[3].substr(1, cells[3].size() - 2));
    }
  }
  std::vector<std::string> names;
  for (const std::string_view section : order) {
    const Parameter& parameter = parameters.at(std::string(section));
    if (parameter.isVariable && !parameter.name.empty()) names.push_back(parameter.name);
  }
  return headingsOf(names);
}

struct EarlierRow {
  double aggregate = 0.0;
  int number = 0;
  std::size_t line = 0;
  ParameterSet values = {};  ///< model scale, in the order of the search space
};

/// Reads the rows of the successful evaluations.
class EarlierRows final {
 public:
  EarlierRows(const SearchSpace& space, std::string_view settings) : space_(space), settings_(settings) {}

  /// False, with fault() and line(), for a text that is no result file of these parameters.
  bool read(std::string_view text) {
    for (; !text.empty();) {
      const std::size_t end = text.find('\n');
      std::string_view line = text.substr(0, end);
      ++line_;
      if (line.ends_with('\r')) line.remove_suffix(1);
      const bool isRow = !line.empty() && line.front() != '#';
      // A row without an end may have lost digits.
      const bool isCutOff = end == std::string_view::npos && columnCount_ != 0;
      if (isRow && !isCutOff && !(columnCount_ == 0 ? readHeader(line) : readRow(line))) return false;
      text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
    }
    if (columnCount_ != 0) return true;
    line_ = 1;
    return fail("expected a result file, with a header row that begins with Evaluation and Status, found none");
  }
  std::vector<EarlierRow>& rows() { return rows_; }
  const std::string& fault() const { return fault_; }
  std::size_t line() const { return line_; }

 private:
  bool fail(std::string text) {
    fault_ = std::move(text);
    return false;
  }

  bool readHeader(std::string_view line) {
    const std::vector<std::string_view> cells = splitAt(line, '\t');
    const auto aggregate = std::find(cells.begin(), cells.end(), kFixedColumns[2]);
    if (cells.size() < kFirstParameter || cells[0] != kFixedColumns[0] || cells[1] != kFixedColumns[1] ||
        aggregate == cells.end()) {
      return fail("expected the header row of a result file, with Evaluation, Status and Aggregate, found " +
                  quotedForMessage(line.substr(0, 60)));
    }
    columnCount_ = cells.size();
    aggregate_ = static_cast<std::size_t>(aggregate - cells.begin());
    std::vector<std::string> found(cells.begin() + kFirstParameter, aggregate);
    const std::vector<std::string> known = headingsOfRun(settings_);
    const bool isOfRun = !known.empty() && std::ranges::all_of(known, [&](const std::string& name) {
      return std::ranges::find(found, name) != found.end();
    });
    // Without the settings of that run those columns behind the status are taken for its parameters that may be.
    if (isOfRun || found.size() > space_.size()) found.resize(isOfRun ? known.size() : space_.size());
    return takeParameters(found);
  }

  bool takeParameters(std::vector<std::string> found) {
    std::vector<std::string> missing;
    const std::vector<std::string> expected = headingsOf(space_.names);
    for (std::size_t k = 0; k < expected.size(); ++k) {
      const auto column = std::ranges::find(found, expected[k]);
      if (column == found.end()) {
        missing.push_back(space_.names[k]);
        continue;
      }
      columns_.push_back(static_cast<std::size_t>(column - found.begin()) + kFirstParameter);
    }
    std::erase_if(found,
                  [&](const std::string& heading) { return std::ranges::find(expected, heading) != expected.end(); });
    if (missing.empty() && found.empty()) return true;
    std::string text = "expected the variable parameters of this setup";
    if (!missing.empty()) text += ", found no " + listOf(missing);
    if (!found.empty())
      text += fmt::format("{}{}", missing.empty() ? ", found " : " and in their place ", listOf(found));
    return fail(text + (missing.empty() ? ", too" : ""));
  }

  bool readRow(std::string_view line) {
    const std::vector<std::string_view> cells = splitAt(line, '\t');
    if (cells.size() != columnCount_) {
      return fail(fmt::format("expected {} cells as in the header row, found {}", columnCount_, cells.size()));
    }
    if (cells[1] == "FAILED") return true;
    EarlierRow row{.line = line_};
    const auto number = parseInteger(cells[0]);
    if (!number || cells[1] != "OK")
      return fail("expected a number and OK or FAILED, found " + quotedForMessage(line.substr(0, 60)));
    row.number = *number;
    for (const std::size_t column : columns_) {
      const auto value = parseReal(cells[column]);
      if (!value || !std::isfinite(*value)) return fail("expected a number, found " + quotedForMessage(cells[column]));
      row.values.push_back(*value);
    }
    row.aggregate = parseReal(cells[aggregate_]).value_or(std::nan(""));
    rows_.push_back(std::move(row));
    return true;
  }

  const SearchSpace& space_;
  std::string_view settings_;
  std::size_t columnCount_ = 0;
  std::size_t aggregate_ = 0;
  std::vector<std::size_t> columns_;  ///< of each parameter of the space
  std::vector<EarlierRow> rows_;
  std::size_t line_ = 0;
  std::string fault_;
};

}  // namespace

std::optional<EarlierSets> readEarlierSets(const std::string& fileName, std::string_view text,
                                           std::string_view settings, EarlierOrder order, std::size_t most,
                                           const SearchSpace& space, const std::optional<ParameterSet>& leftOut,
                                           std::string& reason) {
  EarlierRows reader(space, settings);
  if (!reader.read(text)) {
    reason = fmt::format("{}:{}: {}", fileName, reader.line(), reader.fault());
    return std::nullopt;
  }
  std::vector<EarlierRow>& rows = reader.rows();
  EarlierSets made;
  made.successCount = rows.size();
  if (order == EarlierOrder::best) {
    std::erase_if(rows, [](const EarlierRow& row) { return std::isnan(row.aggregate); });
  }
  if (rows.empty()) {
    reason =
        fmt::format("{}: {}", fileName,
                    made.successCount == 0 ? "it has no successful evaluation"
                                           : "none of its evaluations has an aggregate, by which the best are told");
    return std::nullopt;
  }
  std::ranges::sort(rows, {}, [order](const EarlierRow& row) {
    return std::pair(order == EarlierOrder::best ? row.aggregate : 0.0, row.number);
  });
  std::set<ParameterSet> known;
  if (leftOut) known.insert(*leftOut);
  for (const EarlierRow& row : rows) {
    if (made.sets.size() >= most) break;
    ParameterSet set;
    for (std::size_t j = 0; j < space.size(); ++j) {
      const auto value = sampleValue(row.values[j], j, space);
      if (!value) {
        if (made.outsideCount++ == 0) {
          made.firstOutside =
              fmt::format("{}:{}: {} = {}", fileName, row.line, space.names[j], formatReal(row.values[j]));
        }
        break;
      }
      set.push_back(*value);
    }
    if (set.size() != space.size() || !known.insert(set).second) continue;
    made.sets.push_back(std::move(set));
    made.modelScale.push_back(row.values);
  }
  if (made.sets.empty() && made.outsideCount > 0 && known.size() == (leftOut ? 1U : 0U)) {
    reason = fmt::format("{}: no set lies within the bounds; the first: {}", fileName, made.firstOutside);
    return std::nullopt;
  }
  return made;
}

}  // namespace mirevo
