// Barth-Jespersen limiting through the mesh, through the precomputed limiter
// table and for several fields in one pass gives the bits of the limiter
// written out from its definition; several gradients in one pass give each
// field's own; on 1 and 2 threads.

#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <cstdint>
#include <random>
#include <vector>

#include "core/omp.hpp"
#include "mesh/gradient.hpp"
#include "mesh/gradient_limiter.hpp"
#include "mesh_support.hpp"

namespace vhd {
namespace {

using test::Generated;
using test::kLayouts;

// Same bits (0.0 and -0.0 differ, as do NaNs with different payloads).
bool SameBits(const Array1<double>& a, const Array1<double>& b, int n, int& first_difference) {
  for (int e = 1; e <= n; ++e) {
    if (std::bit_cast<std::uint64_t>(a[e]) != std::bit_cast<std::uint64_t>(b[e])) {
      first_difference = e;
      return false;
    }
  }
  return true;
}

#define EXPECT_SAME_BITS(a, b, n, what)                                          \
  do {                                                                           \
    int bad_ = 0;                                                                \
    EXPECT_TRUE(SameBits(a, b, n, bad_)) << what << ": element " << bad_ << " " \
                                         << (a)[bad_] << " vs " << (b)[bad_];    \
  } while (0)

// Barth-Jespersen written out from its definition, one element at a time
// through the face table: the yardstick of the fast paths.
void ReferenceBarthJespersen(const Mesh& m, const Array1<double>& phi, const Array1<int>& wet, Array1<double>& gx,
                             Array1<double>& gy, double eps) {
  const ElementTable& el = m.elements;
  const FaceTable& fc = m.faces;
  auto active = [&](int e) { return wet.empty() || wet[e] == 1; };
  for (int e = 1; e <= el.nelements; ++e) {
    if (!active(e)) continue;
    std::vector<int> faces, nbs;
    for (int j = 1; j <= ElementFaceCount(el, e); ++j) {
      const int f = ElementFace(el, e, j);
      const int nb = fc.element1[f] == e ? fc.element2[f] : fc.element1[f];
      if (nb > 0 && active(nb)) {
        faces.push_back(f);
        nbs.push_back(nb);
      }
    }
    double hi = phi[e], lo = phi[e];
    for (int nb : nbs) {
      hi = std::max(hi, phi[nb]);
      lo = std::min(lo, phi[nb]);
    }
    double alpha = 1.0;
    for (int f : faces) {
      const double d = gx[e] * (fc.xf[f] - el.xc[e]) + gy[e] * (fc.yf[f] - el.yc[e]);
      double af = 1.0;
      if (d > eps) af = std::min(1.0, (hi - phi[e]) / d);
      else if (d < -eps) af = std::min(1.0, (lo - phi[e]) / d);
      alpha = std::min(alpha, af);
    }
    alpha += 0.0;  // a factor of zero is +0, whichever bound gave it
    gx[e] *= alpha;
    gy[e] *= alpha;
  }
}

// Five fields of different character on a mesh: a trend with noise, pure
// noise, a flat field with spikes (local extrema, zero bounds), and values at
// two very different scales. Wet codes: about a fifth dry (0), a few flooded (2).
struct Fields {
  std::vector<Array1<double>> phi;
  Array1<int> wet;
};

Fields RandomFields(const Mesh& m, unsigned seed) {
  const int ne = m.elements.nelements;
  std::mt19937 rng(seed);
  std::uniform_real_distribution<double> u(-1, 1);
  Fields f;
  f.phi.assign(5, Array1<double>(ne, 0.0));
  f.wet.assign(ne, 1);
  for (int e = 1; e <= ne; ++e) {
    const double x = m.elements.xc[e], y = m.elements.yc[e];
    f.phi[0][e] = 0.05 * x - 0.02 * y + 0.3 * u(rng);
    f.phi[1][e] = u(rng);
    f.phi[2][e] = u(rng) > 0.8 ? 2.0 : 1.0;
    f.phi[3][e] = 1e4 + 1e-3 * u(rng);
    f.phi[4][e] = 1e-6 * (x + u(rng));
    const double r = u(rng);
    f.wet[e] = r < -0.6 ? 0 : (r > 0.95 ? 2 : 1);
  }
  return f;
}

class ThreadCount : public testing::Test {
protected:
  void TearDown() override { OmpSetThreads(saved_); }
  const int saved_ = OmpMaxThreads();
};

using BarthJespersenFastPaths = ThreadCount;
using GradientMultiField = ThreadCount;

TEST_F(BarthJespersenFastPaths, EveryEntryPointGivesTheSameBitsOnOneAndTwoThreads) {
  for (const auto& layout : kLayouts) {
    const Mesh m = Generated(layout.layout, 30, 24, 0.2, 5, {{40, 60, 30, 50}});
    const int ne = m.elements.nelements;
    GradientStencil s;
    SetupGradient(m, 2, Array1<int>(), Array1<int>(), 2, kBoundaryMirror, 4, s);
    LimiterGeometry2D table;
    SetupLimiterGeometry2D(m, table);
    for (unsigned seed : {1u, 2u}) {
      const Fields f = RandomFields(m, seed);
      // Dry elements in one pass, all wet (empty flags) in the other.
      const Array1<int> flags = seed == 1 ? f.wet : Array1<int>();
      const int nf = static_cast<int>(f.phi.size());
      std::vector<Array1<double>> gx(nf, Array1<double>(ne)), gy(nf, Array1<double>(ne));
      for (int i = 0; i < nf; ++i) CALCGRADIENTELEMENT2D(s, f.phi[i], gx[i], gy[i]);
      std::vector<Array1<double>> rx = gx, ry = gy;
      for (int i = 0; i < nf; ++i) ReferenceBarthJespersen(m, f.phi[i], flags, rx[i], ry[i], 1e-12);
      int limited = 0;
      for (int i = 0; i < nf; ++i)
        for (int e = 1; e <= ne; ++e) limited += rx[i][e] != gx[i][e];
      EXPECT_GT(limited, ne / 4) << layout.name;

      for (int threads : {1, 2}) {
        OmpSetThreads(threads);
        SCOPED_TRACE(testing::Message() << layout.name << ", seed " << seed << ", " << threads << " thread(s)");
        // Three fields in one pass (the flow solver's eta, P, Q), limited in
        // place; then all five (a group of four and one of one).
        for (int count : {3, 5}) {
          std::vector<Array1<double>> ax = gx, ay = gy;
          std::vector<GradientField> list;
          for (int i = 0; i < count; ++i) list.push_back({&f.phi[i], &ax[i], &ay[i]});
          CALCLIMITEDGRADIENTALLBJ2D(table, flags, list, 1e-12);
          for (int i = 0; i < count; ++i) {
            EXPECT_SAME_BITS(ax[i], rx[i], ne, "multi-field x, field " << i << " of " << count);
            EXPECT_SAME_BITS(ay[i], ry[i], ne, "multi-field y, field " << i << " of " << count);
          }
        }
        for (int i = 0; i < nf; ++i) {
          // Single field through the table and through the mesh, separate
          // outputs and in place.
          Array1<double> tx(ne), ty(ne), mx(ne), my(ne);
          CALCLIMITEDGRADIENTBJ2D(table, f.phi[i], flags, gx[i], gy[i], tx, ty, 1e-12);
          CALCLIMITEDGRADIENTBJ2D(m, f.phi[i], flags, gx[i], gy[i], mx, my, 1e-12);
          Array1<double> px = gx[i], py = gy[i], qx = gx[i], qy = gy[i];
          CALCLIMITEDGRADIENTBJ2D(table, f.phi[i], flags, px, py, px, py, 1e-12);
          CALCLIMITEDGRADIENTBJ2D(m, f.phi[i], flags, qx, qy, qx, qy, 1e-12);
          EXPECT_SAME_BITS(tx, rx[i], ne, "table x, field " << i);
          EXPECT_SAME_BITS(ty, ry[i], ne, "table y, field " << i);
          EXPECT_SAME_BITS(mx, rx[i], ne, "mesh x, field " << i);
          EXPECT_SAME_BITS(my, ry[i], ne, "mesh y, field " << i);
          EXPECT_SAME_BITS(px, rx[i], ne, "table in place x, field " << i);
          EXPECT_SAME_BITS(py, ry[i], ne, "table in place y, field " << i);
          EXPECT_SAME_BITS(qx, rx[i], ne, "mesh in place x, field " << i);
          EXPECT_SAME_BITS(qy, ry[i], ne, "mesh in place y, field " << i);
        }
      }
    }
  }
}

// A layered mesh of quadrilaterals has six faces per element: the 2D table
// refuses it with a message naming the element and its face count.
TEST(LimiterGeometry, ElementWithMoreThanFourFacesIsFatal) {
  RectangleMeshSpec spec = test::Rectangle(0, 30, 0, 20, 3, 2, CellLayout::kQuadrilaterals);
  spec.bed = [](double, double) { return -5.0; };
  const Mesh m3 = test::Layered(spec, 2, -10.0);
  LimiterGeometry2D g;
  EXPECT_FATAL(SetupLimiterGeometry2D(m3, g), "SetupLimiterGeometry2D: element 1 has 6 faces");
}

// Several fields in one pass over the stencil give each field's single-pass
// gradient bit for bit, for every stencil type and group size.
TEST_F(GradientMultiField, SameBitsAsOneFieldAtATime) {
  const Mesh m = Generated(CellLayout::kMixed, 24, 20, 0.2, 11, {{40, 60, 30, 50}});
  const int ne = m.elements.nelements;
  const Fields f = RandomFields(m, 4);
  const int nf = static_cast<int>(f.phi.size());
  for (int type : {1, 2, 3}) {
    GradientStencil s;
    SetupGradient(m, type, f.wet, Array1<int>(), 2, kBoundaryMirror, 4, s);
    OmpSetThreads(1);
    std::vector<Array1<double>> rx(nf, Array1<double>(ne)), ry(nf, Array1<double>(ne));
    for (int i = 0; i < nf; ++i) CALCGRADIENTELEMENT2D(s, f.phi[i], rx[i], ry[i]);
    for (int threads : {1, 2}) {
      OmpSetThreads(threads);
      SCOPED_TRACE(testing::Message() << "type " << type << ", " << threads << " thread(s)");
      for (int count = 1; count <= nf; ++count) {
        std::vector<Array1<double>> ax(nf, Array1<double>(ne)), ay(nf, Array1<double>(ne));
        std::vector<GradientField> list;
        for (int i = 0; i < count; ++i) list.push_back({&f.phi[i], &ax[i], &ay[i]});
        CALCGRADIENTALLELEMENT2D(s, list);
        for (int i = 0; i < count; ++i) {
          EXPECT_SAME_BITS(ax[i], rx[i], ne, "x, field " << i << " of " << count);
          EXPECT_SAME_BITS(ay[i], ry[i], ne, "y, field " << i << " of " << count);
        }
      }
      Array1<double> ux(ne), uy(ne), vx(ne), vy(ne);
      CALCGRADIENTVELOCITYELEMENT2D(s, f.phi[0], f.phi[1], ux, uy, vx, vy);
      EXPECT_SAME_BITS(ux, rx[0], ne, "velocity ux");
      EXPECT_SAME_BITS(uy, ry[0], ne, "velocity uy");
      EXPECT_SAME_BITS(vx, rx[1], ne, "velocity vx");
      EXPECT_SAME_BITS(vy, ry[1], ne, "velocity vy");
    }
  }
}

}  // namespace
}  // namespace vhd
