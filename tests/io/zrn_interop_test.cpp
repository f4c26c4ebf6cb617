// Files of the data-file layer against other netCDF readers and writers:
// Debian's python3-netCDF4 and xarray (/usr/bin/python3), and the raw
// netCDF library for the layout rules other tools depend on.

#include <gtest/gtest.h>
#include <netcdf.h>

#include <cmath>
#include <filesystem>
#include <limits>
#include <string>
#include <vector>

#include "io/units.hpp"
#include "io/zrn.hpp"
#include "test_support.hpp"
#include "zrn_support.hpp"

namespace vhd {
namespace {

bool HavePython() { return std::filesystem::exists("/usr/bin/python3"); }

// A .zrn0 with two items over 4 half-hour steps, item k at step s holding
// k + s/4, flushed but still open.
ZrnFile WriteSeries(const std::string& name) {
  ZrnFile f;
  zrnHeaderCreate(f, name, kZrnFileData, "Interop series");
  zrnSetEqCalendarAxis(f, ZrnDateTime{2004, 1, 1, 0, 0, 0}, 1800.0);
  zrnSetItemInfo(f, 1, "Surface elevation", kUvqIWaterLevel, kUvqUmeter);
  zrnSetItemAxisEqD0(f, 1);
  zrnSetItemInfo(f, 2, "Discharge", kUvqIDischarge, kUvqUm3PerSec, kZrnDouble);
  zrnSetItemAxisEqD0(f, 2);
  zrnFileCreate(f, true);
  for (int s = 0; s < 4; ++s)
    for (int k = 1; k <= 2; ++k) {
      const double v = k + s / 4.0;
      zrnWriteItemTimeStep(f, 0, &v, 1);
    }
  return f;
}

TEST(ZrnInterop, EveryAttributeIsTextNeverString) {
  test::TempDir dir;
  const std::string name = dir.file("attrs.zrn0");
  ZrnFile f = WriteSeries(name);
  zrnFileClose(f);
  int ncid, nvars;
  ASSERT_EQ(nc_open(name.c_str(), NC_NOWRITE, &ncid), NC_NOERR);
  nc_inq_nvars(ncid, &nvars);
  for (int v = -1; v < nvars; ++v) {
    int natts = 0;
    nc_inq_varnatts(ncid, v, &natts);
    for (int a = 0; a < natts; ++a) {
      char att[NC_MAX_NAME + 1];
      nc_type type;
      nc_inq_attname(ncid, v, a, att);
      nc_inq_atttype(ncid, v, att, &type);
      EXPECT_NE(type, NC_STRING) << "variable " << v << " attribute " << att;
    }
  }
  int format = 0;
  nc_inq_format(ncid, &format);
  EXPECT_EQ(format, NC_FORMAT_NETCDF4_CLASSIC);
  nc_close(ncid);
}

TEST(ZrnInterop, PythonNetcdf4ReadsTheFlushedStepsWhileTheRunStillWrites) {
  if (!HavePython()) GTEST_SKIP() << "/usr/bin/python3 not found";
  test::TempDir dir;
  const std::string name = dir.file("series.zrn0");
  ZrnFile f = WriteSeries(name);
  const std::string script = R"(
import sys, datetime
import netCDF4
ds = netCDF4.Dataset(sys.argv[1])
t = ds.variables["time"]
assert t.units == "seconds since 2004-01-01 00:00:00", t.units
assert t.calendar == "standard"
dates = netCDF4.num2date(t[:], t.units, t.calendar)
want = [datetime.datetime(2004, 1, 1, 0, 0) + datetime.timedelta(minutes=30 * s) for s in range(4)]
assert [str(d) for d in dates] == [str(w) for w in want], dates
h = ds.variables["surface_elevation"]
q = ds.variables["discharge"]
assert h.long_name == "Surface elevation" and h.units == "m"
assert q.units == "m3 s-1"
for s in range(4):
    assert abs(h[s] - (1 + s / 4)) < 1e-6, h[:]
    assert q[s] == 2 + s / 4, q[:]
assert ds.Conventions == "CF-1.8"
print("ok")
)";
  std::string out;
  EXPECT_EQ(test::RunPython(dir, script, name, out), 0) << out;
  zrnFileClose(f);
}

TEST(ZrnInterop, CfSeriesWrittenByPythonReadsBackWithTheSameValues) {
  if (!HavePython()) GTEST_SKIP() << "/usr/bin/python3 not found";
  test::TempDir dir;
  const std::string name = dir.file("python.nc");
  const std::string script = R"(
import sys
import numpy as np
import netCDF4
ds = netCDF4.Dataset(sys.argv[1], "w")
ds.createDimension("time", None)
t = ds.createVariable("time", "f8", ("time",))
t.units = "minutes since 2011-07-15 06:30:00"
t.calendar = "gregorian"
t[:] = [0, 10, 20, 30, 40]
a = ds.createVariable("temp", "f4", ("time",), fill_value=-99.0)
a.units = "degC"
a.standard_name = "sea_water_temperature"
a[:] = np.ma.masked_array([12.5, 13.0, 0.0, 14.0, 14.25], mask=[0, 0, 1, 0, 0])
b = ds.createVariable("wind", "f8", ("time",))
b.long_name = "Wind speed at 10 m"
b.units = "knot"
b[:] = [1.0, 2.0, 4.0, 8.0, 16.0]
ds.close()
print("ok")
)";
  std::string out;
  ASSERT_EQ(test::RunPython(dir, script, name, out), 0) << out;

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  ZrnDateTime start;
  double dt = 0;
  int n = 0;
  ASSERT_EQ(zrnGetEqCalendarAxis(r, start, dt, n), 0);
  EXPECT_EQ(zrnDateTimeText(start), "2011-07-15 06:30:00");
  EXPECT_EQ(dt, 600.0);
  EXPECT_EQ(n, 5);
  ASSERT_EQ(r.items.size(), 2u);
  EXPECT_EQ(r.items[0].item_type, kUvqITemperature);
  EXPECT_EQ(r.items[0].unit, kUvqUdegreeCelsius);
  EXPECT_EQ(r.items[1].name, "Wind speed at 10 m");
  EXPECT_EQ(r.items[1].unit, kUvqUknot);
  const double want_a[5] = {12.5, 13.0, kZrnDefaultDeleteValue, 14.0, 14.25};
  const double want_b[5] = {1.0, 2.0, 4.0, 8.0, 16.0};
  for (int s = 0; s < n; ++s) {
    double a = 0, b = 0, t = 0;
    int item = 0;
    ASSERT_EQ(zrnReadItemTimeStep(r, item, t, &a, 1), 0);
    ASSERT_EQ(zrnReadItemTimeStep(r, item, t, &b, 1), 0);
    EXPECT_EQ(t, 600.0 * s);
    EXPECT_EQ(a, want_a[s]) << s;
    EXPECT_EQ(b, want_b[s]) << s;
  }
  EXPECT_EQ(ZrnCheckItemUnit(r, 2, kUvqIWindSpeed), 0);
  zrnFileClose(r);
}

