#pragma once

#include <span>
#include <string>
#include <string_view>
#include <variant>

#include "common/settings/keyword_row.h"
#include "platform/kdx/kdx.h"

namespace mirevo {

/// Why a value is not of the keyword's type.
struct SetupValueError {
  KdxPosition position;
  std::string explanation;  ///< "expected an integer, found 1.5"
};

/// Converts the values of a keyword to the type of its row. An integer is accepted as a real, and a text in the form of
/// a date as a date; no other type is converted. Texts lose trailing blanks. The name of a coded value becomes its
/// number, if it has one.
std::variant<SetupValue, SetupValueError> convertSetupValue(const KeywordRow& row, const KdxKeyword& keyword);

/// What a coded keyword accepts: "an integer within 32 bits or one of the names 'SCE', 'PSE'".
std::string wantedCode(std::span<const CodeName> codes);
/// " or one of the names 'SCE', 'PSE', 'PDDS'"; empty if each of them has a number, too.
std::string orOneOfTheNames(std::span<const CodeName> codes);
/// ", did you mean 'PSE'?" if a name is similar to what was written; else empty.
std::string nearestCode(std::span<const CodeName> codes, std::string_view written);

/// The default of a row, which must have one.
SetupValue defaultSetupValue(const KeywordRow& row);

/// The value as it is written in a setup.
std::string formatSetupValue(const SetupValue& value);

}  // namespace mirevo
