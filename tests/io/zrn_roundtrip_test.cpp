// Round trips through the data-file layer: every file kind, static and
// dynamic items, time axes of every type, custom blocks, compression,
// appending, positioning, and reading a file that is still being written.

#include <gtest/gtest.h>
#include <netcdf.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cmath>
#include <vector>

#include "io/units.hpp"
#include "io/zrn.hpp"
#include "test_support.hpp"
#include "zrn_support.hpp"

namespace vhd {
namespace {

constexpr ZrnDateTime kStart{2004, 1, 1, 0, 0, 0};

// A value that differs per item, step and position.
double Value(int item, int step, int i) { return 100.0 * item + 10.0 * step + 0.25 * i; }

std::vector<double> Record(int item, int step, long n) {
  std::vector<double> v(static_cast<size_t>(n));
  for (long i = 0; i < n; ++i) v[static_cast<size_t>(i)] = Value(item, step, static_cast<int>(i));
  return v;
}

// Writes nsteps steps of every item with Record() values.
void WriteSteps(ZrnFile& f, int first_step, int nsteps, const std::vector<double>& times = {}) {
  for (int s = first_step; s < first_step + nsteps; ++s)
    for (std::size_t k = 0; k < f.items.size(); ++k) {
      const int item = static_cast<int>(k) + 1;
      const auto r = Record(item, s, f.items[k].axis.Count());
      const double t = times.empty() ? 0.0 : times[static_cast<size_t>(s)];
      ASSERT_EQ(zrnWriteItemTimeStep(f, t, r.data(), static_cast<long>(r.size())), 0);
    }
}

// Reads every record and checks it against Record() (float items to float precision).
void ExpectSteps(ZrnFile& f, int nsteps) {
  for (int s = 0; s < nsteps; ++s)
    for (std::size_t k = 0; k < f.items.size(); ++k) {
      const long n = f.items[k].axis.Count();
      std::vector<double> got(static_cast<size_t>(n));
      int item = 0;
      double t = -1;
      ASSERT_EQ(zrnReadItemTimeStep(f, item, t, got.data(), n), 0);
      ASSERT_EQ(item, static_cast<int>(k) + 1);
      const auto want = Record(item, s, n);
      const double tol = f.items[k].precision == kZrnFloat ? 1e-4 : 0.0;
      for (long i = 0; i < n; ++i)
        ASSERT_NEAR(got[static_cast<size_t>(i)], want[static_cast<size_t>(i)], tol)
            << "item " << item << " step " << s << " value " << i;
    }
}

TEST(ZrnRoundTrip, PointSeriesEquidistantCalendar) {
  test::TempDir dir;
  const std::string name = dir.file("series.zrn0");
  ZrnFile w;
  ASSERT_EQ(zrnHeaderCreate(w, name, kZrnFileData, "Tide at the mouth"), 0);
  ASSERT_EQ(zrnSetDataType(w, 7), 0);
  ASSERT_EQ(zrnSetDeleteValFloat(w, -999.0), 0);
  ASSERT_EQ(zrnSetGeoInfoUTMProj(w, "UTM-32", 500000.0, 6000000.0, 0.0), 0);
  ASSERT_EQ(zrnAddCustomBlock(w, zrnCustomBlockName(kZrnFileData), std::vector<double>{1.5, -2.0}), 0);
  ASSERT_EQ(zrnSetEqCalendarAxis(w, kStart, 1800.0), 0);
  ASSERT_EQ(zrnSetItemInfo(w, 1, "Surface elevation", kUvqIWaterLevel, kUvqUmeter), 0);
  ASSERT_EQ(zrnSetItemAxisEqD0(w, 1), 0);
  ASSERT_EQ(zrnSetItemInfo(w, 2, "Discharge", kUvqIDischarge, kUvqUm3PerSec, kZrnDouble), 0);
  ASSERT_EQ(zrnSetItemValueType(w, 2, kZrnMeanStepBackward), 0);
  ASSERT_EQ(zrnSetItemAxisEqD0(w, 2), 0);
  ASSERT_EQ(zrnFileCreate(w), 0);
  WriteSteps(w, 0, 5);
  ASSERT_EQ(zrnFileClose(w), 0);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  EXPECT_EQ(r.title, "Tide at the mouth");
  EXPECT_EQ(r.file_type, kZrnFileData);
  EXPECT_EQ(r.data_type, 7);
  EXPECT_EQ(r.delete_value, -999.0);
  EXPECT_EQ(r.projection, "UTM-32");
  EXPECT_EQ(r.origin_x, 500000.0);
  EXPECT_EQ(r.origin_y, 6000000.0);
  EXPECT_EQ(r.epsg, 32632);
  double b = 0;
  EXPECT_EQ(zrnGetCustomBlockValue(r, "VX7_Misc", 2, b), 0);
  EXPECT_EQ(b, -2.0);
  ZrnDateTime start;
  double dt = 0, t4 = 0;
  int nsteps = 0;
  EXPECT_EQ(r.time.type, kZrnTimeEqCalendar);
  ASSERT_EQ(zrnGetEqCalendarAxis(r, start, dt, nsteps), 0);
  EXPECT_EQ(zrnDateTimeText(start), "2004-01-01 00:00:00");
  EXPECT_EQ(dt, 1800.0);
  EXPECT_EQ(nsteps, 5);
  ASSERT_EQ(zrnGetStepTime(r, 4, t4), 0);
  EXPECT_EQ(t4, 7200.0);
  ASSERT_EQ(r.items.size(), 2u);
  const ZrnItemInfo& q = r.items[1];
  EXPECT_EQ(q.name, "Discharge");
  EXPECT_EQ(q.item_type, kUvqIDischarge);
  EXPECT_EQ(q.unit, kUvqUm3PerSec);
  EXPECT_EQ(q.value_type, kZrnMeanStepBackward);
  EXPECT_EQ(q.precision, kZrnDouble);
  EXPECT_EQ(r.items[0].axis.type, kZrnAxisD0);
  EXPECT_EQ(r.items[0].var_name, "surface_elevation");
  ExpectSteps(r, 5);
  EXPECT_EQ(zrnFileClose(r), 0);
}

TEST(ZrnRoundTrip, DeleteValuesStayDeleteValuesAndAreLeftOutOfStatistics) {
  test::TempDir dir;
  const std::string name = dir.file("gaps.zrn0");
  ZrnFile w = test::StartSeries(name, 1);
  for (double v : {3.0, kZrnDefaultDeleteValue, 7.0}) zrnWriteItemTimeStep(w, 0, &v, 1);
  EXPECT_EQ(w.items[0].minimum, 3.0);
  EXPECT_EQ(w.items[0].maximum, 7.0);
  zrnFileClose(w);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  double v[3];
  for (int s = 0; s < 3; ++s) ASSERT_EQ(ZrnReadItemAtStep(r, s, 1, &v[s], 1), 0);
  EXPECT_EQ(v[0], 3.0);
  EXPECT_EQ(static_cast<float>(v[1]), static_cast<float>(kZrnDefaultDeleteValue));
  EXPECT_EQ(v[2], 7.0);
  zrnFileClose(r);
}

TEST(ZrnRoundTrip, NonEquidistantAndRelativeAxes) {
  test::TempDir dir;
  struct Case {
    int type;
    double offset;
  };
  const std::vector<double> times = {0.0, 10.0, 35.0, 100.0};
  for (const Case c : {Case{kZrnTimeNeqCalendar, 0.0}, Case{kZrnTimeEqRelative, 50.0},
                       Case{kZrnTimeNeqRelative, 0.0}}) {
    const std::string name = dir.file("axis" + std::to_string(c.type) + ".zrn0");
    ZrnFile w;
    zrnHeaderCreate(w, name, kZrnFileData, "axis");
    if (c.type == kZrnTimeNeqCalendar) { ASSERT_EQ(zrnSetNeqCalendarAxis(w, kStart), 0); }
    if (c.type == kZrnTimeEqRelative) { ASSERT_EQ(zrnSetEqTimeAxis(w, c.offset, 20.0), 0); }
    if (c.type == kZrnTimeNeqRelative) { ASSERT_EQ(zrnSetNeqTimeAxis(w, 0.0), 0); }
    zrnSetItemInfo(w, 1, "Level", kUvqIWaterLevel, kUvqUmeter);
    zrnSetItemAxisEqD0(w, 1);
    ASSERT_EQ(zrnFileCreate(w), 0);
    WriteSteps(w, 0, 4, times);
    zrnFileClose(w);

    ZrnFile r;
    ASSERT_EQ(zrnFileRead(r, name), 0);
    EXPECT_EQ(r.time.type, c.type);
    for (int s = 0; s < 4; ++s) {
      double t = 0;
      zrnGetStepTime(r, s, t);
      const double want = c.type == kZrnTimeEqRelative ? c.offset + 20.0 * s : times[size_t(s)];
      EXPECT_EQ(t, want) << "axis " << c.type << " step " << s;
    }
    if (c.type == kZrnTimeNeqCalendar) {
      ZrnDateTime start;
      double span = 0;
      int n = 0;
      ASSERT_EQ(zrnGetNeqCalendarAxis(r, start, span, n), 0);
      EXPECT_EQ(span, 100.0);
      EXPECT_EQ(n, 4);
    }
    ExpectSteps(r, 4);
    zrnFileClose(r);
  }
}

// Writes a grid file of the axis's kind with one compressed dynamic item over
// two steps and a static item on the same grid.
void WriteGridFile(const std::string& name, const ZrnSpatialAxis& a) {
  ZrnFile w;
  ASSERT_EQ(zrnHeaderCreate(w, name, kZrnFileData, "grid"), 0);
  zrnSetEqCalendarAxis(w, kStart, 600.0);
  zrnSetItemInfo(w, 1, "Depth", kUvqIWaterDepth, kUvqUmeter, kZrnDouble);
  if (a.type == kZrnAxisD1) { ASSERT_EQ(zrnSetItemAxisEqD1(w, 1, a.n[0], a.x0[0], a.dx[0]), 0); }
  if (a.type == kZrnAxisD2) {
    ASSERT_EQ(zrnSetItemAxisEqD2(w, 1, a.n[0], a.n[1], a.x0[0], a.x0[1], a.dx[0], a.dx[1]), 0);
  }
  if (a.type == kZrnAxisD3) {
    ASSERT_EQ(zrnSetItemAxisEqD3(w, 1, a.n[0], a.n[1], a.n[2], a.x0[0], a.x0[1], a.x0[2], a.dx[0],
                                 a.dx[1], a.dx[2]),
              0);
  }
  zrnItemEnableCompression(w, 1, 5);
  ASSERT_EQ(zrnFileCreate(w), 0);
  ZrnItemInfo bed;
  bed.name = "Bed level";
  bed.item_type = kUvqIBathymetry;
  bed.unit = kUvqUmeter;
  bed.precision = kZrnDouble;
  bed.axis = a;
  int sno = 0;
  ASSERT_EQ(zrnStaticCreate(w, bed, sno), 0);
  const auto z = Record(9, 0, a.Count());
  ASSERT_EQ(zrnStaticWrite(w, sno, z.data(), static_cast<long>(z.size())), 0);
  WriteSteps(w, 0, 2);
  ASSERT_EQ(zrnFileClose(w), 0);
}

void ExpectAxis(const ZrnSpatialAxis& got, const ZrnSpatialAxis& want) {
  ASSERT_EQ(got.type, want.type);
  for (int k = 0; k < want.type; ++k) {
    EXPECT_EQ(got.n[k], want.n[k]) << "dimension " << k;
    EXPECT_EQ(got.x0[k], want.x0[k]) << "dimension " << k;
    EXPECT_EQ(got.dx[k], want.dx[k]) << "dimension " << k;
  }
}

ZrnSpatialAxis Grid(int type, std::array<int, 3> n, std::array<double, 3> x0,
                    std::array<double, 3> dx) {
  ZrnSpatialAxis a;
  a.type = type;
  a.n = n;
  a.x0 = x0;
  a.dx = dx;
  return a;
}

// Line and grid files keep their axes for dynamic and static items, also a
// single cell (no second coordinate value to give the spacing) and a
// descending axis (rasters from north to south, layers from the top down).
TEST(ZrnRoundTrip, LineAndGridFilesKeepTheirAxesAndLayout) {
  test::TempDir dir;
  const struct {
    const char* file;
    ZrnSpatialAxis axis;
  } cases[] = {
      {"line.zrn1", Grid(kZrnAxisD1, {4, 1, 1}, {100.0, 0, 0}, {25.0, 1, 1})},
      {"grid.zrn2", Grid(kZrnAxisD2, {3, 2, 1}, {100.0, 200.0, 0}, {10.0, 20.0, 1})},
      {"grid.zrn3", Grid(kZrnAxisD3, {3, 2, 2}, {100.0, 200.0, -5.0}, {10.0, 20.0, 2.5})},
      {"point_line.zrn1", Grid(kZrnAxisD1, {1, 1, 1}, {500.0, 0, 0}, {25.0, 1, 1})},
      {"column.zrn2", Grid(kZrnAxisD2, {1, 3, 1}, {100.0, 200.0, 0}, {10.0, 20.0, 1})},
      {"row.zrn2", Grid(kZrnAxisD2, {3, 1, 1}, {100.0, 200.0, 0}, {10.0, 20.0, 1})},
      {"one_layer.zrn3", Grid(kZrnAxisD3, {3, 2, 1}, {100.0, 200.0, -5.0}, {10.0, 20.0, 2.5})},
      {"one_cell.zrn3", Grid(kZrnAxisD3, {1, 1, 1}, {0.5, 0.25, -3.0}, {0.1, 0.2, 0.3})},
      {"north_south.zrn2", Grid(kZrnAxisD2, {3, 4, 1}, {100.0, 260.0, 0}, {10.0, -20.0, 1})},
      {"top_down.zrn3", Grid(kZrnAxisD3, {2, 2, 3}, {7.0e5, 6.1e6, -0.5}, {0.1, -0.1, -1.5})},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.file);
    const std::string name = dir.file(c.file);
    WriteGridFile(name, c.axis);
    ZrnFile r;
    ASSERT_EQ(zrnFileRead(r, name), 0);
    ZrnSpatialAxis a;
    ASSERT_EQ(zrnGetItemDim(r, 1, a), 0);
    ExpectAxis(a, c.axis);
    EXPECT_EQ(r.items[0].compression, 5);
    int nstatics = 0;
    zrnGetNoOfStatics(r, nstatics);
    ASSERT_EQ(nstatics, 1);
    ZrnItemInfo info;
    ASSERT_EQ(zrnStaticRead(r, info), 0);
    EXPECT_EQ(info.name, "Bed level");
    EXPECT_EQ(info.item_type, kUvqIBathymetry);
    ExpectAxis(info.axis, c.axis);
    std::vector<double> z(static_cast<size_t>(info.axis.Count()));
    ASSERT_EQ(zrnStaticGetData(r, z.data(), static_cast<long>(z.size())), 0);
    EXPECT_EQ(z, Record(9, 0, info.axis.Count()));
    ExpectSteps(r, 2);
    zrnFileClose(r);
  }

