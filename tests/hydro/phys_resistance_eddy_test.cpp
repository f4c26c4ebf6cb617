// Bed resistance, eddy viscosity, the velocity/flux conversions and the
// time-step statistics, checked against their closed forms.

#include <gtest/gtest.h>

#include <cmath>
#include <numbers>
#include <string>

#include "hydro/hd_module.hpp"
#include "setup_support.hpp"

namespace vhd {
namespace {

using test::MakeMesh;

// n x n squares of 10 m (area 100 m2), bed 2 m below datum, all wet at 1 m.
struct Field {
  explicit Field(int n = 3) : mesh(MakeMesh(n, n, 10.0, 10.0, [](double, double) { return -1.0; })) {
    AllocateStateHD(hd, mesh);
    hd.bed.type = kBedManning;
    hd.bed.K.assign(hd.state.nelements, 9.81 / (32.0 * 32.0));
    for (int e = 1; e <= hd.state.nelements; ++e) hd.state.h[e] = 1.0;
  }
  Mesh mesh;
  HdModule hd;
};

// ---- Manning series -----------------------------------------------------------------------

TEST(ManningDrag, DefaultManningOnOneMetreOfWater) {
  Field f;
  CALCRESISTANCEBED(f.hd, f.mesh, 0.0);
  // h^(1/3) of the series is exactly 1 at h = 1: c_f = 9.81 / 32^2 = 0.00958.
  EXPECT_DOUBLE_EQ(f.hd.state.cf[1], 9.81 / 1024.0);
  EXPECT_NEAR(f.hd.state.cf[1], 0.00958, 5e-6);
}

TEST(ManningDrag, SeriesFollowsTheCubeRootOfDepth) {
  const double K = 9.81 / (32.0 * 32.0);
  for (double h : {0.1, 0.3, 1.0, 3.0, 10.0}) {
    const double exact = K / std::cbrt(h);
    EXPECT_NEAR(ManningDragCoefficient(K, h) / exact, 1.0, 3e-3) << "h = " << h;
  }
}

TEST(ManningDrag, StaysFiniteAndNeverFallsAsTheWaterThins) {
  // The cubic series of h^(1/6) has a root near 0.07 mm; the drag must stay
  // finite, positive and non-increasing with depth down to a micrometre of
  // water, and strictly decreasing where the series holds (above 2.5 mm).
  const double K = 9.81 / (32.0 * 32.0);
  double previous = ManningDragCoefficient(K, 1e-6);
  EXPECT_TRUE(std::isfinite(previous));
  for (double h = 1.1e-6; h < 100.0; h *= 1.1) {
    const double cf = ManningDragCoefficient(K, h);
    ASSERT_TRUE(std::isfinite(cf) && cf > 0.0) << "h = " << h;
    if (h > 0.0025) {
      ASSERT_LT(cf, previous) << "h = " << h;
    } else {
      ASSERT_LE(cf, previous) << "h = " << h;
    }
    previous = cf;
  }
}

TEST(ManningDrag, OnlyWetElementsAreUpdated) {
  Field f;
  HdState& s = f.hd.state;
  s.cf[2] = 0.123;
  s.cf[3] = 0.456;
  s.wetdry[2] = kFlooded;
  s.wetdry[3] = kDry;
  s.h[4] = 8.0;
  CALCDRAGCOEFMANNINGBED(f.hd);
  EXPECT_EQ(s.cf[2], 0.123);  // keeps the value of its last wet step
  EXPECT_EQ(s.cf[3], 0.456);
  EXPECT_NEAR(s.cf[4], 9.81 / 1024.0 / 2.0, 1e-3 * 9.81 / 1024.0);  // h^(1/3) = 2
}

TEST(ManningDrag, DragCoefficientAndChezyDoNotDependOnDepth) {
  Field f;
  f.hd.bed.type = kBedChezy;
  f.hd.bed.K.assign(f.hd.state.nelements, 9.81 / 2500.0);
  f.hd.state.h[1] = 0.2;
  f.hd.state.h[2] = 20.0;
  f.hd.state.wetdry[3] = kDry;
  CALCDRAGCOEFMANNINGBED(f.hd);
  for (int e = 1; e <= 3; ++e) EXPECT_EQ(f.hd.state.cf[e], 9.81 / 2500.0);
  f.hd.bed.type = kBedNone;
  CALCDRAGCOEFMANNINGBED(f.hd);
  EXPECT_EQ(f.hd.state.cf[1], 0.0);
}

// ---- bed shear stress ---------------------------------------------------------------------

TEST(BedShearStress, QuadraticLawAlongTheFlow) {
  Field f;
  HdState& s = f.hd.state;
  for (int e = 1; e <= s.nelements; ++e) s.cf[e] = 0.003;
  s.h[1] = 2.0;
  s.P[1] = 1.2;   // u = 0.6
  s.Q[1] = -1.6;  // v = -0.8, |u| = 1
  s.wetdry[2] = kFlooded;
  s.P[2] = 1.0;
  CALCBEDSHEARSTRESS(f.hd);
  EXPECT_DOUBLE_EQ(s.tau_x[1], 1010.0 * 0.003 * 0.6);
  EXPECT_DOUBLE_EQ(s.tau_y[1], -1010.0 * 0.003 * 0.8);
  EXPECT_EQ(s.tau_x[2], 0.0);
  EXPECT_EQ(s.tau_y[2], 0.0);
}

// ---- wave length ----------------------------------------------------------------------------

// Exact linear dispersion: omega^2 = g k tanh(k h), solved by Newton's method.
double ExactWaveLength(double T, double h) {
  const double omega = 2.0 * std::numbers::pi / T;
  double k = omega * omega / 9.81;
  for (int it = 0; it < 100; ++it) {
    const double f = 9.81 * k * std::tanh(k * h) - omega * omega;
    const double df = 9.81 * std::tanh(k * h) + 9.81 * k * h / std::pow(std::cosh(k * h), 2);
    k -= f / df;
  }
  return 2.0 * std::numbers::pi / k;
}

TEST(WaveLength, AgreesWithLinearDispersionFromShallowToDeepWater) {
  for (double T : {2.0, 6.0, 12.0}) {
    for (double h : {0.2, 1.0, 5.0, 20.0, 200.0}) {
      EXPECT_NEAR(WaveLengthHD(T, h) / ExactWaveLength(T, h), 1.0, 0.02) << "T = " << T << ", h = " << h;
    }
  }
  // Deep water: the deep-water length g T^2 / (2 pi).
  EXPECT_NEAR(WaveLengthHD(4.0, 500.0), 9.81 * 16.0 / (2.0 * std::numbers::pi), 1e-9);
}

TEST(WaveLengthDeath, InvalidArgumentsStopWithTheirMessages) {
  test::HdSetupFixture f;
  f.Open("");
  test::ExpectStop([] { WaveLengthHD(0.0, 0.0); }, f.log_path, "Fatal error: Water depth <= 0.0 in WaveLengthHD");
  test::ExpectStop([] { WaveLengthHD(0.0, 5.0); }, f.log_path, "Fatal error: Wave Period <= 0.0 in WaveLengthHD");
}

// ---- directional and wave-induced roughness ---------------------------------------------------

TEST(DirectionalRoughness, FlowDirectionSelectsTheRoughness) {
  test::HdSetupFixture f;
  f.Setup(test::kHd + test::HdSection("BED_RESISTANCE", "type = 6\n") +
              test::HdSection("BED_RESISTANCE.DIRECTIONAL_ROUGHNESS", "constant_values = [0.01, 0.02, 0.04, 0.08]\n"),
          MakeMesh(5, 1, 10.0, 10.0, test::Flat(1.0)));
  HdModule& hd = f.hd;
  HdState& s = hd.state;
  const double u[] = {1.0, 0.0, -1.0, 0.0, 0.0};
  const double v[] = {0.0, 1.0, 0.0, -1.0, 0.0};
  for (int e = 1; e <= 5; ++e) {
    s.h[e] = 1.0;
    s.u[e] = u[e - 1];
    s.v[e] = v[e - 1];
  }
  CALCRESISTANCEBED(hd, f.meshes[0], 0.0);
  auto ks_of = [&](int e) {  // invert K = g ks^(1/3) / 25.4^2 (cf = K at h = 1)
    return std::pow(s.cf[e] * 25.4 * 25.4 / 9.81, 3.0);
  };
  // East, north, west, south, and at rest the mean of the four.
  const double ks[] = {0.01, 0.02, 0.04, 0.08, 0.0375};
  for (int e = 1; e <= 5; ++e) EXPECT_NEAR(ks_of(e), ks[e - 1], 1e-12) << e;
  // A flow towards the north-east weighs east and north equally.
  s.u[1] = s.v[1] = 0.5;
  CALCRESISTANCEBED(hd, f.meshes[0], 0.0);
  EXPECT_NEAR(ks_of(1), 0.015, 1e-12);
}

TEST(WaveInducedRoughness, BoundedAndFallingWithMobility) {
  const double d50 = 0.0002;
  // Still water without waves: the largest ripple roughness of the formula.
  const double still = WaveInducedRoughness(d50, 2.65, 0.0, 0.0, 0.0, 5.0);
  EXPECT_NEAR(still, d50 * (85.0 + 65.0 * std::tanh(2.25)), 1e-15);
  // Mobility psi = U^2 / ((s - 1) g d50) = 150 at the centre of the transition.
  const double u150 = std::sqrt(150.0 * 1.65 * 9.81 * d50);
  EXPECT_NEAR(WaveInducedRoughness(d50, 2.65, u150, 0.0, 0.0, 5.0), 85.0 * d50, 1e-15);
  // Sheet flow under strong waves: about 20 d50, never below 2.5 d50.
  const double sheet = WaveInducedRoughness(d50, 2.65, 0.5, 3.0, 8.0, 4.0);
  EXPECT_NEAR(sheet, 20.0 * d50, 0.5 * d50);
  double previous = 1.0;
  for (double H = 0.0; H <= 3.0; H += 0.25) {
    const double ks = WaveInducedRoughness(d50, 2.65, 0.2, H, 8.0, 4.0);
    EXPECT_LE(ks, previous);
    EXPECT_GE(ks, 2.5 * d50);
    EXPECT_LE(ks, 0.075);
    previous = ks;
  }
}

TEST(WaveInducedRoughness, RecomputedEveryUpdateFrequencyCalls) {
  Field f;
  HdBedResistance& br = f.hd.bed;
  const int ne = f.hd.state.nelements;
  br.type = kBedWaveRoughness;
  br.update_frequency = 3;
  br.grain_diameter.values.assign(ne, 0.0002);
  for (Array1<double>* a : {&br.wave_height, &br.wave_period, &br.wave_direction, &br.ks_wave}) a->assign(ne, 0.0);
  CALCRESISTANCEBED(f.hd, f.mesh, 0.0);  // call 1: computed
  const double still = br.ks_wave[1];
  EXPECT_NEAR(f.hd.state.cf[1], 9.81 * std::cbrt(still) / (25.4 * 25.4), 1e-15);
  br.wave_height.assign(ne, 1.0);
  br.wave_period.assign(ne, 6.0);
  CALCRESISTANCEBED(f.hd, f.mesh, 10.0);  // calls 2 and 3: kept
  CALCRESISTANCEBED(f.hd, f.mesh, 20.0);
  EXPECT_EQ(br.ks_wave[1], still);
  CALCRESISTANCEBED(f.hd, f.mesh, 30.0);  // call 4: recomputed with the waves
  EXPECT_LT(br.ks_wave[1], still);
  // The depth-limited height: a 1 m wave on 1 m of water counts as 0.5 m.
  br.type_of_wave_height_correction = 1;
  br.wave_height_over_depth_limit = 0.5;
  br.wave_update_count = 0;
  CALCRESISTANCEBED(f.hd, f.mesh, 40.0);
  EXPECT_EQ(br.ks_wave[1], WaveInducedRoughness(0.0002, 2.65, 0.0, 0.5, 6.0, 1.0));
}

TEST(SurfaceDrag, OnlyUnderIceOnWetElements) {
  Field f;
  HdState& s = f.hd.state;
  f.hd.bed.K_surface.assign(s.nelements, 0.02);
  Array1<double> ice(s.nelements, 0.0);
  ice[1] = 1.0;
  ice[2] = 1.0;
  s.wetdry[2] = kFlooded;
  s.cf_surface[3] = 5.0;
  CALCDRAGCOEFMANNINGSURFACE(f.hd, ice);
  EXPECT_DOUBLE_EQ(s.cf_surface[1], 0.02);  // h = 1
  EXPECT_EQ(s.cf_surface[2], 0.0);
  EXPECT_EQ(s.cf_surface[3], 0.0);
}

// ---- eddy viscosity ---------------------------------------------------------------------------

struct Smagorinsky : Field {
  Smagorinsky() {
    hd.eddy.horizontal.type = kEddySmagorinsky;
    hd.eddy.horizontal.value.values.assign(hd.state.nelements, 0.28);
    AllocateVelocityGradientsHD(hd.state);
  }
};

TEST(EddyViscosity, SmagorinskyOfTheDefaultConstant) {
  Smagorinsky f;
  HdState& s = f.hd.state;
  // |S| = sqrt(2 u_x^2) = 0.01 1/s on an element of 100 m2.
  s.ux[1] = 0.01 / std::sqrt(2.0);
  // The same |S| from a pure shear u_y + v_x = 0.01.
  s.uy[2] = 0.004;
  s.vx[2] = 0.006;
  CALCEDDYVISCOSITYHD(f.hd, f.mesh);
  EXPECT_NEAR(s.nu_t[1], 0.1568, 1e-12);
  EXPECT_NEAR(s.nu_t[2], 0.1568, 1e-12);
}

TEST(EddyViscosity, UniformFlowDryElementsAndBounds) {
  Smagorinsky f;
  HdState& s = f.hd.state;
  HdEddyRecord& r = f.hd.eddy.horizontal;
  for (int e = 1; e <= s.nelements; ++e) s.vy[e] = 0.01;
  s.vy[1] = 0.0;  // uniform flow
  s.wetdry[2] = kFlooded;
  s.wetdry[3] = kDry;
  CALCEDDYVISCOSITYHD(f.hd, f.mesh);
  EXPECT_EQ(s.nu_t[1], r.minimum_eddy_viscosity);
  EXPECT_EQ(s.nu_t[2], 0.0);
  EXPECT_EQ(s.nu_t[3], 0.0);
  r.minimum_eddy_viscosity = 0.05;
  r.maximum_eddy_viscosity = 0.1;
  CALCEDDYVISCOSITYHD(f.hd, f.mesh);
  EXPECT_EQ(s.nu_t[1], 0.05);
  EXPECT_EQ(s.nu_t[4], 0.1);
}

TEST(EddyViscosity, GeographicAreaIsScaledToSquareMetres) {
  // Cells of 0.001 x 0.001 rad at 60 degrees north: Delta^2 = A R^2 cos(lat).
  const double lat0 = 60.0 * kDegToRad;
  Mesh mesh = MakeMesh(2, 2, 0.001, 0.001, [](double, double) { return -5.0; }, CellLayout::kQuadrilaterals,
                       "LONG/LAT", 0.1, lat0);
  HdModule hd;
  hd.projection = 2;
  hd.metric_radius = kPhysical.earth_radius;
  hd.eddy.horizontal.type = kEddySmagorinsky;
  AllocateStateHD(hd, mesh);
  hd.eddy.horizontal.value.values.assign(hd.state.nelements, 0.28);
  hd.state.ux[1] = 0.01 / std::sqrt(2.0);
  CALCEDDYVISCOSITYHD(hd, mesh);
  const double area = mesh.elements.area[1] * std::pow(kPhysical.earth_radius, 2) * std::cos(mesh.elements.yc[1]);
  EXPECT_NEAR(hd.state.nu_t[1], 2.0 * 0.0784 * area * 0.01, 1e-9 * area);
}

TEST(EddyViscosity, MudCorrectionRaisesTheConstantValue) {
  Field f;
  f.hd.eddy.horizontal.type = kEddyConstant;
  f.hd.eddy.horizontal.value.values.assign(f.hd.state.nelements, 0.002);
  f.hd.eddy.horizontal.value.values[5] = 0.3;
  CALCEDDYVISCOSITYHD(f.hd, f.mesh);
  Array1<double> mud(f.hd.state.nelements, 0.01);
  CORREDDYMUD(f.hd, mud);
  EXPECT_EQ(f.hd.state.nu_t[1], 0.01);
  EXPECT_EQ(f.hd.state.nu_t[5], 0.3);
}

// ---- velocity and flux -------------------------------------------------------------------------

TEST(VelocityFlux, VelocitiesOnlyInWetElementsAndRoundTrip) {
  Field f(2);
  HdState& s = f.hd.state;
  const double h[] = {2.0, 0.05, 0.0, 1.5};
  const int code[] = {kWet, kFlooded, kDry, kWet};
  for (int e = 1; e <= 4; ++e) {
    s.h[e] = h[e - 1];
    s.wetdry[e] = code[e - 1];
    s.P[e] = 0.3 * e;
    s.Q[e] = -0.1 * e;
  }
  CALCVELOCITYFROMFLUX(s);
  EXPECT_DOUBLE_EQ(s.u[1], 0.15);
  EXPECT_DOUBLE_EQ(s.v[4], -0.4 / 1.5);
  EXPECT_EQ(s.u[2], 0.0);
  EXPECT_EQ(s.v[3], 0.0);
  CALCFLUXFROMVELOCITY(s);
  EXPECT_DOUBLE_EQ(s.P[1], 0.3);
  EXPECT_DOUBLE_EQ(s.Q[4], -0.4);
  EXPECT_EQ(s.P[2], 0.0);
  // One component alone leaves the other untouched.
  s.u[1] = 1.0;
  s.v[1] = 7.0;
  CALCFLUXFROMVELOCITYCOMPONENT(s, 1);
  EXPECT_EQ(s.P[1], 2.0);
  EXPECT_DOUBLE_EQ(s.Q[1], -0.1);
  s.Q[1] = 1.0;
  CALCVELOCITYFROMFLUXCOMPONENT(s, 2);
  EXPECT_EQ(s.v[1], 0.5);
  EXPECT_EQ(s.u[1], 1.0);
}

// ---- time-step statistics --------------------------------------------------------------------

TEST(TimeStepStatistics, ExtremesAndAverageInTheLog) {
  test::HdSetupFixture f;
  f.Open("");
  HdModule hd;
  for (double dt : {6.0, 6.0, 4.0, 8.0, 6.0}) RecordTimeStepHD(hd, dt);
  EXPECT_EQ(hd.n_steps, 5);
  EXPECT_EQ(hd.dt_smallest, 4.0);
  EXPECT_EQ(hd.dt_largest, 8.0);
  EXPECT_DOUBLE_EQ(hd.dt_sum, 30.0);
  PrintTimeStepStatisticsHD(hd);
  const std::string log = f.Log();
  for (const char* label : {"Number of time steps", "Minimum time step (s)", "Maximum time step (s)",
                            "Average time step (s)"}) {
    EXPECT_NE(log.find(label), std::string::npos) << label;
  }
}

}  // namespace
}  // namespace vhd
