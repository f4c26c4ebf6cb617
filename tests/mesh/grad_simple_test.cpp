// Green-Gauss ("simple") and node-based gradients.

#include <gtest/gtest.h>

#include <cmath>
#include <vector>

#include "mesh/gradient.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::Generated;
using test::kLayouts;

bool AllNeighbours(const Mesh& m, int e) {
  for (int j = 1; j <= ElementFaceCount(m.elements, e); ++j) {
    const int f = ElementFace(m.elements, e, j);
    if (f == 0 || m.faces.element2[f] == 0) return false;
  }
  return true;
}

// On a regular quadrilateral mesh every face centre lies halfway between the
// two centroids: the distance-weighted face value of a linear field is exact,
// and so is the Green-Gauss gradient of every element with four neighbours.
TEST(GreenGauss, LinearFieldExactOnRegularQuadrilaterals) {
  const Mesh m = Generated(CellLayout::kQuadrilaterals, 12, 9, 0.0);
  const int ne = m.elements.nelements;
  Array1<double> phi(ne), psi(ne);
  for (int e = 1; e <= ne; ++e) {
    phi[e] = 2.0 + 0.3 * m.elements.xc[e] - 0.6 * m.elements.yc[e];
    psi[e] = -0.1 * m.elements.xc[e] + 0.9 * m.elements.yc[e];
  }
  Array1<double> gx(ne), gy(ne), hx(ne), hy(ne), ux(ne), uy(ne), vx(ne), vy(ne);
  CALCGRADIENTSIMPLE2D(m, phi, gx, gy);
  const GradientField fields[2] = {{&phi, &hx, &hy}, {&psi, &vx, &vy}};
  CALCGRADIENTALLSIMPLE2D(m, fields);
  int interior = 0;
  for (int e = 1; e <= ne; ++e) {
    ASSERT_EQ(hx[e], gx[e]);
    ASSERT_EQ(hy[e], gy[e]);
    if (!AllNeighbours(m, e)) continue;
    ++interior;
    EXPECT_NEAR(gx[e], 0.3, 1e-12);
    EXPECT_NEAR(gy[e], -0.6, 1e-12);
    EXPECT_NEAR(vx[e], -0.1, 1e-12);
    EXPECT_NEAR(vy[e], 0.9, 1e-12);
  }
  EXPECT_EQ(interior, 10 * 7);
  CALCGRADIENTSIMPLEVELOCITY2D(m, phi, psi, ux, uy, hx, hy);
  for (int e = 1; e <= ne; ++e) {
    ASSERT_EQ(ux[e], gx[e]);
    ASSERT_EQ(hx[e], vx[e]);
  }
}

// Node-based gradients reproduce fields linear in the coordinates on every
// element, whatever its shape.
TEST(NodeGradient, LinearNodeFieldExactOnEveryElement) {
  for (const auto& layout : kLayouts) {
    const Mesh m = Generated(layout.layout, 10, 8, 0.2, 5);
    const int nn = m.nodes.nnodes, ne = m.elements.nelements;
    Array1<double> un(nn), vn(nn);
    for (int i = 1; i <= nn; ++i) {
      un[i] = 1.0 + 0.25 * m.nodes.x[i] + 0.5 * m.nodes.y[i];
      vn[i] = -0.75 * m.nodes.x[i];
    }
    Array1<double> ux(ne), uy(ne), vx(ne), vy(ne);
    CALCGRADIENTVELOCITYNODEVALUES2D(m, un, vn, ux, uy, vx, vy);
    for (int e = 1; e <= ne; ++e) {
      ASSERT_NEAR(ux[e], 0.25, 1e-12) << layout.name;
      ASSERT_NEAR(uy[e], 0.5, 1e-12) << layout.name;
      ASSERT_NEAR(vx[e], -0.75, 1e-12) << layout.name;
      ASSERT_NEAR(vy[e], 0.0, 1e-12) << layout.name;
    }
  }
}

// Element values -> pseudo-Laplacian node values -> node-based gradient: exact
// for a linear field where all the element's nodes are interior nodes.
TEST(NodeGradient, VelocityFromElementValuesThroughNodes) {
  const Mesh m = Generated(CellLayout::kMixed, 12, 10, 0.15, 8);
  const int nn = m.nodes.nnodes, ne = m.elements.nelements;
  Array1<double> u(ne), v(ne), un(nn), vn(nn), ux(ne), uy(ne), vx(ne), vy(ne);
  for (int e = 1; e <= ne; ++e) {
    u[e] = 0.1 * m.elements.xc[e] + 0.2 * m.elements.yc[e];
    v[e] = 3.0 - 0.05 * m.elements.yc[e];
  }
  CALCGRADIENTVELOCITYELEMENTVALUES2D(m, u, v, un, vn, ux, uy, vx, vy);
  int checked = 0;
  for (int e = 1; e <= ne; ++e) {
    bool interior = true;
    for (int j = 1; j <= ElementNodeCount(m.elements, e); ++j) interior &= m.nodes.code[ElementNode(m.elements, e, j)] == 0;
    if (!interior) continue;
    ++checked;
    EXPECT_NEAR(ux[e], 0.1, 1e-12);
    EXPECT_NEAR(uy[e], 0.2, 1e-12);
    EXPECT_NEAR(vx[e], 0.0, 1e-12);
    EXPECT_NEAR(vy[e], -0.05, 1e-12);
  }
  EXPECT_GT(checked, ne / 2);
}

