#include "parameters/dependency_order.h"

#include <algorithm>
#include <numeric>

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

}  // namespace

std::vector<int> OrderDependentParameters(std::span<const ModelParameter> parameters, NamedParameters named) {
  refuseMutualDependencies(parameters, named);
  refuseRings(parameters, named);

  std::vector<std::size_t> order(parameters.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::vector<std::size_t> position = order;
  std::size_t p = 0;
  while (p < order.size()) {
    std::size_t latest = p;
    for (const std::size_t j : named[order[p]]) latest = std::max(latest, position[j]);
    if (latest == p) {
      ++p;
      continue;
    }
    // Moves the parameter past the latest one that it names; those between move forward by one position. Those before p
    // name no later one and are not moved, so the scan can continue from p.
    std::rotate(order.begin() + static_cast<std::ptrdiff_t>(p), order.begin() + static_cast<std::ptrdiff_t>(p) + 1,
                order.begin() + static_cast<std::ptrdiff_t>(latest) + 1);
    for (std::size_t q = p; q <= latest; ++q) position[order[q]] = q;
  }

  std::vector<int> result(order.size());
  std::transform(order.begin(), order.end(), result.begin(),
                 [](std::size_t index) { return static_cast<int>(index) + 1; });
  return result;
}

}  // namespace mirevo
