#include "import/ostrich_parameters.h"

#include <algorithm>
#include <cmath>
#include <optional>
#include <utility>

#include <fmt/format.h>

#include "common/text.h"

namespace mirevo {
namespace {

/// A transformation of Ostrich: of the given values, of the search, or of what the model gets.
enum class Scale { none, log10, ln };

class ParameterImport final {
 public:
  ParameterImport(const OstrichInput& input, ImportedCase& imported) : input_(input), made_(imported) {}

  void add() {
    addEach("Params", [this](const OstrichLine& line) { addReal(line); });
    addEach("IntegerParams", [this](const OstrichLine& line) { addInteger(line); });
    addEach("ComboParams", [this](const OstrichLine& line) { addChoice(line); });
    addEach("TiedParams", [this](const OstrichLine& line) { addTied(line); });
    if (made_.parameters.empty()) {
      failImport({made_.source, 0}, "expected a parameter between BeginParams and EndParams, found none");
    }
  }

 private:
  template <class AddLine>
  void addEach(std::string_view name, AddLine addLine) {
    const OstrichBlock* const block = input_.block(name);
    if (block == nullptr) return;
    for (const OstrichLine& line : block->lines) {
      if (made_.parameter(line.words.front()) != nullptr) {
        failImport(line.place, fmt::format("the parameter {} is there twice", line.words.front()));
      }
      addLine(line);
    }
  }

  static void requireWords(const OstrichLine& line, std::size_t least, std::string_view form) {
    if (line.words.size() >= least) return;
    failImport(line.place, fmt::format("expected {}, found {}", form, quotedForMessage(line.text)));
  }
  static double numberAt(const OstrichLine& line, std::size_t i) {
    const auto value = i < line.words.size() ? parseReal(line.words[i]) : std::nullopt;
    if (!value) {
      failImport(line.place,
                 fmt::format("expected a number as word {}, found {}", i + 1,
                             i < line.words.size() ? quotedForMessage(line.words[i]) : "the end of the line"));
    }
    return *value;
  }
  static Scale scaleAt(const OstrichLine& line, std::size_t i) {
    const std::string word = i < line.words.size() ? toLowerAscii(line.words[i]) : "none";
    if (word == "none") return Scale::none;
    if (word == "log10") return Scale::log10;
    if (word == "ln" || word == "log") return Scale::ln;
    failImport(line.place,
               fmt::format("expected none, log10 or ln as word {}, found {}", i + 1, quotedForMessage(word)));
  }
  static double unscaled(double value, Scale scale) {
    return scale == Scale::log10 ? std::pow(10.0, value) : scale == Scale::ln ? std::exp(value) : value;
  }

  /// Takes bounds and initial value from words 2 to 4, which are of `scale`.
  void takeRange(const OstrichLine& line, Scale scale, ModelParameter& parameter) {
    parameter.lowerBound = unscaled(numberAt(line, 2), scale);
    parameter.upperBound = unscaled(numberAt(line, 3), scale);
    if (parameter.lowerBound > parameter.upperBound) {
      failImport(line.place, fmt::format("expected a lower bound of at most the upper one, found {} and {}",
                                         line.words[2], line.words[3]));
    }
    const std::string& initial = line.words[1];
    if (!parseReal(initial)) {
      if (!equalIgnoringCase(initial, "random") && !equalIgnoringCase(initial, "extract")) {
        failImport(line.place, fmt::format("expected a number, random or extract as the initial value, found {}",
                                           quotedForMessage(initial)));
      }
      const bool isLog = parameter.transformationType == TransformationType::logarithmic && parameter.lowerBound > 0.0;
      parameter.initialValue = isLog ? std::sqrt(parameter.lowerBound * parameter.upperBound)
                                     : 0.5 * (parameter.lowerBound + parameter.upperBound);
      if (parameter.transformationType == TransformationType::integer) {
        parameter.initialValue = std::floor(parameter.initialValue);
      }
      made_.task.includesInitial = false;
      made_.notes.add(
          NoteKind::toCheck, line.place,
          fmt::format("the initial value {}: {}, the middle of the range, stands in the setup, and the search "
                      "draws its first sets (Include_Initial_Parameters = 0)",
                      initial, formatReal(parameter.initialValue)));
      return;
    }
    parameter.initialValue = unscaled(numberAt(line, 1), scale);
    if (parameter.initialValue < parameter.lowerBound || parameter.initialValue > parameter.upperBound) {
      failImport(line.place, fmt::format("expected an initial value between the bounds {} and {}, found {}",
                                         line.words[2], line.words[3], initial));
    }
  }