  // x runs fastest: value (j, i) of a record sits at j*nx + i, and the
  // coordinate variables hold the cell centres.
  int ncid, var, xv, yv;
  ASSERT_EQ(nc_open(dir.file("grid.zrn2").c_str(), NC_NOWRITE, &ncid), NC_NOERR);
  ASSERT_EQ(nc_inq_varid(ncid, "depth", &var), NC_NOERR);
  ASSERT_EQ(nc_inq_varid(ncid, "x", &xv), NC_NOERR);
  ASSERT_EQ(nc_inq_varid(ncid, "y", &yv), NC_NOERR);
  const size_t idx[3] = {1, 1, 2};
  double v = 0;
  ASSERT_EQ(nc_get_var1_double(ncid, var, idx, &v), NC_NOERR);
  EXPECT_EQ(v, Value(1, 1, 1 * 3 + 2));
  double xs[3], ys[4];
  nc_get_var_double(ncid, xv, xs);
  nc_get_var_double(ncid, yv, ys);
  EXPECT_EQ(xs[2], 120.0);
  EXPECT_EQ(ys[1], 220.0);
  int shuffle, deflate, level;
  nc_inq_var_deflate(ncid, var, &shuffle, &deflate, &level);
  EXPECT_EQ(deflate, 1);
  EXPECT_EQ(level, 5);
  nc_close(ncid);

