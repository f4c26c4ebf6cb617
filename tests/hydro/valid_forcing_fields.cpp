// Depth correction, ice cover and wave radiation stress against physical
// solutions: lakes at rest stay at rest, a raised bed moves the surface to
// eta + k = constant with the volume kept, flow under ice follows the
// combined bed and ice drag, ice below the cut-off leaves the flow alone,
// and a radiation-stress gradient sets up the surface.

#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <memory>
#include <string>

#include "io/units.hpp"
#include "io/zrn.hpp"
#include "mesh/femdata.hpp"
#include "bound_support.hpp"
#include "sw_case.hpp"
#include "test_support.hpp"

namespace vhd::test {
namespace {

constexpr double g = 9.81;

// File name stem + n + ".zrnu".
std::string MapName(const char* stem, int n) {
  std::string name(stem);
  name += std::to_string(n);
  name += ".zrnu";
  return name;
}

// A map file on the case's mesh with nitems element items and steps at
// times[0], times[1], ... (seconds from the case's start, 2004-01-01):
// value(item, step, x, y). The case's time axis is set to end at the last
// step, and the input definition is opened on the elements with the items
// 1 .. nitems.
void ElementMap(SwCase& c, DataSpec& spec, const std::string& path, int nitems, const std::vector<double>& times,
                const std::function<double(int, int, double, double)>& value) {
  const Mesh& mesh = c.mesh;
  const int ne = mesh.elements.nelements;
  // The mesh's tables may hold room beyond its last node and element.
  const int nn = mesh.nodes.nnodes;
  const int nlist = mesh.elements.node_start[ne + 1] - 1;
  ZrnMeshData m;
  for (Array1<double>* a : {&m.x, &m.y, &m.z}) a->assign(nn);
  m.node_id.assign(nn);
  m.node_code.assign(nn);
  for (int n = 1; n <= nn; ++n) {
    m.x[n] = mesh.nodes.x[n], m.y[n] = mesh.nodes.y[n], m.z[n] = mesh.nodes.z[n];
    m.node_id[n] = mesh.nodes.id[n], m.node_code[n] = mesh.nodes.code[n];
  }
  m.element_id.assign(ne);
  m.element_type.assign(ne);
  m.node_start.assign(ne + 1);
  m.node_list.assign(nlist);
  for (int e = 1; e <= ne; ++e) m.element_id[e] = mesh.elements.id[e], m.element_type[e] = mesh.elements.type[e];
  for (int e = 1; e <= ne + 1; ++e) m.node_start[e] = mesh.elements.node_start[e];
  for (int j = 1; j <= nlist; ++j) m.node_list[j] = mesh.elements.node_list[j];
  ZrnFile w;
  zrnHeaderCreate(w, path, kZrnFileMesh2D, "forcing map");
  zrnSetMesh(w, m);
  zrnSetEqCalendarAxis(w, zrnDateTime({2004, 1, 1, 0, 0, 0}), times.size() > 1 ? times[1] - times[0] : 1.0);
  for (int k = 1; k <= nitems; ++k) {
    zrnSetItemInfo(w, k, "Item " + std::to_string(k), kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble);
    zrnSetItemAxisEqD4(w, k, kZrnLocationFace, ne);
  }
  zrnFileCreate(w);
  Array1<double> data(ne);
  for (std::size_t step = 0; step < times.size(); ++step) {
    for (int k = 1; k <= nitems; ++k) {
      for (int e = 1; e <= ne; ++e) {
        data[e] = value(k, static_cast<int>(step), mesh.elements.xc[e], mesh.elements.yc[e]);
      }
      zrnWriteItemTimeStep(w, times[step], data.begin(), ne);
    }
  }
  zrnFileClose(w);
  zrnHeaderDestroy(w);
  c.hd.time_axis.dt = times.back();
  c.hd.time_axis.last_step = 1;
  const int soft = spec.type_of_soft_start;
  const double interval = spec.soft_time_interval;
  InitDataSpec(spec, nitems);
  spec.format = kDataFileMap;
  spec.file_name = path;
  spec.type_of_soft_start = soft;
  spec.soft_time_interval = interval;
  FemDataRequest request;
  request.expect = FemDataExpect::kArea;
  request.location = FemDataLocation::kElements;
  request.mesh = &c.mesh;
  FemDataOpen(spec, request, c.hd.time_axis);
}

// 1 km square, 16 x 16 cells, a steep bump that rises 2 m above the datum
// from a bed 2 m deep, water 1 cm above the datum: the lake-at-rest case.
void LakeWithBump(SwCase& c, CellLayout layout, int order) {
  RectangleMeshSpec spec;
  spec.x1 = spec.y1 = 1000.0;
  spec.nx = spec.ny = 16;
  spec.layout = layout;
  spec.jitter = 0.2;
  spec.bed = [](double x, double y) {
    const double r2 = (x - 500) * (x - 500) + (y - 500) * (y - 500);
    return -2.0 + 4.0 * std::exp(-r2 / 40000.0);
  };
  MakeCase(c, spec, 20.0);
  SetScheme(c.hd, 1, order);
  SetFloodDry(c.hd, 0.005, 0.05, 0.1);
}

// Largest |P|, |Q| and |eta - eta0| over the elements with water.
double LargestMotion(const SwCase& c, double eta0) {
  const HdState& st = c.hd.state;
  double worst = 0.0;
  for (int e = 1; e <= st.nelements; ++e) {
    if (st.h[e] > 0) worst = std::max({worst, std::abs(st.P[e]), std::abs(st.Q[e]), std::abs(st.eta[e] - eta0)});
  }
  return worst;
}

struct LayoutOrder {
  CellLayout layout;
  int order;
};
constexpr LayoutOrder kLayouts[] = {{CellLayout::kRandomTriangles, 1}, {CellLayout::kQuadrilaterals, 2},
                                    {CellLayout::kMixed, 1},           {CellLayout::kMixed, 2},
                                    {CellLayout::kRandomTriangles, 2}, {CellLayout::kQuadrilaterals, 1}};

// A depth correction uniform in space and rising in time (0 to 0.5 m) over a
// lake at rest with a steep emerged bump: nothing moves, on triangles,
// quadrilaterals and mixed meshes, first and second order.
TEST(DepthCorrection, UniformRiseKeepsTheLakeAtRest) {
  TempDir dir;
  int n = 0;
  for (const LayoutOrder& lo : kLayouts) {
    SCOPED_TRACE(testing::Message() << "layout " << static_cast<int>(lo.layout) << " order " << lo.order);
    SwCase c;
    LakeWithBump(c, lo.layout, lo.order);
    HdDepthCorrection& dc = c.hd.forcing.depth;
    dc.type = 1;
    ElementMap(c, dc.data, dir.file(MapName("k", n++)), 1, {0.0, 2000.0},
               [](int, int step, double, double) { return 0.5 * step; });
    StartCase(c, [](double, double) { return 0.01; });
    RunTo(c, 2000.0);
    EXPECT_EQ(c.solver.depth_correction[1], 0.5);
    EXPECT_LT(LargestMotion(c, 0.01), 1e-12);
  }
}

// A bump of the bed correction k (0.3 m high, 1.5 km wide) raised slowly in a
// closed basin 10 km long and 4 to 5 m deep: the water settles with eta + k
// uniform, at the level the volume gives, sum A (c - (d - k)) = V, and the
// volume does not change; at first and second order (whose reconstruction
// takes the gradient of eta + k: with that of eta the surface stayed 2.5 %
// of the bump off on triangles).
TEST(DepthCorrection, SurfaceSettlesAtTheLevelOfTheCorrectedBed) {
  TempDir dir;
  int n = 0;
  for (const LayoutOrder& lo : kLayouts) {
    SCOPED_TRACE(testing::Message() << "layout " << static_cast<int>(lo.layout) << " order " << lo.order);
    SwCase c;
    RectangleMeshSpec spec;
    spec.x1 = 10000.0;
    spec.y1 = 1000.0;
    spec.nx = 50;
    spec.ny = 5;
    spec.layout = lo.layout;
    spec.bed = [](double x, double) { return -5.0 + 1e-4 * x; };
    MakeCase(c, spec, 600.0);
    SetScheme(c.hd, 1, lo.order);
    c.hd.bed.type = kBedDragCoefficient;
    c.hd.bed.K.assign(c.hd.state.nelements, 0.01);
    HdDepthCorrection& dc = c.hd.forcing.depth;
    dc.type = 1;
    auto k = [](double x) { return 0.3 * std::exp(-(x - 6000.0) * (x - 6000.0) / (1500.0 * 1500.0)); };
    ElementMap(c, dc.data, dir.file(MapName("bump", n++)), 1, {0.0, 12000.0, 24000.0},
               [&](int, int step, double x, double) { return step == 0 ? 0.0 : k(x); });
    StartCase(c, [](double, double) { return 0.0; });
    const double v0 = Volume(c);
    RunTo(c, 24000.0);
    EXPECT_NEAR(Volume(c) / v0, 1.0, 1e-13);
    const HdState& st = c.hd.state;
    double area = 0.0, sum = 0.0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double a = c.mesh.elements.area[e];
      area += a;
      sum += a * (st.d[e] - c.solver.depth_correction[e]);
    }
    const double level = (v0 - sum) / area;
    double worst = 0.0;
    for (int e = 1; e <= st.nelements; ++e) {
      worst = std::max(worst, std::abs(st.eta[e] + c.solver.depth_correction[e] - level));
    }
    // Within 0.2 % of the bump's height (what is left of the seiches).
    EXPECT_LT(worst, 6e-4) << "level " << level;
  }
}

// Uniform flow down a channel under full ice cover relaxes towards the
// normal velocity of the combined drag: du/dt = g S0 - (K + K_s) u^2 /
// h^(4/3), with K = g / M^2 of the bed's Manning number and K_s = g / M_s^2
// of the ice roughness height (M_s = 25.4 / k_s^(1/6)); from rest
// u = u_n tanh(g S0 t / u_n), u_n = (g S0 h^(4/3) / (K + K_s))^(1/2). The
// middle reach of a long closed channel follows it.
TEST(IceCover, ChannelFlowFollowsTheBedAndIceDrag) {
  constexpr double kSlope = 1e-3, kManning = 32.0, kDepth = 0.5, kKs = 0.02;
  const double K = g / (kManning * kManning);
  const double Ms = 25.4 / std::pow(kKs, 1.0 / 6.0);
  const double Ks = g / (Ms * Ms);
  const double un = std::sqrt(g * kSlope * std::pow(kDepth, 4.0 / 3.0) / (K + Ks));
  const double un_bed = std::sqrt(g * kSlope * std::pow(kDepth, 4.0 / 3.0) / K);
  for (int type : {2, 1}) {
    SCOPED_TRACE(type);
    SwCase c;
    RectangleMeshSpec spec;
    spec.x1 = 3000.0, spec.y1 = 30.0;
    spec.nx = 300, spec.ny = 3;
    spec.layout = CellLayout::kMixed;
    spec.bed = [&](double x, double) { return -kSlope * x; };
    MakeCase(c, spec, 10.0);
    SetScheme(c.hd, 1, 2);
    HdModule& hd = c.hd;
    hd.bed.type = kBedManning;
    hd.bed.K.assign(hd.state.nelements, K);
    // Thickness 0.3 m (type 2), or a concentration of 1 (type 1): covered.
    HdIce& ice = hd.forcing.ice;
    ice.type = type;
    InitDataSpec(ice.data, 1, {type == 2 ? 0.3 : 1.0});
    ice.roughness.values.assign(hd.state.nelements, kKs);
    StartCase(c, [&](double x, double) { return kDepth - kSlope * x; });
    const double t_end = 2.0 * un / (g * kSlope);
    RunTo(c, t_end);
    const double ue = un * std::tanh(g * kSlope * t_end / un);
    const HdState& st = hd.state;
    double area = 0.0, u = 0.0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double x = c.mesh.elements.xc[e];
      if (x < 1200.0 || x > 1800.0) continue;
      area += c.mesh.elements.area[e];
      u += st.u[e] * c.mesh.elements.area[e];
    }
    EXPECT_NEAR(u / area / ue, 1.0, 2e-3) << "u_n with ice " << un << ", bed only " << un_bed;
  }
}

