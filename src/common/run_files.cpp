#include "common/run_files.h"

#include <vector>

namespace mirevo {
namespace {

std::vector<RunFile> filesOfSetup() {
  using namespace run_files;
  std::vector<RunFile> files{kLog,           kTerminationLog, kMessages,     kKill,          kSeries,  kReport,
                             kBand,          kSavedFolder,    kFailedFolder, kProcessFolder, kRunLock, kProcessLock,
                             kOwnFailedRuns, kScenarioSeries, kSobolSeries,  kTotalBand};
  for (const ResultFileNames& names : {kPlain, kSensitivity, kOptimisation}) {
    files.insert(files.end(), {names.results, names.restart, names.simulatedValues, names.record, names.failures,
                               names.pairs, names.checksums, names.unkept});
    files.insert(files.end(), names.tables.begin(), names.tables.end());
  }
  return files;
}

}  // namespace

std::span<const RunFile> runFilesOfSetup() {
  static const std::vector<RunFile> kFiles = filesOfSetup();
  return kFiles;
}

std::string runFilePath(std::string_view prefix, const RunFile& file) {
  std::string path(prefix);
  path += file.stem;
  if (!file.isNumbered) path += file.extension;
  return path;
}

std::string runFilePath(std::string_view prefix, const RunFile& file, int number) {
  return std::string(prefix).append(file.stem).append(std::to_string(number)).append(file.extension);
}

std::string pathBeside(std::string_view prefix, const RunFile& file) {
  return runFilePath(prefix.substr(0, prefix.rfind('/') + 1), file);
}

std::string fileNameOf(std::string_view path) {
  return std::string(path.substr(path.rfind('/') + 1));
}

}  // namespace mirevo
