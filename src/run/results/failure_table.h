#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// A failed evaluation in `<setup>_Failures.dat` or, of another task, its like, which programs read.
struct FailureRow {
  int number = 0;  ///< of the evaluation
  EvaluationFailure failure;
};

/// The beginning of the file; `headLines` are for people.
std::string failureTableHead(const std::vector<std::string>& headLines);
/// One row, line end included.
std::string failureRowText(const FailureRow& row);
/// The rows of the file's text. Any text is taken; what is no row of one is left out.
std::vector<FailureRow> readFailureTable(std::string_view text);

}  // namespace mirevo
