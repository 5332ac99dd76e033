#include "run/setup/file_roles.h"

#include <algorithm>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/core.h>

#include "common/paths.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "common/take_text.h"
#include "common/text.h"
#include "platform/processes/leaving_links.h"

namespace mirevo {
namespace {

/// Whether the name, after that of the setup, is that of the run's file.
bool isNamedLike(std::string_view rest, const RunFile& file) {
  if (!takeText(rest, file.stem) || !rest.ends_with(file.extension)) return false;
  rest.remove_suffix(file.extension.size());
  return file.isNumbered ? isDigits(rest) : rest.empty();
}

/// The file or folder of runs, one of `files` named after `prefix`, that is `path` or has it inside; both are resolved.
/// What a model may call alike is one by its content alone.
std::optional<std::string> runsOwn(const std::string& path, const std::string& prefix, std::span<const RunFile> files) {
  const std::size_t slash = prefix.rfind('/');
  const auto below = pathInFolder(path, prefix.substr(0, slash));
  if (!below) return std::nullopt;
  std::string_view rest = below->substr(0, below->find('/'));
  const std::string name(rest);
  if (!takeText(rest, std::string_view(prefix).substr(slash + 1))) return std::nullopt;
  const bool isOwn = std::any_of(files.begin(), files.end(), [&](const RunFile& file) {
    return isNamedLike(rest, file) && (!file.mayBeModels || carriesMark(path, file));
  });
  return isOwn ? std::optional(prefix.substr(0, slash + 1) + name) : std::nullopt;
}

/// The same for the setup's files, which are beside it, and the folders that may be elsewhere.
std::optional<std::string> runsOwn(const std::string& path, const RunConfig& config, std::span<const RunFile> files) {
  const std::string target = resolvedPath(path);
  for (const std::string& prefix :
       {fmt::format("{}/{}", config.setupFolder, config.setupName), processFolderPrefix(config)}) {
    const std::size_t slash = prefix.rfind('/');
    const std::string folder = resolvedPath(prefix.substr(0, std::max<std::size_t>(slash, 1)));
    const std::string from = (folder == "/" ? std::string() : folder) + prefix.substr(slash);
    if (auto own = runsOwn(target, from, files)) return own;
  }
  return std::nullopt;
}

/// Process folders are refused where they are made.
void checkBaseFolder(const RunConfig& config, const SectionsRead& sections) {
  const RunFile folders[] = {run_files::kFailedFolder, run_files::kSavedFolder};
  const auto own = runsOwn(config.baseFolder, config, folders);
  if (!own) return;
  sections.batchItems.front().refuse(
      fmt::format("Error: The base folder {} lies in {}, which a run of this setup removes or renames",
                  config.baseFolder, *own),
      "BatchFileName", "expected a folder of your own: copy it under another name and name the copy here");
}

void checkParameterFiles(const RunConfig& config, const SectionsRead& sections) {
  for (std::size_t i = 0; i < config.parameterFiles.size(); ++i) {
    const std::string& file = config.parameterFiles[i].paramFileName;
    const auto refuse = [&](std::string_view what, const std::string& where) {
      sections.parameterFiles[i].refuse(
          fmt::format("Error: The model parameter file {} is {}, too",
                      sections.parameterFiles[i].written("ParamFileName"), what),
          "ParamFileName",
          fmt::format("expected another file, since each model run writes this one before its batch starts; the other "
                      "is {}",
                      where));
    };
    for (std::size_t b = 0; b < config.batchItems.size(); ++b) {
      if (config.batchItems[b].batchFileName != file) continue;
      refuse("a batch file", sections.batchItems[b].location("BatchFileName") + ": BatchFileName");
    }
    // Each is removed before a model run and read after it, whether a measure uses its numbers or not.
    for (std::size_t further = 0; further < config.furtherMeasureFiles.size(); ++further) {
      if (config.furtherMeasureFiles[further].fileName != file) continue;
      refuse("an output-measure file", sections.furtherMeasureFiles[further].location("File_Name") + ": File_Name");
    }
    for (const OutputMeasure& measure : config.measures) {
      if (measure.interfaceType == InterfaceType::measureFile && config.measureFile == file) {
        refuse("the output-measure file", sections.measureFile->location("File_Name") + ": File_Name");
      }
      if (measure.interfaceType != InterfaceType::timeSeries || measure.simulation.fileName != file) continue;
      refuse("the file of a simulated series",
             measure.simulation.fileLocation.substr(0, measure.simulation.fileLocation.rfind(": ")));
    }
  }
}

void warnOfObservations(const RunConfig& config, const SectionsRead& sections) {
  for (std::size_t i = 0; i < config.measures.size(); ++i) {
    const OutputMeasure& measure = config.measures[i];
    if (measure.interfaceType != InterfaceType::timeSeries) continue;
    const auto own = runsOwn(measure.observation.fileName, config, runFilesOfSetup());
    if (!own) continue;
    sections.measures[i].warn(
        "Name",
        fmt::format("the observed series is in {}, which runs of this setup write, rename or remove: at the next "
                    "start it may be another one or gone. Keep it in a file or folder with another name",
                    *own));
  }
}

}  // namespace

void checkFileRoles(const RunConfig& config, const SectionsRead& sections) {
  checkBaseFolder(config, sections);
  checkParameterFiles(config, sections);
  warnOfObservations(config, sections);
}

}  // namespace mirevo