// Wind over a small basin with a sloping beach, with ice of the given type
// and constant concentration (or none: type 0).
std::unique_ptr<SwCase> WindyBasin(int ice_type, double concentration, double wind_speed) {
  auto c = std::make_unique<SwCase>();
  RectangleMeshSpec spec;
  spec.x1 = 2000.0, spec.y1 = 1000.0;
  spec.nx = 12, spec.ny = 6;
  spec.layout = CellLayout::kMixed;
  spec.jitter = 0.2;
  spec.bed = [](double x, double) { return -2.0 + 3.0 * x / 2000.0; };
  MakeCase(*c, spec, 30.0);
  SetScheme(c->hd, 1, 2);
  SetFloodDry(c->hd, 0.005, 0.05, 0.1);
  HdWindForcing& w = c->hd.forcing.wind;
  w.type = wind_speed > 0.0 ? 1 : 0;
  w.format = 0;
  w.constant_speed = wind_speed;
  w.constant_direction = 240.0;
  HdIce& ice = c->hd.forcing.ice;
  ice.type = ice_type;
  ice.c_cut_off_lower = 0.5;
  InitDataSpec(ice.data, ice_type == 3 ? 2 : 1, {concentration, 0.0});
  ice.roughness.values.assign(c->hd.state.nelements, 0.0);
  StartCase(*c, [](double, double) { return 0.0; });
  RunTo(*c, 600.0);
  return c;
}

