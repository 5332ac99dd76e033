#pragma once

namespace mirevo::bench {

/// Prints the time of a fit of the quadratic surrogate in 30 dimensions.
void measureQuadraticSurrogate();
/// Prints the time that an iteration of GLM takes beside the model runs, with 200 parameters and 10,000 observations.
void measureGlm();
/// Prints the time of the covariance of 2,000 parameters from 5,000 observations.
void measureCovariance();

}  // namespace mirevo::bench
