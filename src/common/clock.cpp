#include "common/clock.h"

#include <array>
#include <chrono>
#include <ctime>
#include <unistd.h>

namespace mirevo {
namespace {

constexpr const char* kDateAndTime = "%Y-%m-%d %H:%M:%S";
constexpr const char* kDateAndTimeWithZone = "%Y-%m-%d %H:%M:%S %z";

std::string localTime(std::time_t moment, const char* format) {
  std::tm local{};
  ::localtime_r(&moment, &local);
  std::array<char, 40> text{};
  const std::size_t length = std::strftime(text.data(), text.size(), format, &local);
  return {text.data(), length};
}

}  // namespace

double runTimeClock() {
  return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count();
}

std::string dateAndTimeNow() {
  return dateAndTimeOf(std::time(nullptr));
}

std::string dateAndTimeOf(std::time_t moment) {
  return localTime(moment, kDateAndTime);
}

std::string dateAndTimeWithZone() {
  return localTime(std::time(nullptr), kDateAndTimeWithZone);
}

std::optional<double> takeDateAndTimeWithZone(std::string_view& text) {
  const std::string terminated(text);
  std::tm moment{};
  const char* const end = ::strptime(terminated.c_str(), kDateAndTimeWithZone, &moment);
  if (end == nullptr) return std::nullopt;
  text.remove_prefix(static_cast<std::size_t>(end - terminated.c_str()));
  const long zone = moment.tm_gmtoff;  // timegm() sets it
  return static_cast<double>(::timegm(&moment) - zone);
}

std::string hostName() {
  std::array<char, 256> name{};
  return ::gethostname(name.data(), name.size() - 1) == 0 ? std::string(name.data()) : std::string{};
}

}  // namespace mirevo
