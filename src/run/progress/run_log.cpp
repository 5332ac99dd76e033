#include "run/progress/run_log.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/descriptor.h"
#include "common/descriptor_output.h"
#include "common/file_copy.h"
#include "common/utf8.h"

namespace mirevo {

RunLog::~RunLog() {
  close();
}

bool RunLog::open(const std::string& path, std::string& reason) {
  close();
  const int descriptor = ::open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_APPEND | O_CLOEXEC | O_NOFOLLOW, 0666);
  if (descriptor < 0) {
    reason = std::strerror(errno);
    return false;
  }
  path_ = path;
  descriptor_ = descriptor;
  isClosed_ = false;
  head_.clear();
  const std::string earlier = std::move(pending_);
  pending_.clear();
  write(earlier);
  return true;
}

void RunLog::close() {
  const int descriptor = std::exchange(descriptor_, -1);
  isClosed_ = isClosed_ || descriptor >= 0;
  if (descriptor < 0 || ::close(descriptor) == 0 || errno == EINTR) return;
  if (writeError_.empty()) writeError_ = std::strerror(errno);
}

void RunLog::line(std::string_view text) {
  lastRecord_ = text;
  write(lastRecord_ + '\n');
}

void RunLog::reportLine(std::string_view text) {
  if (text.starts_with(kWarning)) {
    warning(text.substr(kWarning.size()));
  } else {
    line(text);
  }
}

void RunLog::warning(std::string_view text) {
  const std::string record = std::string(kWarning).append(text);
  if (!isClosed_) {
    line(record);
    if (++warningCount_ <= static_cast<int>(kMostWarningsKept)) warnings_.emplace_back(text);
    lastWarning_ = text;
  }
  if (listener_) listener_(record);
}

bool RunLog::isOfNoRun(const std::string& path) {
  constexpr off_t kMostRead = 65536;  // the mark is a few lines from the end
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  const off_t size = file.get() < 0 ? 0 : ::lseek(file.get(), 0, SEEK_END);
  if (size <= 0) return false;
  std::string end(static_cast<std::size_t>(std::min(size, kMostRead)), '\0');
  const ssize_t length = ::pread(file.get(), end.data(), end.size(), size - static_cast<off_t>(end.size()));
  if (length <= 0) return false;
  end.resize(static_cast<std::size_t>(length));
  return end.find(fmt::format("{}\n\n", kOfNoRun)) != std::string::npos;
}

/// One write(2) per record, so that a signal handler never writes into the middle of one, and without buffering, so
/// that a kill loses nothing.
void RunLog::write(std::string_view record) {
  if (descriptor_ < 0) {
    pending_ += record;
    return;
  }
  struct stat status {};
  const bool isKnown = ::fstat(descriptor_, &status) == 0;
  if (isKnown) putBackIfRemoved(descriptor_, path_, status);  // if that fails, the log and the run go on all the same
  // What a model prints and what files are called may be in any encoding.
  const std::string text = withValidUtf8(record);
  const bool isEmpty = isKnown && status.st_size == 0;
  const int error = writeWhole(descriptor_, isEmpty ? head_ + text : text).error;
  if (error != 0 && writeError_.empty()) writeError_ = std::strerror(error);
  if (head_.empty()) head_ = text;
}

}  // namespace mirevo
