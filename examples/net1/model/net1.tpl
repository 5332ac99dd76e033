!
[TITLE]
EPANET Example Network 1, hydraulics alone. The roughness coefficients of its pipes are calibrated in four groups.

[JUNCTIONS]
;ID   elevation (ft)   demand (gal/min)
 10   710                0
 11   710              150
 12   700              150
 13   695              100
 21   700              150
 22   695              200
 23   690              150
 31   700              100
 32   710              100

[RESERVOIRS]
;ID   head (ft)
 9    800

[TANKS]
;ID   elevation   initial, lowest and highest level (ft)   diameter (ft)   least volume
 2    850         120   100   150                          50.5            0

[PIPES]
;ID    from   to   length (ft)   diameter (in)   roughness (Hazen-Williams)
 10    10     11   10530         18              !C_18            !
 110   2      12     200         18              !C_18            !
 11    11     12    5280         14              !C_12            !
 22    22     23    5280         12              !C_12            !
 112   12     22    5280         12              !C_12            !
 12    12     13    5280         10              !C_10            !
 21    21     22    5280         10              !C_10            !
 111   11     21    5280         10              !C_10            !
 113   13     23    5280          8              !C_8             !
 121   21     31    5280          8              !C_8             !
 31    31     32    5280          6              !C_8             !
 122   22     32    5280          6              !C_8             !

[PUMPS]
 9    9      10   HEAD 1

[CURVES]
;a point of the pump's curve: flow (gal/min), head (ft)
 1    1500   250

[PATTERNS]
;demand, as a multiple, in periods of two hours
 1    1.0  1.2  1.4  1.6  1.4  1.2  1.0  0.8  0.6  0.4  0.6  0.8

[CONTROLS]
 LINK 9 OPEN IF NODE 2 BELOW 110
 LINK 9 CLOSED IF NODE 2 ABOVE 140

[TIMES]
 Duration             24:00
 Hydraulic Timestep    1:00
 Pattern Timestep      2:00
 Report Timestep       1:00
 Statistic            NONE

[OPTIONS]
 Units                GPM
 Headloss             H-W
 Pattern              1
 Quality              NONE
 Trials               40
 Accuracy             0.00001

[END]
