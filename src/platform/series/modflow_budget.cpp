#include "platform/series/modflow_budget.h"

#include <algorithm>
#include <array>
#include <cstdlib>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::uint64_t kTextLength = 16;
constexpr std::uint64_t kPlainBytes = 40;   ///< of a header, up to its method
constexpr std::int32_t kMostValues = 1000;  ///< of an entry
enum Method : int { kArrayWithoutTimes, kArray, kList, kLayers, kTopLayer, kListWithMore, kListOfPackage };

}  // namespace

/// What the header of a record says.
struct ModflowBudget::Header {
  std::uint64_t place = 0;  ///< where it begins; then where the next record does
  std::string text;
  std::uint64_t columns = 0;
  std::uint64_t rows = 0;
  std::uint64_t layers = 0;
  int method = 0;
  double time = 0.0;
  std::uint64_t values = 0;  ///< where they begin
  std::uint32_t step = 0;
  std::uint64_t cells() const { return columns * rows * layers; }
};

bool ModflowBudget::refuse(std::uint64_t place, std::string_view expected, std::string_view found) {
  return fail(fmt::format("record {}, at byte {}: expected {}, found {}", recordCount_ + 1, place, expected, found));
}

bool ModflowBudget::readHeader() {
  std::string reason;
  if (!clock_.read(file_.path(), reason)) return fail(reason);
  std::string fault;
  std::size_t furthest = 0;
  std::vector<std::int64_t> seconds;
  for (const std::uint64_t width : {8, 4}) {
    width_ = width;
    if (readRecords(seconds)) {
      nameTerms();
      return setTimes(seconds);
    }
    if (fault.empty() || recordCount_ > furthest) {
      fault = lastError().empty() ? file_.fault() : lastError();
      furthest = recordCount_;
    }
  }
  terms_.clear();
  return fail(fault);
}

bool ModflowBudget::readRecords(std::vector<std::int64_t>& seconds) {
  fail({});
  grid_ = {};
  terms_.clear();
  seconds.clear();
  recordCount_ = 0;
  if (file_.size() == 0) return fail("expected a binary budget of MODFLOW, found an empty file");
  for (Header header; header.place < file_.size(); ++recordCount_) {
    const std::uint64_t begin = header.place;
    if (!readRecord(header)) return false;
    const auto second = clock_.secondOf(header.time);
    if (!second) return refuse(begin, kModflowTime, fmt::format("{}", header.time));
    if (!seconds.empty() && *second < seconds.back()) {
      return refuse(begin, "a time not earlier than that of the record before", fmt::format("{}", header.time));
    }
    if (seconds.empty() || *second > seconds.back()) seconds.push_back(*second);
    header.step = static_cast<std::uint32_t>(seconds.size() - 1);
    header.place = begin;
    const std::uint64_t values = header.values;
    if (header.text == "flow-ja-face") {
      header.place = values + header.cells() * width_;
    } else if (header.method == kListOfPackage || header.method == kList || header.method == kListWithMore) {
      if (!takeGrid(header) || !readList(header)) return false;
    } else {
      const std::uint64_t layer = header.columns * header.rows;
      const std::uint64_t bytes = header.method == kArray    ? header.cells() * width_
                                  : header.method == kLayers ? layer * (4 + width_)
                                                             : layer * width_;
      if (!takeGrid(header) || !addRecord(header, {}, {}, {.method = header.method, .place = values})) return false;
      header.place = values + bytes;
    }
    if (header.place > file_.size()) {
      return refuse(begin, fmt::format("{} bytes", header.place - begin),
                    fmt::format("{}: the file is cut off", file_.size() - begin));
    }
  }
  return !terms_.empty() || fail("expected a term of cells, found flows between neighbours alone");
}

