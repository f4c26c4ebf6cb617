// Time-varying input data on the mesh: point series read forward against the
// analytic series written into them, soft start and circular interpolation
// through the read, coverage refusals, one-step files, linear fields on grids
// (also across projections), lines along a boundary, mesh files, units, and
// the messages for files of the wrong kind.

#include "mesh/femdata.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <string>
#include <vector>

#include "io/units.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/generate.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

constexpr ZrnDateTime kStart{2010, 6, 1, 0, 0, 0};

struct ItemDef {
  std::string name;
  int type = kUvqItemUndefined;
  int unit = kUvqUnitUndefined;
};

// What a test file holds: items, axis, steps and values.
struct FileDef {
  int file_type = kZrnFileData;
  double start = 0.0;  // seconds of the first step after kStart
  double dt = 600.0;
  int nsteps = 2;
  std::vector<ItemDef> items{{"Value"}};
  std::function<void(ZrnFile&, int)> axis = [](ZrnFile& f, int item) {
    zrnSetItemAxisEqD0(f, item);
  };
  std::function<std::vector<double>(int item, int step)> values;
  std::string projection;
  double delete_value = kZrnDefaultDeleteValue;
  const ZrnMeshData* mesh = nullptr;
};

void WriteFile(const std::string& name, const FileDef& d) {
  ZrnFile f;
  ASSERT_EQ(zrnHeaderCreate(f, name, d.file_type, "test input"), 0);
  zrnSetDeleteValFloat(f, d.delete_value);
  if (!d.projection.empty()) zrnSetGeoInfoUTMProj(f, d.projection, 0.0, 0.0, 0.0);
  if (d.mesh != nullptr) {
    ASSERT_EQ(zrnSetMesh(f, *d.mesh), 0);
  }
  ASSERT_EQ(zrnSetEqCalendarAxis(f, zrnAddSeconds(kStart, d.start), d.dt), 0);
  for (int k = 1; k <= static_cast<int>(d.items.size()); ++k) {
    const ItemDef& it = d.items[static_cast<std::size_t>(k - 1)];
    ASSERT_EQ(zrnSetItemInfo(f, k, it.name, it.type, it.unit, kZrnDouble), 0);
    d.axis(f, k);
  }
  ASSERT_EQ(zrnFileCreate(f), 0);
  for (int s = 0; s < d.nsteps; ++s)
    for (int k = 1; k <= static_cast<int>(d.items.size()); ++k) {
      const std::vector<double> v = d.values(k, s);
      ASSERT_EQ(zrnWriteItemTimeStep(f, 0.0, v.data(), static_cast<long>(v.size())), 0);
    }
  ASSERT_EQ(zrnFileClose(f), 0);
}

DataSpec FileSpec(int format, const std::string& name, int n = 1, std::vector<int> items = {}) {
  DataSpec spec;
  InitDataSpec(spec, n, {}, items);
  spec.format = format;
  spec.file_name = name;
  spec.type_of_soft_start = kSoftStartNone;
  return spec;
}

FemDataRequest Request(FemDataExpect expect, FemDataLocation location, const Mesh* mesh = nullptr) {
  FemDataRequest r;
  r.expect = expect;
  r.location = location;
  r.mesh = mesh;
  return r;
}

// Opens a copy of spec for a run from kStart (for the refusals).
void Open(DataSpec spec, const FemDataRequest& request, double duration = 600.0) {
  FemDataOpen(spec, request, kStart, duration);
}

class FemDataTest : public ::testing::Test {
 protected:
  void TearDown() override { CloseLogFile(); }
  test::TempDir dir;
};

// ---- point series ------------------------------------------------------------------------

