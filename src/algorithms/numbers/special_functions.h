#pragma once

#include <functional>
#include <string_view>

namespace mirevo {

/// Receives the messages of a function, one per call; an empty sink drops them. Each message begins with a blank.
using MessageSink = std::function<void(std::string_view)>;

/// Special functions in double precision. `fault` is set to 0 for success and 1 for a fault; a fault sends a message
/// and never stops the run. A NaN argument is a fault. Measured errors: docs/algorithms/special-functions.md.

/// z with Phi(z) = p, by Wichura's algorithm AS 241 (PPND16, 1988, doi:10.2307/2347330). A fault with the result 0 for
/// p outside (0, 1).
double normalQuantile(double p, int& fault, const MessageSink& messages = {});

/// ln Gamma(x) for 0 < x <= 2e36; else a fault with the result 0.
double logGamma(double x, int& fault, const MessageSink& messages = {});

/// psi(x) = d ln Gamma(x) / dx for x > 0; else a fault with the result 0.
double digamma(double x, int& fault, const MessageSink& messages = {});

/// The regularised lower incomplete gamma integral P(shape, x), `logGammaOfShape` being ln Gamma(shape). A fault with
/// the result 0 for a shape that is not above 0 and finite, and for x < 0. A fault with the last value reached when an
/// iteration does not converge.
double incompleteGamma(double x, double shape, double logGammaOfShape, int& fault, const MessageSink& messages = {});

}  // namespace mirevo