void ExpectSameState(const SwCase& a, const SwCase& b) {
  for (int e = 1; e <= a.hd.state.nelements; ++e) {
    ASSERT_EQ(a.hd.state.h[e], b.hd.state.h[e]) << e;
    ASSERT_EQ(a.hd.state.P[e], b.hd.state.P[e]) << e;
    ASSERT_EQ(a.hd.state.Q[e], b.hd.state.Q[e]) << e;
  }
}

// Ice at or below the lower cut-off leaves the wind and the flow as without
// ice, to the bit; ice above the upper cut-off takes the wind away
// entirely (a type-3 cover without thickness has no surface drag).
TEST(IceCover, ConcentrationCutOffs) {
  const auto open = WindyBasin(0, 0.0, 15.0);
  const auto thin = WindyBasin(1, 0.5, 15.0);
  ExpectSameState(*open, *thin);
  const auto calm = WindyBasin(0, 0.0, 0.0);
  const auto closed = WindyBasin(3, 0.95, 15.0);
  ExpectSameState(*calm, *closed);
  double moving = 0.0;
  for (int e = 1; e <= open->hd.state.nelements; ++e) moving = std::max(moving, std::abs(open->hd.state.P[e]));
  EXPECT_GT(moving, 1e-4);
}

// Between the cut-offs the wind components are scaled by
// sqrt(1 - (c - c_l) / (c_u - c_l)): half way, by sqrt(1/2), and the stress
// follows the friction law at the reduced speed.
TEST(IceCover, WindBetweenTheCutOffs) {
  EXPECT_EQ(IceWindFactor(0.5, 0.5, 0.9), 1.0);
  EXPECT_EQ(IceWindFactor(0.91, 0.5, 0.9), 0.0);
  EXPECT_NEAR(IceWindFactor(0.7, 0.5, 0.9), std::sqrt(0.5), 1e-15);
  const auto c = WindyBasin(1, 0.7, 20.0);
  const double W = 20.0 * std::sqrt(0.5);
  const double stress = (0.0016 + 0.001 * W / 24.0) / 800.0 * W * W;
  const BoundaryForcingFields& ff = c->hd.boundary.forcing;
  EXPECT_NEAR(std::hypot(ff.wind_x[3], ff.wind_y[3]), stress, 1e-15);
}

