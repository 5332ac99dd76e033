#include "import/ostrich_case.h"

#include <algorithm>
#include <functional>
#include <set>
#include <utility>

#include <fmt/format.h>

#include "common/text.h"
#include "import/ostrich_input.h"
#include "import/ostrich_outputs.h"
#include "import/ostrich_parameters.h"

namespace mirevo {
namespace {

/// The words of a line with the first ; that is not in quotes as a word of its own.
std::vector<std::string> aroundSemicolon(const OstrichLine& line, std::size_t from) {
  std::vector<std::string> words;
  bool isDone = false;
  for (std::size_t i = 0; i < line.words.size(); ++i) {
    const std::string& word = line.words[i];
    const std::size_t at = i >= from && !isDone ? word.find(';') : std::string::npos;
    if (at == std::string::npos) {
      words.push_back(word);
      continue;
    }
    isDone = true;
    for (const std::string& part : {word.substr(0, at), std::string(";"), word.substr(at + 1)}) {
      if (!part.empty()) words.push_back(part);
    }
  }
  return words;
}

class OstrichImport final {
 public:
  OstrichImport(const std::string& name, std::string_view text, const SourceFiles& files)
      : files_(files), input_(parseOstrichInput(name, text)) {
    made_.source = name;
    made_.folder = files.folder();
  }

  ImportedCase make() {
    addOstrichParameters(input_, made_);
    takeAlgorithm();
    takeCommand();
    takeFilePairs();
    takeObservations();
    takeResponses();
    takeCost();
    addInstructions(std::move(numbers_), files_, made_);
    noteOthers();
    return std::move(made_);
  }

 private:
  ImportNotes& notes() { return made_.notes; }
  SourcePlace whole() const { return {made_.source, 0}; }

  const OstrichLine* take(std::string_view keyword) {
    takenSettings_.insert(toLowerAscii(keyword));
    return input_.setting(keyword);
  }
  const OstrichBlock* takeBlock(std::string_view name) {
    takenBlocks_.insert(toLowerAscii(name));
    return input_.block(name);
  }

  template <class Set>
  void takeInteger(const OstrichLine& line, Set set) {
    const auto value = line.words.size() > 1 ? parseInteger(line.words[1]) : std::nullopt;
    if (!value || *value < 1) {
      failImport(line.place, fmt::format("expected an integer from 1 for {}, found {}", line.words[0],
                                         line.words.size() > 1 ? quotedForMessage(line.words[1]) : "nothing"));
    }
    set(*value);
  }
  static double realOf(const OstrichLine& line) {
    const auto value = line.words.size() > 1 ? parseReal(line.words[1]) : std::nullopt;
    if (!value) failImport(line.place, fmt::format("expected a number for {}", line.words[0]));
    return *value;
  }

  void takeAlgorithm() {
    const OstrichLine* const line = take("ProgramType");
    const std::string type = line != nullptr && line->words.size() > 1 ? toLowerAscii(line->words[1]) : std::string();
    if (line == nullptr) {
      notes().add(NoteKind::toCheck, whole(), "there is no ProgramType: the setup searches by DDS");
    }
    if (const OstrichLine* const seed = take("RandomSeed")) {
      takeInteger(*seed, [this](std::int32_t value) { made_.task.seed = value; });
    }
    if (type == "dds") {
      takeDds({"DDSAlg", "DDS"});
    } else if (type == "paralleldds" || type == "paradds") {
      made_.task.algorithm = "PDDS";
      takeDds({"ParallelDDSAlg", "ParallelDDS", "ParaDDSAlg"});
    } else if (type == "sceua" || type == "shuffledcomplexevolution") {
      made_.task.algorithm = "SCE";
      takeSce();
    } else if (type == "modelevaluation") {
      made_.task.option = "scenarios";
      noteBlock("InitParams", "sets to be evaluated: write them as SCENARIO_n, with Scenario_Type = 1");
    } else if (line != nullptr) {
      notes().add(NoteKind::toCheck, line->place,
                  fmt::format("ProgramType {} has no counterpart: the setup searches by DDS with {} model runs, to be "
                              "chosen by you",
                              line->words.size() > 1 ? line->words[1] : "", made_.task.evaluations));
    }
  }

