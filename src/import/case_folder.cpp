#include "import/case_folder.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <set>
#include <stdio.h>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "import/source_files.h"
#include "measures/instruction_file.h"
#include "parameters/template_file.h"

namespace mirevo {

namespace fs = std::filesystem;

namespace {

constexpr std::string_view kBatch = "mirevo_run.sh";

/// The text of a file of the model's folder, or of one that the import adds to it.
std::string textOf(const ImportedCase& imported, const std::string& file, const SourcePlace& place) {
  const auto added = imported.newFiles.find(file);
  return added != imported.newFiles.end() ? added->second : SourceFiles(imported.folder).read(file, place);
}

std::vector<double> initialValues(const ImportedCase& imported) {
  std::vector<double> values;
  for (const ModelParameter& parameter : imported.parameters) values.push_back(parameter.initialValue);
  return values;
}

void checkTemplates(ImportedCase& imported) {
  std::set<std::size_t> named;
  for (const ImportedTemplate& item : imported.templates) {
    const ParameterTemplate form(item.templateFile, textOf(imported, item.templateFile, item.place),
                                 imported.parameters);
    for (const std::size_t i : form.parametersNamed()) named.insert(i);
    if (imported.newFiles.contains(item.parameterFile) || SourceFiles(imported.folder).exists(item.parameterFile))
      continue;
    imported.newFiles.emplace(item.parameterFile, form.fill(initialValues(imported)));
    imported.notes.add(NoteKind::expressed, item.place,
                       fmt::format("{} did not exist and is made with the initial values", item.parameterFile));
  }
  for (std::size_t i = 0; i < imported.parameters.size(); ++i) {
    const ModelParameter& parameter = imported.parameters[i];
    if (named.contains(i)) continue;
    const std::string in = nameInEquation(parameter.name);
    const bool isUsed = std::any_of(imported.parameters.begin(), imported.parameters.end(),
                                    [&](const auto& other) { return other.equation.find(in) != std::string::npos; });
    if (isUsed) continue;
    imported.notes.add(NoteKind::toCheck, {imported.source, 0},
                       fmt::format("the parameter {} is in no template and does not reach the model", parameter.name));
  }
}

/// Reads the output that an earlier model run may have left in the folder. What the import has made was tried before.
void tryInstructions(ImportedCase& imported, const ImportedOutput& output, const InstructionFile& instructions) {
  const SourceFiles files(imported.folder);
  if (imported.newFiles.contains(output.instructionFile) || !files.exists(output.file)) return;
  std::string reason;
  if (instructions.read(output.file, files.read(output.file, output.place), reason)) return;
  imported.notes.add(
      NoteKind::toCheck, output.place,
      fmt::format("{} does not read the {} that is here: {}", output.instructionFile, output.file, reason));
}

void checkOutputs(ImportedCase& imported) {
  std::set<std::string> read;
  std::set<std::string> wanted;
  for (const ImportedMeasure& measure : imported.measures) wanted.insert(toLowerAscii(measure.measurement));
  for (const ImportedOutput& output : imported.outputs) {
    std::string reason;
    const auto file =
        InstructionFile::parse(output.instructionFile, textOf(imported, output.instructionFile, output.place), reason);
    if (!file) failImport(output.place, reason);
    tryInstructions(imported, output, *file);
    for (const std::string& name : file->names()) {
      if (!read.insert(toLowerAscii(name)).second) {
        failImport(output.place, fmt::format("expected names in {} that no other instruction file has, found {}",
                                             output.instructionFile, quotedForMessage(name)));
      }
      if (wanted.contains(toLowerAscii(name))) continue;
      imported.notes.add(
          NoteKind::toCheck, output.place,
          fmt::format("{} reads {}, which is no observation: it is left out", output.instructionFile, name));
    }
  }
  for (const ImportedMeasure& measure : imported.measures) {
    if (read.contains(toLowerAscii(measure.measurement))) continue;
    failImport(measure.place, fmt::format("expected an instruction that reads {}, found none", measure.measurement));
  }
}

[[noreturn]] void failWriting(const std::string& path, const std::string& reason) {
  fatalError("Error: Unable to write " + path, reason);
}

void writeNew(const fs::path& path, std::string_view content, unsigned mode) {
  std::error_code error;
  fs::create_directories(path.parent_path(), error);
  std::string reason;
  if (error) failWriting(path.parent_path().string(), error.message());
  if (!writeByUnlinkAndCreate(path.string(), content, mode, reason)) failWriting(path.string(), reason);
}

/// A link that leads out of the copied folder goes on leading to the same place.
void copyLink(const fs::path& from, const fs::path& to, const fs::path& root) {
  fs::path target = fs::read_symlink(from);
  const fs::path whole = (from.parent_path() / target).lexically_normal();
  const fs::path below = whole.lexically_relative(root);
  if (target.is_relative() && !below.empty() && *below.begin() == "..") target = whole;
  fs::create_symlink(target, to);
}

/// Copies the model's folder, without the one that is being made, which may be in it.
void copyModel(const fs::path& from, const fs::path& to, const fs::path& leftOut, ImportNotes& notes) {
  fs::create_directories(to);
  for (auto entry = fs::recursive_directory_iterator(from); entry != fs::recursive_directory_iterator(); ++entry) {
    const fs::path target = to / entry->path().lexically_relative(from);
    if (entry->path() == leftOut) {
      entry.disable_recursion_pending();
    } else if (entry->is_symlink()) {
      copyLink(entry->path(), target, from);
    } else if (entry->is_directory()) {
      fs::create_directory(target, entry->path());
    } else if (entry->is_regular_file()) {
      fs::copy_file(entry->path(), target);
    } else {
      notes.add(NoteKind::noCounterpart, {entry->path().string(), 0}, "neither a file nor a folder: it is not copied");
    }
  }
}

std::string batchText(const ImportedCase& imported) {
  std::string text = fmt::format("#!/bin/sh\n# Runs the model as {} has it.\nset -e\n", onOneLine(imported.source));
  for (const std::string& command : imported.commands) text += command + "\n";
  return text;
}

void fill(ImportedCase& imported, const fs::path& folder) {
  constexpr unsigned kText = 0644;
  constexpr unsigned kProgram = 0755;
  const fs::path model = folder / "model";
  copyModel(imported.folder, model, folder, imported.notes);
  for (const auto& [name, content] : imported.newFiles) {
    if (fs::exists(fs::symlink_status(model / name))) {
      failWriting((model / name).string(), "the model has a file of this name: rename it and import again");
    }
    writeNew(model / name, content, kText);
  }
  if (fs::exists(fs::symlink_status(model / kBatch))) {
    failWriting((model / kBatch).string(), "the model has a file of this name: rename it and import again");
  }
  writeNew(model / kBatch, batchText(imported), kProgram);
  writeNew(folder / (imported.name + ".kdx"), setupText(imported), kText);
  writeNew(folder / (imported.name + "_import.txt"),
           fmt::format("What mirevo-import made of {}\n\n{}", onOneLine(imported.source), imported.notes.text()),
           kText);
}

}  // namespace

void checkCase(ImportedCase& imported) {
  checkTemplates(imported);
  checkOutputs(imported);
}

void writeCaseFolder(ImportedCase& imported, const std::string& folder) {
  const fs::path target = fs::absolute(folder).lexically_normal();
  if (fs::exists(fs::symlink_status(target))) {
    fatalError("Error: Unable to write " + folder, "it exists: name another folder, or remove it first");
  }
  const fs::path unfinished = fmt::format("{}.{}{}", target.string(), ::getpid(), kTemporaryEnding);
  const auto remove = [&unfinished] {
    std::error_code ignored;
    fs::remove_all(unfinished, ignored);
  };
  try {
    fs::create_directory(unfinished);
    fill(imported, unfinished);
    if (::renameat2(AT_FDCWD, unfinished.c_str(), AT_FDCWD, target.c_str(), RENAME_NOREPLACE) != 0) {
      failWriting(folder, std::strerror(errno));
    }
  } catch (const fs::filesystem_error& error) {
    remove();
    failWriting(folder, error.what());
  } catch (...) {
    remove();
    throw;
  }
}

}  // namespace mirevo
