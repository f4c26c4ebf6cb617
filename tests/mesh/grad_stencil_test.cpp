// Gradient stencils: exactness for linear fields, convergence for smooth
// fields, the flags, and the 3D stencil.

#include <gtest/gtest.h>

#include <cmath>
#include <random>
#include <vector>

#include "mesh/gradient.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::Generated;
using test::kLayouts;

constexpr double kA = 5.0, kB = 0.3, kC = -0.7;

Array1<double> LinearField(const Mesh& m, double a, double b, double c) {
  Array1<double> phi(m.elements.nelements);
  for (int e = 1; e <= m.elements.nelements; ++e) phi[e] = a + b * m.elements.xc[e] + c * m.elements.yc[e];
  return phi;
}

// Every stencil type and boundary treatment reproduces a linear field on the
// elements whose faces all have neighbours; the mirrored-centroid treatment
// also on the boundary elements. The velocity variant applies the same rows.
TEST(GradientStencil, LinearFieldExactForEveryStencil) {
  for (const auto& layout : kLayouts) {
    const Mesh m = Generated(layout.layout, 18, 14, 0.2, 11, {{30, 50, 20, 40}});
    const Array1<double> phi = LinearField(m, kA, kB, kC);
    const Array1<double> psi = LinearField(m, -1.0, 2.0, 0.5);
    const int ne = m.elements.nelements;
    for (int type = 1; type <= 3; ++type)
      for (int treatment : {1, 2})
        for (int neighbourhood : {4, 8}) {
          GradientStencil s;
          SetupGradient(m, type, Array1<int>(), Array1<int>(), 2, treatment, neighbourhood, s);
          Array1<double> gx(ne), gy(ne), ux(ne), uy(ne), vx(ne), vy(ne);
          CALCGRADIENTELEMENT2D(s, phi, gx, gy);
          CALCGRADIENTVELOCITYELEMENT2D(s, phi, psi, ux, uy, vx, vy);
          int checked = 0, boundary = 0;
          for (int e = 1; e <= ne; ++e) {
            if (s.nmissing[e] > 0 && treatment != kBoundaryMirror) continue;
            ++checked;
            boundary += s.nmissing[e] > 0;
            const double tol = 1e-10 * std::hypot(kB, kC);
            ASSERT_NEAR(gx[e], kB, tol) << layout.name << " type " << type << " treatment " << treatment
                                        << " neighbourhood " << neighbourhood << " element " << e;
            ASSERT_NEAR(gy[e], kC, tol) << layout.name << " type " << type << " element " << e;
            ASSERT_EQ(ux[e], gx[e]);
            ASSERT_EQ(uy[e], gy[e]);
            ASSERT_NEAR(vx[e], 2.0, 1e-10 * std::hypot(2.0, 0.5));
            ASSERT_NEAR(vy[e], 0.5, 1e-10 * std::hypot(2.0, 0.5));
          }
          EXPECT_GT(checked, ne / 2);
          if (treatment == kBoundaryMirror) {
            EXPECT_GT(boundary, 0);
          }
        }
  }
}

// Without the mirrored-centroid correction, type 1 puts the element's own value
// at the face centre of a wall (a ghost that flattens the gradient there).
TEST(GradientStencil, FaceCentreGhostDampsOnlyTheNormalDerivative) {
  const Mesh m = Generated(CellLayout::kQuadrilaterals, 6, 6, 0.0, 1, {}, 6.0, 6.0);
  GradientStencil s;
  SetupGradient(m, 1, Array1<int>(), Array1<int>(), 2, 1, 4, s);
  const Array1<double> phi = LinearField(m, 0.0, 1.0, 1.0);
  Array1<double> gx(m.elements.nelements), gy(m.elements.nelements);
  CALCGRADIENTELEMENT2D(s, phi, gx, gy);
  // South-west corner cell: two neighbours (east, north) and two walls; the
  // quadrilateral through the four face points sees the walls at the
  // element's own value: the exact gradient halves in both directions.
  EXPECT_NEAR(gx[1], 2.0 / 3.0, 1e-12);
  EXPECT_NEAR(gy[1], 2.0 / 3.0, 1e-12);
  // A cell on the south wall (three neighbours) is least squares over real
  // neighbours only and exact.
  EXPECT_NEAR(gx[3], 1.0, 1e-12);
  EXPECT_NEAR(gy[3], 1.0, 1e-12);
}

