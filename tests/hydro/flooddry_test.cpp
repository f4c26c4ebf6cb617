// Flooding and drying: the thresholds of the element pass, the flooding of
// dry neighbours, the momentum reset, the booked mass correction, the initial
// state and the blow-up check.

#include <gtest/gtest.h>

#include <cmath>
#include <string>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "setup_support.hpp"

namespace vhd {
namespace {

using test::MakeMesh;

// A row of n square elements of 10 m x 10 m (area 100 m2), element k in
// column k, or another mesh, with flooding and drying on at the default depths.
struct Row {
  explicit Row(int n, double bed = -1.0) : Row(MakeMesh(n, 1, 10.0, 10.0, test::Flat(-bed))) {}
  explicit Row(Mesh m) : mesh(std::move(m)) {
    AllocateStateHD(hd, mesh);
    hd.flood_dry.type = 1;
    hd.flood_dry.drying_depth = 0.005;
    hd.flood_dry.flooding_depth = 0.05;
    hd.flood_dry.mass_depth = 0.1;
  }
  // Sets element e to depth h with code c and some momentum.
  void Set(int e, double h, int c, double P = 0.3, double Q = -0.2) {
    HdState& s = hd.state;
    s.h[e] = h;
    s.eta[e] = h - s.d[e];
    s.wetdry[e] = c;
    s.P[e] = P;
    s.Q[e] = Q;
  }
  Mesh mesh;
  HdModule hd;
};

TEST(CheckFloodDry, ElementThresholdsFromAWetOrFloodedElement) {
  // From wet: below h_dry dry, else still wet (thin water keeps moving until
  // it dries); from flooded: below h_dry dry, below h_mass flooded, from
  // h_mass wet. The thresholds themselves: h_dry gives wet or flooded, h_mass
  // gives wet.
  const double depths[] = {0.004, 0.005, 0.03, 0.0999, 0.1, 0.5};
  const int from_wet[] = {kDry, kWet, kWet, kWet, kWet, kWet};
  const int from_flooded[] = {kDry, kFlooded, kFlooded, kFlooded, kWet, kWet};
  for (int old_code : {kWet, kFlooded}) {
    const int* expected = old_code == kWet ? from_wet : from_flooded;
    Row r(6);
    for (int e = 1; e <= 6; ++e) r.Set(e, depths[e - 1], old_code);
    CHECKFLOODDRYHD(r.hd, r.mesh);
    for (int e = 1; e <= 6; ++e) {
      EXPECT_EQ(r.hd.state.wetdry[e], expected[e - 1]) << "from " << old_code << ", h = " << depths[e - 1];
      EXPECT_EQ(r.hd.state.wetdry_old[e], old_code);
    }
    EXPECT_EQ(r.hd.flood_dry.n_wet, 5);
  }
}

TEST(CheckFloodDry, ElementThresholdsFromADryElement) {
  // From dry: above h_mass wet, above h_dry flooded, else dry; at h_mass
  // exactly flooded, at h_dry exactly still dry. The only dry result
  // (element 1) has a neighbour too shallow to flood it.
  const double depths[] = {0.005, 0.0051, 0.1, 0.1001};
  const int expected[] = {kDry, kFlooded, kFlooded, kWet};
  Row r(4, 5.0);
  for (int e = 1; e <= 4; ++e) r.Set(e, depths[e - 1], kDry, 0.0, 0.0);
  CHECKFLOODDRYHD(r.hd, r.mesh);
  for (int e = 1; e <= 4; ++e) EXPECT_EQ(r.hd.state.wetdry[e], expected[e - 1]) << "h = " << depths[e - 1];
}

TEST(CheckFloodDry, DryNeighbourFloodsOnlyFromDeepEnoughWater) {
  // Equal beds, so the wet surface always lies above the dry bed; only the
  // depth of the wet side decides: 0.04 m < h_flood < 0.06 m.
  for (double h : {0.04, 0.06}) {
    Row r(2);
    r.Set(1, h, kFlooded);
    r.Set(2, 0.0, kDry);
    CHECKFLOODDRYHD(r.hd, r.mesh);
    EXPECT_EQ(r.hd.state.wetdry[2], h > 0.05 ? kFlooded : kDry) << h;
    EXPECT_EQ(r.hd.state.wetdry[1], kFlooded) << h;
  }
}

TEST(CheckFloodDry, DryNeighbourAboveTheSurfaceStaysDry) {
  // Wet element 1 (bed -1 m, depth 0.5 m: surface at -0.5 m) next to dry
  // element 2 whose bed lies at -0.4 m (above the surface) and dry element 3
  // with its bed at -0.6 m, beside element 2: not a neighbour of element 1.
  Row r(3);
  HdState& s = r.hd.state;
  s.d[2] = 0.4;
  s.d[3] = 0.6;
  r.Set(1, 0.5, kWet);
  r.Set(2, 0.0, kDry, 0.0, 0.0);
  r.Set(3, 0.0, kDry, 0.0, 0.0);
  CHECKFLOODDRYHD(r.hd, r.mesh);
  EXPECT_EQ(s.wetdry[2], kDry);
  EXPECT_EQ(s.wetdry[3], kDry);
  // Lower the bed of element 2 below the surface: now it floods.
  s.d[2] = 0.55;
  CHECKFLOODDRYHD(r.hd, r.mesh);
  EXPECT_EQ(s.wetdry[2], kFlooded);
  EXPECT_EQ(s.wetdry[3], kDry);  // flooding does not chain through a dry element
}

TEST(CheckFloodDry, NegativeDepthIsCutAndBooked) {
  // Element 1 stands on a bed above its wet neighbour's surface, so that the
  // neighbour does not flood it again.
  Row r(2);
  r.hd.state.d[1] = -0.5;
  r.Set(1, -0.001, kWet);
  r.Set(2, 1.0, kWet);
  r.hd.flood_dry.mass_correction.Add(0.25);
  CHECKFLOODDRYHD(r.hd, r.mesh);
  const HdState& s = r.hd.state;
  EXPECT_EQ(s.wetdry[1], kDry);
  EXPECT_EQ(s.h[1], 0.0);
  EXPECT_DOUBLE_EQ(s.eta[1], -s.d[1]);
  EXPECT_DOUBLE_EQ(r.hd.flood_dry.mass_correction.Value(), 0.25 + 0.001 * 100.0);
  EXPECT_DOUBLE_EQ(r.hd.flood_dry.mass_cut[1], 0.1);
}

TEST(CheckFloodDry, MomentumResetRules) {
  // old -> new code, and whether the momentum survives.
  struct Case {
    int old_code;
    double h;
    int new_code;
    bool keeps;
  };
  const Case cases[] = {
      {kWet, 0.5, kWet, true},         // no change
      {kWet, 0.05, kWet, true},        // thin wet water stays wet
      {kWet, 0.001, kDry, false},      // wet to dry
      {kFlooded, 0.5, kWet, true},     // flooded to wet: keeps what its faces brought
      {kFlooded, 0.05, kFlooded, true},
      {kFlooded, 0.001, kDry, false},  // flooded to dry
      {kDry, 0.5, kWet, false},        // dry to wet
      {kDry, 0.05, kFlooded, false},   // dry to flooded
  };
  const int n = static_cast<int>(std::size(cases));
  Row r(n);
  for (int e = 1; e <= n; ++e) r.Set(e, cases[e - 1].h, cases[e - 1].old_code, 0.3, -0.2);
  // No element is deep enough to flood a neighbour: only the element pass acts.
  r.hd.flood_dry.flooding_depth = 10.0;
  CHECKFLOODDRYHD(r.hd, r.mesh);
  for (int e = 1; e <= n; ++e) {
    const Case& c = cases[e - 1];
    EXPECT_EQ(r.hd.state.wetdry[e], c.new_code) << "case " << e;
    EXPECT_EQ(r.hd.state.P[e], c.keeps ? 0.3 : 0.0) << "case " << e;
    EXPECT_EQ(r.hd.state.Q[e], c.keeps ? -0.2 : 0.0) << "case " << e;
  }
}

TEST(CheckFloodDry, TypeZeroLeavesEveryCodeUnchanged) {
  Row r(2);
  r.hd.flood_dry.type = 0;
  r.Set(1, 0.001, kWet);
  r.Set(2, 0.0, kWet);
  CHECKFLOODDRYHD(r.hd, r.mesh);
  EXPECT_EQ(r.hd.state.wetdry[1], kWet);
  EXPECT_EQ(r.hd.state.wetdry[2], kWet);
  EXPECT_EQ(r.hd.state.P[1], 0.3);
}

TEST(CheckFloodDry, SameBitsForOneAndTwoThreads) {
  // A sloping tidal flat with depths around the thresholds and some negative.
  auto run = [](int threads) {
    Row r(MakeMesh(40, 30, 5.0, 5.0, [](double x, double y) { return -0.5 + 0.01 * x + 0.003 * y; },
                   CellLayout::kRandomTriangles));
    for (int e = 1; e <= r.hd.state.nelements; ++e) r.Set(e, 0.2 * std::sin(0.37 * e) - 0.02, e % 3, 0.01 * e, 0.0);
    const int before = OmpMaxThreads();
    OmpSetThreads(threads);
    CHECKFLOODDRYHD(r.hd, r.mesh);
    OmpSetThreads(before);
    return r.hd;
  };
  const HdModule a = run(1);
  const HdModule b = run(2);
  EXPECT_GT(a.flood_dry.mass_correction.Value(), 0.0);
  EXPECT_EQ(a.flood_dry.mass_correction.Value(), b.flood_dry.mass_correction.Value());
  EXPECT_EQ(a.flood_dry.n_wet, b.flood_dry.n_wet);
  for (int e = 1; e <= a.state.nelements; ++e) {
    ASSERT_EQ(a.state.wetdry[e], b.state.wetdry[e]);
    ASSERT_EQ(a.state.P[e], b.state.P[e]);
    ASSERT_GE(a.state.h[e], 0.0);
  }
}

// ---- initial state ----------------------------------------------------------------------

TEST(InitialState, FlatSurfaceOverEmergedBedStartsDryWithNonNegativeDepth) {
  // Bed from -2 m (west) to +1 m (east): the eastern third stands above datum.
  test::HdSetupFixture f;
  f.Setup(test::kHd + test::HdSection("FLOOD_AND_DRY", "type = 1\n"),
          MakeMesh(30, 4, 1.0, 1.0, [](double x, double) { return -2.0 + 0.1 * x; }, CellLayout::kRandomTriangles));
  InitialiseStateHD(f.hd, f.meshes[0]);
  const HdState& s = f.hd.state;
  int dry = 0;
  for (int e = 1; e <= s.nelements; ++e) {
    EXPECT_GE(s.h[e], 0.0);
    EXPECT_DOUBLE_EQ(s.h[e], s.eta[e] + s.d[e]);
    EXPECT_EQ(s.u[e], 0.0);
    if (s.d[e] <= 0.0) {
      EXPECT_EQ(s.wetdry[e], kDry) << "element " << e;
      ++dry;
    } else if (s.d[e] >= 0.1) {
      EXPECT_EQ(s.eta[e], 0.0);
      EXPECT_EQ(s.wetdry[e], kWet);
    }
  }
  EXPECT_GT(dry, 0);
  // Flooding a dry element across a face never happens from still water at
  // datum: every dry bed is above the surface.
  EXPECT_EQ(f.hd.flood_dry.mass_correction.Value(), 0.0);
}

TEST(InitialState, ConstantValuesGiveFluxesAndLowSurfacesSitOnTheBed) {
  test::HdSetupFixture f;
  f.Setup(test::kHd + test::HdSection("FLOOD_AND_DRY", "type = 1\n") +
              test::HdSection("INITIAL_CONDITIONS", "type = 1\nsurface_elevation_constant = -1.0\n"
                                                    "u_velocity_constant = 0.5\nv_velocity_constant = -0.25\n"),
          MakeMesh(20, 2, 1.0, 1.0, [](double x, double) { return -3.0 + 0.2 * x; }));
  InitialiseStateHD(f.hd, f.meshes[0]);
  const HdState& s = f.hd.state;
  for (int e = 1; e <= s.nelements; ++e) {
    EXPECT_GE(s.h[e], 0.0);
    EXPECT_DOUBLE_EQ(s.h[e], s.eta[e] + s.d[e]);
    if (s.wetdry[e] == kWet) {
      EXPECT_DOUBLE_EQ(s.eta[e], -1.0);
      EXPECT_DOUBLE_EQ(s.P[e], 0.5 * s.h[e]);
      EXPECT_DOUBLE_EQ(s.Q[e], -0.25 * s.h[e]);
      EXPECT_DOUBLE_EQ(s.u[e], 0.5);
    } else {
      // Flooded and dry elements carry no momentum and no velocity.
      EXPECT_EQ(s.P[e], 0.0);
      EXPECT_EQ(s.u[e], 0.0);
    }
  }
  // The blow-up limit lies above the highest initial surface and bed.
  EXPECT_GT(f.hd.flood_dry.elevation_limit, 1.0);
}

// ---- blow-up check ------------------------------------------------------------------------

TEST(BlowUp, SoundStatePassesAndElevationTooLargeReportsTheFirstElement) {
  test::HdSetupFixture f;
  f.Open("");
  Row r(4);
  for (int e = 1; e <= 4; ++e) r.Set(e, 1.0, kWet);
  r.hd.flood_dry.elevation_limit = 10.0;
  int status = 0;
  EXPECT_TRUE(CheckBlowUpHD(r.hd, r.mesh, 60.0, &status));
  EXPECT_EQ(status, 0);
  r.Set(3, 20.0, kWet);
  r.Set(4, std::nan(""), kWet);
  EXPECT_FALSE(CheckBlowUpHD(r.hd, r.mesh, 90.0, &status));
  EXPECT_EQ(status, -1);
  const std::string log = f.Log();
  EXPECT_NE(log.find("BLOW-UP - Elevation too large"), std::string::npos);
  const std::size_t at = log.find("element number        :");
  ASSERT_NE(at, std::string::npos) << log;
  const std::string line = log.substr(at + 24, log.find('\n', at) - at - 24);
  EXPECT_EQ(std::stoi(line), 3) << line;
  EXPECT_NE(log.find("total water depth (h) :"), std::string::npos);
  EXPECT_EQ(log.find("domain                :"), std::string::npos);
}

TEST(BlowUp, NonPositiveDepthWithoutFloodingAndDryingIsFatal) {
  test::HdSetupFixture f;
  f.Open("");
  Row r(3);
  r.hd.flood_dry.type = 0;
  for (int e = 1; e <= 3; ++e) r.Set(e, 1.0, kWet);
  r.hd.flood_dry.elevation_limit = 10.0;
  r.Set(2, 0.0, kWet);
  test::ExpectStop([&] { CheckBlowUpHD(r.hd, r.mesh, 30.0); }, f.log_path,
                   "Fatal error: BLOW-UP - Total depth too small");
  // With flooding and drying on, an empty element is no blow-up.
  r.hd.flood_dry.type = 1;
  EXPECT_TRUE(CheckBlowUpHD(r.hd, r.mesh, 30.0));
}

}  // namespace
}  // namespace vhd
