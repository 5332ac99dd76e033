#include "import/source_files.h"

#include <algorithm>
#include <filesystem>
#include <unistd.h>

#include <fmt/format.h>

#include "common/files.h"
#include "common/text.h"
#include "import/source_words.h"

namespace mirevo {

namespace fs = std::filesystem;

std::string SourceFiles::nameOf(std::string_view name, const SourcePlace& place, ImportNotes& notes) const {
  std::string written(name);
  if (written.find('\\') != std::string::npos && !exists(written)) {
    std::replace(written.begin(), written.end(), '\\', '/');
    notes.addForEach(NoteKind::expressed, place, fmt::format("{} is {} here", name, written));
  }
  const fs::path path = fs::path(written).lexically_normal();
  const bool isInside = !written.empty() && path.is_relative() && *path.begin() != ".." && path.has_filename();
  if (!isInside || path == ".") {
    failImport(place, fmt::format("expected a file in the folder of {} or below it, since each model run has a copy of "
                                  "this folder, found {}: move the file there",
                                  place.file, quotedForMessage(name)));
  }
  return path.string();
}

bool SourceFiles::exists(const std::string& name) const {
  return faultOfFile(folder_ + "/" + name).empty();
}

std::string SourceFiles::read(const std::string& name, const SourcePlace& place) const {
  std::string reason;
  auto text = readTextFile(folder_ + "/" + name, reason);
  if (!text) failImport(place, fmt::format("{}: {}", quotedForMessage(name), reason));
  return *std::move(text);
}

std::string shellCommand(const std::string& command, const SourcePlace& place, const SourceFiles& files,
                         ImportNotes& notes) {
  const std::vector<std::string> words = wordsOf(command);
  if (words.empty()) return {};
  const std::string& program = words.front();
  const std::string ending = toLowerAscii(fs::path(program).extension().string());
  if (ending == ".bat" || ending == ".cmd" || ending == ".exe" || command.find('\\') != std::string::npos) {
    notes.add(NoteKind::toCheck, place,
              fmt::format("the command {} is one of Windows: put the one of this system into model/mirevo_run.sh",
                          quotedForMessage(command)));
    return command;
  }
  const bool isHere = program.find('/') == std::string::npos && files.exists(program);
  if (isHere || program.starts_with("./")) {
    const std::string path = files.folder() + "/" + program;
    if (files.exists(program) && ::access(path.c_str(), X_OK) != 0) {
      notes.add(NoteKind::toCheck, place, fmt::format("{} is not executable: chmod +x model/{}", program, program));
    }
  }
  if (!isHere) return command;
  notes.add(NoteKind::expressed, place, fmt::format("{0} is started as ./{0}, as it stands in the folder", program));
  return "./" + std::string(trim(command));
}

}  // namespace mirevo