  // The coordinate values of a descending axis descend (what other readers
  // see), and the axis is kept as numbers, never as strings.
  ASSERT_EQ(nc_open(dir.file("north_south.zrn2").c_str(), NC_NOWRITE, &ncid), NC_NOERR);
  ASSERT_EQ(nc_inq_varid(ncid, "y", &yv), NC_NOERR);
  ASSERT_EQ(nc_get_var_double(ncid, yv, ys), NC_NOERR);
  EXPECT_EQ(ys[0], 260.0);
  EXPECT_EQ(ys[3], 200.0);
  nc_type type;
  size_t len;
  for (const char* att : {"zrn_axis_origin", "zrn_axis_spacing"}) {
    ASSERT_EQ(nc_inq_att(ncid, yv, att, &type, &len), NC_NOERR) << att;
    EXPECT_EQ(type, NC_DOUBLE);
    EXPECT_EQ(len, 1u);
  }
  nc_close(ncid);
}

// Another tool that reverses or cuts an axis rewrites the coordinate values
// but carries our attributes over unchanged: the values win.
TEST(ZrnRoundTrip, CoordinateValuesChangedByAnotherToolWinOverTheStoredAxis) {
  test::TempDir dir;
  const std::string name = dir.file("edited.zrn2");
  WriteGridFile(name, Grid(kZrnAxisD2, {4, 2, 1}, {100.0, 200.0, 0}, {10.0, 20.0, 1}));
  int ncid, xv;
  ASSERT_EQ(nc_open(name.c_str(), NC_WRITE, &ncid), NC_NOERR);
  ASSERT_EQ(nc_inq_varid(ncid, "x", &xv), NC_NOERR);
  const double reversed[4] = {130.0, 120.0, 110.0, 100.0};
  ASSERT_EQ(nc_put_var_double(ncid, xv, reversed), NC_NOERR);
  ASSERT_EQ(nc_close(ncid), NC_NOERR);
  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  ZrnSpatialAxis a;
  ASSERT_EQ(zrnGetItemDim(r, 1, a), 0);
  ExpectAxis(a, Grid(kZrnAxisD2, {4, 2, 1}, {130.0, 200.0, 0}, {-10.0, 20.0, 1}));
  zrnFileClose(r);
}

// Two triangles and a quadrilateral:  4---5---6
//                                     | \ | q |
//                                     1---2---3
ZrnMeshData SmallMesh() {
  return test::MakeZrnMesh({0, 1, 2, 0, 1, 2}, {0, 0, 0, 1, 1, 1}, 1000.0, 2000.0, {{1, 2, 4}, {2, 5, 4}, {2, 3, 6, 5}});
}

TEST(ZrnRoundTrip, MeshFileWithFaceAndNodeItems) {
  test::TempDir dir;
  const std::string name = dir.file("result.zrnu");
  const ZrnMeshData mesh = SmallMesh();
  ZrnFile w;
  ASSERT_EQ(zrnHeaderCreate(w, name, kZrnFileMesh2D, "Flow results"), 0);
  ASSERT_EQ(zrnSetGeoInfoUTMProj(w, "UTM-33", 0, 0, 0, "PROJCRS[\"test\"]", 32633), 0);
  ASSERT_EQ(zrnSetMesh(w, mesh), 0);
  zrnSetEqCalendarAxis(w, kStart, 30.0);
  zrnSetItemInfo(w, 1, "Surface elevation", kUvqIWaterLevel, kUvqUmeter);
  ASSERT_EQ(zrnSetItemAxisEqD4(w, 1, kZrnLocationFace, 3), 0);
  zrnSetItemInfo(w, 2, "Node depth", kUvqIWaterDepth, kUvqUmeter, kZrnDouble);
  ASSERT_EQ(zrnSetItemAxisEqD4(w, 2, kZrnLocationNode, 6), 0);
  ASSERT_EQ(zrnFileCreate(w), 0);
  WriteSteps(w, 0, 2);
  ASSERT_EQ(zrnFileClose(w), 0);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  EXPECT_EQ(r.file_type, kZrnFileMesh2D);
  EXPECT_EQ(r.crs_wkt, "PROJCRS[\"test\"]");
  const double want_block[] = {6, 3, 2, 0, 0};
  for (int k = 1; k <= 5; ++k) {
    double v = -1;
    ASSERT_EQ(zrnGetCustomBlockValue(r, "TANO_KX", k, v), 0);
    EXPECT_EQ(v, want_block[k - 1]);
  }
  ZrnMeshData m;
  ASSERT_EQ(zrnReadMesh(r, m), 0);
  ASSERT_EQ(m.nnodes(), 6);
  ASSERT_EQ(m.nelements(), 3);
  for (int i = 1; i <= 6; ++i) {
    EXPECT_EQ(m.x[i], mesh.x[i]);
    EXPECT_EQ(m.y[i], mesh.y[i]);
    EXPECT_EQ(m.z[i], mesh.z[i]);
    EXPECT_EQ(m.node_id[i], mesh.node_id[i]);
    EXPECT_EQ(m.node_code[i], mesh.node_code[i]);
    if (i <= 4) { EXPECT_EQ(m.node_start[i], mesh.node_start[i]); }
    if (i <= 3) {
      EXPECT_EQ(m.element_id[i], mesh.element_id[i]);
      EXPECT_EQ(m.element_type[i], mesh.element_type[i]);
    }
  }
  for (int j = 1; j <= mesh.node_list.size(); ++j) EXPECT_EQ(m.node_list[j], mesh.node_list[j]);
  EXPECT_DOUBLE_EQ(m.face_x[3], 1001.5);
  EXPECT_DOUBLE_EQ(m.face_y[3], 2000.5);
  EXPECT_EQ(r.items[0].axis.type, kZrnAxisD4);
  EXPECT_EQ(r.items[0].axis.location, kZrnLocationFace);
  EXPECT_EQ(r.items[1].axis.location, kZrnLocationNode);
  EXPECT_EQ(r.items[1].axis.n[0], 6);
  ExpectSteps(r, 2);
  zrnFileClose(r);

  // The UGRID layout itself: 0-based face nodes padded with -1, 8 unique edges.
  int ncid, fv, edim;
  ASSERT_EQ(nc_open(name.c_str(), NC_NOWRITE, &ncid), NC_NOERR);
  ASSERT_EQ(nc_inq_varid(ncid, "mesh2d_face_nodes", &fv), NC_NOERR);
  int fn[12];
  nc_get_var_int(ncid, fv, fn);
  const int want_fn[12] = {0, 1, 3, -1, 1, 4, 3, -1, 1, 2, 5, 4};
  for (int j = 0; j < 12; ++j) EXPECT_EQ(fn[j], want_fn[j]) << j;
  ASSERT_EQ(nc_inq_dimid(ncid, "mesh2d_nEdges", &edim), NC_NOERR);
  size_t nedges = 0;
  nc_inq_dimlen(ncid, edim, &nedges);
  EXPECT_EQ(nedges, 8u);
  nc_close(ncid);
}

TEST(ZrnRoundTrip, MeshItemsMustFitTheMesh) {
  test::TempDir dir;
  ZrnFile w;
  zrnHeaderCreate(w, dir.file("bad.zrnu"), kZrnFileMesh2D, "bad");
  zrnSetMesh(w, SmallMesh());
  zrnSetEqCalendarAxis(w, kStart, 30.0);
  zrnSetItemInfo(w, 1, "Level", kUvqIWaterLevel, kUvqUmeter);
  zrnSetItemAxisEqD4(w, 1, kZrnLocationFace, 4);
  int status = 0;
  zrnFileCreate(w, true, &status);
  EXPECT_EQ(status, kZrnErrSpatialAxis);
}

TEST(ZrnRoundTrip, AppendContinuesTheTimeAxis) {
  test::TempDir dir;
  const std::string name = dir.file("append.zrn0");
  ZrnFile w = test::StartSeries(name, 2);
  WriteSteps(w, 0, 2);
  zrnFileClose(w);

  ZrnFile a;
  ASSERT_EQ(zrnFileAppend(a, name), 0);
  WriteSteps(a, 2, 2);
  zrnFileClose(a);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  EXPECT_EQ(r.time.nsteps, 4);
  double t3 = 0;
  zrnGetStepTime(r, 3, t3);
  EXPECT_EQ(t3, 180.0);
  ExpectSteps(r, 4);
  zrnFileClose(r);
}

TEST(ZrnRoundTrip, EditChangesCustomBlockValues) {
  test::TempDir dir;
  const std::string name = dir.file("edit.zrn0");
  ZrnFile w;
  zrnHeaderCreate(w, name, kZrnFileData, "edit");
  zrnAddCustomBlock(w, "VX7_Misc", std::vector<int>{1, 2, 3});
  zrnSetEqCalendarAxis(w, kStart, 60.0);
  zrnFileCreate(w);
  zrnFileClose(w);

  ZrnFile e;
  ASSERT_EQ(zrnFileEdit(e, name), 0);
  ASSERT_EQ(zrnSetCustomBlockValue(e, "VX7_Misc", 2, 42), 0);
  zrnFileClose(e);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  double v = 0;
  zrnGetCustomBlockValue(r, "VX7_Misc", 2, v);
  EXPECT_EQ(v, 42.0);
  int status = 0;
  zrnSetCustomBlockValue(r, "VX7_Misc", 2, 1, &status);
  EXPECT_EQ(status, kZrnErrSetBlock);  // opened for reading only
  zrnFileClose(r);
}

TEST(ZrnRoundTrip, FindAndSkipPositionTheReader) {
  test::TempDir dir;
  const std::string name = dir.file("find.zrn1");
  ZrnFile w;
  zrnHeaderCreate(w, name, kZrnFileData, "find");
  zrnSetEqCalendarAxis(w, kStart, 10.0);
  for (int item = 1; item <= 3; ++item) {
    zrnSetItemInfo(w, item, "Item " + std::to_string(item), kUvqIWaterLevel, kUvqUmeter, kZrnDouble);
    zrnSetItemAxisEqD1(w, item, 2, 0.0, 1.0);
  }
  zrnFileCreate(w);
  WriteSteps(w, 0, 4);
  zrnFileClose(w);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  double v[2];
  int item = 0;
  double t = 0;
  ASSERT_EQ(zrnFindItemDynamic(r, 2, 3, nullptr), 0);
  ASSERT_EQ(zrnReadItemTimeStep(r, item, t, v, 2), 0);
  EXPECT_EQ(item, 3);
  EXPECT_EQ(t, 20.0);
  EXPECT_EQ(v[1], Value(3, 2, 1));
  // The cycle wraps to item 1 of step 3; skip it, then read item 2.
  ASSERT_EQ(zrnSkipItem(r), 0);
  ASSERT_EQ(zrnReadItemTimeStep(r, item, t, v, 2), 0);
  EXPECT_EQ(item, 2);
  EXPECT_EQ(t, 30.0);
  EXPECT_EQ(v[0], Value(2, 3, 0));
  ASSERT_EQ(ZrnReadItemAtStep(r, 0, 1, v, 2), 0);
  EXPECT_EQ(v[0], Value(1, 0, 0));
  ASSERT_EQ(zrnSkipTimeStep(r), 0);
  int step = 0, next = 0;
  zrnGetDynamicPosition(r, step, next);
  EXPECT_EQ(step, 1);
  EXPECT_EQ(next, 1);
  zrnFileClose(r);
}

TEST(ZrnRoundTrip, ASecondRecordInTheSameProcessReadsAFileBeingWritten) {
  test::TempDir dir;
  const std::string name = dir.file("live.zrn0");
  ZrnFile w = test::StartSeries(name, 1, kZrnDouble);
  WriteSteps(w, 0, 3);
  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  EXPECT_EQ(r.time.nsteps, 3);
  ExpectSteps(r, 3);
  zrnFileClose(r);
  zrnFileClose(w);
}

TEST(ZrnRoundTrip, FlushedStepsSurviveACrashOfTheWriter) {
  test::TempDir dir;
  const std::string name = dir.file("crash.zrn0");
  const pid_t pid = fork();
  ASSERT_GE(pid, 0);
  if (pid == 0) {
    ZrnFile w = test::StartSeries(name, 1, kZrnDouble);
    for (int s = 0; s < 3; ++s) {
      const double v = Value(1, s, 0);
      zrnWriteItemTimeStep(w, 0, &v, 1);
    }
    _exit(0);  // no close: the process dies with the file open
  }
  int wstatus = 0;
  waitpid(pid, &wstatus, 0);
  ASSERT_TRUE(WIFEXITED(wstatus));
  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  EXPECT_EQ(r.time.nsteps, 3);
  ExpectSteps(r, 3);
  zrnFileClose(r);
}

TEST(ZrnRoundTrip, PlainCfSeriesReadsWithDefaults) {
  // A time series as another tool writes it: hours since a date, one
  // variable per series, NaN for missing data, no zrn attributes.
  test::TempDir dir;
  const std::string name = dir.file("plain.nc");
  int ncid, tdim, tv, av, bv;
  ASSERT_EQ(nc_create(name.c_str(), NC_NETCDF4, &ncid), NC_NOERR);
  nc_def_dim(ncid, "time", NC_UNLIMITED, &tdim);
  nc_def_var(ncid, "time", NC_DOUBLE, 1, &tdim, &tv);
  const char* units = "hours since 2020-03-01T06:00:00Z";
  nc_put_att_text(ncid, tv, "units", strlen(units), units);
  nc_def_var(ncid, "wl", NC_FLOAT, 1, &tdim, &av);
  nc_put_att_text(ncid, av, "units", 1, "m");
  nc_put_att_text(ncid, av, "standard_name", 18, "sea_surface_height");
  nc_def_var(ncid, "q", NC_DOUBLE, 1, &tdim, &bv);
  nc_put_att_text(ncid, bv, "long_name", 9, "Discharge");
  nc_put_att_text(ncid, bv, "units", 6, "m3 s-1");
  nc_enddef(ncid);
  const double t[3] = {1.0, 1.5, 3.0};
  const float a[3] = {0.5f, NAN, 1.5f};
  const double b[3] = {10.0, 20.0, 30.0};
  const size_t start = 0, count = 3;
  nc_put_vara_double(ncid, tv, &start, &count, t);
  nc_put_vara_float(ncid, av, &start, &count, a);
  nc_put_vara_double(ncid, bv, &start, &count, b);
  nc_close(ncid);

  ZrnFile r;
  ASSERT_EQ(zrnFileRead(r, name), 0);
  EXPECT_EQ(r.time.type, kZrnTimeNeqCalendar);
  EXPECT_EQ(zrnDateTimeText(r.time.start), "2020-03-01 07:00:00");
  double t2 = 0;
  zrnGetStepTime(r, 2, t2);
  EXPECT_EQ(t2, 7200.0);
  ASSERT_EQ(r.items.size(), 2u);
  EXPECT_EQ(r.items[0].name, "wl");
  EXPECT_EQ(r.items[0].item_type, kUvqIWaterLevel);
  EXPECT_EQ(r.items[0].unit, kUvqUmeter);
  EXPECT_EQ(r.items[1].name, "Discharge");
  EXPECT_EQ(r.items[1].item_type, kUvqItemUndefined);
  EXPECT_EQ(r.items[1].unit, kUvqUm3PerSec);
  EXPECT_EQ(r.delete_value, kZrnDefaultDeleteValue);
  double v = 0;
  ASSERT_EQ(ZrnReadItemAtStep(r, 1, 1, &v, 1), 0);
  EXPECT_EQ(v, kZrnDefaultDeleteValue);
  ASSERT_EQ(ZrnReadItemAtStep(r, 2, 2, &v, 1), 0);
  EXPECT_EQ(v, 30.0);
  zrnFileClose(r);
}

TEST(ZrnRoundTrip, DateArithmetic) {
  ZrnDateTime t;
  ASSERT_TRUE(zrnParseDateTime("2000-02-28 23:59:30", t));
  EXPECT_EQ(zrnDateTimeText(zrnAddSeconds(t, 60.0)), "2000-02-29 00:00:30");
  EXPECT_EQ(zrnDateTimeText(zrnAddSeconds(t, -86400.0 * 59)), "1999-12-31 23:59:30");
  EXPECT_EQ(zrnSecondsBetween(ZrnDateTime{1970, 1, 1, 0, 0, 0}, ZrnDateTime{2001, 9, 9, 1, 46, 40}),
            1e9);
  EXPECT_FALSE(zrnParseDateTime("2001-02-29 00:00:00", t));
  EXPECT_FALSE(zrnParseDateTime("yesterday", t));
  ASSERT_TRUE(zrnParseDateTime("1990-1-1", t));
  EXPECT_EQ(zrnDateTimeText(t), "1990-01-01 00:00:00");
}

}  // namespace
}  // namespace vhd
