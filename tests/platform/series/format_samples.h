#pragma once

#include <cstdlib>
#include <filesystem>
#include <string>

#include <gtest/gtest.h>

namespace mirevo {

/// The path of a real file of a format, in the folder that MIREVO_FORMAT_SAMPLES names; empty where there is none.
inline std::string formatSample(const std::string& name) {
  const char* const folder = std::getenv("MIREVO_FORMAT_SAMPLES");
  if (folder == nullptr) return {};
  const std::string path = std::string(folder) + "/" + name;
  return std::filesystem::exists(path) ? path : std::string();
}

}  // namespace mirevo

/// Declares `path`, and skips the test, naming the file, where it is not there.
#define MIREVO_REQUIRE_SAMPLE(path, name)                \
  const std::string path = ::mirevo::formatSample(name); \
  if ((path).empty()) GTEST_SKIP() << "no " << (name) << " in the folder MIREVO_FORMAT_SAMPLES"
