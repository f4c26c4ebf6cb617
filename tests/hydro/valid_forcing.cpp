// Forcings against physical solutions: a lake at rest under a uniform air
// pressure, wind set-up, the inverse barometer, inertial oscillation and
// geostrophic balance.

#include <gtest/gtest.h>

#include <cmath>
#include <memory>
#include <numbers>

#include "io/units.hpp"
#include "io/zrn.hpp"
#include "sw_case.hpp"
#include "test_support.hpp"

namespace vhd::test {
namespace {

constexpr double kPi = std::numbers::pi;

// Air pressure (hPa) and wind (m/s) given as a map on the case's mesh: a
// .zrnu file with items pressure, x and y velocity, two equal steps that
// cover the run (the time axis of the case starts 2004-01-01).
void WindMap(SwCase& c, const std::string& path, double t_end, const std::function<double(double, double)>& p_hpa) {
  const Mesh& mesh = c.mesh;
  const int ne = mesh.elements.nelements;
  ZrnMeshData m;
  m.node_id = mesh.nodes.id;
  m.x = mesh.nodes.x;
  m.y = mesh.nodes.y;
  m.z = mesh.nodes.z;
  m.node_code = mesh.nodes.code;
  m.element_id = mesh.elements.id;
  m.element_type = mesh.elements.type;
  m.node_start = mesh.elements.node_start;
  m.node_list = mesh.elements.node_list;
  ZrnFile w;
  zrnHeaderCreate(w, path, kZrnFileMesh2D, "wind and pressure");
  zrnSetMesh(w, m);
  zrnSetEqCalendarAxis(w, zrnDateTime({2004, 1, 1, 0, 0, 0}), t_end);
  for (int k = 1; k <= 3; ++k) {
    zrnSetItemInfo(w, k, "Item " + std::to_string(k), kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble);
    zrnSetItemAxisEqD4(w, k, kZrnLocationFace, ne);
  }
  zrnFileCreate(w);
  Array1<double> data(ne);
  for (int step = 0; step < 2; ++step) {
    for (int k = 1; k <= 3; ++k) {
      for (int e = 1; e <= ne; ++e) data[e] = k == 1 ? p_hpa(mesh.elements.xc[e], mesh.elements.yc[e]) : 0.0;
      zrnWriteItemTimeStep(w, step * t_end, data.begin(), ne);
    }
  }
  zrnFileClose(w);
  zrnHeaderDestroy(w);
  HdWindForcing& wind = c.hd.forcing.wind;
  wind.type = 1;
  wind.format = 3;
  InitDataSpec(wind.data, 3);
  wind.data.format = kDataFile;
  wind.data.file_name = path;
  wind.data.type_of_soft_start = kSoftStartNone;
  for (int k = 1; k <= 3; ++k) wind.data.no_soft_start[k] = 1;
  c.hd.time_axis.dt = t_end;
  c.hd.time_axis.last_step = 1;
}

// A uniform air pressure away from the neutral one, with Coriolis on, leaves
// a lake at rest over a steep emerged bump at rest to round-off, on
// triangles, quadrilaterals and mixed meshes, first and second order.
TEST(ForcingLakeAtRest, UniformPressureAndCoriolisKeepTheLakeAtRest) {
  for (CellLayout layout : {CellLayout::kRandomTriangles, CellLayout::kQuadrilaterals, CellLayout::kMixed}) {
    for (int order : {1, 2}) {
      SCOPED_TRACE(testing::Message() << "layout " << static_cast<int>(layout) << " order " << order);
      SwCase c;
      RectangleMeshSpec spec;
      // Coriolis needs a mesh with a geographic reference.
      spec.projection = "UTM-32";
      spec.x0 = 500000.0, spec.x1 = 501000.0;
      spec.y0 = 6000000.0, spec.y1 = 6001000.0;
      spec.nx = spec.ny = 16;
      spec.layout = layout;
      spec.jitter = 0.2;
      spec.bed = [](double x, double y) {
        const double r2 = (x - 500500) * (x - 500500) + (y - 6000500) * (y - 6000500);
        return -2.0 + 4.0 * std::exp(-r2 / 40000.0);
      };
      MakeCase(c, spec, 20.0);
      SetScheme(c.hd, 1, order);
      SetFloodDry(c.hd, 0.005, 0.05, 0.1);
      // A map of the air pressure and wind, constant here: 985 hPa, calm.
      HdWindForcing& wind = c.hd.forcing.wind;
      wind.type = 1;
      wind.format = 3;
      InitDataSpec(wind.data, 3, {985.0, 0.0, 0.0});
      wind.data.type_of_soft_start = kSoftStartNone;
      c.hd.forcing.coriolis.type = 1;
      c.hd.forcing.coriolis.coefficient_given = true;
      c.hd.forcing.coriolis.coefficient = 1.2e-4;
      // A film of 1 cm over the bump's flank stays too.
      StartCase(c, [](double, double) { return 0.01; });
      RunTo(c, 2000.0);
      const HdState& st = c.hd.state;
      double worst = 0.0;
      int wet = 0;
      for (int e = 1; e <= st.nelements; ++e) {
        if (st.h[e] > 0) worst = std::max({worst, std::abs(st.P[e]), std::abs(st.Q[e])});
        if (st.h[e] > 0) worst = std::max(worst, std::abs(st.eta[e] - 0.01));
        wet += st.wetdry[e] == kWet ? 1 : 0;
      }
      EXPECT_LT(worst, 1e-12);
      EXPECT_GT(wet, 0);
      EXPECT_LT(wet, st.nelements);  // the bump's top is dry
    }
  }
}

// Wind set-up in a closed basin 10 km long and 5 m deep under a steady wind
// of 20 m/s along it: the steady slope of the surface is tau / (rho g h),
// tau / rho = c_w W^2 with c from the default linear friction law.
TEST(ForcingWind, SetUpInAClosedBasinMatchesTheStressBalance) {
  for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kMixed}) {
    SCOPED_TRACE(static_cast<int>(layout));
    SwCase c;
    RectangleMeshSpec spec;
    spec.x1 = 10000.0;
    spec.y1 = 800.0;
    spec.nx = 50;
    spec.ny = 4;
    spec.layout = layout;
    spec.bed = [](double, double) { return -5.0; };
    MakeCase(c, spec, 600.0);
    SetScheme(c.hd, 1, 2);
    HdWindForcing& w = c.hd.forcing.wind;
    w.type = 1;
    w.format = 0;
    w.constant_speed = 20.0;
    w.constant_direction = 270.0;  // from the west
    w.soft_time_interval = 12000.0;
    // Bed drag damps the seiches; the steady state has no current.
    c.hd.bed.type = kBedDragCoefficient;
    c.hd.bed.K.assign(c.hd.state.nelements, 0.01);
    StartCase(c, [](double, double) { return 0.0; });
    RunTo(c, 30000.0);
    const double cw = (0.0016 + 0.001 * 20.0 / 24.0) / 800.0;
    const double slope = cw * 400.0 / (kPhysical.g * 5.0);
    // Least-squares slope of eta(x) between 1 and 9 km.
    const HdState& st = c.hd.state;
    double n = 0, sx = 0, sy = 0, sxx = 0, sxy = 0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double x = c.mesh.elements.xc[e];
      if (x < 1000.0 || x > 9000.0) continue;
      n += 1, sx += x, sy += st.eta[e], sxx += x * x, sxy += x * st.eta[e];
    }
    const double fitted = (n * sxy - sx * sy) / (n * sxx - sx * sx);
    EXPECT_NEAR(fitted / slope, 1.0, 0.02) << fitted << " " << slope;
  }
}