// Closed basin for the radiation stress: 10 km by 800 m, 5 m deep.
void WaveBasin(SwCase& c, CellLayout layout) {
  RectangleMeshSpec spec;
  spec.x1 = 10000.0;
  spec.y1 = 800.0;
  spec.nx = 50;
  spec.ny = 4;
  spec.layout = layout;
  spec.bed = [](double, double) { return -5.0; };
  MakeCase(c, spec, 600.0);
  SetScheme(c.hd, 1, 2);
  c.hd.bed.type = kBedDragCoefficient;
  c.hd.bed.K.assign(c.hd.state.nelements, 0.01);
}

// Uniform radiation stresses give no force, to the bit, and a lake at rest
// over a steep emerged bump stays at rest.
TEST(RadiationStress, UniformStressesGiveNoForce) {
  TempDir dir;
  int n = 0;
  for (const LayoutOrder& lo : kLayouts) {
    SCOPED_TRACE(testing::Message() << "layout " << static_cast<int>(lo.layout) << " order " << lo.order);
    SwCase c;
    LakeWithBump(c, lo.layout, lo.order);
    HdRadiationStress& rs = c.hd.forcing.radiation;
    rs.type = 1;
    ElementMap(c, rs.data, dir.file(MapName("s", n++)), 3, {0.0, 1000.0},
               [](int k, int, double, double) { return k == 2 ? -350.0 : 1200.0; });
    StartCase(c, [](double, double) { return 0.01; });
    RunTo(c, 1000.0);
    const BoundaryForcingFields& ff = c.hd.boundary.forcing;
    for (int e = 1; e <= c.hd.state.nelements; ++e) {
      ASSERT_EQ(ff.radiation_x[e], 0.0) << e;
      ASSERT_EQ(ff.radiation_y[e], 0.0) << e;
    }
    EXPECT_LT(LargestMotion(c, 0.01), 1e-12);
  }
}

