#pragma once

#include <span>
#include <vector>

namespace mirevo {

/// Whether Markov chains agree, and how much they tell. `chains` holds the values of one quantity, one vector of equal
/// length per chain, burn-in left out.

/// The potential scale reduction of Gelman and Rubin (1992, doi:10.1214/ss/1177011136) over the halves of the chains
/// (Gelman et al. 2013, Bayesian Data Analysis, section 11.4): near 1 when all halves have the same distribution. NaN
/// for fewer than 4 values per chain and for a quantity that never changes.
double splitRHat(std::span<const std::vector<double>> chains);

/// The number of independent draws whose mean would be known as well as that of the chains (section 11.5 there), with
/// autocorrelations up to the end of Geyer's initial monotone sequence (1992, doi:10.1214/ss/1177011137), over the
/// halves of the chains. NaN as for splitRHat().
double effectiveSampleSize(std::span<const std::vector<double>> chains);

/// Both above look at means alone. Chains may agree in their means before they agree in how far they go, and a few
/// values far off make up most of the variance of a long tail. Vehtari et al. (2021, doi:10.1214/20-BA1221) therefore
/// look at ranks, turned into normal deviates, and at the tails. Values are looked at, too, as their means and standard
/// deviations are reported.

/// The largest splitRHat() of the values, of their normal deviates, and of those of their distances from the median, in
/// which chains of different widths differ. NaN as for splitRHat().
double largestRHat(std::span<const std::vector<double>> chains);

/// The least effectiveSampleSize() of the values, of their normal deviates (bulk), and of being below the 5 % and the
/// 95 % quantile of all values (tails). NaN as for splitRHat().
double leastEffectiveSampleSize(std::span<const std::vector<double>> chains);

}  // namespace mirevo
