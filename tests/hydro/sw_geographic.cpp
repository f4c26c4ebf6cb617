// Shallow-water flow on a "LONG/LAT" mesh: the face geometry on the sphere,
// a lake at rest, a long wave along a parallel and a basin run on the sphere
// and in UTM.

#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <vector>

#include "bound_support.hpp"
#include "mesh/cartography.hpp"
#include "sw_case.hpp"

namespace vhd::test {
namespace {

constexpr double kR = kMeshEarthRadius;
constexpr double kRad = kDegToRad;

// The rectangle [lon0, lon1] x [lat0, lat1] (degrees) as a "LONG/LAT" mesh
// spec in radians; bed(lon, lat) in degrees.
RectangleMeshSpec GeoSpec(double lon0, double lon1, double lat0, double lat1, int nx, int ny, CellLayout layout,
                          const std::function<double(double, double)>& bed) {
  RectangleMeshSpec spec;
  spec.x0 = lon0 * kRad, spec.x1 = lon1 * kRad;
  spec.y0 = lat0 * kRad, spec.y1 = lat1 * kRad;
  spec.nx = nx, spec.ny = ny;
  spec.layout = layout;
  spec.projection = "LONG/LAT";
  if (bed) spec.bed = [bed](double x, double y) { return bed(x / kRad, y / kRad); };
  return spec;
}

// Great-circle distance (m) between two points given in radians.
double GreatCircle(double lon1, double lat1, double lon2, double lat2) {
  const double a = std::pow(std::sin(0.5 * (lat2 - lat1)), 2) +
                   std::cos(lat1) * std::cos(lat2) * std::pow(std::sin(0.5 * (lon2 - lon1)), 2);
  return 2.0 * kR * std::asin(std::sqrt(a));
}

// Element whose centroid is nearest to (lon, lat) in radians.
int NearestElement(const Mesh& mesh, double lon, double lat) {
  int best = 1;
  double dmin = 1e300;
  for (int e = 1; e <= mesh.elements.nelements; ++e) {
    const double d = GreatCircle(lon, lat, mesh.elements.xc[e], mesh.elements.yc[e]);
    if (d < dmin) dmin = d, best = e;
  }
  return best;
}

// The face geometry that the fluxes see is the sphere's: the faces of a cell
// are as long as the great circles between their nodes (to the cell size
// squared), the cell's area is R^2 (sin lat1 - sin lat0) dlon, and the
// outward normals of a cell, times their lengths, add up to the difference
// of the lengths of its northern and southern sides.
TEST(SwGeographic, FaceGeometryIsTheSpheres) {
  Mesh mesh;
  GenerateRectangleMesh(GeoSpec(10.0, 11.0, 59.5, 60.5, 10, 10, CellLayout::kQuadrilaterals, {}), mesh);
  SetupMeshGeometry(mesh);
  double worst_length = 0.0, worst_area = 0.0;
  for (int f = 1; f <= mesh.faces.nfaces; ++f) {
    const int a = FaceNode(mesh.faces, f, 1), b = FaceNode(mesh.faces, f, 2);
    const double gc = GreatCircle(mesh.nodes.x[a], mesh.nodes.y[a], mesh.nodes.x[b], mesh.nodes.y[b]);
    worst_length = std::max(worst_length, std::abs(FaceLengthMetres(mesh, f) / gc - 1.0));
  }
  for (int e = 1; e <= mesh.elements.nelements; ++e) {
    double lat0 = 1e9, lat1 = -1e9;
    for (int j = 1; j <= 4; ++j) {
      lat0 = std::min(lat0, mesh.nodes.y[ElementNode(mesh.elements, e, j)]);
      lat1 = std::max(lat1, mesh.nodes.y[ElementNode(mesh.elements, e, j)]);
    }
    const double exact = kR * kR * (std::sin(lat1) - std::sin(lat0)) * 0.1 * kRad;
    worst_area = std::max(worst_area, std::abs(ElementAreaMetres(mesh, e) / exact - 1.0));
  }
  EXPECT_LT(worst_length, 1e-4);
  EXPECT_LT(worst_area, 1e-4);

  SwCase c;
  MakeCase(c, GeoSpec(10.0, 11.0, 59.5, 60.5, 10, 10, CellLayout::kQuadrilaterals, [](double, double) { return -10.0; }),
           10.0);
  StartCase(c, [](double, double) { return 0.0; });
  const int e = NearestElement(c.mesh, 10.55 * kRad, 60.05 * kRad);
  const double lat_s = 60.0 * kRad, lat_n = 60.1 * kRad, dlon = 0.1 * kRad;
  EXPECT_NEAR(c.solver.metric_closure_x[e], 0.0, 1e-9 * kR * dlon);
  EXPECT_NEAR(c.solver.metric_closure_y[e], kR * dlon * (std::cos(lat_n) - std::cos(lat_s)), 1e-6 * kR * dlon);
}

// Bed of the lake: 10 m deep with an island whose top stands 6 m above
// datum, in relative coordinates (0..1) of the rectangle.
double IslandBed(double s, double t) {
  const double r2 = (s - 0.5) * (s - 0.5) + (t - 0.5) * (t - 0.5);
  return -10.0 + 16.0 * std::exp(-r2 / 0.03);
}

// A lake at rest two degrees across at latitude 60, with an emerged island
// (dry and flooded shore elements), stays at rest to round-off for every
// solver, first and second order, on triangles, quadrilaterals and mixed
// meshes, at datum and at other levels: on the sphere the face pressures of
// an element do not cancel by themselves.
TEST(SwGeographic, LakeAtRestStaysAtRest) {
  struct Layout {
    CellLayout layout;
    std::vector<int> solvers;
  };
  const Layout layouts[] = {{CellLayout::kRandomTriangles, {0, 1, 2, 3, 4}},
                            {CellLayout::kQuadrilaterals, {1, 3}},
                            {CellLayout::kMixed, {1, 4}}};
  for (const Layout& lay : layouts) {
    for (double level : {0.0, 1.3, -0.7}) {
      for (int order : {1, 2}) {
        for (int solver : lay.solvers) {
          if (solver == 0 && level != 0.0) continue;  // no dissipation: see SwLakeAtRest
          SCOPED_TRACE(testing::Message() << "layout " << static_cast<int>(lay.layout) << " level " << level
                                          << " solver " << solver << " order " << order);
          SwCase c;
          RectangleMeshSpec spec = GeoSpec(10.0, 12.0, 59.0, 61.0, 16, 16, lay.layout,
                                           [](double lon, double lat) { return IslandBed((lon - 10) / 2, (lat - 59) / 2); });
          spec.jitter = 0.2;
          spec.seed = 3;
          MakeCase(c, spec, 100.0);
          SetScheme(c.hd, solver, order);
          if (solver == 4) c.hd.solution.face_average_d = 1;
          SetFloodDry(c.hd, 0.005, 0.05, 0.1);
          StartCase(c, [level](double, double) { return level; });
          const HdState& st = c.hd.state;
          int n_dry = 0, n_wet = 0;
          for (int e = 1; e <= st.nelements; ++e) n_dry += st.wetdry[e] == kDry, n_wet += st.wetdry[e] == kWet;
          ASSERT_GT(n_dry, 0);
          ASSERT_GT(n_wet, 100);

          Array1<double> dhdt, dPdt, dQdt;
          CalcDerivativesOnlySW2D(c.hd, c.solver, c.mesh, &dhdt, &dPdt, &dQdt);
          double dmax = 0.0;
          for (int e = 1; e <= st.nelements; ++e)
            dmax = std::max({dmax, std::abs(dhdt[e]), std::abs(dPdt[e]), std::abs(dQdt[e])});
          EXPECT_LT(dmax, 1e-15);

          RunTo(c, 30 * 3600.0);
          EXPECT_GE(c.hd.n_steps, 1000);
          double umax = 0.0, etamax = 0.0;
          for (int e = 1; e <= st.nelements; ++e) {
            if (st.wetdry[e] == kDry) continue;
            umax = std::max({umax, std::abs(st.u[e]), std::abs(st.v[e])});
            etamax = std::max(etamax, std::abs(st.eta[e] - level));
          }
          EXPECT_LT(umax, 1e-10);
          EXPECT_LT(etamax, 1e-10);
        }
      }
    }
  }
}

// Level boundaries at the lake's level hold a lake at rest on the sphere at
// rest too: their faces are part of each element's unbalanced pressure sum.
TEST(SwGeographic, OpenBoundariesHoldALakeAtRest) {
  const double level = 1.3;
  for (int order : {1, 2}) {
    SCOPED_TRACE(testing::Message() << "order " << order);
    BoundCase b;
    RectangleMeshSpec spec = GeoSpec(10.0, 12.0, 59.0, 61.0, 12, 12, CellLayout::kRandomTriangles,
                                     [](double lon, double) { return -10.0 - 2.0 * (lon - 10.0); });
    spec.code_west = 2, spec.code_east = 3;
    const std::string level_boundary = "type = 6\ntype_of_soft_start = 0\nconstant_value = " + std::to_string(level) + "\n";
    b.Make(spec, 100.0, 400, CodeSection(2, level_boundary) + CodeSection(3, level_boundary));
    SetScheme(b.c.hd, 1, order);
    b.Start([level](double, double) { return level; });
    RunTo(b.c, 400 * 100.0);
    double umax = 0.0;
    for (int e = 1; e <= b.c.hd.state.nelements; ++e)
      umax = std::max({umax, std::abs(b.c.hd.state.u[e]), std::abs(b.c.hd.state.v[e])});
    EXPECT_LT(umax, 1e-10);
  }
}

// Time of the largest value of a sampled series, refined by the parabola
// through the largest sample and its two neighbours.
double PeakTime(const std::vector<double>& t, const std::vector<double>& v) {
  std::size_t k = 1;
  for (std::size_t i = 1; i + 1 < v.size(); ++i)
    if (v[i] > v[k]) k = i;
  const double a = v[k - 1], b = v[k], c = v[k + 1];
  const double shift = 0.5 * (a - c) / (a - 2 * b + c);
  return t[k] + shift * (t[k + 1] - t[k]);
}

// A long wave (a simple wave of 1 cm on 100 m of water) running east along
// a channel at latitude 60 from longitude lon0 to lon0 + 2 passes two gauges
// one degree of longitude apart; returns the time between the two passages
// over the great-circle distance between the gauges over sqrt(g h). The
// node longitudes are stored in [-180, 180), as a mesh file across the
// 180-degree meridian holds them.
double LongWaveTimeRatio(double lon0, CellLayout layout, int order) {
  const double depth = 100.0, c0 = std::sqrt(kPhysical.g * depth);
  SwCase c;
  GenerateRectangleMesh(GeoSpec(lon0, lon0 + 2.0, 59.98, 60.02, 200, 4, layout, [depth](double, double) { return -depth; }),
                        c.mesh);
  for (int n = 1; n <= c.mesh.nodes.nnodes; ++n) c.mesh.nodes.x[n] = std::remainder(c.mesh.nodes.x[n], 360.0 * kRad);
  MakeCaseOnMesh(c, 5.0);
  SetScheme(c.hd, 1, order);
  c.hd.solution.face_value_limiter = 0;  // reconstructed face values as they are
  auto eta0 = [lon0](double lon, double) {
    const double s = std::remainder(lon / kRad - lon0, 360.0);
    return 0.01 * std::exp(-std::pow((s - 0.3) / 0.08, 2));
  };
  StartCase(c, eta0, [&](double lon, double lat) { return eta0(lon, lat) * c0 / depth; });
  const double lat = 60.0 * kRad;
  const int a = NearestElement(c.mesh, (lon0 + 0.5) * kRad, lat), b = NearestElement(c.mesh, (lon0 + 1.5) * kRad, lat);
  std::vector<double> t, eta_a, eta_b;
  while (c.t < 2700.0) {
    RunTo(c, c.t + 5.0);
    t.push_back(c.t);
    eta_a.push_back(c.hd.state.eta[a]);
    eta_b.push_back(c.hd.state.eta[b]);
  }
  const ElementTable& el = c.mesh.elements;
  const double expected = GreatCircle(el.xc[a], el.yc[a], el.xc[b], el.yc[b]) / c0;
  return (PeakTime(t, eta_b) - PeakTime(t, eta_a)) / expected;
}

// The wave crosses its degree of longitude at latitude 60 in the time that
// the great-circle distance gives (half the time at the equator), also
// across the 180-degree meridian.
TEST(SwGeographic, LongWaveCrossesADegreeAtLatitude60InTheGreatCircleTime) {
  for (double lon0 : {0.0, 179.0}) {
    for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kRightTriangles}) {
      for (int order : {1, 2}) {
        SCOPED_TRACE(testing::Message() << "from " << lon0 << " layout " << static_cast<int>(layout) << " order "
                                        << order);
        EXPECT_NEAR(LongWaveTimeRatio(lon0, layout, order), 1.0, 0.01);
      }
    }
  }
}

