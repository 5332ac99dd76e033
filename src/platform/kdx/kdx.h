#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <variant>
#include <vector>

#include "common/date_record.h"

namespace mirevo {

/// A position in a KDX text; line and column count from 1, columns in bytes.
struct KdxPosition {
  int line = 0;
  int column = 0;
};

/// One typed value of a keyword, with the position it was read from.
struct KdxValue {
  std::variant<std::int32_t, double, std::string, DateRecord> value;
  KdxPosition position;
};

/// A keyword line: `Name = value {, value}`.
struct KdxKeyword {
  std::string name;
  std::vector<KdxValue> values;
  KdxPosition position;
};

/// A section with its keywords and nested sections, in file order. Look-ups by name are by hash, so that a setup of
/// tens of thousands of sections is read in linear time.
class KdxSection final {
 public:
  /// Deeper nesting is refused as a syntax error, so that no walk over the tree can run out of stack.
  static constexpr std::size_t kMaximumDepth = 100;

  KdxSection(std::string name, KdxPosition position);

  const std::string& name() const { return name_; }
  KdxPosition position() const { return position_; }
  const std::vector<KdxKeyword>& keywords() const { return keywords_; }
  const std::vector<std::unique_ptr<KdxSection>>& sections() const { return sections_; }

  /// The `instance`-th (from 1) nested section with this name; nullptr when there is none.
  const KdxSection* section(std::string_view name, int instance = 1) const;
  /// The `instance`-th (from 1) keyword with this name; nullptr when there is none.
  const KdxKeyword* keyword(std::string_view name, int instance = 1) const;
  /// How often a keyword with this name occurs in this section.
  int keywordCount(std::string_view name) const;

  KdxKeyword& addKeyword(KdxKeyword keyword);
  KdxSection& addSection(std::string name, KdxPosition position);

 private:
  /// Indices of the entries with each name, in file order. A section of a few entries is searched linearly, which takes
  /// a fraction of the memory: a setup has one long list and thousands of short sections.
  class NameIndex {
   public:
    /// Adds the last of `elements`, whose names `nameOf` returns.
    template <class Elements, class NameOf>
    void add(const Elements& elements, NameOf nameOf);
    /// The index of the `instance`-th element with this name; `elements.size()` when there is none.
    template <class Elements, class NameOf>
    std::size_t find(const Elements& elements, NameOf nameOf, std::string_view name, int instance) const;
    template <class Elements, class NameOf>
    std::size_t count(const Elements& elements, NameOf nameOf, std::string_view name) const;

   private:
    static constexpr std::size_t kSearchedAsItStands = 16;
    /// Allows look-ups without a copy of the name.
    struct NameHash {
      using is_transparent = void;
      std::size_t operator()(std::string_view name) const { return std::hash<std::string_view>{}(name); }
    };
    using Places = std::unordered_map<std::string, std::vector<std::size_t>, NameHash, std::equal_to<>>;

    std::unique_ptr<Places> places_;  ///< none while there are few entries
  };

  std::string name_;
  KdxPosition position_;
  std::vector<KdxKeyword> keywords_;
  std::vector<std::unique_ptr<KdxSection>> sections_;
  NameIndex keywordIndex_;
  NameIndex sectionIndex_;
};

/// A text without quotes where a value was expected.
struct KdxUnquotedText {
  std::string text;
  std::string keyword = {};                ///< the keyword whose value it should be
  std::vector<std::string> sections = {};  ///< that contain the keyword, from the outside in
};

/// Why a KDX text cannot be read: the position of the first error, and what was expected there.
struct KdxSyntaxError {
  KdxPosition position;
  std::string message;
  std::optional<KdxUnquotedText> unquoted = {};  ///< if that is the fault
};

/// A parsed KDX text: its targets are the sections of `root`.
struct KdxDocument {
  std::string sourceName;
  KdxSection root{"", {}};
};

/// Parses a KDX text in time linear in its length. `sourceName` is kept for messages only.
std::variant<KdxDocument, KdxSyntaxError> parseKdx(std::string sourceName, std::string_view text);

/// `2001-01-31`, optionally followed by ` 12:30` or `T12:30`, and that by `:15`; empty when `text` has any other form.
/// The fields are not checked: month 13 is accepted here.
std::optional<DateRecord> parseKdxDate(std::string_view text);

}  // namespace mirevo
