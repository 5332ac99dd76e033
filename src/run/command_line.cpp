#include "run/command_line.h"

#include <algorithm>

#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMaximumArguments = 100;

bool isSwitch(std::string_view argument) {
  return argument.starts_with("//");
}

}  // namespace

int CommandLine::countArguments() const {
  int count = 1;
  for (std::size_t i = 0; i < std::min(arguments_.size(), kMaximumArguments); ++i) {
    if (!isSwitch(arguments_[i])) ++count;
  }
  return count;
}

std::string_view CommandLine::getArgument(int index) const {
  for (std::size_t i = 0; i < std::min(arguments_.size(), kMaximumArguments); ++i) {
    if (!isSwitch(arguments_[i]) && --index == 0) return trimTrailing(arguments_[i]);
  }
  return {};
}

std::string_view CommandLine::setupFileName() const {
  const std::string_view name = getArgument(countArguments() - 1);
  return trim(name).empty() ? std::string_view{} : name;
}

bool CommandLine::wantsProgressViewer() const {
  return std::any_of(arguments_.begin(), arguments_.end(),
                     [](const std::string& argument) { return equalIgnoringCase(argument, "//qmon"); });
}

}  // namespace mirevo
