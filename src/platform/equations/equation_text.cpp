#include "platform/equations/equation_text.h"

#include <algorithm>
#include <numbers>
#include <optional>
#include <utility>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}
/// Bytes of a UTF-8 letter count as letters.
bool isNameStart(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_' || static_cast<unsigned char>(c) >= 0x80;
}
bool isNamePart(char c) {
  return isNameStart(c) || isDigit(c) || c == '.';
}

/// Longest text that the parser library accepts.
constexpr std::size_t kMaximumTranslation = 5000;

/// Walks over an equation once, keeping track of open brackets and of whether an operand or an operator must follow.
class Translator final {
 public:
  Translator(std::string_view equation, const EquationNames& names) : equation_(equation), names_(names) {}

  TranslatedEquation run() {
    if (equation_.size() > kMaximumEquationLength) {
      fail(0, fmt::format("the equation is longer than {} characters", kMaximumEquationLength));
    }
    open_.push_back({});
    while (true) {
      skipBlanks();
      if (atEnd()) break;
      if (operandExpected_) {
        takeOperand();
      } else {
        takeOperator();
      }
    }
    finish();
    std::sort(result_.variables.begin(), result_.variables.end());
    result_.variables.erase(std::unique(result_.variables.begin(), result_.variables.end()), result_.variables.end());
    return std::move(result_);
  }

 private:
  /// An open bracket; the first one represents the equation itself.
  struct Bracket {
    std::size_t position = 0;
    const EquationFunction* function = nullptr;
    int arguments = 1;
    std::vector<std::size_t> conditions;  ///< positions of each '?' that waits for its ':'
  };

  [[noreturn]] static void fail(std::size_t position, std::string what, std::string remedy = {}) {
    throw EquationError{position, std::move(what), std::move(remedy)};
  }

  bool atEnd() const { return at_ >= equation_.size(); }
  char here() const { return equation_[at_]; }
  bool startsWith(std::string_view text) const { return equation_.substr(at_, text.size()) == text; }
  void skipBlanks() {
    while (!atEnd() && (here() == ' ' || here() == '\t')) ++at_;
  }
  void emit(std::string_view text) { result_.text += text; }

  /// The text at the current position, for a message.
  std::string found() const {
    if (atEnd()) return "the end of the equation";
    const auto byte = static_cast<unsigned char>(here());
    if (byte < 0x20 || byte == 0x7f) return fmt::format("the control character {}", static_cast<int>(byte));
    if (!isNamePart(here())) return fmt::format("\"{}\"", here());
    std::size_t end = at_;
    while (end < equation_.size() && isNamePart(equation_[end])) ++end;
    return fmt::format("\"{}\"", equation_.substr(at_, end - at_));
  }

  void takeOperand() {
    const char c = here();
    if (isDigit(c) || (c == '.' && at_ + 1 < equation_.size() && isDigit(equation_[at_ + 1]))) {
      takeNumber();
    } else if (isNameStart(c)) {
      takeName();
    } else if (c == '[' || c == '\'' || c == '"') {
      takeQuotedName();
    } else if (c == '(') {
      openBracket(nullptr);
    } else if (c == '-' || c == '+' || (c == '!' && !startsWith("!="))) {
      takeSign();
    } else {
      fail(at_, fmt::format("a number, a name or \"(\" is expected, not {}", found()));
    }
  }

  /// The library accepts one sign before an operand, so a sequence of signs is reduced to one of five cases: two minus
  /// signs cancel, a minus sign after a negation changes nothing, and of negations one or two remain.
  void takeSign() {
    if (here() == '-' && negations_ == 0) minus_ = !minus_;
    if (here() == '!') negations_ = negations_ == 1 ? 2 : 1;
    ++at_;
  }

  void emitSigns() {
    if (minus_ || negations_ > 0) emit(" ");  // a sign must not run together with the operator before it
    if (minus_) emit("-");
    result_.text.append(static_cast<std::size_t>(negations_), '!');
    minus_ = false;
    negations_ = 0;
  }

  void emitOperand(std::string_view text) {
    emitSigns();
    emit(text);
    operandExpected_ = false;
  }

  void emitNumber(double value) {
    emitOperand(fmt::format("c{}", result_.numbers.size()));
    result_.numbers.push_back(value);
  }

