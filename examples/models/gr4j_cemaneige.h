// A daily rainfall-runoff model: GR4J with the CemaNeige snow module.
//
// GR4J (four parameters) after
//   Perrin, C., Michel, C., Andréassian, V. (2003): Improvement of a parsimonious model for streamflow simulation.
//   Journal of Hydrology 279, 275-289. doi:10.1016/S0022-1694(03)00225-7  -- "Perrin" in the comments below.
// CemaNeige (two parameters) after
//   Valéry, A., Andréassian, V., Perrin, C. (2014): 'As simple as possible but not simpler': What is useful in a
//   temperature-based snow-accounting routine? Part 2. Journal of Hydrology 517, 1176-1187.
//   doi:10.1016/j.jhydrol.2014.04.059  -- "Valéry" below.
//
// The snow module has one elevation band instead of the usual five: the forcing is a mean over the catchment, and the
// catchment's distribution of altitudes is not given.
#pragma once

#include <span>
#include <vector>

namespace models {

/// One day over the catchment.
struct Forcing {
  double precipitation = 0.0;  ///< mm/d
  double pet = 0.0;            ///< potential evapotranspiration, mm/d
  double temperature = 0.0;    ///< mean of the day, degC
  double solidFraction = 0.0;  ///< share of the precipitation that is snow, 0..1
};

struct Parameters {
  double x1 = 350.0;  ///< capacity of the production store, mm, > 0
  double x2 = 0.0;    ///< groundwater exchange coefficient, mm/d, either sign
  double x3 = 90.0;   ///< one-day-ahead capacity of the routing store, mm, > 0
  double x4 = 1.7;    ///< time base of the first unit hydrograph, d, > 0
  double ctg = 0.25;  ///< weight of yesterday's thermal state of the snow pack, 0..1
  double kf = 4.0;    ///< degree-day melt factor, mm/degC/d, >= 0
};

/// Share of a day's precipitation that falls as snow, 0..1, by its lowest and highest temperature (Valéry's choice for
/// catchments below 1500 m): all of it on a day without thaw, none on a day without frost, otherwise the fraction of
/// the temperature range that is below 0 degC.
double solidFractionOfRange(double tmin, double tmax);

/// The same from the mean temperature alone, decreasing from 1 at -1 degC to 0 at 3 degC (the choice for higher
/// catchments, after U.S. Army Corps of Engineers 1956, Snow Hydrology).
double solidFractionOfMean(double temperature);

/// CemaNeige for one band.
class SnowPack {
 public:
  /// `meanAnnualSolidPrecipitation` in mm; with 90 % of it or more in the pack the whole area counts as covered.
  SnowPack(const Parameters& parameters, double meanAnnualSolidPrecipitation)
      : ctg_(parameters.ctg), kf_(parameters.kf), fullCover_(0.9 * meanAnnualSolidPrecipitation) {}

  /// Advances by one day; returns the water that reaches the ground, rain and melt, mm.
  double advance(const Forcing& day);

  double water() const { return water_; }  ///< snow water equivalent, mm
  double thermalState() const { return thermalState_; }

 private:
  double ctg_;
  double kf_;
  double fullCover_;           ///< Gthreshold, mm
  double water_ = 0.0;         ///< G, mm
  double thermalState_ = 0.0;  ///< eTG, degC, <= 0
};

/// Spreads each day's water over the days to come. Its ordinates are the differences of an S-curve at whole days
/// (Perrin eqs. 16, 17); they sum to 1.
class UnitHydrograph {
 public:
  UnitHydrograph(double (*sCurve)(double, double), double x4, double timeBase);

  /// Adds today's water and returns what arrives today, mm.
  double advance(double water);

  std::span<const double> ordinates() const { return ordinates_; }
  double stored() const;  ///< mm still on the way

 private:
  std::vector<double> ordinates_;
  std::vector<double> onTheWay_;  ///< mm, entry 0 arrives today
};

/// Fluxes of one day, mm.
struct Fluxes {
  double runoff = 0.0;              ///< Q
  double evapotranspiration = 0.0;  ///< actual, interception included
  double exchange = 0.0;            ///< gained from (> 0) or lost to (< 0) the groundwater
};

class Gr4j {
 public:
  explicit Gr4j(const Parameters& parameters);

  /// One day with `precipitation` (rain and melt) and `pet`, both mm.
  Fluxes advance(double precipitation, double pet);

  double production() const { return production_; }  ///< S, mm
  double routing() const { return routing_; }        ///< R, mm
  double stored() const { return production_ + routing_ + hydrograph1_.stored() + hydrograph2_.stored(); }
  const UnitHydrograph& hydrograph1() const { return hydrograph1_; }
  const UnitHydrograph& hydrograph2() const { return hydrograph2_; }

 private:
  /// Interception, production store and percolation (eqs. 1-8); returns the water Pr that goes to the routing, mm.
  double fillProductionStore(double precipitation, double pet, Fluxes& today);

  Parameters p_;
  double production_;           ///< S, starts at 30 % of its capacity; a year of warm-up removes the effect
  double routing_;              ///< R, starts at 50 %
  UnitHydrograph hydrograph1_;  ///< for the 90 % through the routing store
  UnitHydrograph hydrograph2_;  ///< for the 10 % that bypass it
};

/// Mean annual snowfall (365.25 days), mm.
double meanAnnualSolidPrecipitation(std::span<const Forcing> days);

struct DailyResult {
  double runoff = 0.0;              ///< mm
  double snowWater = 0.0;           ///< mm, at the end of the day
  double productionStore = 0.0;     ///< mm, at the end of the day
  double evapotranspiration = 0.0;  ///< mm
};

std::vector<DailyResult> simulate(const Parameters& parameters, std::span<const Forcing> days);

}  // namespace models