// Inverse barometer: a steady low of 20 hPa over the middle of a closed
// basin 20 m deep raises the surface there by 2000 Pa / (rho0 g) = 0.20 m
// relative to the far field.
TEST(ForcingPressure, InverseBarometerOfALow) {
  TempDir dir;
  for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kRandomTriangles}) {
    SCOPED_TRACE(static_cast<int>(layout));
    SwCase c;
    RectangleMeshSpec spec;
    spec.x1 = spec.y1 = 41000.0;
    spec.nx = spec.ny = 41;
    spec.layout = layout;
    spec.bed = [](double, double) { return -20.0; };
    MakeCase(c, spec, 300.0);
    SetScheme(c.hd, 1, 2);
    const double t_end = 20000.0;
    auto low = [](double x, double y) {
      const double r2 = (x - 20500) * (x - 20500) + (y - 20500) * (y - 20500);
      return 1013.0 - 20.0 * std::exp(-r2 / (7000.0 * 7000.0));
    };
    WindMap(c, dir.file("low" + std::to_string(static_cast<int>(layout)) + ".zrnu"), t_end, low);
    c.hd.forcing.wind.soft_time_interval = 8000.0;
    c.hd.forcing.wind.type_of_soft_start = 2;
    c.hd.bed.type = kBedDragCoefficient;
    c.hd.bed.K.assign(c.hd.state.nelements, 0.005);
    StartCase(c, [](double, double) { return 0.0; });
    RunTo(c, t_end);
    const HdState& st = c.hd.state;
    // The element nearest the centre against the mean of the corner region.
    int centre = 1;
    double best = 1e300, far = 0.0, nfar = 0.0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double x = c.mesh.elements.xc[e] - 20500, y = c.mesh.elements.yc[e] - 20500;
      if (x * x + y * y < best) best = x * x + y * y, centre = e;
      if (std::abs(x) > 17000 && std::abs(y) > 17000) far += st.eta[e], nfar += 1;
    }
    const double rise = st.eta[centre] - far / nfar;
    const double expected = 2000.0 / (kPhysical.rho0 * kPhysical.g);
    EXPECT_NEAR(rise / expected, 1.0, 0.02) << rise;
  }
}