TEST_F(FemDataTest, ReadingForwardGivesTheLinearInterpolantOfTheSeries) {
  // A sine of period 3 h sampled every 600 s, the file starting an hour
  // before the simulation; the run lasts a day.
  const double period = 10800.0, dt = 600.0, lead = 3600.0, duration = 86400.0;
  auto series = [&](double tf) { return 1.5 + std::sin(2 * M_PI * tf / period); };
  FileDef d;
  d.start = -lead;
  d.dt = dt;
  d.nsteps = static_cast<int>((duration + lead) / dt) + 1;
  d.values = [&](int, int s) { return std::vector<double>{series(s * dt)}; };
  const std::string name = dir.file("sine.zrn0");
  WriteFile(name, d);

  DataSpec spec = FileSpec(kDataFile, name);
  FemDataOpen(spec, FemDataRequest{}, kStart, duration);
  double max_error = 0.0;
  for (double t = 0.0; t <= duration; t += 37.3) {
    const double tf = t + lead;  // time on the file's axis
    const int s = std::min(static_cast<int>(tf / dt), d.nsteps - 2);
    const double w = (tf - s * dt) / dt;
    const double want = series(s * dt) * (1 - w) + series((s + 1) * dt) * w;
    max_error = std::max(max_error, std::abs(FemDataValue(spec, 1, t) - want));
  }
  EXPECT_LT(max_error, 1e-12);
  // A step exactly on a file step, the end, and a jump back re-read correctly.
  EXPECT_NEAR(FemDataValue(spec, 1, 1800.0), series(1800.0 + lead), 1e-12);
  EXPECT_NEAR(FemDataValue(spec, 1, duration), series(duration + lead), 1e-12);
  EXPECT_NEAR(FemDataValue(spec, 1, 100.0),
              series(3600.0) * (500.0 / 600) + series(4200.0) * (100.0 / 600), 1e-12);
  FemDataClose(spec);
}

TEST_F(FemDataTest, SoftStartAndTheTargetsOfAPointSeries) {
  FileDef d;
  d.nsteps = 7;
  d.values = [](int, int s) { return std::vector<double>{2.0 + s}; };
  const std::string name = dir.file("ramp.zrn0");
  WriteFile(name, d);
  const Mesh mesh = test::Built(test::Rectangle(0.0, 1.0, 0.0, 1.0, 3, 2));

  DataSpec spec = FileSpec(kDataFile, name);
  spec.type_of_soft_start = kSoftStartSine;
  spec.soft_time_interval = 1200.0;
  spec.reference_values[1] = 1.0;
  FemDataRequest r = Request(FemDataExpect::kArea, FemDataLocation::kElements, &mesh);
  FemDataOpen(spec, r, kStart, 3600.0);
  ASSERT_EQ(FemDataTargets(spec), mesh.elements.nelements);
  Array1<double> v(mesh.elements.nelements);
  // At t = 0 the reference, half way the mean, after T the data.
  FemDataRead(spec, 1, 0.0, v);
  for (double x : v) EXPECT_DOUBLE_EQ(x, 1.0);
  FemDataRead(spec, 1, 600.0, v);
  for (double x : v) EXPECT_DOUBLE_EQ(x, 1.0 + 0.5 * (3.0 - 1.0));
  FemDataRead(spec, 1, 1500.0, v);
  for (double x : v) EXPECT_DOUBLE_EQ(x, 4.5);
  // A component with the no-soft-start flag takes the data at once.
  spec.no_soft_start[1] = 1;
  EXPECT_DOUBLE_EQ(FemDataValue(spec, 1, 300.0, 4), 2.5);
  FemDataClose(spec);
}

TEST_F(FemDataTest, ConstantsAndTheSoftStartFactorNeedNoFile) {
  DataSpec c;
  InitDataSpec(c, 1, {2.0});
  c.type_of_soft_start = kSoftStartLinear;
  c.soft_time_interval = 3600.0;
  FemDataOpen(c, FemDataRequest{}, kStart, 7200.0);
  Array1<double> v(5);
  for (double t : {0.0, 900.0, 1800.0, 3600.0, 5000.0}) {
    FemDataRead(c, 1, t, v);
    for (double x : v) EXPECT_NEAR(x, 2.0 * std::min(t / 3600.0, 1.0), 1e-14);
  }
  DataSpec f;
  InitDataSpec(f, 1);
  f.format = kDataSoftStartFactor;
  f.soft_time_interval = 1000.0;
  EXPECT_NEAR(FemDataValue(f, 1, 500.0), 0.5, 1e-15);
  f.soft_time_interval = 0.0;
  EXPECT_EQ(FemDataValue(f, 1, 0.0), 1.0);
}