// A linear Sxx falling along a closed basin sets the surface up against it:
// the steady slope is -(dSxx/dx) / (rho0 g h); the same force given as
// components (type 3) does the same.
TEST(RadiationStress, LinearGradientSetsUpTheSurface) {
  TempDir dir;
  const double gradient = -0.1;  // dSxx/dx (N/m2)
  const double slope = -gradient / (kPhysical.rho0 * g * 5.0);
  int n = 0;
  for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kMixed, CellLayout::kRandomTriangles}) {
    for (int type : {1, 3}) {
      SCOPED_TRACE(testing::Message() << "layout " << static_cast<int>(layout) << " type " << type);
      SwCase c;
      WaveBasin(c, layout);
      HdRadiationStress& rs = c.hd.forcing.radiation;
      rs.type = type;
      rs.data.type_of_soft_start = kSoftStartSine;
      rs.data.soft_time_interval = 12000.0;
      ElementMap(c, rs.data, dir.file(MapName("g", n++)), type == 1 ? 3 : 2, {0.0, 30000.0},
                 [&](int k, int, double x, double) {
                   if (type == 3) return k == 1 ? -gradient : 0.0;
                   return k == 1 ? 1000.0 + gradient * x : k == 2 ? 50.0 : 400.0;
                 });
      StartCase(c, [](double, double) { return 0.0; });
      RunTo(c, 30000.0);
      const HdState& st = c.hd.state;
      double m = 0, sx = 0, sy = 0, sxx = 0, sxy = 0;
      for (int e = 1; e <= st.nelements; ++e) {
        const double x = c.mesh.elements.xc[e];
        if (x < 1000.0 || x > 9000.0) continue;
        m += 1, sx += x, sy += st.eta[e], sxx += x * x, sxy += x * st.eta[e];
      }
      const double fitted = (m * sxy - sx * sy) / (m * sxx - sx * sx);
      EXPECT_NEAR(fitted / slope, 1.0, 0.02) << fitted << " " << slope;
    }
  }
}

