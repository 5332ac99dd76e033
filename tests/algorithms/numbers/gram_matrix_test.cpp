#include "algorithms/numbers/gram_matrix.h"

#include <gtest/gtest.h>

#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {
namespace {

TEST(GramMatrix, HasTheBitsOfAPlainLoopForAnyNumberOfColumns) {
  UniformGenerator random(1);
  for (const std::size_t p : {0, 1, 3, 4, 5, 13}) {
    for (const std::size_t n : {0, 1, 37}) {
      std::vector<std::vector<double>> values(p, std::vector<double>(n));
      for (auto& column : values) {
        for (double& value : column) value = random.next() - 0.5;
      }
      const std::vector<std::span<const double>> columns(values.begin(), values.end());
      const std::vector<double> gram = gramMatrix(columns);
      ASSERT_EQ(gram.size(), p * p);
      for (std::size_t i = 0; i < p; ++i) {
        for (std::size_t j = 0; j < p; ++j) {
          double sum = 0.0;
          for (std::size_t k = 0; k < n; ++k) sum += values[i][k] * values[j][k];
          EXPECT_EQ(gram[i * p + j], sum) << p << " " << n << " " << i << " " << j;
        }
      }
    }
  }
}

}  // namespace
}  // namespace mirevo
