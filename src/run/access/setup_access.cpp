#include "run/access/setup_access.h"

#include <algorithm>
#include <filesystem>
#include <span>
#include <utility>

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "run/access/setup_value.h"

namespace mirevo {
namespace {

/// A suggestion for a missing name: the nearest of the unknown names in the section.
std::string didYouMean(std::string_view missing, const std::vector<std::string>& unknown) {
  const auto nearest = nearestName(missing, unknown);
  return nearest ? fmt::format("; found {}, did you mean {}?", quotedForMessage(*nearest), quotedForMessage(missing))
                 : std::string{};
}

/// A row with a check of its own, but no refusal, judges the value itself.
bool isRangeChecked(const KeywordRow& row) {
  if (!row.facts.refusal.empty()) return true;
  return row.check == nullptr && !row.facts.range.text().empty();
}

std::string inside(std::string_view path, std::string_view name) {
  return path.empty() ? std::string(name) : fmt::format("{}/{}", path, name);
}

/// A path with item numbers as `n`.
std::string patternOf(std::string_view path) {
  std::string pattern;
  for (const std::string_view name : splitAt(path, '/')) pattern = inside(pattern, itemPattern(name));
  return pattern;
}

/// The section with this path; nullptr if it is not there.
const KdxSection* sectionAt(const KdxSection& target, std::string_view path) {
  const KdxSection* node = &target;
  for (const std::string_view name : splitAt(path, '/')) {
    if (node = node->section(name); node == nullptr) break;
  }
  return node;
}

/// The sections inside the one with the pattern `path` that the schema does not know.
std::vector<std::string> unknownSections(const KdxSection& node, std::string_view path, const SetupSchema& schema) {
  std::vector<std::string> unknown;
  for (const auto& section : node.sections()) {
    if (schema.findSection(inside(path, itemPattern(section->name()))) == nullptr) unknown.push_back(section->name());
  }
  return unknown;
}

/// The name that the section with this path has in the setup, if it and those around it may be misspelt; empty if it is
/// not there.
std::optional<std::string> nameInSetup(const KdxSection& target, std::string_view path, const SetupSchema& schema) {
  const KdxSection* node = &target;
  std::string pattern;
  for (const std::string_view name : splitAt(path, '/')) {
    const KdxSection* inner = node->section(name);
    if (inner == nullptr) {
      const auto nearest = nearestName(name, unknownSections(*node, pattern, schema));
      if (!nearest) return std::nullopt;
      inner = node->section(*nearest);
    }
    node = inner;
    pattern = inside(pattern, itemPattern(name));
  }
  return node->name();
}

/// A section as it is to be added, with the keywords that it needs and the first item of a list that needs one.
std::string linesOfSection(std::string_view name, const SectionRow& row, const SetupSchema& schema,
                           const std::string& indent) {
  std::string lines = fmt::format("\n{}[{}]", indent, name);
  bool needsItem = false;
  for (const KeywordRow& keyword : row.keywords) {
    if (!keyword.isRequired() && !keyword.facts.isOfNewSection) continue;
    lines += fmt::format("\n{}  {} = ...", indent, keyword.name());
    needsItem = needsItem || keyword.name() == kItemCountKeyword;
  }
  for (const std::string& item : schema.sectionNamesInside(needsItem ? row.path : "")) {
    if (needsItem && item.ends_with("_n")) {
      lines += linesOfSection(item.substr(0, item.size() - 1) + "1", *schema.findSection(inside(row.path, item)),
                              schema, indent + "  ");
    }
  }
  return lines + fmt::format("\n{}[/{}]", indent, name);
}

/// The item sections whose number is above `count`, in file order; one whose number is too large to be read counts,
/// too.
std::vector<const KdxSection*> itemsBeyond(const KdxSection& node, std::string_view prefix, std::size_t count) {
  std::vector<const KdxSection*> items;
  for (const auto& section : node.sections()) {
    const std::string_view name = section->name();
    if (!name.starts_with(prefix) || itemPattern(name) == name) continue;
    const auto number = parseInteger(name.substr(prefix.size()));
    if (!number || static_cast<std::size_t>(*number) > count) items.push_back(section.get());
  }
  return items;
}

std::string_view itemPrefix(std::string_view pattern) {
  return pattern.substr(0, pattern.size() - 1);
}

/// The first item section that the count of the list announces and that is not there. `pattern`: "MEASURE_n"; other
/// names are those of no items.
std::optional<std::string> firstMissingItem(const KdxSection& list, std::string_view pattern) {
  const KdxKeyword* keyword = list.keyword(kItemCountKeyword);
  const auto* count = keyword == nullptr ? nullptr : std::get_if<std::int32_t>(&keyword->values.front().value);
  if (count == nullptr || !pattern.ends_with("_n")) return std::nullopt;
  for (std::int32_t number = 1; number <= *count; ++number) {
    std::string name = fmt::format("{}{}", itemPrefix(pattern), number);
    if (list.section(name) == nullptr) return name;
  }
  return std::nullopt;
}

/// The names of the first of itemsBeyond().
std::string namesBeyond(const KdxSection& node, std::string_view prefix, std::size_t count) {
  constexpr std::size_t kMostNames = 8;
  const std::vector<const KdxSection*> items = itemsBeyond(node, prefix, count);
  std::string names;
  for (std::size_t i = 0; i < std::min(items.size(), kMostNames); ++i) {
    names += fmt::format("{}{}", i == 0 ? "" : ", ", items[i]->name());
  }
  return items.size() > kMostNames ? names + ", ..." : names;
}

/// What the keyword accepts, if a text without quotes was written for a coded value.
std::string wantedInstead(const KdxUnquotedText& found, const SetupSchema& schema) {
  std::string pattern;
  for (const std::string& name : std::span(found.sections).subspan(1)) pattern = inside(pattern, itemPattern(name));
  const KeywordRow* row = found.sections.front() == kSetupTarget ? schema.findKeyword(pattern, found.keyword) : nullptr;
  if (row == nullptr || row->type != KeywordType::code) return {};
  const std::span<const CodeName> codes = row->facts.codes;
  return fmt::format("; {} takes {}{}", row->name(), wantedCode(codes), nearestCode(codes, found.text));
}

KdxDocument parsed(const std::string& fileName, std::string_view text, const SetupSchema& schema) {
  auto result = parseKdx(fileName, text);
  if (const auto* error = std::get_if<KdxSyntaxError>(&result)) {
    const std::string fault = faultOfEncoding(text);
    fatalError(
        "Error: Unable to open " + fileName,
        fmt::format("{}:{}:{}: {}{}{}{}", fileName, error->position.line, error->position.column, error->message,
                    error->unquoted ? wantedInstead(*error->unquoted, schema) : "", fault.empty() ? "" : "; ", fault));
  }
  return std::get<KdxDocument>(std::move(result));
}

}  // namespace

SetupFile::SetupFile(const std::string& fileName, std::string folder, std::string_view text, const SetupSchema& schema,
                     RunLog& log)
    : document_(parsed(fileName, text, schema)), folder_(std::move(folder)), schema_(schema), log_(log) {
  for (const SectionRow* row : schema_.sections()) {
    if (row->readWhen == "always") needed_.emplace_back(row->path);
  }
}

SetupSection SetupFile::target() {
  const SetupSection root(*this, document_.root, "", "");
  root.open(kSetupTarget);
  return {*this, *document_.root.section(kSetupTarget), "", ""};
}

void SetupFile::need(const std::vector<std::string>& paths) {
  needed_.insert(needed_.end(), paths.begin(), paths.end());
}

std::string SetupFile::linesToAdd(std::string_view parent, std::string_view opened, bool isOpenedListed) const {
  constexpr int kMostSections = 20;
  const KdxSection* target = document_.root.section(kSetupTarget);
  if (target == nullptr) return {};
  std::string lines;
  std::string misspelt;
  int count = 0;
  const auto add = [&](std::string_view inWhich, std::string_view name) {
    const SectionRow* row = schema_.findSection(patternOf(inside(inWhich, name)));
    if (row == nullptr || ++count > kMostSections) return;
    lines += fmt::format("\n   in [{}]:", inWhich.empty() ? kSetupTarget : inWhich) +
             linesOfSection(name, *row, schema_, "   ");
  };
  if (isOpenedListed) add(parent, opened);
  const std::string missing = inside(parent, opened);
  for (const std::string_view path : needed_) {
    if (path == missing) continue;
    const std::size_t slash = path.rfind('/');
    const std::string_view inWhich = path.substr(0, slash == std::string_view::npos ? 0 : slash);
    const std::string_view name = path.substr(slash == std::string_view::npos ? 0 : slash + 1);
    const auto found = nameInSetup(*target, path, schema_);
    if (!found) {
      add(inWhich, name);
    } else if (*found != name) {
      misspelt +=
          fmt::format("\nmisspelt, too, in [{}]: found {}, did you mean {}?", inWhich.empty() ? kSetupTarget : inWhich,
                      quotedForMessage(*found), quotedForMessage(name));
    }
  }
  for (const std::string_view path : needed_) {
    const KdxSection* list = sectionAt(*target, path);
    if (list == nullptr || path == parent) continue;
    for (const std::string& pattern : schema_.sectionNamesInside(patternOf(path))) {
      const std::optional<std::string> item = firstMissingItem(*list, pattern);
      if (!item) continue;
      if (itemsBeyond(*list, itemPrefix(pattern), 0).empty()) {
        add(path, *item);
      } else {
        misspelt += fmt::format("\nmissing, too, in [{}]: [{}]", path, *item);
      }
    }
  }
  if (count > kMostSections) lines += fmt::format("\n   and {} more", count - kMostSections);
  return (lines.empty() ? lines : "\nsections to add:" + lines) + misspelt;
}

std::string SetupFile::location(KdxPosition position) const {
  if (position.line == 0) return document_.sourceName;  // the position is the whole file
  return fmt::format("{}:{}:{}", document_.sourceName, position.line, position.column);
}

std::string SetupFile::resolve(std::string_view fileName) const {
  if (fileName.empty()) return {};
  std::string path(fileName);
  std::replace(path.begin(), path.end(), '\\', '/');
  std::string normal = (std::filesystem::path(folder_) / path).lexically_normal().string();
  while (normal.size() > 1 && normal.back() == '/') normal.pop_back();
  return normal;
}

std::string SetupFile::relative(const std::string& path) const {
  return path.starts_with(folder_ + "/") ? path.substr(folder_.size() + 1) : path;
}

SetupSection::SetupSection(SetupFile& file, const KdxSection& node, std::string path, std::string pattern)
    : file_(&file), node_(&node), path_(std::move(path)), pattern_(std::move(pattern)) {}

bool SetupSection::holds(std::string_view path) const {
  return sectionAt(*node_, path) != nullptr;
}

std::optional<SetupValue> SetupSection::peek(std::string_view path, std::string_view keyword) const {
  const KdxSection* node = sectionAt(*node_, path);
  const KeywordRow* row = file_->schema().findKeyword(patternOf(inside(path_, path)), keyword);
  if (node == nullptr || row == nullptr) return std::nullopt;
  const KdxKeyword* found = node->keyword(keyword);
  if (found == nullptr) {
    return row->isRequired() || row->isLeftOutByDefault() ? std::nullopt : std::optional(defaultSetupValue(*row));
  }
  auto converted = convertSetupValue(*row, *found);
  auto* value = std::get_if<SetupValue>(&converted);
  return value == nullptr ? std::nullopt : std::optional(std::move(*value));
}

std::optional<SetupSection> SetupSection::openIfPresent(std::string_view name) const {
  const KdxSection* node = node_->section(name);
  if (node == nullptr) return std::nullopt;
  SetupSection section(*file_, *node, inside(path_, name), inside(pattern_, itemPattern(name)));
  section.echoName();
  return section;
}

void SetupSection::echoName() const {
  file_->log().line(fmt::format("[{}]", path_));
}

SetupSection SetupSection::open(std::string_view name) const {
  if (auto section = openIfPresent(name)) return *std::move(section);
  failMissing(name, {});
}

void SetupSection::failMissing(std::string_view name, std::string_view addition) const {
  const std::string meant = didYouMean(name, unknownSections(*node_, pattern_, file_->schema()));
  const std::string where = node_->name().empty() ? std::string("in the file") : "in section " + node_->name();
  fatalError(fmt::format("Error: Unable to open section {} in KDX file", name),
             fmt::format("{}: expected section [{}] {}{}{}", file_->location(node_->position()), name, where, meant,
                         addition.empty() ? file_->linesToAdd(path_, name, meant.empty()) : addition));
}

SetupSection SetupSection::openItem(std::string_view prefix, std::size_t number) const {
  const std::string name = fmt::format("{}{}", prefix, number);
  if (auto section = openIfPresent(name)) return *std::move(section);
  const std::string present = namesBeyond(*node_, prefix, 0);
  const KdxKeyword* count = node_->keyword(kItemCountKeyword);
  const auto* wanted = count == nullptr ? nullptr : std::get_if<std::int32_t>(&count->values.front().value);
  if (wanted == nullptr) failMissing(name, {});
  // Where there are others, the count may be what is wrong.
  failMissing(
      name, fmt::format("\n{}: {} is {}, and there are here: {}{}", location(kItemCountKeyword), kItemCountKeyword,
                        *wanted, present.empty() ? "none" : present, file_->linesToAdd(path_, name, present.empty())));
}

std::optional<SetupSection> SetupSection::itemBeyond(std::string_view prefix, std::size_t count) const {
  const std::vector<const KdxSection*> items = itemsBeyond(*node_, prefix, count);
  if (items.empty()) return std::nullopt;
  const std::string& name = items.front()->name();
  return SetupSection(*file_, *items.front(), inside(path_, name), inside(pattern_, itemPattern(name)));
}

std::string SetupSection::name() const {
  return node_->name();
}

void SetupSection::read(const BoundSection& section) const {
  take(section);
  check(section);
}

void SetupSection::take(const BoundSection& section) const {
  for (const KeywordRow& row : section.row->keywords) {
    if (row.store != nullptr) takeRow(row, section.settings);
  }
}

void SetupSection::takeRow(const KeywordRow& row, void* settings) const {
  const bool isList = row.type == KeywordType::textLines;
  const int count = isList ? node_->keywordCount(row.name()) : std::min(1, node_->keywordCount(row.name()));
  for (int instance = 1; instance <= count; ++instance) {
    const SetupValue value = convert(row, *node_->keyword(row.name(), instance));
    takeValue(row, value, false, settings);
    const auto* number = std::get_if<std::int32_t>(&value);
    if (row.isYesOrNo && number != nullptr && *number != 0 && *number != 1) {
      const auto read = std::size_t(*number & 1);
      warn(row.name(),
           fmt::format("found {}, expected 0 or 1; read as {} ({})", *number, read, kNoYesNames[read].name));
    }
  }
  if (count > 0) return;
  if (row.isRequired()) refuseMissing(row);
  refuseMisspelt(row, row.isLeftOutByDefault() ? "none" : row.facts.defaultValue);
  if (isList || row.isLeftOutByDefault()) return;
  takeValue(row, defaultSetupValue(row), true, settings);
}

void SetupSection::takeValue(const KeywordRow& row, const SetupValue& value, bool isDefault, void* settings) const {
  const bool isFile = row.type == KeywordType::fileName;
  echo(row, isFile && !isDefault ? SetupValue(written(row.name())) : value, isDefault);
  row.store(settings, value);
  if (!row.facts.bearsOnResults) return;
  const bool hasDefault = !row.isRequired() && !row.isLeftOutByDefault();
  const bool isLikeDefault =
      isDefault || (hasDefault && formatSetupValue(value) == formatSetupValue(defaultSetupValue(row)));
  file_->resultSettings().push_back({path_, std::string(row.name()),
                                     isFile ? file_->relative(std::get<std::string>(value)) : formatSetupValue(value),
                                     isLikeDefault});
}

void SetupSection::check(const BoundSection& section) const {
  std::vector<const KeywordRow*> rows;
  for (const KeywordRow& row : section.row->keywords) {
    if (row.store != nullptr && (isRangeChecked(row) || row.check != nullptr)) rows.push_back(&row);
  }
  std::stable_sort(rows.begin(), rows.end(),
                   [](const KeywordRow* a, const KeywordRow* b) { return a->facts.checkOrder < b->facts.checkOrder; });
  for (const KeywordRow* row : rows) {
    if (isRangeChecked(*row)) checkRange(*row, section);
    if (row->check != nullptr) require(row->check(section.settings));
  }
}

void SetupSection::checkRange(const KeywordRow& row, const BoundSection& section) const {
  const KdxKeyword* keyword = node_->keyword(row.name());
  if (keyword == nullptr) return;  // a default is valid
  const SetupValue value = convert(row, *keyword);
  const auto* integer = std::get_if<std::int32_t>(&value);
  const auto* real = std::get_if<double>(&value);
  if (integer == nullptr && real == nullptr) return;  // the name of a code
  const double number = integer != nullptr ? *integer : *real;
  if (row.facts.range.contains(number)) return;
  if (row.facts.refusal.empty()) {
    refuseToRead(keyword->position, row.name(),
                 fmt::format("expected {}, found {}", row.facts.range.text(), formatReal(number)));
  }
  std::string message(row.facts.refusal);
  if (message.ends_with(' ')) {
    message += section.row->itemName != nullptr ? section.row->itemName(section.settings) : name();
  }
  refuse(message, row.name(),
         fmt::format("expected {}{}, found {}", row.facts.range.text(), orOneOfTheNames(row.facts.codes),
                     formatReal(number)));
}

std::size_t SetupSection::readCount(std::string_view itemPrefix) const {
  const KeywordRow& row = *file_->schema().findKeyword(pattern_, kItemCountKeyword);
  std::size_t present = 0;
  for (const auto& section : node_->sections()) {
    const bool isItem = section->name().starts_with(itemPrefix) && itemPattern(section->name()) != section->name();
    present += isItem ? 1 : 0;
  }
  const KdxKeyword* keyword = node_->keyword(row.name());
  if (keyword == nullptr) {
    if (present > 0) refuseMissing(row);  // else the items would be ignored silently
    refuseMisspelt(row, "0");
    echo(row, SetupValue(std::int32_t{0}), true);
    return 0;
  }
  const auto count = std::get<std::int32_t>(convert(row, *keyword));
  echo(row, SetupValue(count), false);
  if (count < 0) refuseToRead(keyword->position, row.name(), fmt::format("expected 0 or more, found {}", count));
  if (present > static_cast<std::size_t>(count)) {
    const std::string_view verb = present == 1 ? "is" : "are";
    warn(row.name(), fmt::format("{} {}n {} here, those beyond {} are not read: {}", countText(present, "section"),
                                 itemPrefix, verb, count, namesBeyond(*node_, itemPrefix, count)));
  }
  return static_cast<std::size_t>(count);
}

SetupValue SetupSection::convert(const KeywordRow& row, const KdxKeyword& keyword) const {
  auto converted = convertSetupValue(row, keyword);
  if (const auto* error = std::get_if<SetupValueError>(&converted)) {
    refuseToRead(error->position, row.name(), error->explanation);
  }
  SetupValue value = std::get<SetupValue>(std::move(converted));
  if (row.type == KeywordType::fileName) return file_->resolve(std::get<std::string>(value));
  return value;
}

void SetupSection::refuse(std::string_view message, std::string_view keyword, std::string_view explanation) const {
  fatalError(message, fmt::format("{}: {}: {}", location(keyword), keyword, explanation));
}

void SetupSection::refuse(std::string_view message, std::string_view keyword, int instance,
                          std::string_view explanation) const {
  const KdxKeyword* found = node_->keyword(keyword, instance);
  const KdxPosition position = found == nullptr ? node_->position() : found->values.front().position;
  fatalError(message, fmt::format("{}: {}: {}", file_->location(position), keyword, explanation));
}

void SetupSection::refuse(const SettingRefusal& refusal) const {
  refuse(refusal.message, refusal.keyword, refusal.explanation);
}

void SetupSection::checkAt(std::string_view keyword, const std::function<void()>& check) const {
  try {
    check();
  } catch (const FatalError& error) {
    refuse(error.message(), keyword, error.detail());
  }
}

void SetupSection::warn(std::string_view keyword, std::string_view text) const {
  file_->log().warning(fmt::format("{}: {}: {}", location(keyword), keyword, text));
}

void SetupSection::note(std::string_view keyword, std::string_view text) const {
  file_->log().line(fmt::format("  {}: {}", keyword, text));
}

std::string SetupSection::written(std::string_view keyword) const {
  const KdxKeyword* found = node_->keyword(keyword);
  const auto* text = found == nullptr ? nullptr : std::get_if<std::string>(&found->values.front().value);
  return text == nullptr ? std::string{} : std::string(trimTrailing(*text));
}

std::string SetupSection::location(std::string_view keyword) const {
  const KdxKeyword* found = node_->keyword(keyword);
  return file_->location(found == nullptr ? node_->position() : found->values.front().position);
}

std::vector<std::string> SetupSection::unknownKeywords() const {
  std::vector<std::string> unknown;
  for (const KdxKeyword& keyword : node_->keywords()) {
    if (file_->schema().findKeyword(pattern_, keyword.name) == nullptr) unknown.push_back(keyword.name);
  }
  return unknown;
}

void SetupSection::refuseMisspelt(const KeywordRow& row, std::string_view meantByNone) const {
  for (const std::string& name : unknownKeywords()) {
    if (editDistance(name, row.name()) > 1) continue;
    refuseToRead(node_->keyword(name)->position, row.name(),
                 fmt::format("the keyword is missing, which would mean {}; found {}, did you mean {}?", meantByNone,
                             quotedForMessage(name), quotedForMessage(row.name())));
  }
}

void SetupSection::refuseMissing(const KeywordRow& row) const {
  refuseToRead(node_->position(), row.name(),
               fmt::format("the keyword is missing in section {}{}", path_, didYouMean(row.name(), unknownKeywords())));
}

void SetupSection::refuseToRead(KdxPosition position, std::string_view keyword, std::string_view explanation) const {
  fatalError(fmt::format("Error: Unable to read keyword in section {} in KDX file", name()),
             fmt::format("{}: {}: {}", file_->location(position), keyword, explanation));
}

void SetupSection::echo(const KeywordRow& row, const SetupValue& value, bool isDefault) const {
  const std::string_view name =
      std::holds_alternative<std::int32_t>(value) ? nameOfCode(row.facts.codes, value) : std::string_view{};
  file_->log().line(fmt::format("  {} = {}{}{}", row.name(), formatSetupValue(value),
                                name.empty() ? std::string{} : fmt::format(" ('{}')", name),
                                isDefault ? " (default)" : ""));
}

}  // namespace mirevo
