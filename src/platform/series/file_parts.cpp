#include "platform/series/file_parts.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <unistd.h>

#include <fmt/core.h>

#include "common/files.h"
#include "common/take_text.h"
#include "common/utf8.h"
#include "platform/series/series_reading.h"

namespace mirevo {
namespace {

constexpr std::size_t kPart = std::size_t{1} << 20;
constexpr std::size_t kLongestLine = std::size_t{1} << 26;

}  // namespace

FileParts::FileParts(const std::string& path, std::shared_ptr<SeriesReading> reading)
    : reading_(std::move(reading)), file_(std::make_unique<Descriptor>(-1)), part_(kPart, '\0') {
  fault_ = faultOfFile(path);
  if (!fault_.empty()) return;
  file_ = std::make_unique<Descriptor>(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (file_->get() < 0) fault_ = std::strerror(errno);
}

std::string_view FileParts::next() {
  if (!file_) return std::exchange(text_, {});
  if (fault_.empty() && reading_ && reading_->watch.isOver()) fault_ = reading_->watch.reason();
  if (!fault_.empty()) return {};
  ssize_t count = 0;
  do {
    count = ::read(file_->get(), part_.data(), part_.size());
  } while (count < 0 && errno == EINTR);
  if (count < 0) fault_ = std::strerror(errno);
  return std::string_view(part_).substr(0, count < 0 ? 0 : static_cast<std::size_t>(count));
}

std::optional<std::string_view> FileParts::nextLine() {
  line_.clear();
  std::string_view line;
  while (true) {
    const std::size_t end = rest_.find('\n');
    const std::string_view piece = rest_.substr(0, end);
    rest_.remove_prefix(end == std::string_view::npos ? rest_.size() : end + 1);
    if (end != std::string_view::npos && line_.empty()) {
      line = piece;
    } else {
      line_ += piece;
      line = line_;
    }
    if (end != std::string_view::npos) {
      endsLine_ = true;
      break;
    }
    if (line_.size() > kLongestLine) fault_ = fmt::format("it has a line of more than {} bytes", kLongestLine);
    rest_ = next();
    if (!rest_.empty()) continue;
    if (!fault_.empty() || line_.empty()) return std::nullopt;
    endsLine_ = false;
    break;
  }
  if (line.ends_with('\r')) {
    line.remove_suffix(1);
    endsLine_ = true;
  }
  if (!std::exchange(isBehindFirstLine_, true)) takeText(line, kByteOrderMark);
  return line;
}

}  // namespace mirevo