// Basin for the Coriolis cases: 200 km square, 10 m deep, cells of 4 km,
// with a Coriolis parameter f of 1e-2 so that gravity waves from the walls
// (10 m/s) stay far from the middle over a few inertial periods;
// centred on (500 km, 6100 km) of UTM zone 32.
constexpr double kXc = 500000.0, kYc = 6100000.0;
void RotatingBasin(SwCase& c, CellLayout layout, double f, double dt_max) {
  RectangleMeshSpec spec;
  spec.projection = "UTM-32";
  spec.x0 = kXc - 100000.0, spec.x1 = kXc + 100000.0;
  spec.y0 = kYc - 100000.0, spec.y1 = kYc + 100000.0;
  spec.nx = spec.ny = 50;
  spec.layout = layout;
  spec.bed = [](double, double) { return -10.0; };
  MakeCase(c, spec, dt_max);
  SetScheme(c.hd, 1, 2);
  c.hd.forcing.coriolis.type = 1;
  c.hd.forcing.coriolis.coefficient_given = true;
  c.hd.forcing.coriolis.coefficient = f;
}

int CentreElement(const SwCase& c) {
  int best_e = 1;
  double best = 1e300;
  for (int e = 1; e <= c.hd.state.nelements; ++e) {
    const double x = c.mesh.elements.xc[e] - kXc, y = c.mesh.elements.yc[e] - kYc;
    if (x * x + y * y < best) best = x * x + y * y, best_e = e;
  }
  return best_e;
}

// Inertial oscillation: a uniform current turns clockwise (f > 0) with the
// period 2 pi / f and keeps its speed; the walls' disturbance does not reach
// the middle within three periods.
TEST(ForcingCoriolis, InertialOscillationKeepsPeriodAndSpeed) {
  const double f = 1e-2, T = 2.0 * kPi / f, u0 = 0.1;
  for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kMixed}) {
    SCOPED_TRACE(static_cast<int>(layout));
    SwCase c;
    RotatingBasin(c, layout, f, 3.0);
    StartCase(c, [](double, double) { return 0.0; }, [u0](double, double) { return u0; });
    const int e = CentreElement(c);
    const HdState& st = c.hd.state;
    RunTo(c, 0.25 * T);
    EXPECT_NEAR(st.u[e], 0.0, 0.01 * u0);
    EXPECT_NEAR(st.v[e], -u0, 0.01 * u0);
    RunTo(c, 3.0 * T);
    const double speed = std::hypot(st.u[e], st.v[e]);
    EXPECT_NEAR(speed / u0, 1.0, 0.01);
    // The phase left after three periods, as a fraction of three turns.
    const double phase = std::atan2(st.v[e], st.u[e]);
    EXPECT_LT(std::abs(phase) / (3.0 * 2.0 * kPi), 0.005) << phase;
  }
}

