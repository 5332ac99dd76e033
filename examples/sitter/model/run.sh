#!/bin/sh
# The catchment above Appenzell, the one between Appenzell and St. Gallen, and the river between the two gauges. The
# first program that fails ends the run with its exit code.
set -e
./gr4j_cemaneige upper.txt upper_forcing.csv upper.csv
./gr4j_cemaneige lower.txt lower_forcing.csv lower.csv
./muskingum river.txt upper.csv lower.csv st_gallen.csv
