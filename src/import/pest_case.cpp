#include "import/pest_case.h"

#include <algorithm>
#include <cmath>
#include <set>
#include <utility>

#include <fmt/format.h>

#include "common/text.h"
#include "import/pest_control.h"

namespace mirevo {
namespace {

constexpr std::string_view kPriorInput = "mirevo_prior.in";
constexpr std::string_view kPriorOutput = "mirevo_prior.out";
constexpr std::string_view kPriorTemplate = "mirevo_prior.tpl";
constexpr std::string_view kPriorInstructions = "mirevo_prior.ins";
constexpr int kPriorField = 26;  // any number with all of its digits

class PestImport final {
 public:
  PestImport(const std::string& name, std::string_view text, const SourceFiles& files) : files_(files) {
    const PestFileReader open = [this](const std::string& table, const SourcePlace& place) {
      return files_.read(files_.nameOf(table, place, made_.notes), place);
    };
    control_ = parsePestControl(name, text, open, made_.notes);
    made_.source = name;
    made_.folder = files.folder();
  }

  ImportedCase make() {
    takeTask();
    takeParameters();
    takeTies();
    takeFiles();
    takeObservations();
    takePriors();
    takeCommands();
    takeGroups();
    noteOthers();
    return std::move(made_);
  }

 private:
  ImportNotes& notes() { return made_.notes; }

  void takeTask() {
    const PestSetting* const most = control_.setting("noptmax");
    const auto iterations = most == nullptr ? std::nullopt : parseInteger(most->value);
    if (most != nullptr && !iterations) {
      failImport(most->place, "expected an integer for NOPTMAX, found " + quotedForMessage(most->value));
    }
    const std::int32_t count = iterations.value_or(0);
    ImportedTask& task = made_.task;
    task.option = count == 0 ? "scenarios" : count < 0 ? "sensitivity" : "optimisation";
    const auto adjustable =
        std::count_if(control_.parameters.begin(), control_.parameters.end(), [](const PestRow& row) {
          const std::string kind = toLowerAscii(row.textOr("partrans", "none"));
          return kind == "none" || kind == "log";
        });
    // As many model runs as the iterations take with forward differences and ten trials of lambda.
    constexpr double kTrials = 10.0;
    constexpr double kFewest = 100.0;
    constexpr double kMost = 10000.0;
    const double runs = std::max(count, 0) * (static_cast<double>(adjustable) + kTrials);
    task.evaluations = static_cast<std::int32_t>(count > 0 ? std::clamp(runs, kFewest, kMost) : 1000.0);
    const SourcePlace place = most == nullptr ? SourcePlace{made_.source, 0} : most->place;
    if (most == nullptr) {
      notes().add(NoteKind::toCheck, place, "there is no NOPTMAX: as for 0, the model is run once");
    } else {
      notes().add(NoteKind::expressed, place, fmt::format("NOPTMAX = {}: Option = '{}'", count, task.option));
    }
    notes().add(NoteKind::toCheck, place,
                fmt::format("the search by derivatives has no counterpart: with Option = 'optimisation' the setup "
                            "searches by {} with {} model runs, to be chosen by you",
                            task.algorithm, task.evaluations));
    notes().add(
        NoteKind::noCounterpart, place,
        "covariance and limits of the parameters: Calculate_Covmatrix takes time series alone, and each observation "
        "is a single number");
    takeOptions();
  }

  void takeOptions() {
    takenSettings_ = {"noptmax", "npar", "nobs", "npargp", "nprior", "nobsgp", "ntplfle", "ninsfle"};
    for (const std::vector<PestSetting>* settings : {&control_.options, &control_.settings}) {
      for (const PestSetting& setting : *settings) {
        const bool mayBeOption = settings == &control_.options || control_.isVersion2;
        if (mayBeOption && setting.name == "rand_seed") {
          if (const auto seed = parseInteger(setting.value)) {
            made_.task.seed = *seed;
            takenSettings_.insert("rand_seed");
          }
        }
        if (mayBeOption && setting.name == "overdue_giveup_minutes") {
          constexpr double kSeconds = 60.0;
          constexpr double kNever = 1.0e6;
          if (const auto minutes = parseReal(setting.value); minutes && *minutes > 0.0 && *minutes < kNever) {
            made_.task.longestModelRun = *minutes * kSeconds;
            takenSettings_.insert("overdue_giveup_minutes");
          }
        }
        if (setting.name == "pestmode") {
          takenSettings_.insert("pestmode");
          if (equalIgnoringCase(setting.value, "estimation")) continue;
          notes().add(NoteKind::toCheck, setting.place,
                      fmt::format("PESTMODE = {} has no counterpart: the setup is one of estimation, with the weights "
                                  "as they are",
                                  setting.value));
        }
      }
    }
  }

