#include "run/setup/setup_access.h"

#include <algorithm>
#include <filesystem>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "run/setup/setup_value.h"

namespace mirevo {
namespace {

KdxDocument parsed(const std::string& fileName, std::string_view text) {
  auto result = parseKdx(fileName, text);
  if (const auto* error = std::get_if<KdxSyntaxError>(&result)) {
    fatalError("Error: Unable to open " + fileName,
               fmt::format("{}:{}:{}: {}", fileName, error->position.line, error->position.column, error->message));
  }
  return std::get<KdxDocument>(std::move(result));
}

/// What a missing name may have been misspelt as: the nearest of the names that stand there and mean nothing.
std::string didYouMean(std::string_view missing, const std::vector<std::string>& unknown) {
  const auto nearest = nearestName(missing, unknown);
  return nearest ? fmt::format("; found {}, did you mean {}?", quotedForMessage(*nearest), quotedForMessage(missing))
                 : std::string{};
}

std::string inside(std::string_view path, std::string_view name) {
  return path.empty() ? std::string(name) : fmt::format("{}/{}", path, name);
}

}  // namespace

SetupFile::SetupFile(const std::string& fileName, std::string folder, std::string_view text, RunLog& log)
    : document_(parsed(fileName, text)), folder_(std::move(folder)), log_(log) {}

SetupSection SetupFile::target() {
  const SetupSection root(*this, document_.root, "", "");
  root.open(kSetupTarget);
  return {*this, *document_.root.section(kSetupTarget), "", ""};
}

std::string SetupFile::place(KdxPosition position) const {
  if (position.line == 0) return document_.sourceName;  // the file as a whole
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
  std::vector<std::string> unknown;
  for (const auto& section : node_->sections()) {
    if (findSection(inside(pattern_, itemPattern(section->name()))) == nullptr) unknown.push_back(section->name());
  }
  const std::string where = node_->name().empty() ? std::string("in the file") : "in section " + node_->name();
  fatalError(fmt::format("Error: Unable to open section {} in KDX file", name),
             fmt::format("{}: expected section [{}] {}{}", file_->place(node_->position()), name, where,
                         didYouMean(name, unknown)));
}

SetupSection SetupSection::openItem(std::string_view prefix, std::size_t number) const {
  return open(fmt::format("{}{}", prefix, number));
}

std::string SetupSection::name() const {
  return node_->name();
}

void SetupSection::read(RunConfig& config, std::size_t item) const {
  for (const KeywordRow& row : keywordsOf(pattern_)) {
    if (row.store != nullptr) readRow(row, config, item);
  }
}

void SetupSection::readRow(const KeywordRow& row, RunConfig& config, std::size_t item) const {
  const bool isList = row.type == KeywordType::textLines;
  const int count = isList ? node_->keywordCount(row.name) : std::min(1, node_->keywordCount(row.name));
  for (int instance = 1; instance <= count; ++instance) {
    take(row, convert(row, *node_->keyword(row.name, instance)), false, config, item);
  }
  if (count > 0 || isList || row.isLeftOutByDefault()) return;
  if (row.isRequired()) refuseMissing(row);
  take(row, defaultSetupValue(row), true, config, item);
}

void SetupSection::take(const KeywordRow& row, const SetupValue& value, bool isDefault, RunConfig& config,
                        std::size_t item) const {
  echo(row.name, value, isDefault);
  row.store(config, item, value);
  if (!row.bearsOnResults) return;
  const bool isFile = row.type == KeywordType::fileName;
  config.resultSettings.push_back({path_, std::string(row.name),
                                   isFile ? file_->relative(std::get<std::string>(value)) : formatSetupValue(value),
                                   isDefault});
}

std::size_t SetupSection::readCount(std::string_view itemPrefix) const {
  const KeywordRow& row = *findKeyword(pattern_, kItemCountKeyword);
  std::size_t present = 0;
  for (const auto& section : node_->sections()) {
    const bool isItem = section->name().starts_with(itemPrefix) && itemPattern(section->name()) != section->name();
    present += isItem ? 1 : 0;
  }
  const KdxKeyword* keyword = node_->keyword(row.name);
  if (keyword == nullptr) {
    if (present > 0) refuseMissing(row);  // items that would be left out without a word
    echo(row.name, SetupValue(std::int32_t{0}), true);
    return 0;
  }
  const auto count = std::get<std::int32_t>(convert(row, *keyword));
  echo(row.name, SetupValue(count), false);
  if (count < 0) refuseToRead(keyword->position, row.name, fmt::format("expected 0 or more, found {}", count));
  if (present > static_cast<std::size_t>(count)) {
    warn(row.name, fmt::format("{} sections {}n stand here, those beyond {} are not read", present, itemPrefix, count));
  }
  return static_cast<std::size_t>(count);
}

SetupValue SetupSection::convert(const KeywordRow& row, const KdxKeyword& keyword) const {
  auto converted = convertSetupValue(row, keyword);
  if (const auto* error = std::get_if<SetupValueError>(&converted)) {
    refuseToRead(error->position, row.name, error->explanation);
  }
  SetupValue value = std::get<SetupValue>(std::move(converted));
  if (row.type == KeywordType::fileName) return file_->resolve(std::get<std::string>(value));
  return value;
}

void SetupSection::check(std::string_view keyword, double value, std::string_view message) const {
  const KeywordRow& row = *findKeyword(pattern_, keyword);
  if (!row.range.contains(value)) {
    refuse(message, keyword, fmt::format("expected {}, found {}", row.range.text(), formatReal(value)));
  }
}

void SetupSection::refuse(std::string_view message, std::string_view keyword, std::string_view explanation) const {
  fatalError(message, fmt::format("{}: {}: {}", place(keyword), keyword, explanation));
}

void SetupSection::warn(std::string_view keyword, std::string_view text) const {
  file_->log().warning(fmt::format("{}: {}: {}", place(keyword), keyword, text));
}

void SetupSection::note(std::string_view keyword, std::string_view text) const {
  file_->log().line(fmt::format("  {}: {}", keyword, text));
}

std::string SetupSection::written(std::string_view keyword) const {
  const KdxKeyword* found = node_->keyword(keyword);
  const auto* text = found == nullptr ? nullptr : std::get_if<std::string>(&found->values.front().value);
  return text == nullptr ? std::string{} : std::string(trimTrailing(*text));
}

/// Of the keyword's first value; of the section where the keyword is absent.
std::string SetupSection::place(std::string_view keyword) const {
  const KdxKeyword* found = node_->keyword(keyword);
  return file_->place(found == nullptr ? node_->position() : found->values.front().position);
}

void SetupSection::refuseMissing(const KeywordRow& row) const {
  std::vector<std::string> unknown;
  for (const KdxKeyword& keyword : node_->keywords()) {
    if (findKeyword(pattern_, keyword.name) == nullptr) unknown.push_back(keyword.name);
  }
  refuseToRead(node_->position(), row.name,
               fmt::format("the keyword is missing in section {}{}", path_, didYouMean(row.name, unknown)));
}

void SetupSection::refuseToRead(KdxPosition position, std::string_view keyword, std::string_view explanation) const {
  fatalError(fmt::format("Error: Unable to read keyword in section {} in KDX file", name()),
             fmt::format("{}: {}: {}", file_->place(position), keyword, explanation));
}

void SetupSection::echo(std::string_view keyword, const SetupValue& value, bool isDefault) const {
  file_->log().line(fmt::format("  {} = {}{}", keyword, formatSetupValue(value), isDefault ? " (default)" : ""));
}

}  // namespace mirevo
