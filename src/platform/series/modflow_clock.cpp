#include "platform/series/modflow_clock.h"

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <utility>
#include <vector>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/files.h"
#include "common/text.h"
#include "platform/series/file_zone.h"

namespace mirevo {
namespace {

constexpr double kDay = 86400.0;
constexpr std::int64_t kUsualStart = dayNumber(2000, 1, 1) * kSecondsOfDay;

std::vector<std::string_view> wordsOf(std::string_view line) {
  std::vector<std::string_view> words;
  constexpr std::string_view kBlanks = " \t\r";
  for (std::size_t begin = line.find_first_not_of(kBlanks); begin != std::string_view::npos;) {
    const std::size_t end = std::min(line.find_first_of(kBlanks, begin), line.size());
    words.push_back(line.substr(begin, end - begin));
    begin = line.find_first_not_of(kBlanks, end);
  }
  return words;
}

std::vector<std::string> timeFilesIn(const std::filesystem::path& folder) {
  std::vector<std::string> files;
  std::error_code failed;
  for (auto entry = std::filesystem::directory_iterator(folder, failed);
       !failed && entry != std::filesystem::directory_iterator(); entry.increment(failed)) {
    if (toLowerAscii(entry->path().extension().string()) == ".tdis") files.push_back(entry->path().string());
  }
  return files;
}

}  // namespace

bool ModflowClock::read(const std::string& fileName, std::string& reason) {
  start_ = kUsualStart;
  unitSeconds_ = kDay;
  std::error_code failed;
  const std::filesystem::path folder = std::filesystem::absolute(fileName, failed).parent_path();
  for (const std::filesystem::path& each : {folder, folder.parent_path()}) {
    const std::vector<std::string> files = timeFilesIn(each);
    if (files.empty()) continue;
    if (files.size() > 1) {
      reason = fmt::format("expected one .tdis file in {}, which says the unit and the start of its times, found {}",
                           each.string(), files.size());
      return false;
    }
    const auto content = readTextFile(files.front(), reason);
    if (!content) reason = fmt::format("{}: {}", files.front(), reason);
    return content && parse(files.front(), *content, reason);
  }
  return true;
}

bool ModflowClock::parse(const std::string& name, const std::string& content, std::string& reason) {
  constexpr std::pair<std::string_view, double> kUnits[] = {{"seconds", 1.0},         {"minutes", 60.0},
                                                            {"hours", 3600.0},        {"days", kDay},
                                                            {"years", 365.25 * kDay}, {"unknown", kDay}};
  start_ = kUsualStart;
  unitSeconds_ = kDay;
  std::size_t number = 0;
  for (const std::string_view line : splitLines(content)) {
    ++number;
    const std::vector<std::string_view> words = wordsOf(line);
    if (words.size() < 2) continue;
    if (equalIgnoringCase(words[0], "time_units")) {
      const auto unit = std::find_if(std::begin(kUnits), std::end(kUnits),
                                     [&](const auto& each) { return equalIgnoringCase(each.first, words[1]); });
      if (unit == std::end(kUnits)) {
        reason = fmt::format("{}:{}: expected a unit of time (seconds, minutes, hours, days, years), found {}", name,
                             number, quotedForMessage(words[1]));
        return false;
      }
      unitSeconds_ = unit->second;
    } else if (equalIgnoringCase(words[0], "start_date_time")) {
      const auto start = parseZonedTime(words[1]);
      if (!start) {
        reason = fmt::format("{}:{}: expected a start like 2001-01-31T12:30:00, found {}", name, number,
                             quotedForMessage(words[1]));
        return false;
      }
      start_ = start->second;
    }
  }
  return true;
}

std::optional<std::int64_t> ModflowClock::secondOf(double time) const {
  constexpr double kLongest = 8000.0 * 365.25 * kDay;  // so that years have four digits
  const double seconds = time * unitSeconds_;
  if (!(seconds >= 0.0 && seconds < kLongest)) return std::nullopt;
  return start_ + std::llround(seconds);
}

}  // namespace mirevo
