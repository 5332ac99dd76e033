#pragma once

#include <fstream>
#include <functional>
#include <string>
#include <time.h>

namespace mirevo {

/// Waits for something that another process does; false when it has not come in time.
inline bool waitUntil(const std::function<bool()>& condition, double seconds = 250.0) {
  for (int i = 0; i < static_cast<int>(seconds * 100.0); ++i) {
    if (condition()) return true;
    const timespec pause{0, 10'000'000};
    ::nanosleep(&pause, nullptr);
  }
  return condition();
}

/// Whether a process runs; one that has ended and was not reaped yet does not.
inline bool isRunning(int process) {
  std::ifstream status("/proc/" + std::to_string(process) + "/stat");
  std::string text;
  if (!std::getline(status, text)) return false;
  const auto state = text.rfind(") ");
  return state != std::string::npos && text[state + 2] != 'Z' && text[state + 2] != 'X';
}

}  // namespace mirevo
