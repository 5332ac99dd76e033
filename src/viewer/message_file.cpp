#include "viewer/message_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "common/descriptor.h"

namespace mirevo {
namespace {

constexpr std::size_t kPiece = 262'144;
constexpr std::size_t kHead = 256;

}  // namespace

bool MessageFile::isBegunAnew(int descriptor, off_t size) const {
  if (size < position_) return true;
  std::string now(head_.size(), '\0');
  const ssize_t count = ::pread(descriptor, now.data(), now.size(), 0);
  return count >= 0 && now.substr(0, static_cast<std::size_t>(count)) != head_;
}

bool MessageFile::readPiece(ProgressRecords& records, std::vector<std::string>* messages) {
  const Descriptor file(::open(path_.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  struct stat about {};
  if (file.get() < 0 || ::fstat(file.get(), &about) != 0 || !S_ISREG(about.st_mode)) return false;
  if (isBegunAnew(file.get(), about.st_size)) {
    records.clear();
    position_ = 0;
    head_.clear();
  }
  if (about.st_size <= position_) return false;
  buffer_.resize(kPiece);
  const ssize_t count = ::pread(file.get(), buffer_.data(), buffer_.size(), position_);
  if (count <= 0) return false;
  const std::string_view bytes(buffer_.data(), static_cast<std::size_t>(count));
  if (position_ < static_cast<off_t>(kHead)) {
    head_ += bytes.substr(0, kHead - static_cast<std::size_t>(position_));
  }
  position_ += count;
  const double written = static_cast<double>(about.st_mtim.tv_sec) + 1e-9 * static_cast<double>(about.st_mtim.tv_nsec);
  records.feed(bytes, written, messages);
  return position_ < about.st_size;
}

}  // namespace mirevo