TEST_F(FemDataTest, DirectionsTurnThroughNorth) {
  FileDef d;
  d.items = {{"Speed"}, {"Direction"}};
  d.values = [](int item, int s) {
    return std::vector<double>{item == 1 ? 10.0 + 10 * s : (s == 0 ? 350.0 : 10.0)};
  };
  const std::string name = dir.file("wind.zrn0");
  WriteFile(name, d);
  DataSpec spec = FileSpec(kDataFile, name, 2);
  spec.time_interpolation[2] = kTimeInterpolationCircular;
  FemDataOpen(spec, FemDataRequest{}, kStart, 600.0);
  EXPECT_DOUBLE_EQ(FemDataValue(spec, 1, 300.0), 15.0);
  EXPECT_DOUBLE_EQ(FemDataValue(spec, 2, 300.0), 360.0);
  EXPECT_DOUBLE_EQ(FemDataValue(spec, 2, 450.0), 365.0);
  FemDataClose(spec);
}

// ---- coverage and one-step files -------------------------------------------------------------

TEST_F(FemDataTest, SeriesThatDoNotCoverTheRunAreRefused) {
  FileDef d;
  d.dt = 0.5;
  d.nsteps = 2;  // 0 .. 0.5 s
  d.values = [](int, int s) { return std::vector<double>{1.0 * s}; };
  const std::string early = dir.file("early.zrn0");
  WriteFile(early, d);
  EXPECT_FATAL(Open(FileSpec(kDataFile, early), FemDataRequest{}, 1.0),
               "The data does not cover the entire simulation");
  d.start = 1.0;
  d.nsteps = 20;
  const std::string late = dir.file("late.zrn0");
  WriteFile(late, d);
  EXPECT_FATAL(Open(FileSpec(kDataFileMap, late), FemDataRequest{}, 2.0),
               "The data does not cover the entire simulation");
  // Format 2 is not checked: it takes the data at the start (here the first step).
  DataSpec once = FileSpec(kDataFileOnce, late);
  FemDataOpen(once, FemDataRequest{}, kStart, 100.0);
  EXPECT_EQ(FemDataValue(once, 1, 50.0), 0.0);
  FemDataClose(once);
}

TEST_F(FemDataTest, OneStepFiles) {
  FileDef d;
  d.nsteps = 1;
  d.values = [](int, int) { return std::vector<double>{4.25}; };
  const std::string name = dir.file("one.zrn0");
  WriteFile(name, d);
  EXPECT_FATAL(Open(FileSpec(kDataFile, name), FemDataRequest{}, 60.0),
               "The data does not cover the entire simulation - only one time step in file");
  DataSpec instant = FileSpec(kDataFile, name);
  FemDataOpen(instant, FemDataRequest{}, kStart, 0.0);
  EXPECT_EQ(FemDataValue(instant, 1, 0.0), 4.25);
  FemDataClose(instant);
  DataSpec once = FileSpec(kDataFileOnce, name);
  FemDataOpen(once, FemDataRequest{}, kStart, 3600.0);
  EXPECT_EQ(FemDataValue(once, 1, 3000.0), 4.25);
  FemDataClose(once);
}

// ---- grids ---------------------------------------------------------------------------------

double Linear(int step, double x, double y) {
  return 3.0 + step + 0.02 * x - 0.015 * (1 + step) * y;
}