  static void requireRange(const PestRow& row, double lower, double upper) {
    if (lower <= upper) return;
    failImport(row.place, fmt::format("expected PARLBND of at most PARUBND, found {} and {}", formatReal(lower),
                                      formatReal(upper)));
  }

  void takeParameters() {
    std::set<std::string> names;
    for (const PestRow& row : control_.parameters) {
      const std::string& name = row.text("parnme");
      if (!names.insert(toLowerAscii(name)).second) {
        failImport(row.place, fmt::format("the parameter {} is there twice", quotedForMessage(name)));
      }
    }
    for (const PestRow& row : control_.parameters) takeParameter(row, names);
    if (made_.parameters.empty())
      failImport({made_.source, 0}, "expected a parameter in \"* parameter data\", found none");
  }

  void takeParameter(const PestRow& row, const std::set<std::string>& names) {
    ModelParameter parameter;
    parameter.name = row.text("parnme");
    parameter.initialValue = row.number("parval1");
    parameter.lowerBound = row.number("parlbnd");
    parameter.upperBound = row.number("parubnd");
    requireRange(row, parameter.lowerBound, parameter.upperBound);
    takeTransformation(row, parameter);
    if (const std::string group = row.textOr("pargp", ""); !group.empty()) parameter.comment = "group " + group;
    const bool isInside =
        parameter.initialValue >= parameter.lowerBound && parameter.initialValue <= parameter.upperBound;
    if (!isInside && parameter.parameterType == ParameterType::variable) {
      failImport(row.place, fmt::format("expected PARVAL1 of {} from PARLBND to PARUBND, {} to {}, found {}",
                                        parameter.name, formatReal(parameter.lowerBound),
                                        formatReal(parameter.upperBound), formatReal(parameter.initialValue)));
    }
    if (!isInside) {
      parameter.lowerBound = std::min(parameter.lowerBound, parameter.initialValue);
      parameter.upperBound = std::max(parameter.upperBound, parameter.initialValue);
      notes().add(NoteKind::expressed, row.place,
                  fmt::format("the bounds of {}, which does not vary, are widened to its value", parameter.name));
    }
    notes().addForEach(NoteKind::noCounterpart, row.place,
                       fmt::format("PARCHGLIM = {}: searches here do not limit the change in an iteration",
                                   row.textOr("parchglim", "none")));
    if (const std::string command = row.textOr("dercom", "1"); command != "1" && command != "0") {
      notes().add(NoteKind::toCheck, row.place,
                  fmt::format("DERCOM = {}: {} has derivatives of its own command, which is not here", command,
                              parameter.name));
    }
    const double scale = row.numberOr("scale", 1.0);
    const double offset = row.numberOr("offset", 0.0);
    if (scale == 1.0 && offset == 0.0) {
      made_.parameters.push_back(std::move(parameter));
    } else {
      takeScaled(row, std::move(parameter), scale, offset, names);
    }
  }

  void takeTransformation(const PestRow& row, ModelParameter& parameter) const {
    const std::string kind = toLowerAscii(row.text("partrans"));
    if (kind == "fixed") {
      parameter.parameterType = ParameterType::fixed;
    } else if (kind == "tied") {
      parameter.parameterType = ParameterType::dependent;
    } else if (kind == "log") {
      parameter.transformationType = TransformationType::logarithmic;
      if (!(parameter.lowerBound > 0.0)) {
        failImport(row.place, fmt::format("expected a PARLBND above 0, as PARTRANS is log, found {}",
                                          formatReal(parameter.lowerBound)));
      }
    } else if (kind != "none") {
      failImport(row.place, "expected none, log, fixed or tied for PARTRANS, found " + quotedForMessage(kind));
    }
  }

