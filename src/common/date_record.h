#pragma once

#include <array>
#include <cstdint>

namespace mirevo {

inline constexpr int kDateFieldCount = 9;

/// A calendar date and time: year, month, day, hour, minute, second; fields 7 to 9 are carried along unexamined. No
/// time zone. Not necessarily valid: see isValidDate().
using DateRecord = std::array<std::int32_t, kDateFieldCount>;

namespace date_field {
inline constexpr int kYear = 0;
inline constexpr int kMonth = 1;
inline constexpr int kDay = 2;
inline constexpr int kHour = 3;
inline constexpr int kMinute = 4;
inline constexpr int kSecond = 5;
}  // namespace date_field

}  // namespace mirevo
