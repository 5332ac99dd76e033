#pragma once

#include <span>
#include <string>
#include <string_view>
#include <variant>

#include "common/settings/keyword_row.h"
#include "platform/kdx/kdx.h"

namespace mirevo {

/// A value that is not of the keyword's type.
struct SetupValueError {
  KdxPosition position;
  std::string explanation;  ///< "expected an integer, found 1.5"
};

/// The values of a keyword as the value that its row asks for. An integer is taken where a real is wanted and a text
/// that has the form of a date where a date is, nothing else is turned into another type. Texts lose trailing blanks. A
/// name of a coded keyword becomes its number where it has one.
std::variant<SetupValue, SetupValueError> convertSetupValue(const KeywordRow& row, const KdxKeyword& keyword);

/// What a coded keyword takes: "an integer within 32 bits or one of the names 'SCE', 'PSE'".
std::string wantedCode(std::span<const CodeName> codes);
/// ", did you mean 'PSE'?" where a name is near to what was written; else empty.
std::string nearestCode(std::span<const CodeName> codes, std::string_view written);

/// The default of a row that has one.
SetupValue defaultSetupValue(const KeywordRow& row);

/// The value as a setup would have it.
std::string formatSetupValue(const SetupValue& value);

}  // namespace mirevo
