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
 protected:
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
      const auto place = text.find(from);
      EXPECT_NE(place, std::string::npos) << from;
      if (place == std::string::npos) continue;
      EXPECT_EQ(text.find(from, place + 1), std::string::npos) << from << " stands more than once";
      text.replace(place, from.size(), to);
    }
    return text;
  }

  RunConfig read(std::string_view edits = {}) {
    RunLog log;
    return readSetup(folder_ / "setup.kdx", edited(edits), log);
  }

  /// The error that reading ends with as refusalOf() tells it, the fixture's folder left out; empty when it is valid.
  std::string failure(std::string_view edits) {
    const std::string refusal = refusalOf([&] { read(edits); });
    return refusal == "accepted" ? "" : withoutFolder(refusal);
  }

  std::string withoutFolder(std::string text) const {
    const std::string prefix = folder_.path() + "/";
    for (auto place = text.find(prefix); place != std::string::npos; place = text.find(prefix, place)) {
      text.erase(place, prefix.size());
    }
    return text;
  }

  /// What reading writes to the log, whether it fails or not.
  std::string logOf(std::string_view edits) {
    RunLog log;
    refusalOf([&] { readSetup(folder_ / "setup.kdx", edited(edits), log); });
    std::string reason;
    EXPECT_TRUE(log.open(folder_ / "setup.log", reason)) << reason;
    return withoutFolder(folder_.read("setup.log"));
  }

  TemporaryFolder folder_;
};

}  // namespace mirevo