  /// The model gets value * SCALE + OFFSET, under the name that is in the templates; bounds and ties are those of the
  /// value before that.
  void takeScaled(const PestRow& row, ModelParameter parameter, double scale, double offset,
                  const std::set<std::string>& names) {
    ModelParameter scaled;
    scaled.name = parameter.name;
    parameter.name += "_unscaled";
    if (names.contains(toLowerAscii(parameter.name))) {
      failImport(row.place, fmt::format("expected no other parameter {}, which is the value of {} without SCALE and "
                                        "OFFSET here: rename it",
                                        parameter.name, scaled.name));
    }
    scaled.parameterType = ParameterType::dependent;
    scaled.equation =
        fmt::format("{} * {} + ({})", nameInEquation(parameter.name), formatReal(scale), formatReal(offset));
    scaled.initialValue = parameter.initialValue * scale + offset;
    scaled.lowerBound = std::min(parameter.lowerBound * scale, parameter.upperBound * scale) + offset;
    scaled.upperBound = std::max(parameter.lowerBound * scale, parameter.upperBound * scale) + offset;
    scaled.comment = "with SCALE and OFFSET";
    notes().add(NoteKind::expressed, row.place,
                fmt::format("SCALE = {}, OFFSET = {}: {} is searched, and {} = {} goes to the model", formatReal(scale),
                            formatReal(offset), parameter.name, scaled.name, scaled.equation));
    unscaled_.emplace(toLowerAscii(scaled.name), parameter.name);
    made_.parameters.push_back(std::move(parameter));
    made_.parameters.push_back(std::move(scaled));
  }

  /// The parameter that PEST means by a name: before SCALE and OFFSET.
  ModelParameter* find(std::string_view name) {
    const auto unscaled = unscaled_.find(toLowerAscii(name));
    return const_cast<ModelParameter*>(made_.parameter(unscaled == unscaled_.end() ? name : unscaled->second));
  }

  const ModelParameter& require(const PestRow& row, std::string_view name) {
    const ModelParameter* const found = find(name);
    if (found != nullptr) return *found;
    std::vector<std::string> names;
    for (const PestRow& parameter : control_.parameters) names.push_back(parameter.text("parnme"));
    const auto nearest = nearestName(name, names);
    failImport(row.place, fmt::format("expected the name of a parameter, found {}{}", quotedForMessage(name),
                                      nearest ? fmt::format(", did you mean {}?", *nearest) : ""));
  }

  void takeTies() {
    std::set<std::string> tied;
    for (const PestRow& row : control_.ties) {
      require(row, row.text("parnme"));
      ModelParameter& parameter = *find(row.text("parnme"));
      const ModelParameter& parent = require(row, row.text("partied"));
      if (parameter.parameterType != ParameterType::dependent) {
        failImport(row.place, fmt::format("expected PARTRANS = tied of {}, which is tied to {} here", parameter.name,
                                          parent.name));
      }
      if (parent.parameterType == ParameterType::dependent) {
        failImport(row.place, fmt::format("expected a parameter that is not tied itself, found {}", parent.name));
      }
      if (parent.initialValue == 0.0) {
        failImport(row.place, fmt::format("expected a PARVAL1 other than 0 of {}, since {} keeps its ratio to it",
                                          parent.name, parameter.name));
      }
      parameter.equation =
          fmt::format("{} * {}", nameInEquation(parent.name), formatReal(parameter.initialValue / parent.initialValue));
      notes().addForEach(NoteKind::expressed, row.place,
                         "a tied parameter is a dependent one with an equation, which its bounds do not limit");
      tied.insert(toLowerAscii(parameter.name));
    }
    for (const PestRow& row : control_.parameters) {
      if (!equalIgnoringCase(row.text("partrans"), "tied") ||
          tied.contains(toLowerAscii(find(row.text("parnme"))->name)))
        continue;
      failImport(row.place, fmt::format("expected what {} is tied to, in a line behind the parameters or as PARTIED, "
                                        "found none",
                                        row.text("parnme")));
    }
  }

  void takeFiles() {
    for (const PestRow& row : control_.inputs) {
      const std::string file = files_.nameOf(row.text("pest_file"), row.place, notes());
      made_.templates.push_back({file, files_.nameOf(row.text("model_file"), row.place, notes()), row.place});
    }
    for (const PestRow& row : control_.outputs) {
      const std::string file = files_.nameOf(row.text("pest_file"), row.place, notes());
      made_.outputs.push_back({files_.nameOf(row.text("model_file"), row.place, notes()), file, row.place});
    }
    if (made_.templates.empty()) failImport({made_.source, 0}, "expected a template of the model's input, found none");
    if (made_.outputs.empty()) failImport({made_.source, 0}, "expected an instruction file, found none");
  }

