"""Small CF files of the shapes other producers write, made with
netCDF4-python: a regular lon/lat grid with monthly steps, a projected grid
with a grid_mapping variable, a station time series over (station, time), a
curvilinear lat/lon grid with NaN fill values."""

import numpy as np
import pytest

netCDF4 = pytest.importorskip("netCDF4")

FILL = np.float32(1.0e20)


def _time(nc, values, units, calendar, bounds=None):
    nc.createDimension("time", None)
    t = nc.createVariable("time", "f8", ("time",))
    t.setncatts({"standard_name": "time", "units": units, "calendar": calendar, "axis": "T"})
    t[:] = values
    if bounds is not None:
        nc.createDimension("bnds", 2)
        t.bounds = "time_bnds"
        b = nc.createVariable("time_bnds", "f8", ("time", "bnds"))
        b[:] = bounds


def regular_monthly(path):
    """pr(time, lat, lon), kg m-2 s-1, noleap monthly means with time bounds,
    both missing_value and _FillValue, some missing values."""
    with netCDF4.Dataset(path, "w") as nc:
        nc.setncatts({"Conventions": "CF-1.7", "title": "monthly precipitation", "institution": "somewhere"})
        edges = np.cumsum([0, 31, 28, 31, 30, 31, 30])
        _time(nc, 0.5 * (edges[:-1] + edges[1:]), "days since 1850-01-01 00:00:00", "noleap",
              np.stack([edges[:-1], edges[1:]], axis=1))
        nc.createDimension("lat", 4)
        nc.createDimension("lon", 6)
        lat = nc.createVariable("lat", "f8", ("lat",))
        lat.setncatts({"standard_name": "latitude", "units": "degrees_north", "axis": "Y"})
        lat[:] = [-67.5, -22.5, 22.5, 67.5]
        lon = nc.createVariable("lon", "f8", ("lon",))
        lon.setncatts({"standard_name": "longitude", "units": "degrees_east", "axis": "X"})
        lon[:] = np.arange(6) * 60.0 + 30.0
        pr = nc.createVariable("pr", "f4", ("time", "lat", "lon"), fill_value=FILL)
        pr.setncatts({"standard_name": "precipitation_flux", "units": "kg m-2 s-1", "missing_value": FILL,
                      "cell_methods": "time: mean", "long_name": "Precipitation"})
        values = (np.random.default_rng(1).random((6, 4, 6)) * 1e-4).astype(np.float32)
        values[:, 0, :2] = FILL
        pr[:] = values
    return path


def projected(path):
    """tas(time, y, x) in K on a UTM grid with a grid_mapping variable,
    hourly steps in a standard calendar."""
    with netCDF4.Dataset(path, "w") as nc:
        nc.Conventions = "CF-1.8"
        _time(nc, np.arange(5) * 3.0, "hours since 2024-03-21 06:00:00", "standard")
        nc.createDimension("y", 3)
        nc.createDimension("x", 4)
        for name, values in (("x", 500000.0 + 250.0 * np.arange(4)), ("y", 6000000.0 + 250.0 * np.arange(3))):
            v = nc.createVariable(name, "f8", (name,))
            v.setncatts({"standard_name": f"projection_{name}_coordinate", "units": "m", "axis": name.upper()})
            v[:] = values
        crs = nc.createVariable("crs", "i4")
        crs.setncatts({"grid_mapping_name": "transverse_mercator", "longitude_of_central_meridian": 9.0,
                       "latitude_of_projection_origin": 0.0, "scale_factor_at_central_meridian": 0.9996,
                       "false_easting": 500000.0, "false_northing": 0.0, "semi_major_axis": 6378137.0,
                       "inverse_flattening": 298.257223563})
        tas = nc.createVariable("tas", "f4", ("time", "y", "x"))
        tas.setncatts({"standard_name": "air_temperature", "units": "K", "grid_mapping": "crs"})
        tas[:] = 270.0 + np.random.default_rng(2).random((5, 3, 4)).astype(np.float32) * 20
    return path


def stations(path):
    """Water level over (station, time) with station names and positions,
    irregular times, a depth without time (a static item)."""
    with netCDF4.Dataset(path, "w") as nc:
        nc.setncatts({"Conventions": "CF-1.8", "featureType": "timeSeries"})
        nc.createDimension("station", 3)
        _time(nc, [0.0, 600.0, 1800.0, 3600.0], "seconds since 2020-06-01", "gregorian")
        names = nc.createVariable("station_name", str, ("station",))
        names.cf_role = "timeseries_id"
        for i, n in enumerate(["north", "mid", "south"]):
            names[i] = n
        for name, units, values in (("lat", "degrees_north", [54.1, 54.0, 53.9]),
                                    ("lon", "degrees_east", [8.1, 8.2, 8.3])):
            v = nc.createVariable(name, "f8", ("station",))
            v.setncatts({"standard_name": "latitude" if name == "lat" else "longitude", "units": units})
            v[:] = values
        zeta = nc.createVariable("zeta", "f8", ("station", "time"), fill_value=-999.0)
        zeta.setncatts({"standard_name": "water_surface_height_above_reference_datum", "units": "m",
                        "coordinates": "lat lon station_name"})
        values = np.random.default_rng(3).random((3, 4))
        values[1, 2] = -999.0
        zeta[:] = values
        depth = nc.createVariable("depth", "f4", ("station",))
        depth.setncatts({"units": "m", "long_name": "depth", "coordinates": "lat lon"})
        depth[:] = [12.5, 8.0, 20.25]
    return path


def curvilinear(path):
    """sst(time, y, x) in degC on a rotated 2-D lat/lon grid named by
    "coordinates", NaN as fill value, daily steps."""
    with netCDF4.Dataset(path, "w") as nc:
        nc.Conventions = "CF-1.10"
        _time(nc, [0.0, 1.0, 2.0], "days since 2000-01-01", "proleptic_gregorian")
        nc.createDimension("y", 3)
        nc.createDimension("x", 5)
        j, i = np.mgrid[0:3, 0:5].astype(np.float64)
        for name, units, values in (("lat", "degrees_north", 50.0 + 0.1 * j + 0.02 * i),
                                    ("lon", "degrees_east", 5.0 + 0.15 * i - 0.03 * j)):
            v = nc.createVariable(name, "f8", ("y", "x"))
            v.setncatts({"standard_name": "latitude" if name == "lat" else "longitude", "units": units})
            v[:] = values
        sst = nc.createVariable("sst", "f4", ("time", "y", "x"), fill_value=np.float32(np.nan))
        sst.setncatts({"standard_name": "sea_water_temperature", "units": "degC", "coordinates": "lat lon"})
        values = (10 + np.random.default_rng(4).random((3, 3, 5)) * 5).astype(np.float32)
        values[:, 0, 0] = np.nan
        values[1, 2, 3] = np.nan
        sst[:] = values
    return path


SHAPES = {"regular": regular_monthly, "projected": projected, "stations": stations, "curvilinear": curvilinear}
