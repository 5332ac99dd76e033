#include "platform/kdx/kdx.h"

#include <algorithm>
#include <span>
#include <utility>

#include <fmt/core.h>

#include "common/text.h"
#include "platform/kdx/kdx_value.h"

namespace mirevo {
namespace {

const std::string& nameOfKeyword(const KdxKeyword& keyword) {
  return keyword.name;
}
const std::string& nameOfSection(const std::unique_ptr<KdxSection>& section) {
  return section->name();
}

bool isNameCharacter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_' || c == '-' || c == '.';
}

/// Reads statement by statement, with its own stack of open sections instead of recursion.
class KdxParser final {
 public:
  KdxParser(KdxDocument& document, std::string_view text) : cursor_(text) { open_.push_back(&document.root); }

  bool parse() {
    while (true) {
      cursor_.skipBlanksCommentsAndLineEnds();
      if (cursor_.atEnd()) return isClosed();
      const bool good = cursor_.peek() == '[' ? parseSectionMark() : parseKeyword();
      if (!good) return false;
    }
  }

  KdxSyntaxError error() const { return error_; }

 private:
  bool fail(KdxPosition position, std::string message) {
    error_ = {position, std::move(message)};
    return false;
  }

  bool failAtValue(KdxSyntaxError error, const std::string& keyword) {
    error_ = std::move(error);
    if (!error_.unquoted) return false;
    error_.unquoted->keyword = keyword;
    for (const KdxSection* section : std::span(open_).subspan(1)) error_.unquoted->sections.push_back(section->name());
    return false;
  }

  bool isClosed() {
    if (open_.size() == 1) return true;
    return fail(cursor_.position(),
                fmt::format("expected \"[/{}]\" to close the section opened at line {}, found the end of the file",
                            open_.back()->name(), open_.back()->position().line));
  }

  /// `[Name]` or `[/Name]`.
  bool parseSectionMark() {
    const KdxPosition start = cursor_.position();
    cursor_.advance();
    cursor_.skipBlanks();
    const bool closes = cursor_.peek() == '/';
    if (closes) cursor_.advance();
    cursor_.skipBlanks();
    const KdxPosition namePosition = cursor_.position();
    const std::string name(cursor_.takeWhile(isNameCharacter));
    if (name.empty()) {
      return fail(namePosition, fmt::format("expected the name of a section, found {}", cursor_.describeNext()));
    }
    cursor_.skipBlanks();
    if (cursor_.peek() != ']') {
      return fail(cursor_.position(), fmt::format("expected ']' after section name {}, found {}",
                                                  quotedForMessage(name), cursor_.describeNext()));
    }
    cursor_.advance();
    return closes ? closeSection(start, name) : openSection(start, name);
  }

  bool openSection(KdxPosition start, const std::string& name) {
    if (open_.size() > KdxSection::kMaximumDepth) {
      return fail(start, fmt::format("expected at most {} sections inside each other", KdxSection::kMaximumDepth));
    }
    open_.push_back(&open_.back()->addSection(name, start));
    return true;
  }

  bool closeSection(KdxPosition start, const std::string& name) {
    if (open_.size() == 1) {
      return fail(start, fmt::format("expected no {}: no section is open", quotedForMessage("[/" + name + "]")));
    }
    const KdxSection& innermost = *open_.back();
    if (innermost.name() != name) {
      return fail(start, fmt::format("expected {} to close the section opened at line {}, found {}",
                                     quotedForMessage("[/" + innermost.name() + "]"), innermost.position().line,
                                     quotedForMessage("[/" + name + "]")));
    }
    open_.pop_back();
    return true;
  }

