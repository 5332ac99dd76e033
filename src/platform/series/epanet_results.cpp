#include "platform/series/epanet_results.h"

#include <array>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::int32_t kMagic = 516114521;
constexpr std::uint64_t kEndBytes = 28;  ///< four rates, number of records, warning flag, magic
constexpr std::size_t kNameLength = 32;
constexpr std::size_t kNodeResults = 4;
constexpr std::size_t kLinkResults = 8;
constexpr std::uint64_t kConcentrationPlace = 852;  ///< of the unit of the chemical
constexpr std::uint64_t kNamesPlace = 884;
constexpr std::int64_t kStart = dayNumber(2000, 1, 1) * kSecondsOfDay;

/// The numbers at the beginning of the file.
enum Head : std::size_t {
  kMagicNumber,
  kVersion,
  kNodes,
  kTanks,
  kLinks,
  kPumps,
  kValves,
  kQuality,
  kTraced,
  kFlowUnits,
  kPressureUnits,
  kStatistic,
  kReportStart,
  kReportStep,
  kDuration,
  kHeadNumbers
};

constexpr std::array<std::string_view, kNodeResults + kLinkResults> kResults = {
    "demand",   "head",    "pressure", "quality", "flow",          "velocity",
    "headloss", "quality", "status",   "setting", "reaction rate", "friction factor"};

}  // namespace

bool EpanetResults::fits(std::string_view head) {
  return beginsWith(head, kMagic);
}

bool EpanetResults::readHeader() {
  nodes_.clear();
  links_.clear();
  const auto magic = file_.number<std::int32_t>(0);
  if (!magic || *magic != kMagic) {
    return fail("expected the results of EPANET 2, found a file that does not begin with their mark");
  }
  const auto end = file_.size() < kEndBytes ? std::nullopt : file_.number<std::int32_t>(file_.size() - 4);
  if (file_.size() < kNamesPlace + kEndBytes || !end || *end != kMagic) {
    return fail(
        fmt::format("expected the closing record of EPANET 2 at its end, byte {}, found none: the file is cut off, "
                    "or the model has not ended its run",
                    file_.size() < kEndBytes ? 0 : file_.size() - kEndBytes));
  }
  auto head = file_.numbers<std::int32_t>(0, kHeadNumbers);
  if (!head) return false;
  head_ = std::move(*head);
  for (const Head count : {kNodes, kTanks, kLinks, kPumps}) {
    if (head_[count] < 0 || static_cast<std::uint64_t>(head_[count]) > file_.size()) {
      return fail(fmt::format("expected a number of objects at byte {}, found {}", 4 * count, head_[count]));
    }
  }
  if (head_[kFlowUnits] < 0 || head_[kPressureUnits] < 0) {
    return fail(fmt::format("expected codes of units at byte {}, found {} and {}", 4 * kFlowUnits, head_[kFlowUnits],
                            head_[kPressureUnits]));
  }
  if (head_[kStatistic] != 0) {
    return fail("it has a statistic of each result in place of a time series: set STATISTIC to NONE in [TIMES]");
  }
  return readNames() && readSteps();
}

bool EpanetResults::readNames() {
  const auto readList = [&](std::uint64_t place, Head count, std::vector<std::string>& names) {
    const auto text = file_.text(place, kNameLength * static_cast<std::size_t>(head_[count]));
    if (!text) return false;
    for (std::size_t begin = 0; begin < text->size(); begin += kNameLength) {
      const std::string_view field = std::string_view(*text).substr(begin, kNameLength);
      names.push_back(onOneLine(trim(field.substr(0, field.find('\0')))));
    }
    return true;
  };
  const auto unit = file_.text(kConcentrationPlace, kNameLength);
  if (!unit) return false;
  concentration_ = onOneLine(trim(std::string_view(*unit).substr(0, unit->find('\0'))));
  return readList(kNamesPlace, kNodes, nodes_) && readList(kNamesPlace + kNameLength * nodes_.size(), kLinks, links_);
}

