!
# Muskingum routing of the Sitter from Appenzell to St. Gallen
K = !K                 !   # travel time, d
X = !X                 !   # weight of the inflow in what the river holds, 0 to 0.49
