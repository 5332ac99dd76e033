#include "models/gr4j_cemaneige.h"

#include <algorithm>
#include <cmath>

namespace models {
namespace {

constexpr double kMinimumMeltSpeed = 0.1;

/// S-curve of the first unit hydrograph, base X4 (Perrin eqs. 9-11).
double sCurve1(double t, double x4) {
  if (t <= 0.0) return 0.0;
  return t < x4 ? std::pow(t / x4, 2.5) : 1.0;
}

/// S-curve of the second, base 2 X4 (Perrin eqs. 12-15).
double sCurve2(double t, double x4) {
  if (t <= 0.0) return 0.0;
  if (t <= x4) return 0.5 * std::pow(t / x4, 2.5);
  return t < 2.0 * x4 ? 1.0 - 0.5 * std::pow(2.0 - t / x4, 2.5) : 1.0;
}

/// content (1 - (1 + ratio^4)^(-1/4)): the outflow of a store, for both percolation and routing.
double storeOutflow(double content, double ratio) {
  const double squared = ratio * ratio;
  return content * (1.0 - 1.0 / std::sqrt(std::sqrt(1.0 + squared * squared)));
}

}  // namespace

double solidFractionOfRange(double tmin, double tmax) {
  if (tmax <= 0.0) return 1.0;
  if (tmin >= 0.0) return 0.0;
  return 1.0 - tmax / (tmax - tmin);
}

double solidFractionOfMean(double temperature) {
  return std::clamp((3.0 - temperature) / 4.0, 0.0, 1.0);
}

double SnowPack::advance(const Forcing& day) {
  const double solid = day.precipitation * day.solidFraction;
  const double rain = day.precipitation - solid;
  water_ += solid;
  // Thermal state of the pack: eTG = min(0, CTG eTG + (1 - CTG) T).
  thermalState_ = std::min(0.0, ctg_ * thermalState_ + (1.0 - ctg_) * day.temperature);
  // A pack at 0 degC melts by Kf (T - 0 degC), as long as there is snow.
  double potentialMelt = 0.0;
  if (thermalState_ == 0.0 && day.temperature > 0.0) potentialMelt = std::min(water_, kf_ * day.temperature);
  // Melt slows down to a tenth as the cover becomes patchy: (0.9 G/Gthreshold + 0.1) of the potential.
  const double cover = water_ < fullCover_ ? water_ / fullCover_ : 1.0;
  const double melt = ((1.0 - kMinimumMeltSpeed) * cover + kMinimumMeltSpeed) * potentialMelt;
  water_ -= melt;
  return rain + melt;
}

UnitHydrograph::UnitHydrograph(double (*sCurve)(double, double), double x4, double timeBase) {
  const int days = std::max(1, static_cast<int>(std::ceil(timeBase)));
  for (int day = 1; day <= days; ++day) ordinates_.push_back(sCurve(day, x4) - sCurve(day - 1, x4));
  onTheWay_.assign(ordinates_.size(), 0.0);
}

double UnitHydrograph::advance(double water) {
  for (std::size_t day = 0; day < ordinates_.size(); ++day) onTheWay_[day] += ordinates_[day] * water;
  const double arriving = onTheWay_.front();
  std::rotate(onTheWay_.begin(), onTheWay_.begin() + 1, onTheWay_.end());
  onTheWay_.back() = 0.0;
  return arriving;
}

double UnitHydrograph::stored() const {
  double sum = 0.0;
  for (const double water : onTheWay_) sum += water;
  return sum;
}

Gr4j::Gr4j(const Parameters& parameters)
    : p_(parameters),
      production_(0.3 * parameters.x1),
      routing_(0.5 * parameters.x3),
      hydrograph1_(sCurve1, parameters.x4, parameters.x4),
      hydrograph2_(sCurve2, parameters.x4, 2.0 * parameters.x4) {}

Fluxes Gr4j::advance(double precipitation, double pet) {
  Fluxes today;
  const double routed = fillProductionStore(precipitation, pet, today);
  const double q9 = hydrograph1_.advance(0.9 * routed);
  const double q1 = hydrograph2_.advance(0.1 * routed);
  // Exchange with the groundwater, the same potential amount for both branches (eq. 18): F = X2 (R/X3)^(7/2).
  const double ratio = routing_ / p_.x3;
  const double exchange = p_.x2 * ratio * ratio * ratio * std::sqrt(ratio);
  // Routing store: R = max(0, R + Q9 + F) (eq. 19), its outflow Qr (eqs. 20, 21).
  const double filled = std::max(0.0, routing_ + q9 + exchange);
  const double exchangeRouting = filled - (routing_ + q9);
  const double qr = storeOutflow(filled, filled / p_.x3);
  routing_ = filled - qr;
  // Direct branch: Qd = max(0, Q1 + F) (eq. 22); total (eq. 23).
  const double qd = std::max(0.0, q1 + exchange);
  today.runoff = qr + qd;
  today.exchange = exchangeRouting + (qd - q1);
  return today;
}

double Gr4j::fillProductionStore(double precipitation, double pet, Fluxes& today) {
  const double fill = production_ / p_.x1;
  double netRain = 0.0;
  double intoStore = 0.0;
  if (precipitation >= pet) {
    // Pn = P - E (eq. 1); Ps = X1 (1 - (S/X1)^2) tanh(Pn/X1) / (1 + S/X1 tanh(Pn/X1)) (eq. 3).
    netRain = precipitation - pet;
    const double wetting = std::tanh(netRain / p_.x1);
    intoStore = p_.x1 * (1.0 - fill * fill) * wetting / (1.0 + fill * wetting);
    today.evapotranspiration = pet;
    production_ += intoStore;
  } else {
    // En = E - P (eq. 2); Es = S (2 - S/X1) tanh(En/X1) / (1 + (1 - S/X1) tanh(En/X1)) (eq. 4).
    const double drying = std::tanh((pet - precipitation) / p_.x1);
    const double fromStore = production_ * (2.0 - fill) * drying / (1.0 + (1.0 - fill) * drying);
    today.evapotranspiration = precipitation + fromStore;
    production_ -= fromStore;
  }
  // Perc = S (1 - (1 + (4/9 S/X1)^4)^(-1/4)) (eqs. 6, 7); Pr = Perc + (Pn - Ps) (eq. 8).
  const double percolation = storeOutflow(production_, 4.0 / 9.0 * production_ / p_.x1);
  production_ -= percolation;
  return percolation + (netRain - intoStore);
}

double meanAnnualSolidPrecipitation(std::span<const Forcing> days) {
  double sum = 0.0;
  for (const Forcing& day : days) sum += day.precipitation * day.solidFraction;
  return days.empty() ? 0.0 : sum / static_cast<double>(days.size()) * 365.25;
}

std::vector<DailyResult> simulate(const Parameters& parameters, std::span<const Forcing> days) {
  SnowPack snow(parameters, meanAnnualSolidPrecipitation(days));
  Gr4j catchment(parameters);
  std::vector<DailyResult> results;
  results.reserve(days.size());
  for (const Forcing& day : days) {
    const double water = snow.advance(day);
    const Fluxes fluxes = catchment.advance(water, day.pet);
    results.push_back({fluxes.runoff, snow.water(), catchment.production(), fluxes.evapotranspiration});
  }
  return results;
}

}  // namespace models