TEST_F(FemDataTest, BilinearGridReproducesALinearFieldEverywhere) {
  const Mesh mesh = test::Built(test::Rectangle(100.0, 900.0, 50.0, 650.0, 9, 7, CellLayout::kMixed, 0.2));
  // A grid larger than the mesh, with other spacings in x and y.
  const int nx = 14, ny = 9;
  const double gx0 = 60.0, gy0 = 0.0, gdx = 70.0, gdy = 85.0;
  FileDef d;
  d.axis = [&](ZrnFile& f, int item) { zrnSetItemAxisEqD2(f, item, nx, ny, gx0, gy0, gdx, gdy); };
  d.values = [&](int, int s) {
    std::vector<double> v;
    for (int j = 0; j < ny; ++j)
      for (int i = 0; i < nx; ++i) v.push_back(Linear(s, gx0 + i * gdx, gy0 + j * gdy));
    return v;
  };
  const std::string name = dir.file("field.zrn2");
  WriteFile(name, d);

  struct Case {
    FemDataLocation location;
    const Array1<double>* x;
    const Array1<double>* y;
  };
  for (const Case& c : {Case{FemDataLocation::kElements, &mesh.elements.xc, &mesh.elements.yc},
                        Case{FemDataLocation::kNodes, &mesh.nodes.x, &mesh.nodes.y},
                        Case{FemDataLocation::kFaces, &mesh.faces.xf, &mesh.faces.yf}}) {
    DataSpec spec = FileSpec(kDataFile, name);
    FemDataOpen(spec, Request(FemDataExpect::kGrid, c.location, &mesh), kStart, 600.0);
    Array1<double> v(c.x->size());
    FemDataRead(spec, 1, 150.0, v);
    double max_error = 0.0;
    for (int i = 1; i <= v.size(); ++i) {
      const double want =
          0.75 * Linear(0, (*c.x)[i], (*c.y)[i]) + 0.25 * Linear(1, (*c.x)[i], (*c.y)[i]);
      max_error = std::max(max_error, std::abs(v[i] - want));
    }
    EXPECT_LT(max_error, 1e-11) << static_cast<int>(c.location);
    FemDataClose(spec);
  }
  // Points, and a point beyond the grid takes the value at its edge.
  DataSpec spec = FileSpec(kDataFile, name);
  FemDataRequest r = Request(FemDataExpect::kArea, FemDataLocation::kPoints);
  r.x = {123.4, 777.7, 2000.0};
  r.y = {555.5, 61.0, 100.0};
  FemDataOpen(spec, r, kStart, 600.0);
  EXPECT_NEAR(FemDataValue(spec, 1, 0.0, 1), Linear(0, 123.4, 555.5), 1e-11);
  EXPECT_NEAR(FemDataValue(spec, 1, 600.0, 2), Linear(1, 777.7, 61.0), 1e-11);
  EXPECT_NEAR(FemDataValue(spec, 1, 0.0, 3), Linear(0, gx0 + (nx - 1) * gdx, 100.0), 1e-11);
  FemDataClose(spec);
}

TEST_F(FemDataTest, GridInAnotherProjectionIsReadThroughGeographicCoordinates) {
  // A UTM zone 32 mesh near 9 E, 55 N and a geographic grid holding the
  // longitude and the latitude: read at the element centres they must give the
  // centres' own geographic coordinates (to the bilinear error of a smooth map).
  RectangleMeshSpec ms = test::Rectangle(480000.0, 520000.0, 6090000.0, 6130000.0, 6, 6);
  ms.projection = "UTM-32";
  const Mesh mesh = test::Built(ms);
  const int nx = 41, ny = 41;
  const double lon0 = 8.5, lat0 = 54.8, step = 0.025;
  FileDef d;
  d.projection = "LONG/LAT";
  d.items = {{"Longitude"}, {"Latitude"}};
  d.nsteps = 1;
  d.axis = [&](ZrnFile& f, int item) {
    zrnSetItemAxisEqD2(f, item, nx, ny, lon0, lat0, step, step);
  };
  d.values = [&](int item, int) {
    std::vector<double> v;
    for (int j = 0; j < ny; ++j)
      for (int i = 0; i < nx; ++i) v.push_back(item == 1 ? lon0 + i * step : lat0 + j * step);
    return v;
  };
  const std::string name = dir.file("geo.zrn2");
  WriteFile(name, d);
  DataSpec spec = FileSpec(kDataFileOnce, name, 2);
  FemDataOpen(spec, Request(FemDataExpect::kGrid, FemDataLocation::kElements, &mesh), kStart,
              3600.0);
  CTqCartography utm;
  TqCartCreate(utm, "UTM-32");
  Array1<double> lon(mesh.elements.nelements), lat(mesh.elements.nelements);
  FemDataRead(spec, 1, 0.0, lon);
  FemDataRead(spec, 2, 0.0, lat);
  for (int e = 1; e <= mesh.elements.nelements; ++e) {
    double want_lon = 0, want_lat = 0;
    TqCartProj2Geo(utm, mesh.elements.xc[e], mesh.elements.yc[e], want_lon, want_lat);
    EXPECT_NEAR(lon[e], want_lon, 1e-9) << e;
    EXPECT_NEAR(lat[e], want_lat, 1e-9) << e;
  }
  FemDataClose(spec);
}

