!
# GR4J and CemaNeige for the Sitter between Appenzell and St. Gallen
X1  = !X1_lower          !   # capacity of the production store, mm
X2  = !X2_lower          !   # groundwater exchange coefficient, mm/d
X3  = !X3_lower          !   # capacity of the routing store, mm
X4  = !X4_lower          !   # time base of the unit hydrograph, d
CTG = !CTG               !   # weight of the snow pack's past temperature, the same in both catchments
Kf  = !Kf                !   # degree-day factor, mm/degC/d, the same in both catchments

area_km2 = 186.6
start    = 1981-01-01        # 21 months of warm-up before the calibration years
end      = 2002-09-30
