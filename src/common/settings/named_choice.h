#pragma once

#include <cstddef>
#include <iterator>
#include <type_traits>
#include <utility>

#include "common/settings/keyword_row.h"

namespace mirevo {

/// A coded row for a field that is an enumeration, whose values are from 0 on those of `Names`, an array of CodeName;
/// `fieldOf(settings)` is a lambda without captures.
template <class Settings, const auto& Names, class FieldOf>
KeywordRow namedChoice(FieldOf, KeywordFacts facts) {
  facts.codes = Names;
  return choice<Settings>(
      [](Settings& settings, const SetupValue& value) {
        auto& field = FieldOf{}(settings);
        for (std::size_t i = 0; i < std::size(Names); ++i) {
          if (isCode(Names[i], value)) field = static_cast<std::remove_reference_t<decltype(field)>>(i);
        }
      },
      std::move(facts));
}

}  // namespace mirevo