// A basin 2 km by 4 km, 10 m deep, open to the west through a level
// boundary held at the datum, under a uniform radiation-stress force along
// the boundary (north, F = rho0 g h s). With the boundary's radiation
// correction the level along the boundary tilts with the force and the
// water settles nearly at rest with the slope s; without it the flat
// boundary level drives a circulation through the boundary (mean speed
// 0.07 m/s after 4000 s, against 4e-4 m/s with it after 24000 s).
TEST(RadiationStress, LevelBoundaryTiltsWithTheForce) {
  const double s = 1e-5;
  double mean_speed[2] = {0.0, 0.0};
  for (int correction : {1, 0}) {
    SCOPED_TRACE(correction);
    BoundCase b;
    RectangleMeshSpec spec = Channel(10, 20, 200.0, 200.0, Flat(10.0), 2, 1);
    spec.layout = CellLayout::kMixed;
    b.Make(spec, 600.0, 40,
           CodeSection(2, "type = 6\nconstant_value = 0.0\ntype_of_soft_start = 0\n"
                          "type_of_radiation_stress_correction = " + std::to_string(correction) + "\n"));
    SwCase& c = b.c;
    SetScheme(c.hd, 1, 2);
    c.hd.bed.type = kBedDragCoefficient;
    c.hd.bed.K.assign(c.hd.state.nelements, 0.003);
    HdRadiationStress& rs = c.hd.forcing.radiation;
    rs.type = 3;
    rs.data.type_of_soft_start = kSoftStartSine;
    rs.data.soft_time_interval = 6000.0;
    ElementMap(c, rs.data, b.dir.file("force.zrnu"), 2, {0.0, 24000.0},
               [&](int k, int, double, double) { return k == 2 ? kPhysical.rho0 * g * 10.0 * s : 0.0; });
    b.Start([](double, double) { return 0.0; });
    RunTo(c, correction == 1 ? 24000.0 : 4000.0);
    ASSERT_EQ(c.run_status, 0);
    const HdState& st = c.hd.state;
    double m = 0, sy = 0, se = 0, syy = 0, sye = 0;
    for (int e = 1; e <= st.nelements; ++e) {
      const double y = c.mesh.elements.yc[e];
      mean_speed[correction] += std::hypot(st.u[e], st.v[e]) / st.nelements;
      m += 1, sy += y, se += st.eta[e], syy += y * y, sye += y * st.eta[e];
    }
    if (correction == 1) {
      const double fitted = (m * sye - sy * se) / (m * syy - sy * sy);
      EXPECT_NEAR(fitted / s, 1.0, 0.02) << fitted;
    }
  }
  EXPECT_LT(mean_speed[1], 1e-3);
  EXPECT_GT(mean_speed[0], 50.0 * mean_speed[1]) << mean_speed[0] << " " << mean_speed[1];
}

// Depth correction, ice and radiation stress over a sloping beach give the
// same bits on one and two threads.
TEST(ForcingFieldsThreads, SameBitsOnOneAndTwoThreads) {
  TempDir dir;
  auto run = [&](int threads) {
    auto c = std::make_unique<SwCase>();
    RectangleMeshSpec spec;
    spec.x1 = 2000.0, spec.y1 = 1000.0;
    spec.nx = 12, spec.ny = 6;
    spec.layout = CellLayout::kMixed;
    spec.jitter = 0.2;
    spec.bed = [](double x, double) { return -2.0 + 3.0 * x / 2000.0; };
    MakeCase(*c, spec, 30.0);
    SetScheme(c->hd, 1, 2);
    SetFloodDry(c->hd, 0.005, 0.05, 0.1);
    c->hd.bed.type = kBedManning;
    c->hd.bed.K.assign(c->hd.state.nelements, 0.01);
    HdWindForcing& w = c->hd.forcing.wind;
    w.type = 1, w.format = 0, w.constant_speed = 15.0, w.constant_direction = 250.0;
    HdIce& ice = c->hd.forcing.ice;
    ice.type = 3;
    ice.c_cut_off_lower = 0.5;
    InitDataSpec(ice.data, 2, {0.7, 0.2});
    ice.roughness.values.assign(c->hd.state.nelements, 0.05);
    HdDepthCorrection& dc = c->hd.forcing.depth;
    dc.type = 1;
    ElementMap(*c, dc.data, dir.file(MapName("k", threads)), 1, {0.0, 300.0},
               [](int, int step, double x, double y) { return 0.1 * step * std::sin(x / 300.0 + y / 200.0); });
    HdRadiationStress& rs = c->hd.forcing.radiation;
    rs.type = 1;
    ElementMap(*c, rs.data, dir.file(MapName("s", threads)), 3, {0.0, 300.0},
               [](int k, int, double x, double y) { return k * 100.0 * std::cos(x / 500.0 - y / 400.0); });
    StartCase(*c, [](double, double) { return 0.0; });
    OmpSetThreads(threads);
    RunTo(*c, 300.0);
    OmpSetThreads(1);
    return c;
  };
  const auto a = run(1), b = run(2);
  ExpectSameState(*a, *b);
  int moving = 0;
  for (int e = 1; e <= a->hd.state.nelements; ++e) moving += a->hd.state.P[e] != 0.0 ? 1 : 0;
  EXPECT_GT(moving, 0);
}

}  // namespace
}  // namespace vhd::test