  void noteFormat(const OstrichLine& line, std::size_t i) {
    for (; i < line.words.size(); ++i) {
      if (equalIgnoringCase(line.words[i], "free")) continue;
      made_.notes.add(NoteKind::toCheck, line.place,
                      fmt::format("the format {}: values are written with as many digits as the field has room for",
                                  line.words[i]));
    }
  }

  void addReal(const OstrichLine& line) {
    requireWords(line, 4, "name, initial value, lower bound, upper bound, and transformations");
    constexpr std::size_t kIn = 4;
    constexpr std::size_t kSearch = 5;
    constexpr std::size_t kOut = 6;
    ModelParameter parameter;
    parameter.name = line.words[0];
    if (scaleAt(line, kSearch) != Scale::none) parameter.transformationType = TransformationType::logarithmic;
    takeRange(line, scaleAt(line, kIn), parameter);
    if (parameter.transformationType == TransformationType::logarithmic && !(parameter.lowerBound > 0.0)) {
      failImport(line.place,
                 fmt::format("expected a lower bound above 0 for a search of logarithms, found {}", line.words[2]));
    }
    if (scaleAt(line, kIn) != Scale::none) {
      made_.notes.add(NoteKind::expressed, line.place,
                      fmt::format("the values of {} are given as {}: in the setup they are the values themselves",
                                  parameter.name, line.words[kIn]));
    }
    noteFormat(line, kOut + 1);
    const Scale out = scaleAt(line, kOut);
    if (out == Scale::none) {
      made_.parameters.push_back(std::move(parameter));
      return;
    }
    ModelParameter written;
    written.name = std::exchange(parameter.name, parameter.name + "_value");
    written.parameterType = ParameterType::dependent;
    written.equation = fmt::format("{}({})", out == Scale::log10 ? "log10" : "log", nameInEquation(parameter.name));
    written.initialValue = out == Scale::log10 ? std::log10(parameter.initialValue) : std::log(parameter.initialValue);
    if (!std::isfinite(written.initialValue)) {
      failImport(line.place,
                 fmt::format("expected values above 0, as {} is written as {}", written.name, line.words[kOut]));
    }
    written.lowerBound = written.upperBound = written.initialValue;
    made_.notes.add(
        NoteKind::expressed, line.place,
        fmt::format("{} is searched, and {} = {} goes to the model", parameter.name, written.name, written.equation));
    made_.parameters.push_back(std::move(parameter));
    made_.parameters.push_back(std::move(written));
  }

  void addInteger(const OstrichLine& line) {
    requireWords(line, 4, "name, initial value, lower bound and upper bound");
    ModelParameter parameter;
    parameter.name = line.words[0];
    parameter.transformationType = TransformationType::integer;
    takeRange(line, Scale::none, parameter);
    noteFormat(line, 4);
    made_.parameters.push_back(std::move(parameter));
  }

  /// A list of values: there is no such parameter here.
  void addChoice(const OstrichLine& line) {
    requireWords(line, 3, "name, type, initial value, number of values and the values");
    const auto value = parseReal(line.words[2]);
    if (!value) {
      failImport(line.place, fmt::format("expected a number, found {}: texts cannot be parameters here; write the text "
                                         "into the template and remove the parameter",
                                         quotedForMessage(line.words[2])));
    }
    ModelParameter parameter;
    parameter.name = line.words[0];
    parameter.parameterType = ParameterType::fixed;
    parameter.initialValue = parameter.lowerBound = parameter.upperBound = *value;
    made_.notes.add(NoteKind::toCheck, line.place,
                    fmt::format("{} has a list of values, which has no counterpart: it is fixed at {}", parameter.name,
                                formatReal(*value)));
    made_.parameters.push_back(std::move(parameter));
  }

