#!/bin/sh
# Runs TOPMODEL, which is the module r.topmodel of GRASS GIS, in this folder: reads topmodel.txt, topidx.txt and weather.txt,
# writes the listing topmodel.lst and makes discharge.csv of it.
set -e
export LC_ALL=C
export GISBASE="${GISBASE:-$(ls -d /usr/lib/grass[0-9]* | tail -n 1)}"
export LD_LIBRARY_PATH="$GISBASE/lib"

# A module of GRASS wants to know where its maps are, even one that reads none: the folder grass, which holds no map.
export GISRC="$PWD/gisrc"
printf 'GISDBASE: %s\nLOCATION_NAME: grass\nMAPSET: PERMANENT\nGUI: text\n' "$PWD" >gisrc

rm -f topmodel.lst
"$GISBASE/bin/r.topmodel" --overwrite --quiet parameters=topmodel.txt topidxstats=topidx.txt input=weather.txt \
  output=topmodel.lst </dev/null

# The listing has numbered steps behind the row of headings; the flow in its second column is in m3 per step. Each step must
# be there and be a number.
awk -v OFS=, '
  NR == FNR { day[NR] = $1; days = NR; next }
  FNR == 1 { print "time,discharge_m3s" }
  $1 == "timestep" { table = 1; next }
  table && NF {
    if ($1 != ++steps || $2 !~ /^[0-9.]+e[-+][0-9]+$/) { bad = "line " FNR ": " $0; exit }
    print day[steps], sprintf("%.7f", $2 / 86400)
  }
  END {
    if (!bad && steps != days) bad = steps + 0 " steps of " days
    if (bad) { print "topmodel.lst, " bad >"/dev/stderr"; exit 3 }
  }
' days.txt topmodel.lst >discharge.csv