  /// Weights of a difference, model less observation, below and above: PEST++ takes groups of some names for bounds.
  void takeWeight(const PestRow& row, double weight, const std::string& group, ImportedMeasure& measure) {
    measure.weight = measure.weightAbove = weight;
    const std::string name = toLowerAscii(group);
    const auto begins = [&name](std::initializer_list<std::string_view> starts) {
      return std::any_of(starts.begin(), starts.end(), [&](std::string_view start) { return name.starts_with(start); });
    };
    const bool isUpper = begins({"l_", "less", "<@"});
    const bool isLower = begins({"g_", "greater", ">@"});
    if (!isUpper && !isLower) return;
    (isUpper ? measure.weight : measure.weightAbove) = 0.0;
    notes().addForEach(NoteKind::toCheck, row.place,
                       fmt::format("as in PEST++, the group {} has {} bounds: only a model value {} counts", group,
                                   isUpper ? "upper" : "lower", isUpper ? "above" : "below"));
  }

  void takeObservations() {
    std::set<std::string> names;
    for (const PestRow& row : control_.observations) {
      ImportedMeasure measure;
      measure.name = row.text("obsnme");
      if (!names.insert(toLowerAscii(measure.name)).second) {
        failImport(row.place, fmt::format("the observation {} is there twice", quotedForMessage(measure.name)));
      }
      measure.measurement = measure.name;
      measure.observedValue = row.number("obsval");
      measure.place = row.place;
      const double weight = row.number("weight");
      const std::string group = row.textOr("obgnme", "observations");
      if (weight < 0.0) {
        failImport(row.place, fmt::format("expected a weight of 0 or more, found {}", formatReal(weight)));
      }
      if (weight == 0.0) {
        notes().addForEach(NoteKind::expressed, row.place, "a weight of 0: the difference is only reported");
      } else {
        takeWeight(row, weight, group, measure);
        measure.objective = group;
        made_.addObjective(group);
      }
      made_.measures.push_back(std::move(measure));
    }
    if (made_.measures.empty()) {
      failImport({made_.source, 0}, "expected an observation in \"* observation data\", found none");
    }
    for (const PestRow& row : control_.observationGroups) {
      for (const std::string_view column : {"gtarg", "covfle"}) {
        if (!row.has(column)) continue;
        notes().add(NoteKind::noCounterpart, row.place,
                    fmt::format("{} behind the observation group {}: target and covariance of a group",
                                row.text(column), row.text("obgnme")));
      }
    }
    if (made_.objectives.empty() && control_.priors.empty()) {
      failImport(control_.observations.front().place, "expected an observation with a weight above 0, found none");
    }
  }

  /// Prior information becomes a dependent parameter that is written to a file by a template, copied by the batch and
  /// read from there, as an observation is.
  void takePriors() {
    if (control_.priors.empty()) return;
    std::string form = "ptf ~\n";
    std::string instructions = "pif ~\n";
    for (const PestPrior& prior : control_.priors) {
      const PestRow place{prior.place, {}};
      ModelParameter parameter;
      parameter.name = prior.name;
      if (made_.parameter(prior.name) != nullptr) {
        failImport(
            prior.place,
            fmt::format("expected another name for the prior information than that of the parameter {}", prior.name));
      }
      parameter.parameterType = ParameterType::dependent;
      for (const PestPriorTerm& term : prior.terms) {
        const ModelParameter& known = require(place, term.parameter);
        const std::string name = nameInEquation(known.name);
        const double value = term.isLogarithm ? std::log10(known.initialValue) : known.initialValue;
        if (!std::isfinite(value)) {
          failImport(prior.place, fmt::format("expected a parameter above 0 in log(), found {} = {}", known.name,
                                              formatReal(known.initialValue)));
        }
        parameter.equation += fmt::format("{}({}) * {}", parameter.equation.empty() ? "" : " + ",
                                          formatReal(term.factor), term.isLogarithm ? "log10(" + name + ")" : name);
        parameter.initialValue += term.factor * value;
      }
      parameter.lowerBound = parameter.upperBound = parameter.initialValue;
      parameter.comment = "prior information";
      made_.parameters.push_back(parameter);
      form += fmt::format("~{:{}}~\n", prior.name, kPriorField - 2);
      instructions += fmt::format("l1 !{}!\n", prior.name);
      takePriorMeasure(prior);
      notes().addForEach(
          NoteKind::expressed, prior.place,
          fmt::format("prior information is the equation of a dependent parameter, which is read from {} "
                      "as an observation is",
                      kPriorOutput));
    }
    const SourcePlace place{made_.source, 0};
    made_.newFiles.emplace(kPriorTemplate, form);
    made_.newFiles.emplace(kPriorInstructions, instructions);
    made_.templates.push_back({std::string(kPriorTemplate), std::string(kPriorInput), place});
    made_.outputs.push_back({std::string(kPriorOutput), std::string(kPriorInstructions), place});
  }

