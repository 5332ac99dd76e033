#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <sys/stat.h>

namespace mirevo {

/// Copies the content of a file to an empty one, both open at their beginning, in the cheapest way that the file
/// systems offer. Holes stay holes. False, with the reason in errno, when that fails.
bool copyContent(int from, int to);

/// Whether a file system lets files share blocks, as far as that was tried.
enum class BlockSharing { unknown, possible, impossible };

/// The same in steps that take a part of a second each; after each, `copied` gets its number of bytes, and may throw.
/// Files that share blocks are one step. `sharing` is for copies between the same two folders.
bool copyContent(int from, int to, const std::function<void(std::uint64_t)>& copied, BlockSharing& sharing);

/// Copies a regular file with its mode and times. The copy is written as `target` + ".part" and renamed, so that
/// `target` is complete as soon as it exists. False, with the system's reason, when that fails; the reason names the
/// target if that, and not the source, is at fault.
bool copyWhole(const std::string& source, const std::string& target, std::string& reason);

/// Puts a file back that was removed while it was open, with all that was written to it; `descriptor`, which must be
/// readable, too, then refers to the new file, at its end. Does nothing if the file is there. False, with the reason in
/// errno, when that fails; EEXIST if another file has taken its name.
bool putBackIfRemoved(int descriptor, const std::string& path);
/// The same where the caller has just called fstat() on the descriptor.
bool putBackIfRemoved(int descriptor, const std::string& path, const struct stat& status);

}  // namespace mirevo