TEST(ZrnInterop, XarrayOpensAMeshFile) {
  if (!HavePython()) GTEST_SKIP() << "/usr/bin/python3 not found";
  test::TempDir dir;
  const std::string name = dir.file("mesh.zrnu");
  // Two triangles forming the unit square.
  const ZrnMeshData m = test::MakeZrnMesh({0, 1, 1, 0}, {0, 0, 1, 1}, 500000.0, 6000000.0, {{1, 2, 3}, {1, 3, 4}});
  ZrnFile f;
  zrnHeaderCreate(f, name, kZrnFileMesh2D, "mesh");
  zrnSetGeoInfoUTMProj(f, "UTM-32", 0, 0, 0);
  ASSERT_EQ(zrnSetMesh(f, m), 0);
  zrnSetEqCalendarAxis(f, ZrnDateTime{2004, 1, 1, 0, 0, 0}, 60.0);
  zrnSetItemInfo(f, 1, "Surface elevation", kUvqIWaterLevel, kUvqUmeter);
  zrnSetItemAxisEqD4(f, 1, kZrnLocationFace, 2);
  ASSERT_EQ(zrnFileCreate(f), 0);
  for (int s = 0; s < 3; ++s) {
    const double v[2] = {0.1 * s, -0.1 * s};
    zrnWriteItemTimeStep(f, 0, v, 2);
  }
  zrnFileClose(f);

  const std::string script = R"(
import sys
import numpy as np
import xarray as xr
ds = xr.open_dataset(sys.argv[1])
assert ds.sizes["mesh2d_nFaces"] == 2 and ds.sizes["mesh2d_nNodes"] == 4, ds.sizes
assert ds.sizes["time"] == 3
topo = ds["mesh2d"].attrs
assert topo["cf_role"] == "mesh_topology" and topo["topology_dimension"] == 2
assert topo["node_coordinates"] == "mesh2d_node_x mesh2d_node_y"
fn = ds["mesh2d_face_nodes"].values
assert fn.shape == (2, 3), fn.shape
assert fn.tolist() == [[0, 1, 2], [0, 2, 3]], fn
eta = ds["surface_elevation"]
assert eta.dims == ("time", "mesh2d_nFaces"), eta.dims
assert eta.attrs["location"] == "face" and eta.attrs["mesh"] == "mesh2d"
assert eta.attrs["grid_mapping"] == "crs"
assert np.allclose(eta.values[2], [0.2, -0.2])
assert str(ds["time"].values[1])[:19] == "2004-01-01T00:01:00", ds["time"].values
assert int(ds["crs"].attrs["epsg"]) == 32632
assert ds["crs"].attrs["EPSG_code"] == "EPSG:32632"
assert "location" not in ds["mesh2d_node_x"].attrs
print("ok")
)";
  std::string out;
  EXPECT_EQ(test::RunPython(dir, script, name, out), 0) << out;
}

