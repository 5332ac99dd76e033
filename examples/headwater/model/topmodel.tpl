!
# Subcatchment
Headwater
# A: area, m2
1.783E+06
# qs0: initial subsurface flow, m/h (the mean runoff, 167 mm a year)
0.000019
# lnTe: logarithm of the mean transmissivity of the saturated soil, m2/h
!lnTe              !
# m: decline of the transmissivity with the storage deficit, m
!m                 !
# Sr0: initial deficit of the root zone, m
0.0
# Srmax: largest deficit of the root zone, m
!Srmax             !
# td: delay in the unsaturated zone, hours per metre of deficit
!td                !
# vch, vr: velocities in the main channel and in the subcatchment, m/h; water leaves within the day
1000
1000
# infex: infiltration excess, off; K0, psi and dtheta are of that
0
2.0
0.1
0.1
# d, Ad_r: distance from the outlet, m, and share of the area up to it
   0   0.0
1000   0.5
2000   1.0
