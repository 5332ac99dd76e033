#include "algorithms/searches/search_methods.h"

#include <array>

#include "algorithms/searches/dds.h"
#include "algorithms/searches/pse.h"
#include "algorithms/searches/sce.h"

namespace mirevo {
namespace {

template <class Method>
std::unique_ptr<SearchMethod> makeOne() {
  return std::make_unique<Method>();
}

/// All searches; a new one is added here.
constexpr std::array kSearches = {makeOne<SceMethod>, makeOne<PseMethod>, makeOne<DdsMethod>};

}  // namespace

std::vector<std::unique_ptr<SearchMethod>> searchMethods() {
  std::vector<std::unique_ptr<SearchMethod>> methods;
  methods.reserve(kSearches.size());
  for (const auto& make : kSearches) methods.push_back(make());
  return methods;
}

std::span<const CodeName> searchNames() {
  static const auto names = [] {
    std::array<CodeName, kSearches.size()> all;
    for (std::size_t i = 0; i < all.size(); ++i) all[i] = kSearches[i]()->facts().name;
    return all;
  }();
  return names;
}

std::unique_ptr<SearchMethod> makeSearchMethod(const SetupValue& value) {
  for (const auto& make : kSearches) {
    auto method = make();
    if (isCode(method->facts().name, value)) return method;
  }
  return nullptr;
}

}  // namespace mirevo
