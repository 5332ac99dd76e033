#pragma once

#include "common/reading_watch.h"
#include "platform/series/netcdf_reader.h"

namespace mirevo {

/// What the series of a run have in common while they are read.
struct SeriesReading {
  ReadingWatch watch;
  NetcdfReader netcdf;
};

}  // namespace mirevo