bool ModflowBudget::readRecord(Header& header) {
  const std::uint64_t place = header.place;
  const std::uint64_t bytes = kPlainBytes + 3 * width_;
  if (file_.size() - place < bytes) {
    return refuse(place, fmt::format("a header of {} bytes", bytes),
                  fmt::format("{}: the file is cut off", file_.size() - place));
  }
  const auto text = file_.text(place + 8, kTextLength);
  const auto numbers = file_.numbers<std::int32_t>(place + 24, 4);
  const auto time = file_.real(place + kPlainBytes + 2 * width_, width_);
  if (!text || !numbers || !time) return false;
  header.text = modflowText(*text);
  if (header.text.empty()) return refuse(place, "a text such as STORAGE", "none");
  if ((*numbers)[0] < 1 || (*numbers)[1] < 1 || (*numbers)[2] == 0) {
    return refuse(place, "numbers of columns, rows and layers",
                  fmt::format("{}, {} and {}", (*numbers)[0], (*numbers)[1], (*numbers)[2]));
  }
  if ((*numbers)[2] > 0) {
    return refuse(place, "the compact form of a budget (in MODFLOW-2005 the option COMPACT BUDGET), which has times",
                  "the other one");
  }
  header.columns = static_cast<std::uint64_t>((*numbers)[0]);
  header.rows = static_cast<std::uint64_t>((*numbers)[1]);
  header.layers = static_cast<std::uint64_t>(-std::int64_t{(*numbers)[2]});
  if (header.columns * header.rows > kMostResultItems || header.cells() > kMostResultItems) {
    return refuse(place, fmt::format("at most {} cells", kMostResultItems),
                  fmt::format("{} x {} x {}", header.columns, header.rows, header.layers));
  }
  header.method = (*numbers)[3];
  if (header.method == kArrayWithoutTimes) header.method = kArray;
  if (header.method < kArray || header.method > kListOfPackage) {
    return refuse(place, "a method from 0 to 6", std::to_string(header.method));
  }
  header.time = *time;
  header.values = place + bytes;
  return true;
}

bool ModflowBudget::takeGrid(const Header& header) {
  if (grid_.cells() == 0) grid_ = {header.columns, header.rows, header.layers};
  if (header.columns == grid_.columns && header.rows == grid_.rows && header.layers == grid_.layers) return true;
  return refuse(header.place, fmt::format("{} x {} x {} cells as before", grid_.columns, grid_.rows, grid_.layers),
                fmt::format("{} x {} x {}", header.columns, header.rows, header.layers));
}

bool ModflowBudget::readList(Header& header) {
  const std::uint64_t begin = header.place;
  std::uint64_t place = header.values;
  std::string package;
  if (header.method == kListOfPackage) {
    const auto text = file_.text(place + 3 * kTextLength, kTextLength);
    if (!text) return false;
    package = modflowText(*text);
    place += 4 * kTextLength;
  }
  std::vector<std::string> further = {{}};
  if (header.method != kList) {
    const auto count = file_.number<std::int32_t>(place);
    if (!count) return false;
    if (*count < 1 || *count > kMostValues)
      return refuse(begin, "the number of values of an entry", std::to_string(*count));
    place += 4;
    for (std::int32_t i = 1; i < *count; ++i, place += kTextLength) {
      const auto text = file_.text(place, kTextLength);
      if (!text) return false;
      further.push_back(modflowText(*text));
    }
  }
  const auto length = file_.number<std::int32_t>(place);
  if (!length) return false;
  if (*length < 0) return refuse(begin, "the length of a list", std::to_string(*length));
  const std::uint64_t ids = header.method == kListOfPackage ? 8 : 4;
  Record record{.method = kList,
                .place = place + 4,
                .length = static_cast<std::uint64_t>(*length),
                .stride = ids + further.size() * width_,
                .offset = ids};
  for (const std::string& name : further) {
    if (!addRecord(header, package, name, record)) return false;
    record.offset += width_;
  }
  header.place = record.place + record.length * record.stride;
  return true;
}

