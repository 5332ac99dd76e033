#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/analyses/sobol_design.h"
#include "algorithms/analyses/sobol_indices.h"
#include "common/data_table.h"

namespace mirevo {

/// The indices of an output from the first blocks of the design.
struct SobolStage {
  std::size_t rows = 0;
  std::vector<SobolIndex> first;
  std::vector<SobolIndex> total;
};

/// An output measure or objective function with its indices.
struct SobolOutput {
  std::string kind;  ///< "measure" or "objective"
  std::string name;
  SobolIndices indices;
  std::vector<SobolStage> stages;  ///< an eighth, a quarter, a half and all of the blocks
};

/// What a Sobol' analysis found.
struct SobolFindings {
  SobolDesign design;
  std::vector<SobolFactor> factors;
  std::vector<std::string> parameters;  ///< names of the variable parameters
  std::vector<SobolOutput> outputs;     ///< measures, then objective functions
  std::size_t runCount = 0;             ///< evaluations that were made
  std::size_t failedCount = 0;
  double negligibleIndex = 0.05;
};

/// Of a single factor, whose indices are known without a run; empty for more of them.
std::string singleFactorText(std::span<const SobolFactor> factors);

/// The indices of an output for the whole design and its stages. `values`: one per set, NaN for a failed run.
SobolOutput sobolOutput(const SobolDesign& design, std::span<const double> values, const ReplicateBootstrap& bootstrap,
                        std::string kind, std::string name);

/// The indices as tables for programs: all of them, and those of the stages.
std::vector<DataTable> sobolTables(const SobolFindings& findings);

/// The indices as lines of text, in words: which factors matter, which can be fixed, which interact. Of outputs without
/// objective functions these are the measures. `tableFile` has the rest.
std::vector<std::string> formatSobol(const SobolFindings& findings, std::string_view tableFile);

/// Warnings about a design too small for what it is to tell, and failures that may distort it.
std::vector<std::string> sobolWarnings(const SobolFindings& findings);

}  // namespace mirevo
