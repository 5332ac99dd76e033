#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "run/results/result_rows.h"
#include "run/results/row_checksums.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// A row of a result file that must not be taken for a result.
struct RowFault {
  std::size_t line = 0;  ///< in the file, from 1
  int number = 0;        ///< of its evaluation
  std::string what;      ///< what is wrong with it, for people
};

struct CheckedRows {
  std::vector<RowFault> faults;     ///< in the order of the rows; one of a row
  std::size_t withoutChecksum = 0;  ///< rows of which only their own values tell whether they hold
};

/// How much is known of the rows that are checked.
enum class RowOrigin {
  thisSetup,     ///< the setup is the one that they were computed with
  perhapsOther,  ///< it may have been changed since; it says nothing of a row that has its checksum
};

/// Checks the rows of a result file, in the order of the file: whether they are as they were written (`checksums`, of
/// which the last rows may have none, as after a power cut, and all rows of an earlier version of the program), whether
/// the objective functions are those of the measures, the aggregate that of the objective functions, and the values of
/// a failed evaluation those of a failed one, and whether a number occurs twice or is beyond the plan of the run.
/// Aggregates whose scale comes from the sample of the run are checked by their checksums alone: as long as the run
/// goes on they may be NaN.
CheckedRows checkRows(const ResultRows& rows, const RowChecksums& checksums, const RunConfig& config, RowOrigin origin);

/// "line 14 (evaluation No. 5): it has ..."
std::string rowFaultText(const RowFault& fault);

}  // namespace mirevo