bool ModflowBudget::addRecord(const Header& header, std::string_view package, std::string_view further,
                              const Record& record) {
  auto term = std::find_if(terms_.begin(), terms_.end(), [&](const Term& each) {
    return each.text == header.text && each.package == package && each.further == further;
  });
  if (term == terms_.end()) {
    term = terms_.insert(term, {header.text, std::string(package), std::string(further), {}, {}});
    if (terms_.size() > kMostResultItems / grid_.cells()) {
      return refuse(header.place, fmt::format("at most {} items", kMostResultItems), "more");
    }
  }
  if (!term->records.empty() && term->records.back().step == header.step) {
    return refuse(header.place, fmt::format("one record of {} for a time", header.text), "another");
  }
  term->records.push_back(record);
  term->records.back().step = header.step;
  return true;
}

void ModflowBudget::nameTerms() {
  for (Term& term : terms_) {
    const bool isShared = std::any_of(terms_.begin(), terms_.end(), [&](const Term& other) {
      return other.text == term.text && other.package != term.package;
    });
    term.name = term.text;
    if (isShared && !term.package.empty()) term.name += " " + term.package;
    if (!term.further.empty()) term.name += " " + term.further;
  }
}

int ModflowBudget::itemCount() const {
  return static_cast<int>(grid_.cells() * terms_.size());
}

std::string ModflowBudget::itemName(int item) const {
  if (!hasItem(item)) return {};
  const auto place = static_cast<std::uint64_t>(item - 1);
  return terms_[place / grid_.cells()].name + grid_.nameOf(place % grid_.cells());
}

std::optional<double> ModflowBudget::valueIn(const Record& record, std::uint64_t cell, bool isFlow, bool& isThere) {
  const std::uint64_t layer = grid_.columns * grid_.rows;
  if (record.method == kList) {
    const auto ids = file_.column<std::int32_t>(record.place, record.stride, static_cast<std::size_t>(record.length));
    if (!ids) return std::nullopt;
    double sum = 0.0;
    std::size_t count = 0;
    for (std::size_t i = 0; i < ids->size(); ++i) {
      if (std::int64_t{(*ids)[i]} != static_cast<std::int64_t>(cell) + 1) continue;
      const auto value = file_.real(record.place + i * record.stride + record.offset, width_);
      if (!value) return std::nullopt;
      sum += *value;
      ++count;
    }
    if (count > 1 && !isFlow) {
      fail("the cell has several entries, whose auxiliary values cannot be added up");
      return std::nullopt;
    }
    isThere = isThere || count > 0;
    return sum;
  }
  if (record.method == kArray) {
    isThere = true;
    return file_.real(record.place + cell * width_, width_);
  }
  std::uint64_t values = record.place;
  std::int64_t valueLayer = 1;
  if (record.method == kLayers) {
    const auto number = file_.number<std::int32_t>(record.place + cell % layer * 4);
    if (!number) return std::nullopt;
    valueLayer = *number;
    values += layer * 4;
  }
  if (valueLayer != static_cast<std::int64_t>(cell / layer) + 1) return 0.0;
  isThere = true;
  return file_.real(values + cell % layer * width_, width_);
}

std::optional<std::vector<double>> ModflowBudget::readValues(int item) {
  std::vector<double> values(static_cast<std::size_t>(timeStepCount()), std::numeric_limits<double>::quiet_NaN());
  const auto place = static_cast<std::uint64_t>(item - 1);
  const Term& term = terms_[place / grid_.cells()];
  bool isThere = false;
  for (const Record& record : term.records) {
    const auto value = valueIn(record, place % grid_.cells(), term.further.empty(), isThere);
    if (!value) return std::nullopt;
    if (!isNoModflowValue(*value)) values[record.step] = *value;
  }
  if (isThere) return values;
  fail(fmt::format("{} has no entry for this cell at any time", term.text));
  return std::nullopt;
}

}  // namespace mirevo
