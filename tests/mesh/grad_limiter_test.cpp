// Limiters: Barth-Jespersen extrema, dry neighbours and 3D bounds, ENO choice
// and ties, the weighted limiter.

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <random>

#include "mesh/gradient.hpp"
#include "mesh/gradient_limiter.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::Generated;
using test::kLayouts;

int Across(const Mesh& m, int f, int e) {
  return m.faces.element1[f] == e ? m.faces.element2[f] : m.faces.element1[f];
}

TEST(BarthJespersen, ExtremumGivesZeroAndDryNeighboursKeepAlphaOne) {
  const Mesh m = Generated(CellLayout::kRandomTriangles, 10, 8, 0.2, 4);
  const int ne = m.elements.nelements;
  Array1<double> phi(ne, 1.0), gx(ne, 0.3), gy(ne, -0.2), lx(ne), ly(ne);
  const int peak = 45, dip = 80;
  phi[peak] = 2.0;
  phi[dip] = 0.0;
  CALCLIMITEDGRADIENTBJ2D(m, phi, Array1<int>(), gx, gy, lx, ly, 1e-12);
  EXPECT_EQ(lx[peak], 0.0);
  EXPECT_EQ(ly[peak], 0.0);
  EXPECT_EQ(lx[dip], 0.0);
  EXPECT_EQ(ly[dip], 0.0);

  // The same peak with every neighbour dry: nothing bounds it.
  Array1<int> wet(ne, 1);
  for (int j = 1; j <= ElementFaceCount(m.elements, peak); ++j) {
    const int nb = Across(m, ElementFace(m.elements, peak, j), peak);
    if (nb > 0) wet[nb] = 0;
  }
  CALCLIMITEDGRADIENTBJ2D(m, phi, wet, gx, gy, lx, ly, 1e-12);
  EXPECT_EQ(lx[peak], 0.3);
  EXPECT_EQ(ly[peak], -0.2);
}

// ENO picks the smallest candidate; equal magnitudes keep the own gradient;
// dry neighbours and closed faces offer nothing.
TEST(Eno, SmallestCandidateAndTies) {
  const Mesh m = Generated(CellLayout::kMixed, 12, 10, 0.2, 6);
  const int ne = m.elements.nelements;
  std::mt19937 rng(3);
  std::uniform_real_distribution<double> angle(0, 2 * M_PI);
  Array1<double> gx(ne), gy(ne), lx(ne), ly(ne);
  for (int e = 1; e <= ne; ++e) {
    const double a = angle(rng);
    gx[e] = 2 * std::cos(a);
    gy[e] = 2 * std::sin(a);
  }
  CALCLIMITEDGRADIENTENO2D(m, Array1<int>(), Array1<int>(), gx, gy, lx, ly);
  int same = 0;
  for (int e = 1; e <= ne; ++e) {
    // Magnitudes agree to rounding only; strictly smaller ones may win.
    same += lx[e] == gx[e] && ly[e] == gy[e];
    EXPECT_NEAR(std::hypot(lx[e], ly[e]), 2.0, 1e-14);
  }
  EXPECT_GT(same, 0);
  // Exact ties: the element's own gradient everywhere.
  for (int e = 1; e <= ne; ++e) {
    gx[e] = (e % 2) ? 1.0 : -1.0;
    gy[e] = (e % 3) ? 0.5 : -0.5;
  }
  CALCLIMITEDGRADIENTENO2D(m, Array1<int>(), Array1<int>(), gx, gy, lx, ly);
  for (int e = 1; e <= ne; ++e) {
    ASSERT_EQ(lx[e], gx[e]);
    ASSERT_EQ(ly[e], gy[e]);
  }

  // One small gradient: its open, wet neighbours take it; across a closed face
  // or into a dry element it is not offered.
  const int small = 60;
  gx[small] = 0.01;
  gy[small] = 0.0;
  Array1<int> open(m.faces.nfaces, 1), wet(ne, 1);
  const int closed_face = ElementFace(m.elements, small, 1);
  open[closed_face] = 0;
  const int behind_closed = Across(m, closed_face, small);
  const int dry_face = ElementFace(m.elements, small, 2);
  const int dry = Across(m, dry_face, small);
  wet[dry] = 0;
  const int taker = Across(m, ElementFace(m.elements, small, 3), small);
  ASSERT_GT(behind_closed * dry * taker, 0);
  CALCLIMITEDGRADIENTENO2D(m, wet, open, gx, gy, lx, ly);
  EXPECT_EQ(lx[taker], 0.01);
  EXPECT_EQ(lx[behind_closed], gx[behind_closed]);
  EXPECT_EQ(lx[dry], gx[dry]);
}

