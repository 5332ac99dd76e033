// The programs of the example models, from input files to output files.
#pragma once

#include <string>
#include <string_view>

namespace models {

inline constexpr std::string_view kCatchmentHeader =
    "time,discharge_m3s,snow_water_equivalent_mm,production_store_mm,evapotranspiration_mm\n";
inline constexpr std::string_view kRiverHeader = "time,discharge_m3s,routed_m3s,lateral_m3s\n";

/// GR4J with CemaNeige. The parameter file gives
///   X1, X2, X3, X4   GR4J: production store [mm], exchange [mm/d], routing store [mm], unit hydrograph time base [d]
///   CTG, Kf          CemaNeige: weight of the pack's past temperature [-], degree-day factor [mm/degC/d]
///   area_km2         catchment area
///   start, end       first and last day to simulate (2001-01-31); optional, else the whole forcing
/// The forcing has the columns time, precipitation_mm, pet_mm and either tmin_degC and tmax_degC or temperature_degC,
/// in any order, one row per day. The simulated file has the columns of kCatchmentHeader.
void runCatchment(const std::string& parameterName, const std::string& forcingName, const std::string& simulatedName);

/// The discharge at the lower end of a river reach: the upstream discharge, routed by the Muskingum method, plus the
/// lateral inflow. The parameter file gives K [d] and X [-]; both discharges are in columns discharge_m3s of files with
/// the same days. The simulated file has the columns of kRiverHeader.
void runRiver(const std::string& parameterName, const std::string& upstreamName, const std::string& lateralName,
              const std::string& simulatedName);

}  // namespace models