  /// A setting of an algorithm's block; those that are not taken are noted.
  using Taker = std::function<bool(const OstrichLine& line)>;
  void takeSettings(std::initializer_list<std::string_view> names, const Taker& takes) {
    for (const std::string_view name : names) {
      const OstrichBlock* const block = takeBlock(name);
      if (block == nullptr) continue;
      for (const OstrichLine& line : block->lines) {
        if (!takes(line)) notes().add(NoteKind::noCounterpart, line.place, line.text);
      }
      return;
    }
    notes().add(NoteKind::toCheck, whole(),
                fmt::format("there is no block Begin{}: {} model runs stand in the setup, to be chosen by you",
                            *names.begin(), made_.task.evaluations));
  }

  void takeDds(std::initializer_list<std::string_view> names) {
    takeSettings(names, [this](const OstrichLine& line) {
      const std::string key = toLowerAscii(line.words[0]);
      if (key == "perturbationvalue") {
        made_.task.perturbation = realOf(line);
        if (made_.task.perturbation < 0.0 || made_.task.perturbation > 1.0) {
          failImport(line.place, fmt::format("expected a PerturbationValue from 0 to 1, found {}", line.words[1]));
        }
      } else if (key == "maxiterations") {
        takeInteger(line, [this](std::int32_t value) { made_.task.evaluations = value; });
      } else if (key == "useinitialparamvalues") {
        return true;  // unless there are parameters that have none
      } else if (key == "userandomparamvalues") {
        made_.task.includesInitial = false;
      } else {
        return false;
      }
      return true;
    });
  }

  void takeSce() {
    ImportedTask& task = made_.task;
    bool hasInitial = false;
    takeSettings({"SCEUA"}, [&](const OstrichLine& line) {
      const std::string key = toLowerAscii(line.words[0]);
      const auto into = [&](std::int32_t& field) {
        takeInteger(line, [&field](std::int32_t value) { field = value; });
        return true;
      };
      if (key == "budget") return into(task.evaluations);
      if (key == "numcomplexes") return into(task.complexes);
      if (key == "numpointspercomplex") return into(task.pointsOfComplex);
      if (key == "numpointspersubcomplex") return into(task.pointsOfSubcomplex);
      if (key == "numevolutionsteps") return into(task.evolutionSteps);
      if (key == "loopstagnationcriteria") return into(task.loopsOfConvergence.emplace());
      if (key == "pctchangecriteria") {
        task.leastChange = realOf(line);
        notes().add(
            NoteKind::toCheck, line.place,
            fmt::format("{} is taken as a fraction: Min_Change = {}", line.text, formatReal(*task.leastChange)));
        return true;
      }
      if (key == "useinitialpoint") {
        hasInitial = line.words.size() > 1 && equalIgnoringCase(line.words[1], "yes");
        return true;
      }
      return false;
    });
    task.includesInitial = task.includesInitial && hasInitial;
  }

  void noteBlock(std::string_view name, std::string_view what) {
    const OstrichBlock* const block = takeBlock(name);
    if (block == nullptr) return;
    for (const OstrichLine& line : block->lines) {
      notes().add(NoteKind::toCheck, line.place, fmt::format("{}: {}", line.text, what));
    }
  }

  void takeCommand() {
    const OstrichLine* const line = take("ModelExecutable");
    if (line == nullptr || line->words.size() < 2) {
      failImport(line == nullptr ? whole() : line->place,
                 "expected ModelExecutable and the command that runs the model");
    }
    std::string_view command = line->text;
    command = trim(command.substr(line->words[0].size()));
    if (command.size() > 1 && (command.front() == '"' || command.front() == '\'') &&
        command.back() == command.front() && command.find(command.front(), 1) == command.size() - 1) {
      command = command.substr(1, command.size() - 2);
    }
    made_.commands.push_back(shellCommand(std::string(command), line->place, files_, notes()));
    if (const OstrichLine* const folder = take("ModelSubdir")) {
      notes().add(NoteKind::expressed, folder->place,
                  fmt::format("{}: each slot has a copy of the whole folder", folder->text));
    }
    if (const OstrichLine* const objective = take("ObjectiveFunction");
        objective != nullptr && objective->words.size() > 1) {
      objective_ = toLowerAscii(objective->words[1]);
      if (objective_ != "wsse" && objective_ != "gcop") {
        notes().add(NoteKind::toCheck, objective->place,
                    fmt::format("{} has no counterpart: observations give a weighted sum of squares", objective->text));
      }
    }
  }