// No data is stored as NaN with a NaN _FillValue: QGIS's mesh reader takes
// every value within 2.2e-16 of the fill value for no data, so the default
// delete value 1e-35 as fill blanked every zero. Zero and values near the
// delete value stay what they are; our reader gives the delete value back.
TEST(ZrnInterop, NoDataIsStoredAsNaNAndZeroStaysZero) {
  const double del = kZrnDefaultDeleteValue, inf = std::numeric_limits<double>::infinity();
  const std::vector<double> written = {0.0, del, 2.5, -1e-20, inf, -3.0};
  const ZrnMeshData mesh =
      test::MakeZrnMesh({0, 1, 2, 0, 1, 2}, {0, 0, 0, 1, 1, 1}, 0.0, 0.0, {{1, 2, 5, 4}, {2, 3, 6, 5}});
  for (const int precision : {kZrnFloat, kZrnDouble}) {
    SCOPED_TRACE(precision == kZrnFloat ? "float" : "double");
    test::TempDir dir;
    const std::string name = dir.file("nodata.zrnu");
    ZrnFile f;
    zrnHeaderCreate(f, name, kZrnFileMesh2D, "no data");
    ASSERT_EQ(zrnSetMesh(f, mesh), 0);
    zrnSetEqCalendarAxis(f, ZrnDateTime{2004, 1, 1, 0, 0, 0}, 60.0);
    zrnSetItemInfo(f, 1, "Surface elevation", kUvqIWaterLevel, kUvqUmeter, precision);
    zrnSetItemAxisEqD4(f, 1, kZrnLocationNode, 6);
    ASSERT_EQ(zrnFileCreate(f), 0);
    const std::vector<float> single(written.begin(), written.end());
    ASSERT_EQ(precision == kZrnFloat ? zrnWriteItemTimeStep(f, 0, single.data(), 6)
                                     : zrnWriteItemTimeStep(f, 0, written.data(), 6),
              0);
    zrnFileClose(f);
    // What the file holds: the values as written (in the item's precision), NaN for no data.
    std::vector<double> want(written.begin(), written.end());
    if (precision == kZrnFloat) want.assign(single.begin(), single.end());

    int ncid = -1, var = -1;
    ASSERT_EQ(nc_open(name.c_str(), NC_NOWRITE, &ncid), NC_NOERR);
    ASSERT_EQ(nc_inq_varid(ncid, "surface_elevation", &var), NC_NOERR);
    double fill = 0.0, stored[6];
    nc_get_att_double(ncid, var, "_FillValue", &fill);
    nc_get_var_double(ncid, var, stored);
    nc_close(ncid);
    EXPECT_TRUE(std::isnan(fill));
    for (int i = 0; i < 6; ++i) {
      if (i == 1) EXPECT_TRUE(std::isnan(stored[i]));
      else EXPECT_EQ(stored[i], want[static_cast<std::size_t>(i)]) << i;
    }

    ZrnFile r;
    ASSERT_EQ(zrnFileRead(r, name), 0);
    int item = 0;
    double time = 0.0, back[6];
    ASSERT_EQ(zrnReadItemTimeStep(r, item, time, back, 6), 0);
    zrnFileClose(r);
    want[1] = del;
    for (int i = 0; i < 6; ++i) EXPECT_EQ(back[i], want[static_cast<std::size_t>(i)]) << i;
  }
}