  void takeNumber() {
    const std::size_t start = at_;
    const auto skipDigits = [this] {
      while (!atEnd() && isDigit(here())) ++at_;
    };
    skipDigits();
    if (!atEnd() && here() == '.') ++at_;
    skipDigits();
    if (!atEnd() && std::string_view("eEdD").find(here()) != std::string_view::npos) {
      std::size_t exponent = at_ + 1;
      if (exponent < equation_.size() && (equation_[exponent] == '+' || equation_[exponent] == '-')) ++exponent;
      if (exponent < equation_.size() && isDigit(equation_[exponent])) {
        at_ = exponent;
        skipDigits();
      }
    }
    if (!atEnd() && isNamePart(here())) failAfterNumber(start);
    const std::string_view text = equation_.substr(start, at_ - start);
    const std::optional<double> value = parseReal(text);
    if (!value) fail(start, fmt::format("\"{}\" is not a number within the range of 64 bits", text));
    emitNumber(*value);
  }

  [[noreturn]] void failAfterNumber(std::size_t start) {
    while (!atEnd() && isNamePart(here())) ++at_;
    const std::string_view word = equation_.substr(start, at_ - start);
    fail(start, fmt::format("\"{}\" is neither a number nor a name that can stand without brackets", word),
         names_.find(word) >= 0 ? fmt::format("write the parameter as [{}]", word) : "");
  }

  void takeName() {
    const std::size_t start = at_;
    while (!atEnd() && isNamePart(here())) ++at_;
    const std::string_view name = equation_.substr(start, at_ - start);
    skipBlanks();
    const bool called = !atEnd() && here() == '(';
    if (called) {
      // Only a function can precede a bracket, so a parameter called "max" does not hide max().
      if (const EquationFunction* function = findEquationFunction(name)) return openBracket(function);
      if (names_.find(name) < 0) failUnknown(start, name, "function", equationFunctionNames());
    }
    takeVariable(start, name);
  }

  void takeQuotedName() {
    const std::size_t start = at_;
    const char close = here() == '[' ? ']' : here();
    std::string name;
    for (++at_; !atEnd(); ++at_) {
      if (here() == close) {
        if (at_ + 1 >= equation_.size() || equation_[at_ + 1] != close) break;
        ++at_;
      }
      name += here();
    }
    if (atEnd()) fail(start, fmt::format("the name that begins here has no closing {}", close));
    ++at_;
    takeVariable(start, name, true);
  }

  void takeVariable(std::size_t start, std::string_view name, bool quoted = false) {
    if (const std::ptrdiff_t index = names_.find(name); index >= 0) {
      emitOperand(fmt::format("v{}", index));
      result_.variables.push_back(static_cast<std::size_t>(index));
    } else if (const std::optional<double> constant = quoted ? std::nullopt : findConstant(name)) {
      emitNumber(*constant);
    } else {
      failUnknown(start, name, "parameter", names_.all());
    }
  }

  /// pi and e, unless a parameter's name differs from the constant only in case: "e" meant as the parameter "E" must
  /// not become 2.718.
  std::optional<double> findConstant(std::string_view name) const {
    std::optional<double> constant;
    if (name == "pi") constant = std::numbers::pi;
    if (name == "e") constant = std::numbers::e;
    if (!constant) return std::nullopt;
    for (const std::string& other : names_.all()) {
      if (other.size() == name.size() && equalIgnoringCase(other, name)) return std::nullopt;
    }
    return constant;
  }

  [[noreturn]] static void failUnknown(std::size_t start, std::string_view name, std::string_view kind,
                                       std::span<const std::string> known) {
    const std::optional<std::string> nearest = nearestName(name, known);
    fail(start, fmt::format("no {} is called \"{}\"", kind, name),
         nearest ? fmt::format("did you mean \"{}\"?", *nearest) : "");
  }

  void openBracket(const EquationFunction* function) {
    if (static_cast<int>(open_.size()) > kMaximumEquationNesting) {
      fail(at_, fmt::format("brackets are nested more than {} deep", kMaximumEquationNesting));
    }
    emitSigns();
    if (function != nullptr) emit(function->name);
    emit("(");
    open_.push_back({at_, function, 1, {}});
    ++at_;
  }