bool EpanetResults::readSteps() {
  const auto tanks = static_cast<std::uint64_t>(head_[kTanks]);
  const auto pumps = static_cast<std::uint64_t>(head_[kPumps]);
  results_ = kNamesPlace + 36 * nodes_.size() + 52 * links_.size() + 8 * tanks + 28 * pumps + 4;
  const std::uint64_t record = 4 * (kNodeResults * nodes_.size() + kLinkResults * links_.size());
  const auto steps = file_.number<std::int32_t>(file_.size() - 12);
  if (!steps) return false;
  if (*steps < 0 || record == 0 || results_ + static_cast<std::uint64_t>(*steps) * record + kEndBytes != file_.size()) {
    return fail(fmt::format("expected {} bytes for {} of {} bytes each, found {}",
                            results_ + static_cast<std::uint64_t>(std::max(*steps, 0)) * record + kEndBytes,
                            countText(static_cast<std::size_t>(std::max(*steps, 0)), "record"), record, file_.size()));
  }
  std::vector<std::int64_t> seconds(static_cast<std::size_t>(*steps));
  for (std::size_t step = 0; step < seconds.size(); ++step) {
    seconds[step] = kStart + head_[kReportStart] + static_cast<std::int64_t>(step) * head_[kReportStep];
  }
  return setTimes(seconds);
}

int EpanetResults::itemCount() const {
  return static_cast<int>(kNodeResults * nodes_.size() + kLinkResults * links_.size());
}

std::size_t EpanetResults::resultOf(int item) const {
  const auto place = static_cast<std::size_t>(item - 1);
  const std::size_t ofNodes = kNodeResults * nodes_.size();
  return place < ofNodes ? place % kNodeResults : kNodeResults + (place - ofNodes) % kLinkResults;
}

std::size_t EpanetResults::objectOf(int item) const {
  const auto place = static_cast<std::size_t>(item - 1);
  const std::size_t ofNodes = kNodeResults * nodes_.size();
  return place < ofNodes ? place / kNodeResults : (place - ofNodes) / kLinkResults;
}

std::string EpanetResults::itemName(int item) const {
  if (!hasItem(item)) return {};
  const std::size_t result = resultOf(item);
  const bool isNode = result < kNodeResults;
  return fmt::format("{} {}: {}", isNode ? "node" : "link", (isNode ? nodes_ : links_)[objectOf(item)],
                     kResults.at(result));
}

std::string EpanetResults::itemUnit(int item) const {
  if (!hasItem(item)) return {};
  // The last flow and the last two pressures are those of version 2.3.
  constexpr std::array<std::string_view, 11> kFlows = {"ft3/s", "gal/min", "Mgal/d", "imp. Mgal/d", "acre ft/d", "L/s",
                                                       "L/min", "ML/d",    "m3/h",   "m3/d",        "m3/s"};
  // So the engine writes them; its documentation has kPa and m the other way round.
  constexpr std::array<std::string_view, 5> kPressures = {"psi", "kPa", "m", "bar", "ft"};
  constexpr std::array<std::string_view, 4> kQualities = {"", "mg/L", "h", "%"};
  const auto flow = static_cast<std::size_t>(head_[kFlowUnits]);
  const auto pressure = static_cast<std::size_t>(head_[kPressureUnits]);
  const auto quality = static_cast<std::size_t>(head_[kQuality]);
  const bool isMetric = flow >= 5;
  switch (resultOf(item)) {
    case 0:
    case 4:
      return flow < kFlows.size() ? std::string(kFlows.at(flow)) : std::string();
    case 1:
      return isMetric ? "m" : "ft";
    case 2:
      return pressure < kPressures.size() ? std::string(kPressures.at(pressure)) : std::string();
    case 3:
    case 7:
      if (quality == 1 && !concentration_.empty()) return concentration_;
      return quality < kQualities.size() ? std::string(kQualities.at(quality)) : std::string();
    case 5:
      return isMetric ? "m/s" : "ft/s";
    default:
      return {};
  }
}

std::optional<std::vector<double>> EpanetResults::readValues(int item) {
  const std::uint64_t nodes = nodes_.size();
  const std::uint64_t links = links_.size();
  const std::size_t result = resultOf(item);
  // A record has the first result of all nodes, then the second, and so on.
  const std::uint64_t column = result < kNodeResults
                                   ? result * nodes + objectOf(item)
                                   : kNodeResults * nodes + (result - kNodeResults) * links + objectOf(item);
  const std::uint64_t record = 4 * (kNodeResults * nodes + kLinkResults * links);
  const auto read = file_.column<float>(results_ + 4 * column, record, static_cast<std::size_t>(timeStepCount()));
  if (!read) return std::nullopt;
  return std::vector<double>(read->begin(), read->end());
}

}  // namespace mirevo
