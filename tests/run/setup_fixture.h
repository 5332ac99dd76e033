#pragma once

#include <algorithm>
#include <string>

#include <gtest/gtest.h>

#include "common/files.h"
#include "refusal.h"
#include "run/setup/setup_reader.h"
#include "temporary_folder.h"

namespace mirevo {

/// A folder with a small model and a valid setup of every section beside it, tests/run/setup.kdx. Tests change it by
/// `edits`, a text "from => to & from => to": the one place where `from` stands becomes `to`. Behind an assignment `to`
/// is the value alone ("Option = 2 => 0"), unless it is empty or an assignment itself.
class SetupFixture : public testing::Test {
 public:
  SetupFixture() {
    folder_.write("model/run.sh", "#!/bin/sh\n");
    folder_.write("model/soil.par", "0\n");
    folder_.write("model/soil.tpl", "!\n!Depth!\n");
    folder_.write("model/blank.tpl", "   \n!Depth!\n");
    folder_.write("sample.txt", "Depth\tRate\n");
  }

  std::string edited(std::string_view edits) const {
    std::string reason;
    std::string text = readTextFile(MIREVO_SOURCE_DIR "/tests/run/setup.kdx", reason).value_or(reason);
    while (!edits.empty()) {
      const std::string_view edit = edits.substr(0, edits.find(" & "));
      edits.remove_prefix(std::min(edits.size(), edit.size() + 3));
      const std::string from(edit.substr(0, edit.find(" => ")));
      std::string to(edit.substr(from.size() + 4));
      const auto value = from.find(" = ");
      if (value != std::string::npos && !to.empty() && to.find(" = ") == std::string::npos)
        to.insert(0, from.substr(0, value + 3));
      const auto location = text.find(from);
      EXPECT_NE(location, std::string::npos) << from;
      if (location == std::string::npos) continue;
      EXPECT_EQ(text.find(from, location + 1), std::string::npos) << from << " stands more than once";
      text.replace(location, from.size(), to);
    }
    return text;
  }

  /// The setup with a keyword of a section ("MODEL_PARAMETERS/PARAMETER_n", of items the first) set to a value as it is
  /// to be written.
  static std::string withValue(std::string text, std::string_view section, std::string_view keyword,
                               std::string_view value) {
    std::size_t at = 0;
    for (std::string_view rest = section; !rest.empty();) {
      std::string name(rest.substr(0, rest.find('/')));
      rest.remove_prefix(std::min(rest.size(), name.size() + 1));
      if (name.ends_with("_n")) name.back() = '1';
      at = text.find("[" + name + "]", at);
      EXPECT_NE(at, std::string::npos) << section;
      at += name.size() + 2;
    }
    const std::string name(section.substr(section.rfind('/') + 1));
    const std::size_t end = std::min(text.find("[/", at), text.find("[", at + 1));
    const std::string assignment = std::string(keyword) + " = ";
    const std::size_t old = text.find(" " + assignment, at);
    if (old < end) {
      text.replace(old + 1, text.find('\n', old) - old - 1, assignment + std::string(value));
    } else {
      text.insert(at, "\n" + assignment + std::string(value) + "\n");
    }
    return text;
  }

  /// The error that reading a text ends with, the fixture's folder left out; empty when it is valid.
  std::string failureOf(const std::string& text) {
    RunLog log;
    const std::string refusal = refusalOf([&] { readSetup(folder_ / "setup.kdx", text, log); });
    return refusal == "accepted" ? "" : withoutFolder(refusal);
  }

  RunConfig read(std::string_view edits = {}) {
    RunLog log;
    return readSetup(folder_ / "setup.kdx", edited(edits), log);
  }

  /// The error that reading ends with as refusalOf() tells it, the fixture's folder left out; empty when it is valid.
  std::string failure(std::string_view edits) { return failureOf(edited(edits)); }

  std::string withoutFolder(std::string text) const {
    const std::string prefix = folder_.path() + "/";
    for (auto location = text.find(prefix); location != std::string::npos; location = text.find(prefix, location)) {
      text.erase(location, prefix.size());
    }
    return text;
  }

  /// What reading writes to the log, whether it fails or not.
  std::string logOf(std::string_view edits) { return logOfText(edited(edits)); }
  std::string logOfText(const std::string& text) {
    RunLog log;
    refusalOf([&] { readSetup(folder_ / "setup.kdx", text, log); });
    std::string reason;
    EXPECT_TRUE(log.open(folder_ / "setup.log", reason)) << reason;
    return withoutFolder(folder_.read("setup.log"));
  }

  TemporaryFolder folder_;
};

}  // namespace mirevo
