#pragma once

#include <cstddef>
#include <string>

namespace mirevo {

/// The functions of netCDF-C that the program calls, under their names there without "nc_". They are in a module of its
/// own, platform/series/netcdf: some forty libraries come with NetCDF, which a run without such files need not load.
struct NetcdfFunctions {
  const char* (*inq_libvers)();
  /// Of HDF5; null where NetCDF is without it.
  int (*hdf5Version)(unsigned* major, unsigned* minor, unsigned* release);
  const char* (*strerror)(int status);
  int (*open)(const char* path, int mode, int* file);
  int (*close)(int file);
  int (*inq_nvars)(int file, int* count);
  int (*inq_var)(int file, int variable, char* name, int* type, int* dimensionCount, int* dimensions,
                 int* attributeCount);
  int (*inq_vartype)(int file, int variable, int* type);
  int (*inq_vardimid)(int file, int variable, int* dimensions);
  int (*inq_dimlen)(int file, int dimension, std::size_t* length);
  int (*inq_dimname)(int file, int dimension, char* name);
  int (*inq_att)(int file, int variable, const char* name, int* type, std::size_t* length);
  int (*get_att_text)(int file, int variable, const char* name, char* text);
  int (*get_att_string)(int file, int variable, const char* name, char** texts);
  int (*free_string)(std::size_t count, char** texts);
  int (*get_att_double)(int file, int variable, const char* name, double* values);
  int (*get_var_double)(int file, int variable, double* values);
  int (*get_vara_double)(int file, int variable, const std::size_t* start, const std::size_t* count, double* values);
};

inline constexpr const char* kNetcdfFunctionsName = "mirevoNetcdfFunctions";

/// Loads the module at the first call; null, with the reason, if that fails.
const NetcdfFunctions* netcdfFunctions(std::string& reason);

}  // namespace mirevo
