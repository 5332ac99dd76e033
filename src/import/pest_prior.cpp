#include "import/pest_prior.h"

#include <algorithm>
#include <utility>

#include <fmt/format.h>

#include "common/take_text.h"
#include "common/text.h"
#include "import/source_words.h"

namespace mirevo {
namespace {

constexpr std::size_t kBehindEquals = 3;  // value, weight, group

/// Reads the left side of the equation.
class TermReader final {
 public:
  TermReader(const SourcePlace& place, std::string_view text) : place_(place), rest_(trim(text)) {}

  std::vector<PestPriorTerm> read() {
    std::vector<PestPriorTerm> terms;
    while (!rest_.empty()) {
      double sign = 1.0;
      if (rest_.front() == '+' || rest_.front() == '-') {
        sign = rest_.front() == '-' ? -1.0 : 1.0;
        rest_ = trim(rest_.substr(1));
      } else if (!terms.empty()) {
        failImport(place_, "expected + or - before the next term, found " + quotedForMessage(rest_));
      }
      PestPriorTerm term = readTerm();
      term.factor *= sign;
      terms.push_back(std::move(term));
    }
    if (terms.empty()) failImport(place_, "expected a term such as 1.0 * log(k1) before the =");
    return terms;
  }

 private:
  PestPriorTerm readTerm() {
    PestPriorTerm term;
    const std::size_t star = rest_.find('*');
    if (star != std::string_view::npos) {
      if (const auto factor = parseReal(rest_.substr(0, star))) {
        term.factor = *factor;
        rest_ = trim(rest_.substr(star + 1));
      }
    }
    const std::string_view front = rest_.substr(0, 3);
    const std::string_view behind = rest_.size() > 3 ? trim(rest_.substr(3)) : std::string_view();
    if (equalIgnoringCase(front, "log") && behind.starts_with('(')) {
      const std::size_t close = behind.find(')');
      if (close == std::string_view::npos) failImport(place_, "expected ) behind the name in log(");
      term.isLogarithm = true;
      term.parameter = std::string(trim(behind.substr(1, close - 1)));
      rest_ = trim(behind.substr(close + 1));
    } else {
      const std::size_t end = std::min(rest_.find_first_of(" \t"), rest_.size());
      term.parameter = std::string(rest_.substr(0, end));
      rest_ = trim(rest_.substr(end));
    }
    if (term.parameter.empty() || parseReal(term.parameter)) {
      failImport(place_, "expected the name of a parameter, found " + quotedForMessage(term.parameter));
    }
    return term;
  }

  const SourcePlace& place_;
  std::string_view rest_;
};

}  // namespace

PestPrior parsePestPrior(const SourcePlace& place, std::string_view line) {
  line = trim(line);
  const std::size_t equals = line.find('=');
  const std::size_t blank = line.find_first_of(" \t");
  if (equals == std::string_view::npos || blank == std::string_view::npos || blank > equals) {
    failImport(place, "expected a name, an equation with = and a value, a weight and a group, found " +
                          quotedForMessage(line));
  }
  PestPrior prior;
  prior.place = place;
  prior.name = std::string(line.substr(0, blank));
  prior.terms = TermReader(place, line.substr(blank, equals - blank)).read();
  const std::vector<std::string> words = wordsOf(line.substr(equals + 1));
  const auto value = words.size() == kBehindEquals ? parseReal(words[0]) : std::nullopt;
  const auto weight = words.size() == kBehindEquals ? parseReal(words[1]) : std::nullopt;
  if (!value || !weight) {
    failImport(place, "expected a value, a weight and a group behind the =, found " +
                          quotedForMessage(trim(line.substr(equals + 1))));
  }
  prior.value = *value;
  prior.weight = *weight;
  prior.group = words[2];
  return prior;
}

}  // namespace mirevo
