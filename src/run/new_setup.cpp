#include "run/new_setup.h"

#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <string_view>
#include <system_error>

#include <fmt/core.h>

#include "common/descriptor.h"
#include "common/descriptor_output.h"
#include "common/text.h"
#include "platform/terminal/front_end.h"

namespace mirevo {
namespace {

/// The system's reason; empty if all went well. A file that exists is not touched.
std::string create(const std::string& path, const NewFile& file) {
  const Descriptor descriptor(::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, file.mode));
  if (descriptor.get() < 0) return std::strerror(errno);
  const OutputResult written = writeWhole(descriptor.get(), file.content);
  if (written.error == 0) return {};
  std::error_code ignored;
  std::filesystem::remove(path, ignored);
  return std::strerror(written.error);
}

int refuse(std::string_view message, std::string_view detail) {
  showMessage(fmt::format("Error: {}\n{}", message, detail));
  return 1;
}

/// Writes them all, or none. Returns what is wrong.
std::string createAll(const std::filesystem::path& folder, const std::vector<NewFile>& files) {
  std::vector<std::string> made;
  for (const NewFile& file : files) {
    const std::filesystem::path path = folder / file.name;
    std::error_code failed;
    std::filesystem::create_directories(path.parent_path(), failed);
    const std::string reason = failed ? failed.message() : create(path.string(), file);
    if (reason.empty()) {
      made.push_back(path.string());
      continue;
    }
    for (const std::string& each : made) std::filesystem::remove(each, failed);
    return fmt::format("{}: {}", path.string(), reason);
  }
  return {};
}

}  // namespace

int writeNewSetup(const std::string& folder) {
  const std::vector<NewFile> files = newSetupFiles();
  const std::filesystem::path root = folder.empty() ? std::filesystem::path(".") : std::filesystem::path(folder);
  if (toLowerAscii(folder).ends_with(".kdx")) {
    return refuse("Unable to write a new setup",
                  fmt::format("expected the folder for it, found {}; the setup is called {}", folder, files[0].name));
  }
  std::string present;
  for (const NewFile& file : files) {
    std::error_code ignored;
    const std::filesystem::path path = root / file.name;
    if (std::filesystem::exists(std::filesystem::symlink_status(path, ignored))) present += "\n   " + path.string();
  }
  if (!present.empty()) {
    return refuse("Unable to write a new setup",
                  "nothing was written, as these files are there already; name another folder:" + present);
  }
  if (const std::string reason = createAll(root, files); !reason.empty()) {
    return refuse("Unable to write a new setup", reason);
  }
  std::string list;
  for (const NewFile& file : files) list += fmt::format("{:<32} {}\n", (root / file.name).string(), file.meaning);
  const std::string setup = (root / files[0].name).string();
  return writeAnswer(fmt::format("{}\nNext: Mirevo --check {}, then Mirevo {}\n", list, setup, setup));
}

}  // namespace mirevo
