#pragma once

#include <memory>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "common/settings/keyword_row.h"

namespace mirevo {

/// The classes derived from `Base` among which a setup chooses by number or name. `facts()` of a class gives its `name`
/// and `longName`, which are the same for all objects of the class.
template <class Base>
class ChoiceTable final {
 public:
  /// `ChoiceTable<SearchMethod>::of<SceMethod, PseMethod>()`; classes with a number first.
  template <class... Forms>
  static ChoiceTable of() {
    return ChoiceTable({makeOne<Forms>...});
  }

  /// Their numbers and names in setups.
  std::span<const CodeName> names() const { return names_; }
  /// The meanings of the numbers and names, for the manual: "0 Shuffled Complex Evolution, 1 Population Simplex
  /// Evolution".
  const std::string& meanings() const { return meanings_; }
  /// An object of the class with this number or name, with the default settings; nullptr when there is none.
  std::unique_ptr<Base> make(const SetupValue& value) const {
    for (std::size_t i = 0; i < names_.size(); ++i) {
      if (isCode(names_[i], value)) return makers_[i]();
    }
    return nullptr;
  }
  /// One object of each class, with the default settings.
  std::vector<std::unique_ptr<Base>> all() const {
    std::vector<std::unique_ptr<Base>> forms;
    for (const Maker maker : makers_) forms.push_back(maker());
    return forms;
  }

 private:
  using Maker = std::unique_ptr<Base> (*)();

  template <class Form>
  static std::unique_ptr<Base> makeOne() {
    return std::make_unique<Form>();
  }

  explicit ChoiceTable(std::vector<Maker> makers) : makers_(std::move(makers)) {
    for (const auto& form : all()) {
      const CodeName& name = names_.emplace_back(form->facts().name);
      const std::string value = name.code ? std::to_string(*name.code) : fmt::format("`'{}'`", name.name);
      meanings_ += fmt::format("{}{} {}", meanings_.empty() ? "" : ", ", value, form->facts().longName);
    }
  }

  std::vector<Maker> makers_;
  std::vector<CodeName> names_;
  std::string meanings_;
};

}  // namespace mirevo
