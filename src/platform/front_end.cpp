#include "platform/front_end.h"

#include <array>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <unistd.h>

namespace mirevo {

FrontEnd chosenFrontEnd() {
  const char* value = std::getenv("G48");
  return value != nullptr && std::string_view(value) == "QMON" ? FrontEnd::qmon : FrontEnd::win;
}

std::string programBaseName() {
  std::array<char, 4096> path{};
  const ssize_t length = ::readlink("/proc/self/exe", path.data(), path.size());
  if (length <= 0) return "Mirevo";
  std::string name(path.data(), static_cast<std::size_t>(length));
  name.erase(0, name.rfind('/') + 1);
  if (const auto dot = name.rfind('.'); dot != std::string::npos && dot > 0) name.erase(dot);
  return name;
}

int showMessage(std::string_view text, std::optional<std::string_view> title, int type) {
  static_cast<void>(type);
  std::string shown;
  if (title) shown.append(*title).append(": ");
  shown.append(text).append("\n");
  std::fwrite(shown.data(), 1, shown.size(), stderr);
  return 1;
}

void qmonExit(int exitCode) {
  std::exit(exitCode);
}

double runTimeClock() {
  return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count();
}

std::string dateAndTimeNow() {
  const std::time_t now = std::time(nullptr);
  std::tm local{};
  ::localtime_r(&now, &local);
  std::array<char, 32> text{};
  const std::size_t length = std::strftime(text.data(), text.size(), "%Y-%m-%d %H:%M:%S", &local);
  return {text.data(), length};
}

}  // namespace mirevo