  void takePriorMeasure(const PestPrior& prior) {
    ImportedMeasure measure;
    measure.name = measure.measurement = prior.name;
    measure.observedValue = prior.value;
    measure.place = prior.place;
    if (prior.weight > 0.0) {
      takeWeight({prior.place, {}}, prior.weight, prior.group, measure);
      measure.objective = prior.group;
      made_.addObjective(prior.group);
    }
    if (toLowerAscii(prior.group).starts_with("regul")) {
      notes().addForEach(NoteKind::toCheck, prior.place,
                         "the weight of a regularisation group is taken as it is, and not adjusted during the search");
    }
    made_.measures.push_back(std::move(measure));
  }

  void takeCommands() {
    if (control_.commands.empty()) failImport({made_.source, 0}, "expected a model command line, found none");
    for (const PestLine& line : control_.commands) {
      made_.commands.push_back(shellCommand(line.text, line.place, files_, notes()));
    }
    if (control_.commands.size() > 1) {
      notes().add(NoteKind::toCheck, control_.commands[1].place,
                  "the commands run one after the other; further ones for derivatives are to be removed from "
                  "model/mirevo_run.sh");
    }
    if (!control_.priors.empty()) made_.commands.push_back(fmt::format("cp {} {}", kPriorInput, kPriorOutput));
  }

  /// The increments of derivatives, which a sensitivity analysis has for all parameters alike.
  void takeGroups() {
    std::set<std::string> increments;
    bool areRelative = true;
    bool areCentral = !control_.parameterGroups.empty();
    for (const PestRow& row : control_.parameterGroups) {
      increments.insert(row.textOr("derinc", "0.01"));
      areRelative = areRelative && equalIgnoringCase(row.textOr("inctyp", "relative"), "relative");
      areCentral = areCentral && toLowerAscii(row.textOr("forcen", "switch")).starts_with("always_3");
    }
    const bool isTaken = increments.size() == 1 && areRelative;
    if (isTaken) {
      const auto part = parseReal(*increments.begin());
      if (part && *part > 0.0 && *part <= 1.0) made_.task.perturbedPartOfValue = *part;
    }
    if (areCentral) made_.task.differencing = "central";
    for (const PestRow& row : control_.parameterGroups) {
      std::string text = fmt::format("parameter group {}:", row.text("pargpnme"));
      for (const auto& [name, value] : row.values) {
        if (name != "pargpnme") text += fmt::format(" {} = {},", name, value);
      }
      text.back() = ':';
      const bool hasAll = made_.task.perturbedPartOfValue.has_value();
      notes().add(hasAll ? NoteKind::noCounterpart : NoteKind::toCheck, row.place,
                  text + (hasAll ? " of these a sensitivity analysis has derinc, relative to the value"
                                 : " a sensitivity analysis has one increment for all parameters, the default here"));
    }
  }

  void noteOthers() {
    for (const PestSetting& setting : control_.settings) {
      if (takenSettings_.contains(setting.name)) continue;
      const std::string name = setting.name.empty() ? std::string() : setting.name + " = ";
      notes().add(NoteKind::noCounterpart, setting.place, fmt::format("control data: {}{}", name, setting.value));
    }
    for (const PestSetting& option : control_.options) {
      if (takenSettings_.contains(option.name)) continue;
      const bool isOfReading = option.name == "additional_ins_delimiters" && !option.value.empty();
      notes().add(isOfReading ? NoteKind::toCheck : NoteKind::noCounterpart, option.place,
                  fmt::format("++{}({}){}", option.name, option.value,
                              isOfReading ? ": numbers in listings end at a blank or a comma only" : ""));
    }
    for (const PestLine& line : control_.others) {
      notes().add(NoteKind::noCounterpart, line.place, fmt::format("section \"* {}\": {}", line.section, line.text));
    }
  }

  const SourceFiles& files_;
  ImportedCase made_;
  PestControl control_;
  std::map<std::string, std::string> unscaled_;  ///< names of the values before SCALE and OFFSET
  std::set<std::string, std::less<>> takenSettings_;
};

}  // namespace

ImportedCase importPestControl(const std::string& name, std::string_view text, const SourceFiles& files) {
  return PestImport(name, text, files).make();
}

}  // namespace mirevo