TEST_F(FemDataTest, DeleteValuesTakeNoPartInTheWeights) {
  FileDef d;
  d.delete_value = -999.0;
  d.nsteps = 1;
  d.axis = [](ZrnFile& f, int item) { zrnSetItemAxisEqD2(f, item, 2, 2, 0.0, 0.0, 1.0, 1.0); };
  d.values = [](int, int) { return std::vector<double>{1.0, 2.0, -999.0, 4.0}; };
  const std::string name = dir.file("masked.zrn2");
  WriteFile(name, d);
  DataSpec spec = FileSpec(kDataFileOnce, name);
  FemDataRequest r = Request(FemDataExpect::kGrid, FemDataLocation::kPoints);
  r.x = {0.5, 0.0};
  r.y = {0.5, 1.0};
  FemDataOpen(spec, r, kStart, 0.0);
  EXPECT_DOUBLE_EQ(FemDataValue(spec, 1, 0.0, 1), (1.0 + 2.0 + 4.0) / 3);
  EXPECT_EQ(FemDataValue(spec, 1, 0.0, 2), -999.0);
  FemDataClose(spec);
}

// ---- lines ---------------------------------------------------------------------------------

TEST_F(FemDataTest, LineValuesSpreadAlongTheBoundary) {
  RectangleMeshSpec ms = test::Rectangle(0.0, 300.0, 0.0, 1000.0, 3, 8);
  ms.code_east = 2;
  const Mesh mesh = test::Built(ms);
  MeshSection section;
  SetupMeshSection(mesh, 2, section);
  FileDef d;
  d.axis = [](ZrnFile& f, int item) { zrnSetItemAxisEqD1(f, item, 5, 0.0, 1.0); };
  d.values = [](int, int s) {
    return std::vector<double>{0.0 + s, 1.0 + s, 2.0 + s, 3.0 + s, 4.0 + s};
  };
  const std::string name = dir.file("east.zrn1");
  WriteFile(name, d);
  DataSpec spec = FileSpec(kDataFile, name);
  FemDataRequest r = Request(FemDataExpect::kLine, FemDataLocation::kFaces, &mesh);
  r.entities.assign(section.faces.begin(), section.faces.end());
  FemDataOpen(spec, r, kStart, 600.0);
  Array1<double> v(section.faces.size());
  FemDataRead(spec, 1, 300.0, v);
  // The east side is walked south to north: 0 at the south corner, 4 at the north.
  for (int i = 1; i <= v.size(); ++i)
    EXPECT_NEAR(v[i], 4.0 * mesh.faces.yf[section.faces[i]] / 1000.0 + 0.5, 1e-12) << i;
  FemDataClose(spec);
}

// ---- mesh files ------------------------------------------------------------------------------

