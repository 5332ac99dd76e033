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

}  // namespace mirevo
