#include "run/command_line.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <iterator>
#include <span>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMaximumArguments = 100;

bool isSwitch(std::string_view argument) {
  return argument.starts_with("//");
}

bool asksForViewer(std::string_view argument) {
  return equalIgnoringCase(argument, "//qmon");
}

constexpr std::string_view kKeywordQuestion = "--keyword";
constexpr std::string_view kHelpQuestion = "--help";
constexpr std::string_view kShortHelpQuestion = "-h";
constexpr std::array<std::string_view, 4> kQuestions = {kHelpQuestion, kShortHelpQuestion, "--version",
                                                        kKeywordQuestion};

constexpr std::array<std::string_view, 2> kCommands = {"--new", "--check"};

std::string listOf(std::span<const std::string> arguments) {
  std::string list;
  for (const std::string& argument : arguments) {
    list.append(list.empty() ? "" : ", ").append(quotedForMessage(argument));
  }
  return list;
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
  return std::any_of(arguments_.begin(), arguments_.end(), asksForViewer);
}

std::vector<std::string> CommandLine::ordinaryArguments() const {
  std::vector<std::string> ordinary;
  for (int index = 1; index < countArguments(); ++index) ordinary.emplace_back(getArgument(index));
  return ordinary;
}

std::optional<ProgramQuestion> CommandLine::question(const std::function<bool(const std::string&)>& isFile) const {
  std::vector<std::string> others = ordinaryArguments();
  if (setupFileName().empty() || isFile(others.back())) return std::nullopt;
  const auto asked = std::find_if(others.rbegin(), others.rend(), [](const std::string& argument) {
    return std::find(kQuestions.begin(), kQuestions.end(), argument) != kQuestions.end();
  });
  if (asked == others.rend()) return std::nullopt;
  ProgramQuestion question{*asked == kShortHelpQuestion ? std::string(kHelpQuestion) : *asked, {}, {}};
  auto after = others.erase(asked.base() - 1);
  if (question.name == kKeywordQuestion && after != others.end()) {
    question.keyword = *after;
    others.erase(after);
  }
  std::copy_if(arguments_.begin(), arguments_.end(), std::back_inserter(others), isSwitch);
  if (!others.empty()) {
    question.ignored.push_back(
        fmt::format("Ignored: {}; {} is answered, and nothing is run", listOf(others), question.name));
  }
  return question;
}

std::optional<ProgramCommand> CommandLine::command(const std::function<bool(const std::string&)>& isFile) const {
  std::vector<std::string> others = ordinaryArguments();
  const auto given = std::find_first_of(others.begin(), others.end(), kCommands.begin(), kCommands.end());
  if (given == others.end() || (given == others.end() - 1 && isFile(*given))) return std::nullopt;
  ProgramCommand command{*given, {}, {}};
  others.erase(given);
  if (!others.empty()) {
    command.argument = trim(others.back());
    others.pop_back();
  }
  std::copy_if(arguments_.begin(), arguments_.end(), std::back_inserter(others), isSwitch);
  if (!others.empty()) command.ignored.push_back(fmt::format("Ignored: {}; no run is made", listOf(others)));
  return command;
}

std::optional<std::pair<std::string, std::string>> CommandLine::mistypedCommand() const {
  const std::vector<std::string> commands(kCommands.begin(), kCommands.end());
  for (const std::string& argument : ordinaryArguments()) {
    if (!argument.starts_with("--") || argument == getArgument(countArguments() - 1)) continue;
    if (const auto meant = nearestName(argument, commands)) return std::pair(argument, *meant);
  }
  return std::nullopt;
}

std::vector<std::string> CommandLine::ignored() const {
  std::vector<std::string> ordinary;
  std::vector<std::string> switches;
  for (const std::string& argument : arguments_) {
    if (!isSwitch(argument)) ordinary.push_back(argument);
    if (isSwitch(argument) && !asksForViewer(argument)) switches.push_back(argument);
  }
  const auto setup = static_cast<std::size_t>(countArguments()) - 1;  // counted among the ordinary ones, from 1
  if (setup > 0 && setup <= ordinary.size()) ordinary.erase(ordinary.begin() + static_cast<std::ptrdiff_t>(setup) - 1);
  std::vector<std::string> sentences;
  if (!switches.empty()) sentences.push_back(fmt::format("Ignored: {}; the only switch is //qmon", listOf(switches)));
  if (!ordinary.empty()) {
    sentences.push_back(fmt::format("Ignored: {}; the setup file is the last argument, {}", listOf(ordinary),
                                    quotedForMessage(setupFileName())));
  }
  return sentences;
}

}  // namespace mirevo
