#include "platform/processes/kept_files.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <optional>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <type_traits>
#include <unistd.h>
#include <vector>

#include "common/checksum.h"
#include "common/descriptor.h"
#include "common/files.h"
#include "common/run_files.h"
#include "platform/processes/folder_tree.h"

namespace mirevo {
namespace {

using namespace folder_tree;

/// Longer than the steps of any file system's times.
constexpr std::int64_t kTimeSteps = 2'000'000'000;
constexpr std::string_view kRecordHead = "Mirevo process folder 1\n";
constexpr std::size_t kCompared = 1 << 17;

/// As it is on disk, before the path and its length.
struct CopyRecord {
  FileState original;
  FileState copy;
  std::uint32_t isReliable = 0;  ///< the states alone tell whether the files are as they were
  std::uint32_t pathLength = 0;
};
static_assert(std::is_trivially_copyable_v<CopyRecord> && sizeof(CopyRecord) == 88);

/// What tells one start of the machine from another; empty where the system does not.
std::string startOfMachine() {
  std::string ignored;
  return readTextFile("/proc/sys/kernel/random/boot_id", ignored).value_or("");
}

std::string markOf(const std::string& folder) {
  return folder + "/" + run_files::kFolderMark;
}

/// The record of a process folder.
class CopyRecords final {
 public:
  explicit CopyRecords(const std::string& folder) {
    struct stat status {};
    const std::string mark = markOf(folder);
    std::string ignored;
    if (::lstat(mark.c_str(), &status) != 0 || !S_ISREG(status.st_mode)) return;
    text_ = readTextFile(mark, ignored).value_or("");
    if (!isWhole()) return;
    std::string_view rest = std::string_view(text_).substr(kRecordHead.size());
    rest.remove_suffix(sizeof(std::uint64_t));
    const std::size_t lineEnd = rest.find('\n');
    if (lineEnd == std::string_view::npos) return;
    const std::string start = startOfMachine();
    isOfThisStart_ = !start.empty() && rest.substr(0, lineEnd + 1) == start;
    rest.remove_prefix(lineEnd + 1);
    CopyRecord record;
    while (rest.size() >= sizeof record) {
      std::memcpy(&record, rest.data(), sizeof record);
      rest.remove_prefix(sizeof record);
      if (record.pathLength > rest.size()) return;
      records_.emplace(rest.substr(0, record.pathLength), record);
      rest.remove_prefix(record.pathLength);
    }
  }

  bool isEmpty() const { return records_.empty(); }
  bool isOfThisStart() const { return isOfThisStart_; }
  const CopyRecord* of(std::string_view path) const {
    const auto found = records_.find(path);
    return found == records_.end() ? nullptr : &found->second;
  }

 private:
  bool isWhole() const {
    if (!text_.starts_with(kRecordHead) || text_.size() < kRecordHead.size() + sizeof(std::uint64_t)) return false;
    std::uint64_t sum = 0;
    std::memcpy(&sum, text_.data() + text_.size() - sizeof sum, sizeof sum);
    return sum == checksumOf(std::string_view(text_).substr(0, text_.size() - sizeof sum));
  }

  std::string text_;
  std::unordered_map<std::string_view, CopyRecord> records_;
  bool isOfThisStart_ = false;
};

/// Whether two files can be read and have the same content.
bool haveSameContent(const std::string& one, const std::string& other, const std::function<void()>& look) {
  const std::array<Descriptor, 2> files{
      Descriptor(::open(one.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK)),
      Descriptor(::open(other.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK))};
  std::array<std::vector<char>, 2> parts{std::vector<char>(kCompared), std::vector<char>(kCompared)};
  const auto readPart = [&files, &parts](std::size_t which) -> ssize_t {
    std::size_t filled = 0;
    while (filled < kCompared) {
      const ssize_t count = ::read(files[which].get(), parts[which].data() + filled, kCompared - filled);
      if (count < 0) return -1;
      if (count == 0) break;
      filled += static_cast<std::size_t>(count);
    }
    return static_cast<ssize_t>(filled);
  };
  while (true) {
    look();
    const ssize_t count = readPart(0);
    if (count < 0 || readPart(1) != count) return false;
    if (std::memcmp(parts[0].data(), parts[1].data(), static_cast<std::size_t>(count)) != 0) return false;
    if (count < static_cast<ssize_t>(kCompared)) return true;
  }
}

/// Whether a folder is this user's and has no access list or other attribute that a model may have given it; what the
/// system's security modules note does not count.
bool isPlainFolder(const std::string& path, const struct stat& status) {
  if (!S_ISDIR(status.st_mode) || status.st_uid != ::geteuid()) return false;
  std::array<char, 4096> names{};
  const ssize_t length = ::llistxattr(path.c_str(), names.data(), names.size());
  if (length < 0) return errno == ENOTSUP;
  for (std::string_view rest(names.data(), static_cast<std::size_t>(length)); !rest.empty();) {
    if (!rest.starts_with("security.")) return false;
    rest.remove_prefix(std::min(rest.size(), rest.find('\0') + 1));
  }
  return true;
}

/// The folder as it was left, reduced to what may remain.
class Reduction final {
 public:
  Reduction(const std::string& target, const FolderListing& listing, const ListedPaths& paths,
            const FolderMaking& making, const std::function<void()>& look)
      : target_(target), listing_(listing), paths_(paths), making_(making), look_(look), records_(target) {}

