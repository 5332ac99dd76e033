#include "parameters/dependency_order.h"

#include <algorithm>
#include <cstdint>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {
namespace {

using NamedParameters = std::span<const std::vector<std::size_t>>;

bool names(NamedParameters named, std::size_t i, std::size_t j) {
  return std::binary_search(named[i].begin(), named[i].end(), j);
}

void refuseMutualDependencies(std::span<const ModelParameter> parameters, NamedParameters named) {
  for (std::size_t i = 0; i < named.size(); ++i) {
    for (const std::size_t j : named[i]) {
      if (parameters[j].parameterType != ParameterType::dependent || !names(named, j, i)) continue;
      const std::string detail =
          i == j ? fmt::format("the equation of \"{}\" names itself", trimTrailing(parameters[i].name))
                 : fmt::format("\"{}\" and \"{}\" name each other in their equations", trimTrailing(parameters[i].name),
                               trimTrailing(parameters[j].name));
      fatalError(fmt::format("Illegal relationship between dependent parameters {} and {} in the Model Parameters "
                             "list. Two dependent parameters cannot depend mutually on each other !!",
                             i + 1, j + 1),
                 detail);
    }
  }
}

/// The parameters of a cycle of dependencies, each naming the next and the last the first; empty when there is none. A
/// depth-first search with its own stack, as a chain may be as long as the list.
std::vector<std::size_t> findRing(NamedParameters named) {
  enum class State : char { unseen, open, done };
  struct Visit {
    std::size_t parameter;
    std::size_t next = 0;  ///< index into named[parameter]
  };
  std::vector<State> state(named.size(), State::unseen);
  for (std::size_t start = 0; start < named.size(); ++start) {
    if (state[start] != State::unseen) continue;
    std::vector<Visit> path{{start}};
    state[start] = State::open;
    while (!path.empty()) {
      Visit& visit = path.back();
      if (visit.next == named[visit.parameter].size()) {
        state[visit.parameter] = State::done;
        path.pop_back();
        continue;
      }
      const std::size_t child = named[visit.parameter][visit.next++];
      if (state[child] == State::unseen) {
        state[child] = State::open;
        path.push_back({child});
      } else if (state[child] == State::open) {
        std::vector<std::size_t> ring;
        auto from = std::find_if(path.begin(), path.end(), [child](const Visit& v) { return v.parameter == child; });
        for (; from != path.end(); ++from) ring.push_back(from->parameter);
        return ring;
      }
    }
  }
  return {};
}

void refuseRings(std::span<const ModelParameter> parameters, NamedParameters named) {
  const std::vector<std::size_t> ring = findRing(named);
  if (ring.empty()) return;
  std::string positions;
  std::string chain;
  for (std::size_t k = 0; k < ring.size(); ++k) {
    if (k > 0) positions += k + 1 == ring.size() ? " and " : ", ";
    positions += std::to_string(ring[k] + 1);
    chain += fmt::format("\"{}\" names ", trimTrailing(parameters[ring[k]].name));
  }
  chain += fmt::format("\"{}\"", trimTrailing(parameters[ring.front()].name));
  fatalError(fmt::format("Illegal relationship between dependent parameters {} in the Model Parameters list. Dependent "
                         "parameters cannot depend on each other in a ring !!",
                         positions),
             chain);
}

/// A permutation of 0..N-1 in which an element is moved, and the order of two compared, in constant time on average: a
/// ring of elements with labels that increase along it, kept apart as in Dietz and Sleator (1987), Two algorithms for
/// maintaining order in a list. Labels wrap around; they are compared by their distance from the ring's base, element
/// N.
class OrderedList final {
 public:
  explicit OrderedList(std::size_t count) : base_(count), next_(count + 1), previous_(count + 1), labels_(count + 1) {
    const std::uint64_t gap = ~std::uint64_t{0} / (count + 1);
    for (std::size_t i = 0; i <= count; ++i) {
      labels_[i] = i == base_ ? 0 : gap * (i + 1);
      next_[i] = i == base_ ? 0 : i + 1;
      previous_[next_[i]] = i;
    }
  }

  bool isEmpty() const { return next_[base_] == base_; }
  std::size_t front() const { return next_[base_]; }
  bool isBefore(std::size_t a, std::size_t b) const {
    return labels_[a] - labels_[base_] < labels_[b] - labels_[base_];
  }
  void remove(std::size_t element) {
    next_[previous_[element]] = next_[element];
    previous_[next_[element]] = previous_[element];
  }
  void insertAfter(std::size_t before, std::size_t element) {
    if (labels_[next_[before]] - labels_[before] == 1) makeGapAfter(before);
    const std::size_t after = next_[before];
    labels_[element] = labels_[before] + (labels_[after] - labels_[before]) / 2;
    previous_[element] = before;
    next_[element] = after;
    next_[before] = previous_[after] = element;
  }

 private:
  /// Spreads the labels of the j - 1 elements behind `before` evenly up to the first whose label is more than j * j
  /// further on.
  void makeGapAfter(std::size_t before) {
    const std::uint64_t start = labels_[before];
    std::uint64_t count = 1;
    std::size_t end = next_[before];
    for (; end != before && labels_[end] - start <= count * count; end = next_[end]) ++count;
    const std::uint64_t gap = (end == before ? ~std::uint64_t{0} : labels_[end] - start) / count;
    std::size_t element = next_[before];
    for (std::uint64_t k = 1; k < count; ++k, element = next_[element]) labels_[element] = start + k * gap;
  }

  std::size_t base_;
  std::vector<std::size_t> next_;
  std::vector<std::size_t> previous_;
  std::vector<std::uint64_t> labels_;
};

}  // namespace

std::vector<int> OrderDependentParameters(std::span<const ModelParameter> parameters, NamedParameters named) {
  refuseMutualDependencies(parameters, named);
  refuseRings(parameters, named);

  OrderedList list(parameters.size());
  std::vector<bool> isSettled(parameters.size(), false);
  std::vector<int> order;
  order.reserve(parameters.size());
  // Those before the first parameter of the list name no later one and are not moved, so the scan need not start again.
  while (!list.isEmpty()) {
    const std::size_t first = list.front();
    std::size_t latest = first;
    for (const std::size_t j : named[first]) {
      if (!isSettled[j] && list.isBefore(latest, j)) latest = j;
    }
    list.remove(first);
    if (latest != first) {
      // One move past the latest parameter that it names; those between keep their order.
      list.insertAfter(latest, first);
    } else {
      isSettled[first] = true;
      order.push_back(static_cast<int>(first) + 1);
    }
  }
  return order;
}

}  // namespace mirevo
