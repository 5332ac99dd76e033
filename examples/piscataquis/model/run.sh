#!/bin/sh
exec ./gr4j_cemaneige parameters.txt forcing.csv simulated.csv