  void takeOperator() {
    static constexpr std::string_view kOperators[] = {"<=", ">=", "!=", "==", "&&", "||", "**",
                                                      "<",  ">",  "+",  "-",  "*",  "/",  "^"};
    static constexpr std::pair<std::string_view, std::string_view> kMisspelt[] = {
        {"<>", "!="}, {"><", "!="}, {"=<", "<="}, {"=>", ">="}};
    const char c = here();
    if (c == ')') return closeBracket();
    if (c == ',') return takeComma();
    if (c == '?') return takeQuestion();
    if (c == ':') return takeColon();
    for (const auto& [found, meant] : kMisspelt) {
      if (!startsWith(found)) continue;
      fail(at_, fmt::format("\"{}\" is no operator of an equation", found), fmt::format("did you mean {}?", meant));
    }
    for (const std::string_view symbol : kOperators) {
      if (!startsWith(symbol)) continue;
      emit(symbol == "**" ? "^" : symbol);
      at_ += symbol.size();
      operandExpected_ = true;
      return;
    }
    if (c == '=') fail(at_, "\"=\" is no operator of an equation", "write == to compare two values");
    if (c == '&' || c == '|') fail(at_, fmt::format("\"{}\" is no operator", c), fmt::format("write {}{}", c, c));
    fail(at_, fmt::format("an operator is expected, not {}", found()));
  }

  void takeQuestion() {
    if (++conditionals_ > kMaximumEquationNesting) {
      fail(at_, fmt::format("the equation has more than {} conditionals", kMaximumEquationNesting));
    }
    open_.back().conditions.push_back(at_);
    emit("?");
    ++at_;
    operandExpected_ = true;
  }

  void takeColon() {
    if (open_.back().conditions.empty()) fail(at_, "\":\" without a \"?\" before it");
    open_.back().conditions.pop_back();
    emit(":");
    ++at_;
    operandExpected_ = true;
  }

  void refuseOpenCondition() const {
    if (!open_.back().conditions.empty()) {
      fail(open_.back().conditions.back(), "\"?\" has no \":\" after it", "write: condition ? value : other value");
    }
  }

  void takeComma() {
    refuseOpenCondition();
    Bracket& bracket = open_.back();
    if (bracket.function == nullptr) {
      fail(at_, "a comma stands only between the arguments of a function", "write decimals with a point");
    }
    ++bracket.arguments;
    emit(",");
    ++at_;
    operandExpected_ = true;
  }

  void closeBracket() {
    refuseOpenCondition();
    if (open_.size() == 1) fail(at_, "\")\" without a \"(\" before it");
    const Bracket& bracket = open_.back();
    if (const EquationFunction* function = bracket.function) {
      const int maximum = function->maximumArguments();
      if (bracket.arguments < function->minimumArguments() || (maximum >= 0 && bracket.arguments > maximum)) {
        fail(bracket.position, fmt::format("{}() takes {} argument{}, not {}", function->name, maximum,
                                           maximum == 1 ? "" : "s", bracket.arguments));
      }
    }
    open_.pop_back();
    emit(")");
    ++at_;
  }

  void finish() {
    if (operandExpected_) {
      if (result_.text.empty()) fail(0, "the equation is empty");
      fail(at_, "the equation ends where a number, a name or \"(\" is expected");
    }
    refuseOpenCondition();
    if (open_.size() > 1) fail(open_.back().position, "\"(\" has no \")\" after it");
    if (result_.text.size() > kMaximumTranslation) {
      fail(0, "the equation has too many terms", "divide it between several dependent parameters");
    }
  }

  std::string_view equation_;
  const EquationNames& names_;
  std::size_t at_ = 0;
  bool operandExpected_ = true;
  bool minus_ = false;  ///< signs before the next operand: a minus sign, then negations
  int negations_ = 0;
  int conditionals_ = 0;  ///< so far: each may be nested in the one before
  std::vector<Bracket> open_;
  TranslatedEquation result_;
};

}  // namespace

bool EquationNames::add(const std::string& name) {
  const std::string_view trimmed = trimTrailing(name);
  if (!index_.emplace(std::string(trimmed), names_.size()).second) return false;
  names_.emplace_back(trimmed);
  return true;
}

std::ptrdiff_t EquationNames::find(std::string_view name) const {
  const auto found = index_.find(std::string(trimTrailing(name)));
  return found == index_.end() ? -1 : static_cast<std::ptrdiff_t>(found->second);
}

TranslatedEquation translateEquation(std::string_view equation, const EquationNames& names) {
  return Translator(equation, names).run();
}

}  // namespace mirevo