  /// The equation of a tied parameter over the names `x`, whose type is word `at`, and the number of its coefficients.
  std::pair<std::string, std::size_t> equationOf(const OstrichLine& line, std::size_t at,
                                                 const std::vector<std::string>& x) const {
    const std::string type = toLowerAscii(line.words[at]);
    const auto c = [&](std::size_t i) { return "(" + formatReal(numberAt(line, at + 1 + i)) + ")"; };
    std::string equation;
    std::size_t coefficients = 0;
    if (type == "linear" && x.size() == 1) {
      equation = fmt::format("{} * {} + {}", c(0), x[0], c(1));
      coefficients = 2;
    } else if (type == "linear" && x.size() == 2) {
      equation = fmt::format("{} * {} * {} + {} * {} + {} * {} + {}", c(0), x[0], x[1], c(1), x[1], c(2), x[0], c(3));
      coefficients = 4;
    } else if (type == "wsum") {
      for (std::size_t i = 0; i < x.size(); ++i) equation += fmt::format("{}{} * {}", i == 0 ? "" : " + ", c(i), x[i]);
      coefficients = x.size();
    } else if (type == "exp" && x.size() == 1) {
      const bool isNatural = equalIgnoringCase(line.words[std::min(at + 1, line.words.size() - 1)], "exp");
      equation = isNatural ? fmt::format("{} * exp({} * {}) + {}", c(1), c(2), x[0], c(3))
                           : fmt::format("{} * {} ^ ({} * {}) + {}", c(1), c(0), c(2), x[0], c(3));
      coefficients = 4;
    } else {
      failImport(line.place,
                 fmt::format("expected a tied parameter of type linear (of 1 or 2 parameters), wsum or exp, "
                             "found {} of {}: give {} as a parameter of BeginParams, import, and write its "
                             "Parameter_Equation into the setup",
                             quotedForMessage(line.words[at]), x.size(), line.words[0]));
    }
    return {equation, coefficients};
  }

  /// name, number of parameters, their names, type, coefficients.
  void addTied(const OstrichLine& line) {
    requireWords(line, 4, "name, number of parameters, their names, type and coefficients");
    const auto count = parseInteger(line.words[1]);
    const auto names = static_cast<std::size_t>(std::max(count.value_or(0), 0));
    if (names == 0 || names > line.words.size() - 3) {
      failImport(line.place,
                 fmt::format("expected the number of parameters, found {}", quotedForMessage(line.words[1])));
    }
    std::vector<std::string> x;
    for (std::size_t i = 0; i < names; ++i) {
      const ModelParameter* const parent = made_.parameter(line.words[2 + i]);
      if (parent == nullptr) {
        failImport(line.place,
                   fmt::format("expected the name of a parameter, found {}", quotedForMessage(line.words[2 + i])));
      }
      x.push_back(nameInEquation(parent->name));
    }
    const std::size_t at = 2 + names;
    const auto [equation, coefficients] = equationOf(line, at, x);
    noteFormat(line, at + 1 + coefficients);
    made_.notes.add(NoteKind::toCheck, line.place, fmt::format("read as {} = {}", line.words[0], equation));
    ModelParameter parameter;
    parameter.name = line.words[0];
    parameter.parameterType = ParameterType::dependent;
    parameter.equation = equation;
    made_.parameters.push_back(std::move(parameter));
  }

  const OstrichInput& input_;
  ImportedCase& made_;
};

}  // namespace

void addOstrichParameters(const OstrichInput& input, ImportedCase& imported) {
  ParameterImport(input, imported).add();
}

}  // namespace mirevo
