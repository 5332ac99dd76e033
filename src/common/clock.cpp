#include "common/clock.h"

#include <array>
#include <chrono>
#include <ctime>
#include <unistd.h>

namespace mirevo {
namespace {

std::string localTime(const char* format) {
  const std::time_t now = std::time(nullptr);
  std::tm local{};
  ::localtime_r(&now, &local);
  std::array<char, 40> text{};
  const std::size_t length = std::strftime(text.data(), text.size(), format, &local);
  return {text.data(), length};
}

}  // namespace

double runTimeClock() {
  return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count();
}

std::string dateAndTimeNow() {
  return localTime("%Y-%m-%d %H:%M:%S");
}

std::string dateAndTimeWithZone() {
  return localTime("%Y-%m-%d %H:%M:%S %z");
}

std::string hostName() {
  std::array<char, 256> name{};
  return ::gethostname(name.data(), name.size() - 1) == 0 ? std::string(name.data()) : std::string{};
}

}  // namespace mirevo