// Geostrophic balance: a surface sloping north with the geostrophic current
// f u = -g d(eta)/dy along it stays steady in the middle of the basin.
TEST(ForcingCoriolis, GeostrophicCurrentStaysInBalance) {
  const double f = 1e-2, s = 1e-5, ug = -kPhysical.g * s / f;
  for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kRandomTriangles}) {
    SCOPED_TRACE(static_cast<int>(layout));
    SwCase c;
    RotatingBasin(c, layout, f, 1.0);
    StartCase(c, [s](double, double y) { return s * (y - kYc); }, [ug](double, double) { return ug; });
    RunTo(c, 4.0 * kPi / f);
    // The mean current of the middle 60 km square (the irregular triangles
    // give each element its own small deviation).
    const HdState& st = c.hd.state;
    double u = 0.0, v = 0.0, n = 0.0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double x = c.mesh.elements.xc[e] - kXc, y = c.mesh.elements.yc[e] - kYc;
      if (std::abs(x) > 30000.0 || std::abs(y) > 30000.0) continue;
      u += st.u[e], v += st.v[e], n += 1.0;
    }
    EXPECT_NEAR(u / n / ug, 1.0, 0.02) << u / n;
    EXPECT_LT(std::abs(v / n), 0.02 * std::abs(ug)) << v / n;
  }
}

}  // namespace
}  // namespace vhd::test

namespace vhd::test {
namespace {

// A closed basin forced only by the tidal potential of one semi-diurnal
// constituent: 2 degrees of longitude on the equator, 1000 m deep, so that
// its gravest seiche (about 75 min) is far shorter than the constituent's
// 12.42 h and the surface follows the equilibrium tide quasi-statically. The
// east-west difference of the surface, fitted at the constituent's frequency
// over its second and third periods, has the amplitude and phase of that of
// the equilibrium tide (minus its basin mean, which a closed basin cannot
// follow).
TEST(ForcingTidePotential, ClosedBasinRespondsAtTheConstituentsPeriod) {
  constexpr double kRad = kPi / 180.0;
  SwCase c;
  RectangleMeshSpec spec;
  spec.x0 = 0.0, spec.x1 = 2.0 * kRad;
  spec.y0 = -1.0 * kRad, spec.y1 = 1.0 * kRad;
  spec.nx = spec.ny = 16;
  spec.layout = CellLayout::kMixed;
  spec.projection = "LONG/LAT";
  spec.bed = [](double, double) { return -1000.0; };
  MakeCase(c, spec, 600.0);
  SetScheme(c.hd, 1, 2);
  HdTidalPotential& tp = c.hd.forcing.tide;
  tp.type = 1;
  TidalConstituent m2;
  m2.species = 2;
  m2.amplitude = 0.24;
  m2.period = 12.42 * 3600.0;
  tp.constituents = {m2};
  StartCase(c, [](double, double) { return 0.0; });
  const HdState& st = c.hd.state;
  const double w = 2.0 * kPi / m2.period;
  // East minus west mean of a field over the outer columns of elements.
  auto difference = [&](const Array1<double>& q) {
    double east = 0, west = 0, ne = 0, nw = 0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double x = c.mesh.elements.xc[e];
      if (x > 1.8 * kRad) east += q[e], ne += 1;
      if (x < 0.2 * kRad) west += q[e], nw += 1;
    }
    return east / ne - west / nw;
  };
  // Least squares of a cos(wt) + b sin(wt) + m for the surface and for the
  // equilibrium tide.
  double S[3][3] = {}, r[2][3] = {};
  for (int k = 1; k <= static_cast<int>(3 * m2.period / 600.0); ++k) {
    RunTo(c, k * 600.0);
    if (c.t < m2.period) continue;
    const double base[3] = {std::cos(w * c.t), std::sin(w * c.t), 1.0};
    const double y[2] = {difference(st.eta), difference(tp.eta_eq)};
    for (int i = 0; i < 3; ++i) {
      for (int j = 0; j < 3; ++j) S[i][j] += base[i] * base[j];
      for (int m = 0; m < 2; ++m) r[m][i] += base[i] * y[m];
    }
  }
  ASSERT_GE(c.run_status, 0);
  double amp[2], phase[2];
  for (int m = 0; m < 2; ++m) {
    // Cramer's rule on the 3 x 3 normal equations.
    auto det = [](double A[3][3]) {
      return A[0][0] * (A[1][1] * A[2][2] - A[1][2] * A[2][1]) - A[0][1] * (A[1][0] * A[2][2] - A[1][2] * A[2][0]) +
             A[0][2] * (A[1][0] * A[2][1] - A[1][1] * A[2][0]);
    };
    double coef[3];
    for (int i = 0; i < 3; ++i) {
      double A[3][3];
      for (int a = 0; a < 3; ++a)
        for (int b = 0; b < 3; ++b) A[a][b] = b == i ? r[m][a] : S[a][b];
      coef[i] = det(A) / det(S);
    }
    amp[m] = std::hypot(coef[0], coef[1]);
    phase[m] = std::atan2(coef[1], coef[0]);
  }
  EXPECT_GT(amp[1], 1e-3);
  EXPECT_NEAR(amp[0] / amp[1], 1.0, 0.05) << amp[0] << " " << amp[1];
  EXPECT_NEAR(std::remainder(phase[0] - phase[1], 2.0 * kPi), 0.0, 0.05);
}

}  // namespace
}  // namespace vhd::test