// QGIS's mesh reader pairs variables whose long_name reads like one part of a
// vector ("Current direction" with a "Current ... magnitude") and refuses the
// file when the partner is missing. Mesh items with such names carry their
// name in zrn_item_name only; every item still reads back by its name.
TEST(ZrnInterop, MeshItemsNamedLikeVectorPartsHaveNoLongName) {
  struct Case {
    const char* name;
    bool long_name;
  };
  const std::vector<Case> cases = {
      {"Surface elevation", true},     {"Current speed", true},
      {"U velocity", true},            {"Current direction", false},
      {"Wind Direction", false},       {"Velocity magnitude", false},
      {"Flux, x-component", false},    {"Flux, y-component", false},
      {"u component of wind", false},  {"V component of wind", false},
  };
  test::TempDir dir;
  const std::string name = dir.file("names.zrnu");
  const ZrnMeshData m = test::MakeZrnMesh({0, 1, 1, 0}, {0, 0, 1, 1}, 0.0, 0.0, {{1, 2, 3, 4}});
  ZrnFile f;
  zrnHeaderCreate(f, name, kZrnFileMesh2D, "names");
  ASSERT_EQ(zrnSetMesh(f, m), 0);
  zrnSetEqCalendarAxis(f, ZrnDateTime{2004, 1, 1, 0, 0, 0}, 60.0);
  for (std::size_t k = 0; k < cases.size(); ++k) {
    const int item = static_cast<int>(k + 1);
    zrnSetItemInfo(f, item, cases[k].name, kUvqItemUndefined, kUvqUnonDim);
    zrnSetItemAxisEqD4(f, item, kZrnLocationFace, 1);
  }
  ASSERT_EQ(zrnFileCreate(f), 0);
  zrnFileClose(f);

  int ncid = -1;
  ASSERT_EQ(nc_open(name.c_str(), NC_NOWRITE, &ncid), NC_NOERR);
  int nvars = 0;
  nc_inq_nvars(ncid, &nvars);
  std::vector<std::string> with_long_name;
  for (int v = 0; v < nvars; ++v) {
    size_t len = 0;
    if (nc_inq_attlen(ncid, v, "zrn_item_name", &len) != NC_NOERR) continue;
    std::string item(len, '\0');
    nc_get_att_text(ncid, v, "zrn_item_name", item.data());
    if (nc_inq_attlen(ncid, v, "long_name", &len) == NC_NOERR) with_long_name.push_back(item);
  }
  nc_close(ncid);
  std::vector<std::string> want_long_name;
  for (const Case& c : cases)
    if (c.long_name) want_long_name.emplace_back(c.name);
  EXPECT_EQ(with_long_name, want_long_name);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  int nitems = 0;
  zrnGetNoOfItems(r, nitems);
  ASSERT_EQ(nitems, static_cast<int>(cases.size()));
  for (int k = 1; k <= nitems; ++k) {
    std::string item;
    int type = 0, unit = 0, value_type = 0;
    zrnGetItemInfo(r, k, item, type, unit, value_type);
    EXPECT_EQ(item, cases[static_cast<std::size_t>(k - 1)].name);
  }
  zrnFileClose(r);
}

}  // namespace
}  // namespace vhd