  /// `Keyword = value {, value}` up to the end of the line.
  bool parseKeyword() {
    KdxKeyword keyword;
    keyword.position = cursor_.position();
    keyword.name = cursor_.takeWhile(isNameCharacter);
    if (keyword.name.empty()) {
      const std::string found = cursor_.describeNext();
      const bool maybeComment = found.starts_with("\"#") || found.starts_with("\";") || found.starts_with("\"!");
      return fail(keyword.position, fmt::format("expected a section or a keyword, found {}{}", found,
                                                maybeComment ? "; a comment begins with //" : ""));
    }
    if (open_.size() == 1) {
      return fail(keyword.position,
                  fmt::format("expected a section before keyword {}", quotedForMessage(keyword.name)));
    }
    cursor_.skipBlanks();
    if (cursor_.peek() != '=') {
      return fail(cursor_.position(), fmt::format("expected '=' after keyword {}", quotedForMessage(keyword.name)));
    }
    char separator = '=';
    do {
      cursor_.advance();
      cursor_.skipBlanks();
      std::variant<KdxValue, KdxSyntaxError> value = readKdxValue(cursor_, separator);
      if (auto* wrong = std::get_if<KdxSyntaxError>(&value)) return failAtValue(std::move(*wrong), keyword.name);
      keyword.values.push_back(std::get<KdxValue>(std::move(value)));
      cursor_.skipBlanks();
      separator = ',';
    } while (cursor_.peek() == separator);
    if (!cursor_.atLineEndOrComment()) {
      const bool isText = std::holds_alternative<std::string>(keyword.values.back().value);
      return fail(
          cursor_.position(),
          fmt::format(
              "expected ',' or the end of the line after a value, found {}{}", cursor_.describeNext(),
              isText ? "; write a quote inside a text twice, or put the text between quotes of the other kind" : ""));
    }
    open_.back()->addKeyword(std::move(keyword));
    return true;
  }

  KdxCursor cursor_;
  std::vector<KdxSection*> open_;  ///< the root, then the open sections from the outside in
  KdxSyntaxError error_;
};

}  // namespace

KdxSection::KdxSection(std::string name, KdxPosition position) : name_(std::move(name)), position_(position) {}

template <class Elements, class NameOf>
void KdxSection::NameIndex::add(const Elements& elements, NameOf nameOf) {
  if (places_ != nullptr) {
    (*places_)[nameOf(elements.back())].push_back(elements.size() - 1);
  } else if (elements.size() > kSearchedAsItStands) {
    places_ = std::make_unique<Places>();
    for (std::size_t i = 0; i < elements.size(); ++i) (*places_)[nameOf(elements[i])].push_back(i);
  }
}

template <class Elements, class NameOf>
std::size_t KdxSection::NameIndex::find(const Elements& elements, NameOf nameOf, std::string_view name,
                                        int instance) const {
  if (places_ != nullptr) {
    const auto found = places_->find(name);
    const bool exists =
        found != places_->end() && instance >= 1 && static_cast<std::size_t>(instance) <= found->second.size();
    return exists ? found->second[static_cast<std::size_t>(instance) - 1] : elements.size();
  }
  for (std::size_t i = 0; i < elements.size(); ++i) {
    if (nameOf(elements[i]) == name && --instance == 0) return i;
  }
  return elements.size();
}

template <class Elements, class NameOf>
std::size_t KdxSection::NameIndex::count(const Elements& elements, NameOf nameOf, std::string_view name) const {
  if (places_ != nullptr) {
    const auto found = places_->find(name);
    return found == places_->end() ? 0 : found->second.size();
  }
  return static_cast<std::size_t>(
      std::count_if(elements.begin(), elements.end(), [&](const auto& element) { return nameOf(element) == name; }));
}

const KdxSection* KdxSection::section(std::string_view name, int instance) const {
  const std::size_t place = sectionIndex_.find(sections_, nameOfSection, name, instance);
  return place == sections_.size() ? nullptr : sections_[place].get();
}

const KdxKeyword* KdxSection::keyword(std::string_view name, int instance) const {
  const std::size_t place = keywordIndex_.find(keywords_, nameOfKeyword, name, instance);
  return place == keywords_.size() ? nullptr : &keywords_[place];
}

int KdxSection::keywordCount(std::string_view name) const {
  return static_cast<int>(keywordIndex_.count(keywords_, nameOfKeyword, name));
}

KdxKeyword& KdxSection::addKeyword(KdxKeyword keyword) {
  keywords_.push_back(std::move(keyword));
  keywordIndex_.add(keywords_, nameOfKeyword);
  return keywords_.back();
}

KdxSection& KdxSection::addSection(std::string name, KdxPosition position) {
  sections_.push_back(std::make_unique<KdxSection>(std::move(name), position));
  sectionIndex_.add(sections_, nameOfSection);
  return *sections_.back();
}

std::variant<KdxDocument, KdxSyntaxError> parseKdx(std::string sourceName, std::string_view text) {
  KdxDocument document;
  document.sourceName = std::move(sourceName);
  KdxParser parser(document, text);
  if (!parser.parse()) return parser.error();
  return document;
}

}  // namespace mirevo