namespace vhd::test {
namespace {

// Wind, air pressure and Coriolis over a sloping beach give the same bits on
// one and two threads.
TEST(ForcingThreads, SameBitsOnOneAndTwoThreads) {
  auto run = [](int threads) {
    auto c = std::make_unique<SwCase>();
    RectangleMeshSpec spec;
    spec.projection = "UTM-32";
    spec.x0 = 500000.0, spec.x1 = 502000.0;
    spec.y0 = 6000000.0, spec.y1 = 6001000.0;
    spec.nx = 12, spec.ny = 6;
    spec.layout = CellLayout::kMixed;
    spec.jitter = 0.2;
    spec.bed = [](double x, double) { return -2.0 + 3.0 * (x - 500000.0) / 2000.0; };
    MakeCase(*c, spec, 30.0);
    SetScheme(c->hd, 1, 2);
    SetFloodDry(c->hd, 0.005, 0.05, 0.1);
    HdWindForcing& w = c->hd.forcing.wind;
    w.type = 1;
    w.format = 3;
    InitDataSpec(w.data, 3, {995.0, 15.0, -8.0});
    w.data.type_of_soft_start = kSoftStartNone;
    w.soft_time_interval = 200.0;
    c->hd.forcing.coriolis.type = 2;
    StartCase(*c, [](double, double) { return 0.0; });
    OmpSetThreads(threads);
    RunTo(*c, 300.0);
    OmpSetThreads(1);
    return c;
  };
  const auto a = run(1), b = run(2);
  const HdState &sa = a->hd.state, &sb = b->hd.state;
  int moving = 0;
  for (int e = 1; e <= sa.nelements; ++e) {
    ASSERT_EQ(sa.eta[e], sb.eta[e]) << e;
    ASSERT_EQ(sa.P[e], sb.P[e]) << e;
    ASSERT_EQ(sa.Q[e], sb.Q[e]) << e;
    moving += sa.P[e] != 0.0 ? 1 : 0;
  }
  EXPECT_GT(moving, 0);
}

}  // namespace
}  // namespace vhd::test