  void takeFilePairs() {
    std::vector<std::string> names;
    for (const ModelParameter& parameter : made_.parameters) names.push_back(parameter.name);
    int digits = 6;
    if (const OstrichLine* const precision = take("NumDigitsOfPrecision")) {
      constexpr std::int32_t kMostDigits = 17;
      takeInteger(*precision, [&](std::int32_t value) { digits = std::min(value, kMostDigits); });
    }
    const OstrichBlock* const block = takeBlock("FilePairs");
    if (block == nullptr || block->lines.empty()) {
      failImport(whole(), "expected a template and a file between BeginFilePairs and EndFilePairs, found none");
    }
    for (const OstrichLine& line : block->lines) {
      const std::vector<std::string> words = aroundSemicolon(line, 0);
      if (words.size() != 3 || words[1] != ";") {
        failImport(line.place, "expected a template ; and a file of the model, found " + quotedForMessage(line.text));
      }
      const std::string from = files_.nameOf(words[0], line.place, notes());
      const std::string to = files_.nameOf(words[2], line.place, notes());
      const std::string made = fmt::format("mirevo_{}.tpl", made_.templates.size() + 1);
      made_.newFiles.emplace(made, markedTemplate(from, files_.read(from, line.place), names, digits, notes()));
      made_.templates.push_back({made, to, line.place});
      notes().add(
          NoteKind::expressed, line.place,
          fmt::format("{} is {} with marks around the names; what follows a value on its line may move", made, from));
    }
  }

  /// file ; keyword line column separator, from word `at` on; returns the place behind it.
  std::size_t takeNumber(const std::vector<std::string>& words, std::size_t at, const OstrichLine& line) {
    constexpr std::size_t kWords = 5;  // file ; keyword line column
    const auto integer = [&](std::size_t i) {
      const auto value = i < words.size() ? parseInteger(words[i]) : std::nullopt;
      return value && *value >= 0 ? std::optional(static_cast<std::size_t>(*value)) : std::nullopt;
    };
    const auto lineNumber = integer(at + 3);
    const auto column = integer(at + 4);
    if (words.size() < at + kWords || words[at + 1] != ";" || !lineNumber || !column || *column < 1) {
      failImport(line.place, "expected a file ; a keyword, a line from 0 and a column from 1, found " +
                                 quotedForMessage(line.text));
    }
    OstrichNumber number;
    number.name = words[0];
    number.file = files_.nameOf(words[at], line.place, notes());
    if (words[at + 2] != "OST_NULL") number.keyword = words[at + 2];
    number.line = *lineNumber;
    number.column = *column;
    number.place = line.place;
    at += kWords;
    if (at < words.size()) {
      if (words[at].size() != 1) {
        failImport(line.place, fmt::format("expected one character in quotes that separates columns, found {}",
                                           quotedForMessage(words[at])));
      }
      number.separator = words[at] == "\t" ? ' ' : words[at].front();
      ++at;
    }
    numbers_.push_back(std::move(number));
    return at;
  }

  void takeObservations() {
    const OstrichBlock* const block = takeBlock("Observations");
    if (block == nullptr) return;
    for (const OstrichLine& line : block->lines) {
      const std::vector<std::string> words = aroundSemicolon(line, 3);
      const auto value = words.size() > 1 ? parseReal(words[1]) : std::nullopt;
      const auto weight = words.size() > 2 ? parseReal(words[2]) : std::nullopt;
      if (!value || !weight || *weight < 0.0) {
        failImport(line.place,
                   "expected a name, a value and a weight of 0 or more, found " + quotedForMessage(line.text));
      }
      std::size_t at = takeNumber(words, 3, line);
      std::string group = "observations";
      if (at < words.size()) {
        if (equalIgnoringCase(words[at], "yes")) {
          notes().add(NoteKind::noCounterpart, line.place,
                      "augmented output: yes (every number is in the result file)");
        }
        ++at;
      }
      if (at < words.size()) group = words[at];
      ImportedMeasure measure;
      measure.name = measure.measurement = words[0];
      measure.observedValue = *value;
      measure.weight = measure.weightAbove = *weight;
      measure.place = line.place;
      if (*weight > 0.0 && objective_ == "gcop") {
        notes().addForEach(
            NoteKind::expressed, line.place,
            "with ObjectiveFunction GCOP observations count for nothing: the difference is only reported");
      } else if (*weight > 0.0) {
        measure.objective = group;
        made_.addObjective(group);
      } else {
        notes().addForEach(NoteKind::expressed, line.place, "a weight of 0: the difference is only reported");
        measure.weight = measure.weightAbove = 1.0;
      }
      made_.measures.push_back(std::move(measure));
    }
  }

