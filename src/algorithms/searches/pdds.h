#pragma once

#include "algorithms/searches/dds.h"

namespace mirevo {

/// DDS with several candidates at a time, as a setup selects it. How many there are is a setting and not the number of
/// slots, so that the search is the same on any number of them.
class PddsMethod final : public DdsMethod {
 public:
  PddsMethod();

  const SearchFacts& facts() const override;
  BoundSection section() override;
  std::string_view budgetRefusal() const override;
  std::int64_t mostAtOnce() const override { return settings.candidates; }
};

}  // namespace mirevo
