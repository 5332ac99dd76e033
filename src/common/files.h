#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

class ReadingWatch;

/// Why there is no file at `path` ("No such file or directory", "Is a directory", "Not a regular file" of a device or
/// pipe); empty where there is one.
std::string faultOfFile(const std::string& path);

/// The whole content of a file; empty, with the system's reason in `reason` ("No such file or directory"), on failure.
/// Folders, devices and pipes are refused like a file that cannot be read.
std::optional<std::string> readTextFile(const std::string& path, std::string& reason);
/// The same for a file that may be damaged: ends when the time of `watch` is over, and refuses a file for whose content
/// there is too little memory.
std::optional<std::string> readTextFile(const std::string& path, std::string& reason, ReadingWatch& watch);

/// Why a text file that a model wrote, and of which the model's folder has one of `usualBytes`, is not to be read: it
/// is far larger. Empty if it is not.
std::string faultOfSize(const std::string& path, std::uintmax_t usualBytes);

inline constexpr std::size_t kFileHeadLength = 16384;  ///< room for the mark of a result behind a long title
/// The same of the first kFileHeadLength bytes.
std::optional<std::string> readFileHead(const std::string& path, std::string& reason);

/// The whole content of a file; empty if there is no such file. Throws FatalError, with the system's reason, if it
/// exists but cannot be read: it must not be mistaken for a missing one. With a `length` only the first bytes.
std::optional<std::string> readFileIfThere(const std::string& path, std::size_t length = std::string::npos);

/// For text files that are written often and whole: removes `path` and creates it again with `mode` and `content`. On
/// ext4 creating a file is an order of magnitude cheaper than truncating an existing one. False, with the system's
/// reason, when that fails.
bool writeByUnlinkAndCreate(const std::string& path, std::string_view content, unsigned mode, std::string& reason);

/// The ending of the temporary file that replaceFile() writes.
inline constexpr std::string_view kTemporaryEnding = ".tmp";

/// Replaces or creates a file: `content` is written to a temporary file beside it, flushed to disk and renamed, so that
/// at every moment either the old or the new file is there, whole. The old file's mode is kept. False, with the
/// system's reason, when that fails; the old file is then untouched.
/// Programs that may replace the same file at once give each a temporary name with an ending of its own.
bool replaceFile(const std::string& path, std::string_view content, std::string& reason,
                 std::string_view temporaryEnding = kTemporaryEnding);

/// A text a part at a time: each call returns the next part, which holds until the following call, and an empty one at
/// the end.
using TextParts = std::function<std::string_view()>;
/// The same with a large content.
bool replaceFile(const std::string& path, const TextParts& content, std::string& reason,
                 std::string_view temporaryEnding = kTemporaryEnding);
/// Whether the file has this content, of which no more is asked for than it takes to tell.
bool hasContent(const std::string& path, const TextParts& content);

}  // namespace mirevo
