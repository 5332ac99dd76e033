!
# GR4J and CemaNeige for the Piscataquis at Dover-Foxcroft
X1  = !X1                !   # capacity of the production store, mm
X2  = !X2                !   # groundwater exchange coefficient, mm/d
X3  = !X3                !   # capacity of the routing store, mm
X4  = !X4                !   # time base of the unit hydrograph, d
CTG = !CTG               !   # weight of the snow pack's past temperature
Kf  = !Kf                !   # degree-day factor, mm/degC/d

area_km2 = 771.486538
start    = 1980-10-01        # a year of warm-up before the calibration years
end      = 2000-12-31
