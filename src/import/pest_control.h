#pragma once

#include <cstddef>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "import/import_notes.h"

namespace mirevo {

/// A line of a table in a control file, or of a file that it names: its words by the names of the columns.
struct PestRow {
  SourcePlace place;
  std::map<std::string, std::string, std::less<>> values;

  bool has(std::string_view column) const;
  /// Throws FatalError where there is none.
  const std::string& text(std::string_view column) const;
  double number(std::string_view column) const;
  std::string textOr(std::string_view column, std::string_view otherwise) const;
  double numberOr(std::string_view column, double otherwise) const;
};

/// A term of a line of prior information: factor * value, or factor * log10(value).
struct PestPriorTerm {
  double factor = 1.0;
  std::string parameter;
  bool isLogarithm = false;
};

struct PestPrior {
  SourcePlace place;
  std::string name;
  std::vector<PestPriorTerm> terms;
  double value = 0.0;
  double weight = 0.0;
  std::string group;
};

/// A line that is not interpreted, with the section that it is in.
struct PestLine {
  SourcePlace place;
  std::string section;
  std::string text;
};

/// A setting of the control data: by position in files of version 1, by name in those of version 2.
struct PestSetting {
  SourcePlace place;
  std::string name;  ///< lower case; empty for a further word of version 1
  std::string value;
};

/// A control file (`case.pst`) of PEST or PEST++, of version 1 or 2, after the published manuals: Doherty, PEST User
/// Manual; White et al., PEST++ User's Manual.
struct PestControl {
  bool isVersion2 = false;
  std::vector<PestSetting> settings;
  std::vector<PestRow> parameterGroups;    ///< pargpnme, inctyp, derinc, derinclb, forcen, ...
  std::vector<PestRow> parameters;         ///< parnme, partrans, parchglim, parval1, parlbnd, parubnd, pargp, ...
  std::vector<PestRow> ties;               ///< parnme, partied
  std::vector<PestRow> observationGroups;  ///< obgnme, ...
  std::vector<PestRow> observations;       ///< obsnme, obsval, weight, obgnme
  std::vector<PestPrior> priors;
  std::vector<PestLine> commands;
  std::vector<PestRow> inputs;       ///< pest_file, model_file: a template and the file made from it
  std::vector<PestRow> outputs;      ///< the same of instructions and the file that they read
  std::vector<PestSetting> options;  ///< of `++` lines and of the control data of version 2
  std::vector<PestLine> others;      ///< what is in sections that are not read

  const PestSetting* setting(std::string_view name) const;
  /// The `++` option of that name.
  const PestSetting* option(std::string_view name) const;
};

/// Opens a file that a control file names; throws FatalError where there is none.
using PestFileReader = std::function<std::string(const std::string& name, const SourcePlace& place)>;

/// Parses a control file. `sourceName` is for messages and notes; `open` reads the tables of version 2. Throws
/// FatalError with the place and what was expected.
PestControl parsePestControl(const std::string& sourceName, std::string_view text, const PestFileReader& open,
                             ImportNotes& notes);

}  // namespace mirevo
