#include "run/setup/setup_warnings.h"

#include <fmt/format.h>

#include "common/text.h"
#include "platform/equations/expression_evaluator.h"

namespace mirevo {
namespace {

/// Limits the log if, for instance, every line of a file gives a warning.
constexpr int kMostWarnings = 50;
constexpr std::size_t kMostHomes = 3;  ///< of what may be in more sections it is no news where
constexpr std::string_view kUnusedTimeKeyword = "MaxSimTime";

class EntryCheck final {
 public:
  explicit EntryCheck(SetupFile& file) : file_(file) {}

  /// Recursive; the parser limits the depth.
  void checkInside(const KdxSection& node, const std::string& pattern) {
    for (const KdxKeyword& keyword : node.keywords()) checkKeyword(node, keyword, pattern);
    for (const auto& section : node.sections()) {
      const std::string name = itemPattern(section->name());
      const std::string path = pattern.empty() ? name : fmt::format("{}/{}", pattern, name);
      const bool isFirst = node.section(section->name()) == section.get();
      if (file_.schema().findSection(path) == nullptr) {
        warn(section->position(), "section", section->name(), file_.schema().sectionsThatHold(name),
             nearestName(section->name(), file_.schema().sectionNamesInside(pattern)));
      } else if (!isFirst) {
        warnRepeated(section->position(), "section", section->name(), node.section(section->name())->position());
      } else {
        checkInside(*section, path);
      }
    }
  }

  void finish() {
    if (count_ > kMostWarnings) file_.log().warning(fmt::format("{} more like these", count_ - kMostWarnings));
  }

 private:
  void checkKeyword(const KdxSection& node, const KdxKeyword& keyword, const std::string& pattern) {
    const KeywordRow* row = file_.schema().findKeyword(pattern, keyword.name);
    if (keyword.name == kUnusedTimeKeyword) {
      report(keyword.position, fmt::format("keyword {} is not used; MaxSimulationTime in [SimultaneousSimulations] "
                                           "limits the time of a model run",
                                           quotedForMessage(keyword.name)));
    } else if (row == nullptr) {
      std::vector<std::string> known;
      if (const SectionRow* section = file_.schema().findSection(pattern)) {
        for (const KeywordRow& other : section->keywords) known.emplace_back(other.name());
      }
      warn(keyword.position, "keyword", keyword.name, file_.schema().sectionsWith(keyword.name),
           nearestName(keyword.name, known));
    } else if (row->type != KeywordType::textLines && node.keyword(keyword.name) != &keyword) {
      warnRepeated(keyword.position, "keyword", keyword.name, node.keyword(keyword.name)->position);
    }
  }

  /// `homes`: the sections that may have it.
  void warn(KdxPosition position, std::string_view kind, const std::string& name, const std::vector<std::string>& homes,
            const std::optional<std::string>& nearest) {
    std::string hint;
    if (!homes.empty() && homes.size() <= kMostHomes) {
      hint = fmt::format(" here, it belongs in [{}]", fmt::join(homes, "] or ["));
    } else if (nearest) {
      hint = fmt::format(", did you mean {}?", quotedForMessage(*nearest));
    }
    report(position, fmt::format("{} {} is unknown and not read{}", kind, quotedForMessage(name), hint));
  }

  void warnRepeated(KdxPosition position, std::string_view kind, const std::string& name, KdxPosition first) {
    report(position,
           fmt::format("{} {} is at line {} already, this one is not read", kind, quotedForMessage(name), first.line));
  }

  void report(KdxPosition position, const std::string& text) {
    if (++count_ <= kMostWarnings) file_.log().warning(fmt::format("{}: {}", file_.location(position), text));
  }

  SetupFile& file_;
  int count_ = 0;
};

}  // namespace

void warnAboutUnusedEntries(SetupFile& file) {
  EntryCheck check(file);
  // Other targets belong to other programs; a second one with this program's name would not be read.
  const KdxSection& root = file.document().root;
  const KdxSection* target = root.section(kSetupTarget);
  if (target == nullptr) return;
  if (const KdxSection* second = root.section(kSetupTarget, 2)) {
    file.log().warning(fmt::format("{}: a second [{}] is not read", file.location(second->position()), kSetupTarget));
  }
  check.checkInside(*target, "");
  check.finish();
}

std::vector<std::string> unusedParameterWarnings(std::span<const ModelParameter> parameters,
                                                 std::span<const InternalConstraint> constraints,
                                                 std::span<const ParameterTemplate> templates) {
  std::vector<std::string> names;
  for (const ModelParameter& parameter : parameters) names.push_back(parameter.name);
  std::vector<double> values(parameters.size());
  const ExpressionEvaluator equations(names, values);
  std::vector<bool> isUsed(parameters.size());
  // Marks the parameters and those from which they are computed.
  const auto follow = [&](std::vector<std::size_t> toFollow) {
    while (!toFollow.empty()) {
      const std::size_t index = toFollow.back();
      toFollow.pop_back();
      if (isUsed[index]) continue;
      isUsed[index] = true;
      if (parameters[index].parameterType != ParameterType::dependent) continue;
      const auto equation = equations.compile(parameters[index].equation);
      toFollow.insert(toFollow.end(), equation->variables().begin(), equation->variables().end());
    }
  };
  for (const ParameterTemplate& parameterTemplate : templates) follow(parameterTemplate.parametersNamed());
  const std::vector<bool> reachesModel = isUsed;
  for (const InternalConstraint& constraint : constraints) {
    for (const std::string& side : {constraint.leftEquation, constraint.rightEquation}) {
      const auto equation = equations.compile(side);
      follow({equation->variables().begin(), equation->variables().end()});
    }
  }
  std::vector<std::string> warnings;
  for (std::size_t i = 0; i < parameters.size(); ++i) {
    const bool isVariable = parameters[i].parameterType == ParameterType::variable;
    if (isVariable ? reachesModel[i] : isUsed[i]) continue;
    warnings.push_back(
        fmt::format("the {} parameter {} is in no template: its value does not reach the model",
                    nameOfCode(kParameterTypeNames, static_cast<std::int32_t>(parameters[i].parameterType)),
                    quotedForMessage(parameters[i].name)));
  }
  return warnings;
}

}  // namespace mirevo