  void takeResponses() {
    const OstrichBlock* const block = takeBlock("ResponseVars");
    if (block == nullptr) return;
    for (const OstrichLine& line : block->lines) {
      const std::vector<std::string> words = aroundSemicolon(line, 1);
      const std::size_t at = takeNumber(words, 1, line);
      if (at < words.size() && equalIgnoringCase(words[at], "yes")) {
        notes().add(NoteKind::noCounterpart, line.place, "augmented output: yes (every number is in the result file)");
      }
      ImportedMeasure measure;
      measure.name = measure.measurement = words[0];
      measure.place = line.place;
      made_.measures.push_back(std::move(measure));
    }
  }

  /// The cost of BeginGCOP: response variables, as they are.
  void takeCost() {
    const OstrichBlock* const block = takeBlock("GCOP");
    if (block != nullptr && objective_ != "gcop" && !made_.objectives.empty()) {
      notes().add(NoteKind::toCheck, block->place, "BeginGCOP: not in effect without ObjectiveFunction GCOP");
      for (const OstrichLine& line : block->lines) notes().add(NoteKind::noCounterpart, line.place, line.text);
      return;
    }
    std::size_t costs = 0;
    for (std::size_t i = 0; block != nullptr && i < block->lines.size(); ++i) {
      const OstrichLine& line = block->lines[i];
      if (!equalIgnoringCase(line.words[0], "CostFunction") || line.words.size() < 2) {
        notes().add(NoteKind::noCounterpart, line.place, line.text);
        continue;
      }
      const auto isIt = [&](const ImportedMeasure& measure) { return measure.name == line.words[1]; };
      const auto found = std::find_if(made_.measures.begin(), made_.measures.end(), isIt);
      if (found == made_.measures.end() || found->observedValue) {
        failImport(line.place,
                   fmt::format("expected the name of a response variable as the cost, found {}: let the model "
                               "write the cost, and read it in BeginResponseVars",
                               quotedForMessage(line.words[1])));
      }
      found->objective = found->name;
      made_.addObjective(found->name, FunctionType::sum);
      if (++costs == 2) {
        notes().add(NoteKind::toCheck, line.place,
                    "several cost functions: the search makes their sum small, with Weight 1 each");
      }
    }
    if (made_.objectives.empty()) {
      failImport(block == nullptr ? whole() : block->place,
                 "expected observations with weights above 0, or a CostFunction in BeginGCOP, found neither");
    }
  }

  void noteOthers() {
    for (const OstrichBlock& block : input_.blocks) {
      const std::string name = toLowerAscii(block.name);
      constexpr std::string_view kParameters[] = {"params", "integerparams", "comboparams", "tiedparams"};
      const bool isTaken = takenBlocks_.contains(name) ||
                           std::find(std::begin(kParameters), std::end(kParameters), name) != std::end(kParameters);
      if (isTaken && &block == input_.block(name)) continue;
      if (isTaken) failImport(block.place, fmt::format("expected one block Begin{}, found another", block.name));
      if (name == "extrafiles" || name == "extradirs") {
        notes().add(NoteKind::expressed, block.place,
                    fmt::format("Begin{}: each slot has a copy of the whole folder", block.name));
        for (const OstrichLine& line : block.lines) notes().add(NoteKind::expressed, line.place, line.text);
        continue;
      }
      const bool bears = name == "constraints" || name == "tiedrespvars";
      notes().add(bears ? NoteKind::toCheck : NoteKind::noCounterpart, block.place,
                  fmt::format("Begin{}{}", block.name, bears ? ": not in effect in the setup" : ""));
      for (const OstrichLine& line : block.lines) {
        notes().add(bears ? NoteKind::toCheck : NoteKind::noCounterpart, line.place, line.text);
      }
    }
    for (const OstrichLine& line : input_.settings) {
      const std::string key = toLowerAscii(line.words[0]);
      const bool isLast = input_.setting(line.words[0]) == &line;
      if (takenSettings_.contains(key) && isLast) continue;
      notes().add(NoteKind::noCounterpart, line.place,
                  line.text + (isLast ? "" : ": a later line has the same keyword, and is taken"));
    }
  }

  const SourceFiles& files_;
  OstrichInput input_;
  ImportedCase made_;
  std::vector<OstrichNumber> numbers_;
  std::string objective_ = "wsse";
  std::set<std::string> takenSettings_;
  std::set<std::string> takenBlocks_;
};

}  // namespace

ImportedCase importOstrichInput(const std::string& name, std::string_view text, const SourceFiles& files) {
  return OstrichImport(name, text, files).make();
}

}  // namespace mirevo
