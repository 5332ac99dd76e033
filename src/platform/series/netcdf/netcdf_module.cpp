#include <netcdf.h>

#include "platform/series/netcdf_functions.h"

extern "C" {

/// Of HDF5, where NetCDF is linked with it.
int H5get_libversion(unsigned* major, unsigned* minor, unsigned* release) __attribute__((weak));

const char* mirevoModuleVersion() {
  return MIREVO_MODULE_VERSION;
}

extern const mirevo::NetcdfFunctions mirevoNetcdfFunctions;
const mirevo::NetcdfFunctions mirevoNetcdfFunctions = {
    .inq_libvers = &nc_inq_libvers,
    .hdf5Version = &H5get_libversion,
    .strerror = &nc_strerror,
    .open = &nc_open,
    .close = &nc_close,
    .inq_nvars = &nc_inq_nvars,
    .inq_var = &nc_inq_var,
    .inq_vartype = &nc_inq_vartype,
    .inq_vardimid = &nc_inq_vardimid,
    .inq_dimlen = &nc_inq_dimlen,
    .inq_dimname = &nc_inq_dimname,
    .inq_att = &nc_inq_att,
    .get_att_text = &nc_get_att_text,
    .get_att_string = &nc_get_att_string,
    .free_string = &nc_free_string,
    .get_att_double = &nc_get_att_double,
    .get_var_double = &nc_get_var_double,
    .get_vara_double = &nc_get_vara_double,
};
}
