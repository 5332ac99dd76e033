!
# GR4J and CemaNeige for the Sitter above Appenzell
X1  = !X1_upper          !   # capacity of the production store, mm
X2  = !X2_upper          !   # groundwater exchange coefficient, mm/d
X3  = !X3_upper          !   # capacity of the routing store, mm
X4  = !X4_upper          !   # time base of the unit hydrograph, d
CTG = !CTG               !   # weight of the snow pack's past temperature, the same in both catchments
Kf  = !Kf                !   # degree-day factor, mm/degC/d, the same in both catchments

area_km2 = 74.4
start    = 1981-01-01        # 21 months of warm-up before the calibration years
end      = 2002-09-30