  std::unordered_set<std::string> reduce() {
    const auto status = statusOf(target_);
    if (!status) return {};
    if (!isPlainFolder(target_, *status) || records_.isEmpty()) {
      removeTree(target_, look_);
      return {};
    }
    pending_ = {""};
    while (!pending_.empty()) {
      const std::string below = std::move(pending_.back());
      pending_.pop_back();
      const std::string folder = target_ + below;
      if (::chmod(folder.c_str(), S_IRWXU) != 0) fail("set the mode of", folder, errno);
      remaining_.insert(below);
      const auto names = namesIn(folder);
      if (!names) continue;
      for (const std::string& name : *names) {
        if (below.empty() && name == run_files::kFolderMark) continue;
        std::string path = below;
        reduceEntry(path.append("/").append(name));
      }
    }
    return std::move(remaining_);
  }

 private:
  void reduceEntry(const std::string& path) {
    look_();
    const std::string entry = target_ + path;
    const auto status = statusOf(entry);
    if (!status) return;
    const auto listed = paths_.find(path);
    const FolderListing::Entry* original = listed == paths_.end() ? nullptr : listed->second;
    if (original != nullptr && S_ISDIR(original->mode) && isPlainFolder(entry, *status)) {
      pending_.push_back(path);
    } else if (original != nullptr && S_ISREG(original->mode) && S_ISREG(status->st_mode) &&
               isUnchanged(path, *original, *status)) {
      remaining_.insert(path);
    } else {
      removeTree(entry, look_);
    }
  }

  bool isUnchanged(const std::string& path, const FolderListing::Entry& original, const struct stat& status) const {
    const FileState state = stateOf(status);
    // On another disk there can be no link, and a copy is kept as any other.
    if (making_.links(original) && state.device == original.state.device) return state.inode == original.state.inode;
    const CopyRecord* record = records_.of(path);
    if (record == nullptr || record->original != original.state || record->copy != state) return false;
    if (status.st_nlink != 1 || making_.isOwnFile(path)) return false;
    if (record->isReliable != 0 && records_.isOfThisStart()) return true;
    return haveSameContent(listing_.folder + path, target_ + path, look_);
  }

  const std::string& target_;
  const FolderListing& listing_;
  const ListedPaths& paths_;
  const FolderMaking& making_;
  const std::function<void()>& look_;
  CopyRecords records_;
  std::vector<std::string> pending_;
  std::unordered_set<std::string> remaining_;
};

void append(std::string& text, const void* bytes, std::size_t size) {
  text.append(static_cast<const char*>(bytes), size);
}

}  // namespace

ListedPaths pathsOf(const FolderListing& listing) {
  ListedPaths paths;
  paths.reserve(listing.entries.size());
  for (const FolderListing::Entry& entry : listing.entries) paths.emplace(entry.path, &entry);
  return paths;
}

bool FolderMaking::links(const FolderListing::Entry& entry) const {
  constexpr mode_t kWritable = S_IWUSR | S_IWGRP | S_IWOTH;
  return linksReadOnlyFiles && S_ISREG(entry.mode) && (entry.mode & kWritable) == 0 && !isOwnFile(entry.path);
}

bool FolderMaking::isOwnFile(std::string_view path) const {
  return std::find(ownFiles.begin(), ownFiles.end(), path) != ownFiles.end();
}

std::unordered_set<std::string> removeAllButUnchanged(const std::string& target, const FolderListing& listing,
                                                      const ListedPaths& paths, const FolderMaking& making,
                                                      const std::function<void()>& look) {
  return Reduction(target, listing, paths, making, look).reduce();
}

void recordCopies(const std::string& target, const FolderListing& listing, const FolderMaking& making) {
  Descriptor mark(::open(markOf(target).c_str(), O_WRONLY | O_TRUNC | O_CLOEXEC | O_NOFOLLOW));
  const std::string start = startOfMachine();
  if (mark.get() < 0 || start.empty()) return;
  const bool areReliable = hasReliableTimes(target) && hasReliableTimes(listing.folder);
  const auto root = statusOf(target);
  // No model has run yet: what is older than this by more than a step of the clock is not of the same moment as
  // anything that a model will write.
  const std::int64_t now = fileClock();
  std::string text(kRecordHead);
  text += start;
  for (const FolderListing::Entry& entry : listing.entries) {
    if (!S_ISREG(entry.mode) || making.isOwnFile(entry.path)) continue;
    const auto status = statusOf(target + entry.path);
    if (!status || !S_ISREG(status->st_mode) || status->st_nlink != 1) continue;
    CopyRecord record{entry.state, stateOf(*status), 0, static_cast<std::uint32_t>(entry.path.size())};
    const bool isReliable = areReliable && root && record.copy.device == root->st_dev &&
                            record.original.device == listing.entries.front().state.device &&
                            record.original.changed < listing.begun - kTimeSteps &&
                            record.copy.changed < now - kTimeSteps;
    record.isReliable = isReliable ? 1 : 0;
    append(text, &record, sizeof record);
    text += entry.path;
  }
  const std::uint64_t sum = checksumOf(text);
  append(text, &sum, sizeof sum);
  std::string_view rest(text);
  while (!rest.empty()) {
    const ssize_t written = ::write(mark.get(), rest.data(), rest.size());
    if (written <= 0) break;  // a part is no record
    rest.remove_prefix(static_cast<std::size_t>(written));
  }
}

}  // namespace mirevo
