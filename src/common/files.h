#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace mirevo {

/// Why there is no file at `path` ("No such file or directory", "Is a directory", "Not a regular file" of a device or
/// pipe); empty where there is one.
std::string faultOfFile(const std::string& path);

/// The whole content of a file, or nothing with the system's reason in `reason` ("No such file or directory").
/// Folders, devices and pipes are refused like a file that cannot be read.
std::optional<std::string> readTextFile(const std::string& path, std::string& reason);

/// The whole content of a file; nothing where there is none. Throws FatalError, with the system's reason, where there
/// is one that cannot be read: what it holds must not be taken for nothing.
std::optional<std::string> readFileIfThere(const std::string& path);

/// Text files that are written often and whole: removes `path` and creates it anew with `mode` and `content`. On ext4
/// creating a file is an order of magnitude cheaper than truncating an existing one. False, with the system's reason,
/// when that fails.
bool writeByUnlinkAndCreate(const std::string& path, std::string_view content, unsigned mode, std::string& reason);

/// What follows a file's name while replaceFile() writes it.
inline constexpr std::string_view kTemporaryEnding = ".tmp";

/// Puts `content` in the place of a file, or makes it: written beside it, flushed to disk and renamed, so that at every
/// moment either the old or the new one is there, whole. The old file's mode is kept. False, with the system's reason,
/// when that fails; the old file is then untouched.
bool replaceFile(const std::string& path, std::string_view content, std::string& reason);

}  // namespace mirevo