class FemDataMeshFile : public FemDataTest {
 protected:
  void SetUp() override {
    mesh = test::Built(test::Rectangle(0.0, 400.0, 0.0, 300.0, 4, 3, CellLayout::kMixed));
    // The mesh as a data file holds it: through a mesh file of its own.
    WriteMeshZrnu(mesh, dir.file("mesh.zrnu"));
    ZrnFile mf;
    ZrnOpenInput(mf, dir.file("mesh.zrnu"));
    zrnReadMesh(mf, zmesh);
    zrnHeaderDestroy(mf);
    FileDef d;
    d.file_type = kZrnFileMesh2D;
    d.mesh = &zmesh;
    d.items = {{"Element value", kUvqIWaterLevel, kUvqUcentimeter}, {"Node value"}};
    d.axis = [&](ZrnFile& f, int item) {
      if (item == 1)
        zrnSetItemAxisEqD4(f, item, kZrnLocationFace, mesh.elements.nelements);
      else
        zrnSetItemAxisEqD4(f, item, kZrnLocationNode, mesh.nodes.nnodes);
    };
    d.values = [&](int item, int s) {
      std::vector<double> v;
      if (item == 1) {
        for (int e = 1; e <= mesh.elements.nelements; ++e) v.push_back(100.0 * e + s);
      } else {
        for (int i = 1; i <= mesh.nodes.nnodes; ++i)
          v.push_back(NodeField(mesh.nodes.x[i], mesh.nodes.y[i]));
      }
      return v;
    };
    WriteFile(name, d);
  }
  static double NodeField(double x, double y) { return 1.0 + 0.01 * x + 0.003 * y; }
  Mesh mesh;
  ZrnMeshData zmesh;
  std::string name = dir.file("state.zrnu");
};

TEST_F(FemDataMeshFile, ElementItemIsReadBackOnTheSameMeshInTheEngineUnit) {
  DataSpec spec = FileSpec(kDataFile, name);
  FemDataRequest r = Request(FemDataExpect::kMesh, FemDataLocation::kElements, &mesh);
  r.item_types = {kUvqIWaterLevel};
  FemDataOpen(spec, r, kStart, 600.0);
  Array1<double> v(mesh.elements.nelements);
  FemDataRead(spec, 1, 300.0, v);
  // Centimetres in the file, metres in the engine.
  for (int e = 1; e <= v.size(); ++e) EXPECT_NEAR(v[e], (100.0 * e + 0.5) / 100.0, 1e-12) << e;
  FemDataClose(spec);
  // Faces take the mean of their elements.
  FemDataRequest rf = Request(FemDataExpect::kMesh, FemDataLocation::kFaces, &mesh);
  FemDataOpen(spec, rf, kStart, 600.0);
  Array1<double> f(mesh.faces.nfaces);
  FemDataRead(spec, 1, 0.0, f);
  for (int k = 1; k <= f.size(); ++k) {
    const int e1 = mesh.faces.element1[k], e2 = mesh.faces.element2[k];
    EXPECT_DOUBLE_EQ(f[k], e2 > 0 ? 50.0 * (e1 + e2) : 100.0 * e1) << k;
  }
  FemDataClose(spec);
}

TEST_F(FemDataMeshFile, NodeItemOntoNodesElementsAndPoints) {
  DataSpec spec = FileSpec(kDataFile, name, 1, {2});
  FemDataOpen(spec, Request(FemDataExpect::kMesh, FemDataLocation::kNodes, &mesh), kStart, 600.0);
  Array1<double> n(mesh.nodes.nnodes);
  FemDataRead(spec, 1, 0.0, n);
  for (int i = 1; i <= n.size(); ++i)
    EXPECT_DOUBLE_EQ(n[i], NodeField(mesh.nodes.x[i], mesh.nodes.y[i]));
  FemDataClose(spec);
  // A linear node field: the element mean is the centroid value, and points
  // inside elements get the exact linear value.
  FemDataOpen(spec, Request(FemDataExpect::kMesh, FemDataLocation::kElements, &mesh), kStart,
              600.0);
  Array1<double> e(mesh.elements.nelements);
  FemDataRead(spec, 1, 0.0, e);
  for (int k = 1; k <= e.size(); ++k)
    EXPECT_NEAR(e[k], NodeField(mesh.elements.xc[k], mesh.elements.yc[k]), 1e-12);
  FemDataClose(spec);
  FemDataRequest rp = Request(FemDataExpect::kMesh, FemDataLocation::kPoints, &mesh);
  rp.x = {13.0, 250.5, 399.0, 180.0};
  rp.y = {17.0, 120.25, 299.0, 260.0};
  FemDataOpen(spec, rp, kStart, 600.0);
  for (int i = 1; i <= 4; ++i)
    EXPECT_NEAR(
        FemDataValue(spec, 1, 0.0, i),
        NodeField(rp.x[static_cast<std::size_t>(i - 1)], rp.y[static_cast<std::size_t>(i - 1)]),
        1e-12);
  FemDataClose(spec);
}

