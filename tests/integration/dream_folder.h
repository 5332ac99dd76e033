#pragma once

#include <cmath>
#include <string>

#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"

namespace mirevo::testing {

/// A setup with chains for a, b (c is fixed). `dream`: further lines of the section DREAM.
inline std::string writeDream(const ModelFolder& folder, RunSettings settings, const std::string& dream) {
  settings.option = 3;
  folder.writeSetup(settings);
  std::string text = folder.read("basin.kdx");
  const auto begin = text.find("Uncertainty_Type = 1");
  text.replace(begin, 20, "Uncertainty_Type = 'DREAM'");
  const auto first = text.find("[PARAMETER_1]", begin);
  const auto last = text.find("[/UNCERTAINTY_ESTIMATION]", first);
  text.replace(first, last - first, "[DREAM]\n" + dream + "\n    [/DREAM]\n  ");
  return folder.write("basin.kdx", text);
}

/// A number of a table whose rows begin with a name.
inline double dreamCell(const std::string& table, const std::string& name, const std::string& column) {
  const ReadTable read = readDataTable(table);
  for (const auto& row : read.rows) {
    if (row[0] == name) return realCell(row[*read.column(column)]).value();
  }
  ADD_FAILURE() << "no row " << name << " in\n" << table;
  return std::nan("");
}

}  // namespace mirevo::testing
