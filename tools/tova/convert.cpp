// `tova convert IN OUT [...]`: netCDF (CF) files to gridded data files and
// back. The conversion is the Python package's (`python3 -m tova convert`,
// on xarray, netCDF4, pyproj and UDUNITS-2); this command runs it with the
// same arguments and passes its exit status on, or says how to install what
// is missing.
#include "python_command.h"
#include "tova_cli.h"

namespace tova_cli {

int runConvert(const std::vector<std::string>& args) {
    return runPythonCommand(
        "convert", args,
        {{"xarray"},
         "the conversion needs the Python package tova with xarray, netCDF4, pyproj and UDUNITS-2",
         "python3-xarray python3-netcdf4 python3-pyproj python3-cftime libudunits2-0"});
}

}  // namespace tova_cli