Mesh Layered(CellLayout layout, double jitter, bool sloping) {
  RectangleMeshSpec spec = test::Rectangle(0, 60, 0, 40, 6, 4, layout, jitter);
  if (sloping) spec.bed = [](double x, double y) { return -8.0 - 0.05 * x + 0.03 * y; };
  else spec.bed = [](double, double) { return -8.0; };
  return test::Layered(spec, 4, -20.0);
}

TEST(NodeGradient, LayeredElementsFromNodeValues) {
  const Mesh m3 = Layered(CellLayout::kMixed, 0.2, true);
  const int nn = m3.nodes.nnodes, ne = m3.elements.nelements;
  Array1<double> pn(nn), qn(nn), hn(nn);
  for (int i = 1; i <= nn; ++i) {
    pn[i] = 0.3 * m3.nodes.x[i] - 0.2 * m3.nodes.y[i] + 0.7 * m3.nodes.z[i];
    qn[i] = -m3.nodes.z[i];
    hn[i] = 0.4 * m3.nodes.x[i] + 0.1 * m3.nodes.y[i];
  }
  Array1<double> ux(ne), uy(ne), uz(ne), vx(ne), vy(ne), vz(ne), hx(ne), hy(ne);
  CALCGRADIENTVELOCITYNODEVALUES3D(m3, pn, qn, ux, uy, uz, vx, vy, vz);
  CALCGRADIENTNODEVALUES3DLAYER(m3, hn, hx, hy);
  for (int e = 1; e <= ne; ++e) {
    ASSERT_NEAR(ux[e], 0.3, 1e-10) << e;
    ASSERT_NEAR(uy[e], -0.2, 1e-10) << e;
    ASSERT_NEAR(uz[e], 0.7, 1e-10) << e;
    ASSERT_NEAR(vz[e], -1.0, 1e-10) << e;
    ASSERT_NEAR(hx[e], 0.4, 1e-12) << e;
    ASSERT_NEAR(hy[e], 0.1, 1e-12) << e;
  }
}

// Regular hexahedra over a flat bed: the 3D Green-Gauss gradient is exact on
// elements with neighbours on every side, and the along-layer velocity
// gradient on elements with four side neighbours.
TEST(GreenGauss, LayeredRegularHexahedra) {
  const Mesh m3 = Layered(CellLayout::kQuadrilaterals, 0.0, false);
  const int ne = m3.elements.nelements;
  Array1<double> phi(ne), u(ne), v(ne);
  for (int e = 1; e <= ne; ++e) {
    phi[e] = 0.3 * m3.elements.xc[e] + 0.2 * m3.elements.yc[e] - 0.5 * m3.elements.zc[e];
    u[e] = 0.3 * m3.elements.xc[e];
    v[e] = -0.4 * m3.elements.yc[e];
  }
  Array1<double> gx(ne), gy(ne), gz(ne), ux(ne), uy(ne), vx(ne), vy(ne);
  CALCGRADIENTSIMPLE3D(m3, phi, gx, gy, gz);
  CALCGRADIENTSIGMASIMPLEVELOCITY3D(m3, u, v, ux, uy, vx, vy);
  int full = 0, sides = 0;
  for (int e = 1; e <= ne; ++e) {
    int neighbours = 0, side_neighbours = 0;
    for (int j = 1; j <= ElementFaceCount(m3.elements, e); ++j) {
      const int f = ElementFace(m3.elements, e, j);
      if (f == 0 || m3.faces.element2[f] == 0) continue;
      ++neighbours;
      side_neighbours += m3.face_column[f] != 0;
    }
    if (side_neighbours == 4) {
      ++sides;
      EXPECT_NEAR(ux[e], 0.3, 1e-12) << e;
      EXPECT_NEAR(uy[e], 0.0, 1e-12) << e;
      EXPECT_NEAR(vy[e], -0.4, 1e-12) << e;
    }
    if (neighbours == 6) {
      ++full;
      EXPECT_NEAR(gx[e], 0.3, 1e-12) << e;
      EXPECT_NEAR(gy[e], 0.2, 1e-12) << e;
      EXPECT_NEAR(gz[e], -0.5, 1e-12) << e;
    }
  }
  EXPECT_GT(full, 0);
  EXPECT_GT(sides, 0);
}

}  // namespace
}  // namespace vhd