// Settings of the basin runs: second order HLLC, flooding and drying, a
// constant eddy viscosity of 50 m2/s.
void BasinSettings(SwCase& c) {
  SetScheme(c.hd, 3, 2);
  SetFloodDry(c.hd, 0.005, 0.05, 0.1);
  c.hd.eddy.horizontal.type = kEddyConstant;
  c.hd.eddy.horizontal.value.values.assign(c.hd.state.nelements, 50.0);
  AllocateVelocityGradientsHD(c.hd.state);
}

// A basin of 0.2 x 0.15 degrees at 55 N (13 x 17 km) with a beach along its
// western side, run once on the sphere and once on the same mesh projected
// to UTM zone 32: a hump of 1 m on 10 m of water spreads, reflects and runs up
// the dry beach. The projection and the sphere differ by the UTM scale and
// the ellipsoid (a few tenths of a percent in length), so the depths agree
// to within 1 % of the basin depth, element by element. On the sphere, 1
// and 2 threads give the same bits.
TEST(SwGeographic, BasinOnTheSphereMatchesTheBasinInUtm) {
  const double lon0 = 9.0, lon1 = 9.2, lat0 = 55.0, lat1 = 55.15;
  // Bed: 10 m deep, rising over the western quarter to 2 m above datum.
  auto beach = [&](double lon, double) {
    const double s = (lon - lon0) / (lon1 - lon0);
    return s < 0.25 ? -10.0 + 48.0 * (0.25 - s) : -10.0;
  };
  for (CellLayout layout : {CellLayout::kRandomTriangles, CellLayout::kMixed}) {
    SCOPED_TRACE(testing::Message() << "layout " << static_cast<int>(layout));
    RectangleMeshSpec spec = GeoSpec(lon0, lon1, lat0, lat1, 24, 24, layout, beach);
    spec.jitter = 0.15;
    SwCase geo, utm;
    MakeCase(geo, spec, 10.0);

    // The same nodes and elements in UTM zone 32.
    GenerateRectangleMesh(spec, utm.mesh);
    CTqCartography cart;
    TqCartCreate(cart, "UTM-32");
    for (int n = 1; n <= utm.mesh.nodes.nnodes; ++n) {
      double x, y;
      TqCartGeo2Proj(cart, utm.mesh.nodes.x[n] / kRad, utm.mesh.nodes.y[n] / kRad, x, y);
      utm.mesh.nodes.x[n] = x, utm.mesh.nodes.y[n] = y;
    }
    utm.mesh.projection = "UTM-32";
    MakeCaseOnMesh(utm, 10.0);

    double lon_c = 0.5 * (lon0 + lon1), lat_c = 0.5 * (lat0 + lat1);
    double xc, yc;
    TqCartGeo2Proj(cart, lon_c + 0.04, lat_c, xc, yc);
    const double hump_radius = 2000.0;  // m
    auto hump = [](double r2) { return std::exp(-r2); };
    BasinSettings(geo);
    BasinSettings(utm);
    auto geo_hump = [&](double lon, double lat) {
      const double dx = (lon - (lon_c + 0.04) * kRad) * kR * std::cos(lat), dy = (lat - lat_c * kRad) * kR;
      return hump((dx * dx + dy * dy) / (hump_radius * hump_radius));
    };
    StartCase(geo, geo_hump);
    StartCase(utm, [&](double x, double y) {
      return hump(((x - xc) * (x - xc) + (y - yc) * (y - yc)) / (hump_radius * hump_radius));
    });
    const double v0 = Volume(geo);
    RunTo(geo, 1500.0);
    RunTo(utm, 1500.0);
    EXPECT_NEAR(Volume(geo) / v0, 1.0, 1e-10);
    double worst = 0.0, moved = 0.0;
    int shore = 0;
    for (int e = 1; e <= geo.hd.state.nelements; ++e) {
      worst = std::max(worst, std::abs(geo.hd.state.h[e] - utm.hd.state.h[e]));
      moved = std::max(moved, std::abs(geo.hd.state.eta[e]));
      shore += geo.hd.state.wetdry[e] != kWet;
    }
    EXPECT_GT(shore, 0);
    EXPECT_GT(moved, 0.05);
    EXPECT_LT(worst / 10.0, 0.01) << "largest depth difference " << worst << " m";

    SwCase two;
    MakeCase(two, spec, 10.0);
    BasinSettings(two);
    OmpSetThreads(2);
    StartCase(two, geo_hump);
    RunTo(two, 1500.0);
    OmpSetThreads(1);
    EXPECT_EQ(std::memcmp(two.hd.state.h.begin(), geo.hd.state.h.begin(), geo.hd.state.nelements * sizeof(double)), 0);
  }
}

}  // namespace
}  // namespace vhd::test
