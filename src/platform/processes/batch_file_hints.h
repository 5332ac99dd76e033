#pragma once

#include <string>

namespace mirevo {

/// A hint if an existing file could not be executed because of its "#!" line, else empty.
std::string interpreterHint(const std::string& file);

/// What a shell tells with its own codes (POSIX.1-2017, 2.8.2) about the batch file, in parentheses, or empty.
std::string meaningOfCode(int status, const std::string& file);

}  // namespace mirevo
