#include "run/tasks/simulated_room.h"

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <string>
#include <system_error>

#include <fmt/format.h>

namespace mirevo {
namespace {

std::string sizeText(std::uintmax_t bytes) {
  return fmt::format("{:.1f} MB", static_cast<double>(bytes) / 1e6);
}

}  // namespace

void logRoomOfSimulatedValues(const TaskContext& context, const RunFile& file, std::size_t sets,
                              SeriesPrecision precision) {
  constexpr std::uintmax_t kMuch = 100'000'000;
  const std::string path = runFilePath(context.filePrefix, file);
  const std::uintmax_t bytes = sets * sizeof(double) * simulatedValueCount(context.observedSeries, precision);
  std::error_code failed;
  const std::uintmax_t size = std::filesystem::file_size(path, failed);
  const std::uintmax_t written = failed ? 0 : std::min(size, bytes);
  const std::filesystem::space_info disk = std::filesystem::space(std::filesystem::path(path).parent_path(), failed);
  const bool isShort = !failed && bytes - written > disk.available;
  if (bytes < kMuch && !isShort) return;
  std::string text =
      fmt::format("The simulated values of {} sets take {} in {}", sets, sizeText(bytes), fileNameOf(path));
  if (written > 1'000'000) text += fmt::format(", which has {} of them", sizeText(written));
  if (!failed) text += fmt::format("; its disk has {}{} free", isShort ? "only " : "", sizeText(disk.available));
  if (isShort && context.warnUser) {
    context.warnUser(text);
  } else if (isShort) {
    context.log.warning(text);
  } else {
    context.log.line(text);
  }
}

}  // namespace mirevo
