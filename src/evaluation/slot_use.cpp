#include "evaluation/slot_use.h"

#include <algorithm>

#include <fmt/format.h>

namespace mirevo {
namespace {

/// So much of the slots' time counts as evenly divided.
constexpr double kEven = 0.95;
constexpr int kMostSlotsAdvised = 64;
constexpr std::size_t kMostNumbersShown = 8;

}  // namespace

void SlotUse::advance(double now) {
  if (hasStarted_) busySeconds_ += runningCount_ * (now - now_);
  now_ = now;
}

void SlotUse::runStarted(double now) {
  advance(now);
  if (!hasStarted_) first_ = now;
  hasStarted_ = true;
  ++runningCount_;
  ++startedCount_;
}

void SlotUse::runEnded(double now) {
  advance(now);
  --runningCount_;
  lastEnd_ = now;
  busyUntilLastEnd_ = busySeconds_;
}

void SlotUse::endBatch() {
  if (startedCount_ > 0) ++batches_[startedCount_];
  startedCount_ = 0;
}

std::optional<double> SlotUse::busyShare(int slotCount) const {
  if (!lastEnd_ || !(*lastEnd_ > first_)) return std::nullopt;
  return busyUntilLastEnd_ / (slotCount * (*lastEnd_ - first_));
}

double SlotUse::evenness(int slotCount) const {
  double runs = 0.0;
  double places = 0.0;
  for (const auto& [size, count] : batches_) {
    const int rounds = (size + slotCount - 1) / slotCount;
    runs += static_cast<double>(count) * size;
    places += static_cast<double>(count) * rounds * slotCount;
  }
  return places > 0.0 ? runs / places : 1.0;
}

std::vector<int> SlotUse::evenNumbers() const {
  std::vector<int> numbers;
  const int most = batches_.empty() ? 0 : std::min(batches_.rbegin()->first, kMostSlotsAdvised);
  for (int slots = 2; slots <= most; ++slots) {
    if (evenness(slots) >= kEven) numbers.push_back(slots);
  }
  return numbers;
}

std::string SlotUse::text(int slotCount, std::string_view what) const {
  const auto share = busyShare(slotCount);
  if (slotCount < 2 || !share) return {};
  std::string text =
      fmt::format("The {} {} were busy for {:.0f} % of the time between the first and the last model run", slotCount,
                  what, 100.0 * *share);
  const double even = evenness(slotCount);
  std::vector<int> numbers = evenNumbers();
  // Of a part without batches, or of run times that differ, the batches say nothing.
  if (even >= kEven || numbers.empty() || hasParts_ || *share > even) return text;
  // Those around the number of slots that there are.
  const auto distance = [slotCount](int number) { return std::abs(number - slotCount); };
  std::ranges::stable_sort(numbers, {}, distance);
  numbers.resize(std::min(numbers.size(), kMostNumbersShown));
  std::ranges::sort(numbers);
  std::string list;
  for (std::size_t i = 0; i < numbers.size(); ++i) {
    list += fmt::format("{}{}", i == 0 ? "" : i + 1 == numbers.size() ? " or " : ", ", numbers[i]);
  }
  const int least = batches_.begin()->first;
  const int most = batches_.rbegin()->first;
  return text +
         fmt::format("; its batches of {}{} model runs fill at most {:.0f} % of it, and {} {} would divide them evenly",
                     least, least == most ? "" : fmt::format(" to {}", most), 100.0 * even, list, what);
}

}  // namespace mirevo