// The weighted limiter: a mean of the neighbours' gradients, a uniform
// gradient unchanged on every element shape, own gradient when alone.
TEST(WeightedLimiter, MeanOfTheNeighboursAndUniformGradients) {
  for (const auto& layout : kLayouts) {
    const Mesh m = Generated(layout.layout, 8, 6, 0.2, 2);
    const int ne = m.elements.nelements;
    Array1<double> gx(ne, 0.4), gy(ne, -0.3), lx(ne), ly(ne);
    CALCLIMITEDGRADIENTSIMPLE2D(m, Array1<int>(), Array1<int>(), gx, gy, lx, ly);
    for (int e = 1; e <= ne; ++e) {
      ASSERT_NEAR(lx[e], 0.4, 1e-15) << layout.name;
      ASSERT_NEAR(ly[e], -0.3, 1e-15) << layout.name;
    }
  }
  const Mesh m = Generated(CellLayout::kRightTriangles, 6, 6, 0.0);
  const int ne = m.elements.nelements;
  std::mt19937 rng(8);
  std::uniform_real_distribution<double> u(-1, 1);
  Array1<double> gx(ne), gy(ne), lx(ne), ly(ne);
  for (int e = 1; e <= ne; ++e) {
    gx[e] = u(rng);
    gy[e] = u(rng);
  }
  // With three neighbours the result is a weighted mean of their gradients
  // (positive weights): within their range, component by component.
  CALCLIMITEDGRADIENTSIMPLE2D(m, Array1<int>(), Array1<int>(), gx, gy, lx, ly);
  int checked = 0;
  for (int e = 1; e <= ne; ++e) {
    double lo[2] = {1e300, 1e300}, hi[2] = {-1e300, -1e300};
    int n = 0;
    for (int j = 1; j <= 3; ++j) {
      const int c = Across(m, ElementFace(m.elements, e, j), e);
      if (c == 0) continue;
      ++n;
      lo[0] = std::min(lo[0], gx[c]), hi[0] = std::max(hi[0], gx[c]);
      lo[1] = std::min(lo[1], gy[c]), hi[1] = std::max(hi[1], gy[c]);
    }
    if (n != 3) continue;
    ++checked;
    EXPECT_TRUE(lx[e] >= lo[0] - 1e-15 && lx[e] <= hi[0] + 1e-15) << e;
    EXPECT_TRUE(ly[e] >= lo[1] - 1e-15 && ly[e] <= hi[1] + 1e-15) << e;
  }
  EXPECT_GT(checked, 20);
  // All neighbours dry: the element keeps its own gradient.
  Array1<int> wet(ne, 0);
  wet[20] = 1;
  CALCLIMITEDGRADIENTSIMPLE2D(m, wet, Array1<int>(), gx, gy, lx, ly);
  EXPECT_NEAR(lx[20], gx[20], 1e-15);
  EXPECT_NEAR(ly[20], gy[20], 1e-15);
}

// The 3D twins on a layered mesh: Barth-Jespersen bounds over all faces of a
// layered element, ENO ties keep the own gradient.
TEST(BarthJespersen, LayeredMeshBoundsAndEnoTies) {
  RectangleMeshSpec spec = test::Rectangle(0, 60, 0, 40, 6, 5, CellLayout::kMixed, 0.2);
  spec.bed = [](double x, double) { return -6.0 - 0.1 * x; };
  const Mesh m3 = test::Layered(spec, 4, -20.0);
  const int ne = m3.elements.nelements;
  GradientStencil s;
  SetupGradient(m3, 2, Array1<int>(), Array1<int>(), 3, 1, 4, s);
  std::mt19937 rng(12);
  std::uniform_real_distribution<double> u(-1, 1);
  Array1<double> phi(ne), gx(ne), gy(ne), gz(ne), lx(ne), ly(ne), lz(ne);
  for (int e = 1; e <= ne; ++e) phi[e] = 0.1 * m3.elements.zc[e] + 0.5 * u(rng);
  CALCGRADIENTELEMENT3D(s, phi, gx, gy, gz);
  CALCLIMITEDGRADIENTBJ3D(m3, phi, Array1<int>(), gx, gy, gz, lx, ly, lz, 1e-14);
  int limited = 0;
  for (int e = 1; e <= ne; ++e) {
    double lo = phi[e], hi = phi[e];
    for (int j = 1; j <= ElementFaceCount(m3.elements, e); ++j) {
      const int f = ElementFace(m3.elements, e, j);
      const int nb = f == 0 ? 0 : Across(m3, f, e);
      if (nb == 0) continue;
      lo = std::min(lo, phi[nb]);
      hi = std::max(hi, phi[nb]);
    }
    for (int j = 1; j <= ElementFaceCount(m3.elements, e); ++j) {
      const int f = ElementFace(m3.elements, e, j);
      if (f == 0 || Across(m3, f, e) == 0) continue;
      const double val = phi[e] + lx[e] * (m3.faces.xf[f] - m3.elements.xc[e]) +
                         ly[e] * (m3.faces.yf[f] - m3.elements.yc[e]) + lz[e] * (m3.faces.zf[f] - m3.elements.zc[e]);
      ASSERT_LE(val, hi + 1e-12) << e;
      ASSERT_GE(val, lo - 1e-12) << e;
    }
    limited += lx[e] != gx[e];
  }
  EXPECT_GT(limited, 0);
  for (int e = 1; e <= ne; ++e) {
    gx[e] = 1.0;
    gy[e] = (e % 2) ? 1.0 : -1.0;
    gz[e] = (e % 3) ? 2.0 : -2.0;
  }
  CALCLIMITEDGRADIENTENO3D(m3, Array1<int>(), Array1<int>(), gx, gy, gz, lx, ly, lz);
  for (int e = 1; e <= ne; ++e) {
    ASSERT_EQ(ly[e], gy[e]);
    ASSERT_EQ(lz[e], gz[e]);
  }
}

TEST(LimiterCodes, ThreeDimensionalWeightedIsFatal) {
  const Mesh m = Generated(CellLayout::kMixed, 6, 5, 0.1, 2);
  const int ne = m.elements.nelements;
  Array1<double> phi(ne, 1.0), gx(ne, 0.5), gy(ne, 0.5), gz(ne, 0.0), ax(ne), ay(ne), az(ne);
  EXPECT_FATAL(CALCLIMITEDGRADIENT3D(kLimiterWeighted, m, phi, Array1<int>(), Array1<int>(), gx, gy, gz, ax, ay, az,
                                     1e-12),
               "Simple limiter not implemented in 3D");
}

}  // namespace
}  // namespace vhd
