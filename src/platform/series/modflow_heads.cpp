#include "platform/series/modflow_heads.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "common/text.h"
#include "platform/series/modflow_clock.h"

namespace mirevo {
namespace {

constexpr std::size_t kTextLength = 16;

}  // namespace

std::string ModflowGrid::nameOf(std::uint64_t cell) const {
  return fmt::format("({},{},{})", cell / (columns * rows) + 1, cell / columns % rows + 1, cell % columns + 1);
}

std::string modflowText(std::string_view field) {
  const bool isPrintable = std::all_of(field.begin(), field.end(), [](char c) { return c >= ' ' && c < '\x7f'; });
  return isPrintable ? toLowerAscii(trim(field)) : std::string();
}

bool isNoModflowValue(double value) {
  return !(std::abs(value) < 0.99e30);
}

bool ModflowHeads::findWidth() {
  for (const std::uint64_t width : {8, 4}) {
    const auto text = file_.text(8 + 2 * width, kTextLength);
    if (text && !modflowText(*text).empty()) {
      width_ = width;
      return true;
    }
  }
  return fail(
      fmt::format("expected a binary file of heads of MODFLOW, with a text such as HEAD at byte 24 (or 16 with "
                  "numbers of 32 bits), found none"));
}

bool ModflowHeads::readHeader() {
  grid_ = {};
  quantities_.clear();
  ModflowClock clock;
  std::string reason;
  if (!clock.read(file_.path(), reason)) return fail(reason);
  if (!findWidth()) return false;
  const std::uint64_t headBytes = 8 + 2 * width_ + kTextLength + 12;
  std::vector<std::int64_t> seconds;
  std::uint64_t place = 0;
  for (std::size_t number = 1; place < file_.size(); ++number) {
    const auto refuse = [&](std::string_view expected, std::string_view found) {
      return fail(fmt::format("record {}, at byte {}: expected {}, found {}", number, place, expected, found));
    };
    const std::uint64_t left = file_.size() - place;
    if (left < headBytes)
      return refuse(fmt::format("a header of {} bytes", headBytes), fmt::format("{}: the file is cut off", left));
    const auto head = file_.text(place, headBytes);
    if (!head) return false;
    const auto time = file_.real(place + 8 + width_, width_);
    const auto shape = file_.numbers<std::int32_t>(place + headBytes - 12, 3);
    if (!time || !shape) return false;
    const std::string name = modflowText(std::string_view(*head).substr(8 + 2 * width_, kTextLength));
    if (name.empty()) return refuse("a text such as HEAD", "none");
    if ((*shape)[0] < 1 || (*shape)[1] < 1 || (*shape)[2] < 1) {
      return refuse("numbers of columns, rows and the layer",
                    fmt::format("{}, {} and {}", (*shape)[0], (*shape)[1], (*shape)[2]));
    }
    const auto columns = static_cast<std::uint64_t>((*shape)[0]);
    const auto rows = static_cast<std::uint64_t>((*shape)[1]);
    if (number == 1) grid_ = {columns, rows, 0};
    if (columns != grid_.columns || rows != grid_.rows) {
      return refuse(fmt::format("{} columns and {} rows as before", grid_.columns, grid_.rows),
                    fmt::format("{} and {}", columns, rows));
    }
    if (columns * rows > (left - headBytes) / width_) {
      return refuse(fmt::format("{} values of {} bytes", columns * rows, width_),
                    fmt::format("{} bytes: the file is cut off", left - headBytes));
    }
    const auto second = clock.secondOf(*time);
    if (!second) return refuse(kModflowTime, fmt::format("{}", *time));
    if (seconds.empty() || *second > seconds.back()) seconds.push_back(*second);
    if (*second < seconds.back())
      return refuse("a time not earlier than that of the record before", fmt::format("{}", *time));
    auto quantity =
        std::find_if(quantities_.begin(), quantities_.end(), [&](const Quantity& each) { return each.name == name; });
    if (quantity == quantities_.end()) quantity = quantities_.insert(quantity, {name});
    quantity->records.push_back({static_cast<std::uint32_t>(seconds.size() - 1),
                                 static_cast<std::uint32_t>((*shape)[2] - 1), place + headBytes});
    grid_.layers = std::max(grid_.layers, static_cast<std::uint64_t>((*shape)[2]));
    if (grid_.layers * quantities_.size() > kMostResultItems / (columns * rows)) {
      return refuse(fmt::format("at most {} cells", kMostResultItems), fmt::format("a layer No. {}", (*shape)[2]));
    }
    place += headBytes + columns * rows * width_;
  }
  return setTimes(seconds);
}

int ModflowHeads::itemCount() const {
  return static_cast<int>(grid_.cells() * quantities_.size());
}

std::string ModflowHeads::itemName(int item) const {
  if (!hasItem(item)) return {};
  const auto place = static_cast<std::uint64_t>(item - 1);
  return quantities_[place / grid_.cells()].name + grid_.nameOf(place % grid_.cells());
}

std::optional<std::vector<double>> ModflowHeads::readValues(int item) {
  std::vector<double> values(static_cast<std::size_t>(timeStepCount()), std::numeric_limits<double>::quiet_NaN());
  const auto place = static_cast<std::uint64_t>(item - 1);
  const std::uint64_t cell = place % grid_.cells();
  const std::uint64_t inLayer = grid_.columns * grid_.rows;
  for (const Record& record : quantities_[place / grid_.cells()].records) {
    if (record.layer != cell / inLayer) continue;
    const std::uint64_t at = record.place + cell % inLayer * width_;
    const auto value = file_.real(at, width_);
    if (!value) return std::nullopt;
    if (!isNoModflowValue(*value)) values[record.step] = *value;
  }
  return values;
}

}  // namespace mirevo