// Flags: inactive elements and closed faces never enter a stencil (their
// values may be anything), and the stencil stays exact around them.
TEST(GradientStencil, FlagsExcludeElementsAndFaces) {
  const Mesh m = Generated(CellLayout::kMixed, 20, 16, 0.15, 3);
  const int ne = m.elements.nelements;
  std::mt19937 rng(5);
  std::uniform_real_distribution<double> u(0, 1);
  Array1<int> active(ne, 1), open(m.faces.nfaces, 1);
  for (int e = 1; e <= ne; ++e) active[e] = u(rng) < 0.1 ? 0 : 1;
  for (int f = 1; f <= m.faces.nfaces; ++f) open[f] = u(rng) < 0.05 ? 0 : 1;
  Array1<double> phi = LinearField(m, kA, kB, kC);
  for (int e = 1; e <= ne; ++e)
    if (active[e] != 1) phi[e] = std::nan("");
  for (int type = 1; type <= 3; ++type) {
    GradientStencil s;
    SetupGradient(m, type, active, open, 2, kBoundaryMirror, 4, s);
    Array1<double> gx(ne), gy(ne);
    CALCGRADIENTELEMENT2D(s, phi, gx, gy);
    int exact = 0;
    for (int e = 1; e <= ne; ++e) {
      if (active[e] != 1) {
        EXPECT_EQ(s.start[e + 1], s.start[e]) << "inactive element " << e << " has a row";
        continue;
      }
      ASSERT_TRUE(std::isfinite(gx[e]) && std::isfinite(gy[e])) << "type " << type << " element " << e;
      if (s.nvalid[e] == 0) {
        EXPECT_EQ(gx[e], 0.0);
        EXPECT_EQ(gy[e], 0.0);
      } else if (s.nvalid[e] >= 2) {
        EXPECT_NEAR(gx[e], kB, 1e-9) << "type " << type << " element " << e;
        EXPECT_NEAR(gy[e], kC, 1e-9) << "type " << type << " element " << e;
        ++exact;
      }
    }
    EXPECT_GT(exact, ne / 2);
  }
}

// A smooth field: the gradient error falls at first order or better.
TEST(GradientStencil, SmoothFieldConvergesAtFirstOrderOrBetter) {
  const double k = 2 * M_PI / 100.0;
  auto phi_of = [&](double x, double y) { return std::sin(k * x) * std::cos(0.8 * k * y); };
  for (int type = 1; type <= 3; ++type) {
    double previous = 0;
    for (int level = 0; level < 3; ++level) {
      const int n = 10 << level;
      const Mesh m = Generated(CellLayout::kMixed, n, (n * 4) / 5, 0.2, 21);
      const int ne = m.elements.nelements;
      Array1<double> phi(ne), gx(ne), gy(ne);
      for (int e = 1; e <= ne; ++e) phi[e] = phi_of(m.elements.xc[e], m.elements.yc[e]);
      GradientStencil s;
      SetupGradient(m, type, Array1<int>(), Array1<int>(), 2, kBoundaryMirror, 4, s);
      CALCGRADIENTELEMENT2D(s, phi, gx, gy);
      double sum = 0, area = 0;
      for (int e = 1; e <= ne; ++e) {
        const double x = m.elements.xc[e], y = m.elements.yc[e];
        const double ex = gx[e] - k * std::cos(k * x) * std::cos(0.8 * k * y);
        const double ey = gy[e] + 0.8 * k * std::sin(k * x) * std::sin(0.8 * k * y);
        sum += (ex * ex + ey * ey) * m.elements.area[e];
        area += m.elements.area[e];
      }
      const double error = std::sqrt(sum / area);
      if (level > 0) {
        const double rate = std::log2(previous / error);
        EXPECT_GT(rate, 0.9) << "type " << type << " level " << level;
      }
      previous = error;
    }
  }
}

TEST(GradientStencil, UnknownTypeIsFatal) {
  const Mesh m = Generated(CellLayout::kRightTriangles, 2, 2, 0.0);
  GradientStencil s;
  EXPECT_FATAL(SetupGradient(m, 4, Array1<int>(), Array1<int>(), 2, 1, 4, s),
               "SetupGradient: Gradient type not supported");
}

// The 3D least-squares stencil on a layered mesh over a sloping bed.
TEST(GradientStencil, LinearFieldExactOnLayeredMesh) {
  RectangleMeshSpec spec = test::Rectangle(0, 100, 0, 80, 8, 6, CellLayout::kMixed, 0.15);
  spec.bed = [](double x, double y) { return -10.0 - 0.05 * x - 0.02 * y; };
  const Mesh m3 = test::Layered(spec, 4, -20.0);
  const int ne = m3.elements.nelements;
  Array1<double> phi(ne);
  for (int e = 1; e <= ne; ++e)
    phi[e] = 1.0 + 0.2 * m3.elements.xc[e] - 0.1 * m3.elements.yc[e] + 0.5 * m3.elements.zc[e];
  for (int type = 1; type <= 3; ++type) {
    GradientStencil s;
    SetupGradient(m3, type, Array1<int>(), Array1<int>(), 3, 1, 4, s);
    Array1<double> gx(ne), gy(ne), gz(ne);
    CALCGRADIENTELEMENT3D(s, phi, gx, gy, gz);
    int checked = 0;
    for (int e = 1; e <= ne; ++e) {
      if (s.nvalid[e] < 4) continue;  // needs neighbours above, below and around
      ++checked;
      ASSERT_NEAR(gx[e], 0.2, 1e-10) << "type " << type << " element " << e;
      ASSERT_NEAR(gy[e], -0.1, 1e-10) << "type " << type << " element " << e;
      ASSERT_NEAR(gz[e], 0.5, 1e-10) << "type " << type << " element " << e;
    }
    EXPECT_GT(checked, ne / 4);
  }
}

}  // namespace
}  // namespace vhd