TEST_F(FemDataMeshFile, AnotherMeshOrAWrongUnitIsRefused) {
  const Mesh other = test::Built(test::Rectangle(0.0, 1.0, 0.0, 1.0, 5, 3));
  EXPECT_FATAL(Open(FileSpec(kDataFile, name), Request(FemDataExpect::kMesh, FemDataLocation::kElements, &other)),
               "Fatal error: Wrong data file: ");
  FemDataRequest discharge = Request(FemDataExpect::kMesh, FemDataLocation::kElements, &mesh);
  discharge.item_types = {kUvqIDischarge};
  EXPECT_FATAL(Open(FileSpec(kDataFile, name), discharge), "does not have the required unit type");
}

// ---- files of the wrong kind -------------------------------------------------------------------

TEST_F(FemDataTest, FilesOfTheWrongKindAreRefusedWithTheirMessages) {
  const Mesh mesh = test::Built(test::Rectangle(0.0, 1.0, 0.0, 1.0, 2, 2));
  FileDef point;
  point.values = [](int, int) { return std::vector<double>{1.0}; };
  const std::string zrn0 = dir.file("p.zrn0");
  WriteFile(zrn0, point);
  FileDef line = point;
  line.axis = [](ZrnFile& f, int item) { zrnSetItemAxisEqD1(f, item, 3, 0.0, 1.0); };
  line.values = [](int, int) { return std::vector<double>{1.0, 2.0, 3.0}; };
  const std::string zrn1 = dir.file("l.zrn1");
  WriteFile(zrn1, line);
  FileDef grid = point;
  grid.axis = [](ZrnFile& f, int item) { zrnSetItemAxisEqD2(f, item, 2, 2, 0.0, 0.0, 1.0, 1.0); };
  grid.values = [](int, int) { return std::vector<double>{1.0, 2.0, 3.0, 4.0}; };
  const std::string zrn2 = dir.file("g.zrn2");
  WriteFile(zrn2, grid);

  struct Case {
    std::string file;
    FemDataExpect expect;
    int item;
    std::string message;
  };
  const std::vector<Case> cases = {
      {zrn0, FemDataExpect::kMesh, 1, "Invalid data file - the file must be a zrnu file"},
      {zrn1, FemDataExpect::kGrid, 1, "Invalid data file - the file must be a zrn2 file"},
      {zrn2, FemDataExpect::kLine, 1, "Invalid data file - the file must contain line information"},
      {zrn1, FemDataExpect::kArea, 1, "Invalid data file - the file must contain area information"},
      {zrn1, FemDataExpect::kPoint, 1,
       "Invalid data file - the file must contain information for only one point"},
      {zrn0, FemDataExpect::kPoint, 2, "Invalid number of items in ZRN file"},
      {dir.file("p.dat"), FemDataExpect::kPoint, 1, "Illegal data file"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    EXPECT_FATAL(Open(FileSpec(kDataFile, c.file, 1, {c.item}), Request(c.expect, FemDataLocation::kElements, &mesh)),
                 "Fatal error: " + c.message + ": ");
  }
  EXPECT_FATAL(Open(FileSpec(kDataFile, zrn2), Request(FemDataExpect::kGrid, FemDataLocation::kElements)),
               "Fatal error: No mesh supplied");
}

}  // namespace
}  // namespace vhd
