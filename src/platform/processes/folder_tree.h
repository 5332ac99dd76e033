#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <sys/stat.h>
#include <vector>

namespace mirevo {

/// What all that works on whole folders has in common.
namespace folder_tree {

/// Throws FatalError: "Unable to read the folder /model/in: Permission denied".
[[noreturn]] void fail(std::string_view what, const std::string& path, int error);

/// Whether the error means that an entry seen a moment ago is gone. If a setup is in its model's folder, other ranks of
/// the job and runs of other setups may be working in the folder that is copied.
bool hasVanished(int error);

/// The names in a folder, sorted, without "." and ".."; empty when there is no such folder.
std::optional<std::vector<std::string>> namesIn(const std::string& path);

/// The status of `path` itself, not of a link's target; empty when nothing is there.
std::optional<struct stat> statusOf(const std::string& path);

/// Whether the entry of a process folder, directly in it, is not the model's.
bool isOwn(std::string_view name);

}  // namespace folder_tree

/// Removes a file, a link, or a folder with all its content, if there is one; the mark of a process folder last, so
/// that it is known for what it is until it is gone. `look` is called for each entry and may throw. Throws FatalError
/// with a line that names the path and the system's reason.
void removeTree(const std::string& root, const std::function<void()>& look = {});

/// The same for what a failure leaves half made; keeps silent if that cannot be removed.
void removeIfPossible(const std::string& root);

}  // namespace mirevo
