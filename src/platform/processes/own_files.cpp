#include "platform/processes/own_files.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <initializer_list>
#include <system_error>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/file_copy.h"
#include "common/paths.h"
#include "platform/processes/folder_room.h"
#include "platform/processes/leaving_links.h"
#include "platform/processes/process_folder.h"

namespace mirevo {
namespace {

namespace fs = std::filesystem;

/// The largest folder behind a link that is copied into every process folder; the manual names it.
constexpr FolderExtent kMostCopied{100'000'000, 10'000};
/// Links on the way to one file; more are a circle.
constexpr int kMostLinks = 40;

[[noreturn]] void refuse(const std::string& file, const LeavingLink& link, std::string_view why) {
  fatalError(
      fmt::format("Error: The file {} does not lie in the model's folder", file),
      fmt::format("the link {} leads to {}, which all model runs would share; {}\nReplace the link with a folder "
                  "or file of the model, or name another file.",
                  link.link, link.target, why));
}

/// The type of what the link leads to; refuses what cannot be copied.
fs::file_type requireCopyable(const std::string& file, const LeavingLink& link,
                              std::initializer_list<const std::string*> folders) {
  if (!link.fault.empty()) fatalError("Error: Unable to read the link " + link.link, link.fault);
  std::error_code failed;
  const fs::file_type type = fs::status(link.target, failed).type();
  switch (type) {
    case fs::file_type::not_found:
      if (link.isForFolder) refuse(file, link, "there is no such folder");
      return type;
    case fs::file_type::regular:
      return type;
    case fs::file_type::directory:
      for (const std::string* folder : folders) {
        if (!pathInFolder(resolvedPath(*folder), link.target)) continue;
        refuse(file, link, fmt::format("it cannot be copied, as {} is in it", *folder));
      }
      if (const FolderExtent extent = extentOf(link.target, failed, kMostCopied); failed) {
        refuse(file, link, failed.message());
      } else if (!extent.exceeds(kMostCopied)) {
        return type;
      }
      refuse(file, link,
             fmt::format("it is too large to be copied for each of them: more than {} MB or {} files",
                         kMostCopied.bytes / 1'000'000, kMostCopied.entries));
    default:
      refuse(file, link, failed ? failed.message() : "it is neither a file nor a folder");
  }
}

void replaceWithCopy(const LeavingLink& link, fs::file_type type, std::string_view processFolderPrefix) {
  if (::unlink(link.link.c_str()) != 0) {
    fatalError(fmt::format("Unable to remove the link {}: {}", link.link, std::strerror(errno)));
  }
  std::string reason;
  if (type == fs::file_type::directory) {
    copyFolder(link.target, link.link, processFolderPrefix);
  } else if (type == fs::file_type::regular && !copyWhole(link.target, link.link, reason)) {
    fatalError(fmt::format("Unable to copy {} in place of the link {}: {}", link.target, link.link, reason));
  }
}

}  // namespace

std::vector<std::string> requireOwnFiles(const std::string& baseFolder, std::span<const std::string> files) {
  std::vector<std::string> told;
  for (const std::string& file : files) {
    const auto link = findLeavingLink(baseFolder, file);
    if (!link || requireCopyable(baseFolder + file, *link, {&baseFolder}) != fs::file_type::directory) continue;
    std::string text = fmt::format(
        "The link {} leads to {}, out of the model's folder. Every process folder has a copy of that folder in its "
        "place, as model runs write or read files of their own in it; the original stays as it is.",
        link->link, link->target);
    if (std::find(told.begin(), told.end(), text) == told.end()) told.push_back(std::move(text));
  }
  return told;
}

void makeFilesOwn(const std::string& folder, const std::string& baseFolder, std::span<const std::string> files,
                  std::string_view processFolderPrefix) {
  for (const std::string& file : files) {
    int count = 0;
    while (const auto link = findLeavingLink(folder, file)) {
      if (++count > kMostLinks) refuse(folder + file, *link, "it leads through too many others");
      replaceWithCopy(*link, requireCopyable(folder + file, *link, {&baseFolder, &folder}), processFolderPrefix);
    }
  }
}

}  // namespace mirevo
