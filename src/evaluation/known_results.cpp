#include "evaluation/known_results.h"

#include <bit>
#include <utility>

namespace mirevo {

std::uint64_t KnownResults::hashOf(std::span<const double> set) const {
  std::uint64_t hash = 0;
  for (std::size_t k = 0; k < set.size(); ++k) {
    hash ^= std::bit_cast<std::uint64_t>(toModelScale(space_, k, set[k]));
    // The finaliser of Stafford's variant 13 of MurmurHash3, as in SplitMix64 (Steele, Lea and Flood 2014).
    hash = (hash ^ (hash >> 30)) * 0xbf58476d1ce4e5b9ULL;
    hash = (hash ^ (hash >> 27)) * 0x94d049bb133111ebULL;
    hash ^= hash >> 31;
    hash += 0x9e3779b97f4a7c15ULL;
  }
  return hash;
}

KnownResults::Step KnownResults::next(int number, std::span<const double> set) {
  if (aggregator_ == nullptr) return {};
  const std::uint64_t hash = hashOf(set);
  // After a restart there may be rows of later evaluations, which do not answer for one whose row is lost; and which
  // one answers must not depend on what runs beside it.
  const auto running = running_.find(hash);
  const bool isAwaited = running != running_.end() && running->second < number;
  const auto known = succeeded_.find(hash);
  if (!isAwaited && known != succeeded_.end() && known->second < number) return {Step::Kind::repeat, known->second};
  if (running == running_.end() || running->second == number) {
    running_.try_emplace(hash, number);
    return {};
  }
  waiting_[hash].push_back(number);
  return {Step::Kind::wait};
}

void KnownResults::run(int number, std::span<const double> set) {
  if (aggregator_ != nullptr) running_.try_emplace(hashOf(set), number);
}

void KnownResults::putBack(int number, std::span<const double> set) {
  if (aggregator_ == nullptr) return;
  const auto running = running_.find(hashOf(set));
  if (running != running_.end() && running->second == number) running_.erase(running);
}

std::vector<int> KnownResults::ended(int number, std::span<const double> set, bool hasSucceeded) {
  if (aggregator_ == nullptr) return {};
  const std::uint64_t hash = hashOf(set);
  if (hasSucceeded) {
    const auto [known, isNew] = succeeded_.try_emplace(hash, number);
    if (!isNew && number < known->second) known->second = number;
  }
  const auto running = running_.find(hash);
  if (running == running_.end() || running->second != number) return {};
  running_.erase(running);
  const auto waiting = waiting_.find(hash);
  if (waiting == waiting_.end()) return {};
  std::vector<int> numbers = std::move(waiting->second);
  waiting_.erase(waiting);
  return numbers;
}

void KnownResults::closeBatch() {
  running_.clear();
  waiting_.clear();
}

}  // namespace mirevo
