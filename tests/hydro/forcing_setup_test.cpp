// Forcing setup and the per-element fields: wind friction law, wind
// components and soft start, Coriolis parameter, the equilibrium tide
// against the formulas of the constituents, and every setup message.

#include <gtest/gtest.h>

#include <cmath>
#include <numbers>

#include "hydro/forcing.hpp"
#include "hydro/sw_fluxes.hpp"
#include "io/units.hpp"
#include "io/zrn.hpp"
#include "mesh/cartography.hpp"
#include "setup_support.hpp"

namespace vhd {
namespace {

using test::HdSection;
using test::HdSetupFixture;
using test::kHd;
using test::MakeMesh;

constexpr double kDeg = std::numbers::pi / 180.0;

Mesh Utm() { return MakeMesh(4, 3, 1000.0, 1000.0, test::Flat(10.0), CellLayout::kMixed, "UTM-32", 500000.0, 6000000.0); }

// Setup and the solver tables (where the mesh-dependent fields are made).
void SetupWithSolver(HdSetupFixture& f, const std::string& body, const Mesh& mesh, HdSolver& solver) {
  f.Setup(body, mesh);
  SetupSolverHD(f.hd, f.meshes[0], solver);
}

TEST(ForcingSetup, FrictionLawAtItsEnds) {
  HdWindForcing w;
  struct Case {
    double speed, c;
  } cases[] = {{-1.0, 0.0016}, {0.0, 0.0016}, {12.0, 0.0021}, {24.0, 0.0026}, {40.0, 0.0026}};
  for (const Case& c : cases) EXPECT_NEAR(WindFrictionHD(w, c.speed), c.c, 1e-15) << c.speed;
  w.friction_type = 0;
  w.constant_friction = 0.003;
  EXPECT_EQ(WindFrictionHD(w, 50.0), 0.003);
}

TEST(ForcingSetup, DefaultWindOfTenFromTheNorth) {
  HdSetupFixture f;
  HdSolver s;
  SetupWithSolver(f, kHd + HdSection("WIND_FORCING", "type = 1\nformat = 0\nconstant_speed = 10\n"),
                  MakeMesh(3, 3, 10.0, 10.0, test::Flat(2.0)), s);
  HdModule& hd = f.hd;
  EXPECT_EQ(hd.forcing.wind.neutral_pressure, 101300.0);
  UpdateForcingHD(hd, s, f.meshes[0], 0.0, 30.0);
  EXPECT_NEAR(hd.forcing.wind.u, 0.0, 1e-14);
  EXPECT_EQ(hd.forcing.wind.v, -10.0);
  const double factor = (0.0016 + 0.001 * 10.0 / 24.0) / 800.0 * 10.0;
  EXPECT_NEAR(hd.forcing.wind.stress_factor, factor, 1e-18);
  EXPECT_NEAR(hd.boundary.forcing.wind_y[5], -10.0 * factor, 1e-16);
  EXPECT_NEAR(hd.boundary.forcing.wind_x[5], 0.0, 1e-18);
}

// Format 1: speed and direction from a point series; the direction from 350
// to 10 degrees passes through north, so half way the wind blows from the
// north at the mean speed.
TEST(ForcingSetup, WindSeriesInterpolatesTheDirectionThroughNorth) {
  HdSetupFixture f;
  ZrnFile z;
  ASSERT_EQ(zrnHeaderCreate(z, f.dir.file("wind.zrn0"), kZrnFileData, "wind"), 0);
  ASSERT_EQ(zrnSetEqCalendarAxis(z, zrnDateTime(f.time.start), 3600.0), 0);
  for (int k = 1; k <= 2; ++k) {
    ASSERT_EQ(zrnSetItemInfo(z, k, k == 1 ? "Speed" : "Direction", kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble),
              0);
    ASSERT_EQ(zrnSetItemAxisEqD0(z, k), 0);
  }
  ASSERT_EQ(zrnFileCreate(z), 0);
  const double values[2][2] = {{10.0, 350.0}, {20.0, 10.0}};
  for (const auto& step : values) {
    for (double v : step) ASSERT_EQ(zrnWriteItemTimeStep(z, 0.0, &v, 1), 0);
  }
  ASSERT_EQ(zrnFileClose(z), 0);
  HdSolver s;
  SetupWithSolver(f, kHd + HdSection("WIND_FORCING", "type = 1\nformat = 1\nfile_name = \"wind.zrn0\"\n"),
                  MakeMesh(3, 3, 10.0, 10.0, test::Flat(2.0)), s);
  UpdateForcingHD(f.hd, s, f.meshes[0], 1800.0, 30.0);
  EXPECT_NEAR(f.hd.forcing.wind.u, 0.0, 1e-12);
  EXPECT_NEAR(f.hd.forcing.wind.v, -15.0, 1e-12);
}

// A series step without a speed (the file's delete value, here -999) gives
// calm air while it brackets the time, not a wind of -999 m/s; the wind
// returns with the next complete pair of steps.
TEST(ForcingSetup, WindSeriesWithoutAValueIsCalm) {
  HdSetupFixture f;
  ZrnFile z;
  ASSERT_EQ(zrnHeaderCreate(z, f.dir.file("wind.zrn0"), kZrnFileData, "wind"), 0);
  ASSERT_EQ(zrnSetEqCalendarAxis(z, zrnDateTime(f.time.start), 3600.0), 0);
  ASSERT_EQ(zrnSetDeleteValFloat(z, -999.0), 0);
  for (int k = 1; k <= 2; ++k) {
    ASSERT_EQ(zrnSetItemInfo(z, k, k == 1 ? "Speed" : "Direction", kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble),
              0);
    ASSERT_EQ(zrnSetItemAxisEqD0(z, k), 0);
  }
  ASSERT_EQ(zrnFileCreate(z), 0);
  const double values[4][2] = {{10.0, 0.0}, {-999.0, 0.0}, {20.0, -999.0}, {12.0, 90.0}};
  for (const auto& step : values) {
    for (double v : step) ASSERT_EQ(zrnWriteItemTimeStep(z, 0.0, &v, 1), 0);
  }
  ASSERT_EQ(zrnFileClose(z), 0);
  HdSolver s;
  f.time.last_step = 360;
  SetupWithSolver(f, kHd + HdSection("WIND_FORCING", "type = 1\nformat = 1\nfile_name = \"wind.zrn0\"\n"),
                  MakeMesh(3, 3, 10.0, 10.0, test::Flat(2.0)), s);
  struct Case {
    double t, u, v;
  } cases[] = {{0.0, 0.0, -10.0}, {1800.0, 0.0, 0.0}, {5400.0, 0.0, 0.0}, {9000.0, 0.0, 0.0}, {10800.0, -12.0, 0.0}};
  for (const Case& c : cases) {
    UpdateForcingHD(f.hd, s, f.meshes[0], c.t, 30.0);
    EXPECT_NEAR(f.hd.forcing.wind.u, c.u, 1e-12) << c.t;
    EXPECT_NEAR(f.hd.forcing.wind.v, c.v, 1e-12) << c.t;
    EXPECT_EQ(f.hd.boundary.forcing.wind_x[5] == 0.0 && f.hd.boundary.forcing.wind_y[5] == 0.0, c.u == 0 && c.v == 0)
        << c.t;
  }
}

TEST(ForcingSetup, SoftStartGrowsTheWindAndMovesThePressure) {
  HdModule hd;
  HdWindForcing& w = hd.forcing.wind;
  w.type = 1;
  w.format = 3;
  w.type_of_soft_start = 1;
  w.soft_time_interval = 1000.0;
  InitDataSpec(w.data, 3, {990.0, 3.0, 4.0});
  w.data.type_of_soft_start = kSoftStartNone;
  Mesh mesh = MakeMesh(2, 2, 10.0, 10.0, test::Flat(2.0));
  hd.projection = 1;
  AllocateStateHD(hd, mesh);
  HdSolver s;
  hd.state.h.assign(hd.state.nelements, 2.0);
  SetupSolverHD(hd, mesh, s);
  for (double t : {0.0, 250.0, 1000.0, 2000.0}) {
    UpdateForcingHD(hd, s, mesh, t, 30.0);
    const double sf = std::min(1.0, t / 1000.0);
    EXPECT_NEAR(w.pressure[1], 100.0 * (sf * 990.0 + (1.0 - sf) * 1013.0), 1e-9) << t;
    const double W = 5.0 * sf;
    EXPECT_NEAR(hd.boundary.forcing.wind_x[1], WindFrictionHD(w, W) / 800.0 * W * 3.0 * sf, 1e-15) << t;
  }
}

// Where a map holds no value the air is calm at the neutral pressure (no
// jump of the pressure to zero next to it).
TEST(ForcingSetup, MapWithoutValueIsCalmAtTheNeutralPressure) {
  for (double missing : {kZrnDefaultDeleteValue, std::nan("")}) {
    HdModule hd;
    HdWindForcing& w = hd.forcing.wind;
    w.type = 1;
    w.format = 3;
    InitDataSpec(w.data, 3, {missing, 5.0, missing});
    w.data.type_of_soft_start = kSoftStartNone;
    Mesh mesh = MakeMesh(2, 2, 10.0, 10.0, test::Flat(2.0));
    AllocateStateHD(hd, mesh);
    HdSolver s;
    SetupSolverHD(hd, mesh, s);
    UpdateForcingHD(hd, s, mesh, 100.0, 30.0);
    EXPECT_EQ(w.pressure[2], 101300.0);
    EXPECT_EQ(hd.boundary.forcing.wind_x[2], 0.0);
    EXPECT_EQ(hd.boundary.forcing.wind_y[2], 0.0);
  }
}

TEST(ForcingSetup, CoriolisParameterFromTheLatitude) {
  const double two_omega = 2.0 * 7.292e-5;
  {
    // No section: no Coriolis force, also on a mesh without a geographic
    // reference.
    HdSetupFixture f;
    HdSolver s;
    SetupWithSolver(f, kHd, MakeMesh(3, 3, 10.0, 10.0, test::Flat(2.0)), s);
    EXPECT_EQ(f.hd.forcing.coriolis.type, 0);
    EXPECT_FALSE(SourcesActive(s));
  }
  {
    // A section without type: type 2, f from each element's latitude.
    HdSetupFixture f;
    HdSolver s;
    SetupWithSolver(f, kHd + HdSection("CORIOLIS", ""), Utm(), s);
    const Mesh& m = f.meshes[0];
    CTqCartography cart;
    TqCartCreate(cart, "UTM-32");
    for (int e = 1; e <= m.elements.nelements; ++e) {
      double lon, lat;
      TqCartXy2Geo(cart, m.elements.xc[e], m.elements.yc[e], lon, lat);
      EXPECT_NEAR(f.hd.forcing.coriolis.f[e], two_omega * std::sin(lat * kDeg), 1e-17);
      EXPECT_EQ(f.hd.boundary.forcing.coriolis[e], f.hd.forcing.coriolis.f[e]);
    }
    EXPECT_TRUE(SourcesActive(s));
  }
  {
    // Type 1: the latitude of the centre of the mesh's bounding box.
    HdSetupFixture f;
    HdSolver s;
    SetupWithSolver(f, kHd + HdSection("CORIOLIS", "type = 1\n"), Utm(), s);
    CTqCartography cart;
    TqCartCreate(cart, "UTM-32");
    double lon, lat;
    TqCartXy2Geo(cart, 502000.0, 6001500.0, lon, lat);
    EXPECT_NEAR(f.hd.forcing.coriolis.latitude, lat, 1e-9);
    EXPECT_NEAR(f.hd.forcing.coriolis.f[3], two_omega * std::sin(lat * kDeg), 1e-17);
  }
  {
    HdSetupFixture f;
    HdSolver s;
    SetupWithSolver(f, kHd + HdSection("CORIOLIS", "type = 1\nlatitude = 30\n"), Utm(), s);
    EXPECT_NEAR(f.hd.forcing.coriolis.f[1], 7.292e-5, 1e-18);
    HdSetupFixture g;
    SetupWithSolver(g, kHd + HdSection("CORIOLIS", "type = 1\nlatitude = 30\ncoriolis_coefficient = 1e-3\n"), Utm(),
                    s);
    EXPECT_EQ(g.hd.forcing.coriolis.f[1], 1e-3);
  }
}

// The built-in constituents at a date and place against the equilibrium-tide
// formulas, evaluated here on their own.
TEST(ForcingTide, BuiltinEquilibriumTideMatchesTheFormulas) {
  EXPECT_DOUBLE_EQ(DaysFromTideEpoch(1900, 1, 1, 0, 0, 0), 0.5);
  EXPECT_DOUBLE_EQ(DaysFromTideEpoch(2000, 1, 1, 12, 0, 0), 36525.0);

  HdSetupFixture f;
  HdSolver s;
  f.time.start = {2021, 6, 15, 6, 30, 0};
  SetupWithSolver(f, kHd + HdSection("TIDAL_POTENTIAL", "type = 3\n"), Utm(), s);
  HdModule& hd = f.hd;
  const double t = 7.0 * 3600.0 + 123.0;
  UPDATETIDE(hd, t);

  const double d0 = DaysFromTideEpoch(2021, 6, 15, 6, 30, 0);
  const double T0 = d0 / 36525.0, T = (t / 86400.0 + d0) / 36525.0;
  const double h = 280.19 + 36000.76953125 * T0 + 0.000303 * T0 * T0;
  const double sm = 277.03 + 481267.90625 * T0 + 0.002525 * T0 * T0 + 1.889e-6 * T0 * T0 * T0;
  const double p = 334.38 + 4069.033935546875 * T0 - 0.010325 * T0 * T0 - 1.2e-5 * T0 * T0 * T0;
  auto node = [](double TT) {
    return (259.1600036621094 - 1934.1424560546875 * TT + 0.0021059999708086252 * TT * TT +
            2.221999920948292e-6 * TT * TT * TT) * kDeg;
  };
  const double N0 = node(T0), N = node(T);
  const double V[6] = {
      2 * h - 2 * sm - 2.1 * std::sin(N0),
      0.0,
      2 * h - 3 * sm + p - 2.1 * std::sin(N0),
      2 * h - 17.7 * std::sin(N0) + 0.7 * std::sin(2 * N0),
      h + 90 - 8.9 * std::sin(N0) + 0.7 * std::sin(2 * N0),
      h - 2 * sm - 90 + 10.8 * std::sin(N0) - 1.3 * std::sin(2 * N0) + 0.2 * std::sin(3 * N0),
  };
  const double F[6] = {1 - 0.037 * std::cos(N),
                       1.0,
                       1 - 0.037 * std::cos(N),
                       1.024 + 0.286 * std::cos(N) + 0.008 * std::cos(2 * N),
                       1.006 + 0.115 * std::cos(N) - 0.009 * std::cos(2 * N),
                       1.009 + 0.187 * std::cos(N) - 0.015 * std::cos(2 * N)};
  const double A[6] = {0.242334, 0.113033, 0.046398, 0.030704, 0.141565, 0.100514};
  const double W[6] = {1.4051890250864362e-4, 1.454441043328608e-4, 1.3787970041036562e-4,
                       1.4584231720055478e-4, 7.29211604462623e-5,  6.759774185145898e-5};
  const int S[6] = {2, 2, 2, 2, 1, 1};
  const Mesh& m = f.meshes[0];
  CTqCartography cart;
  TqCartCreate(cart, "UTM-32");
  for (int e = 1; e <= m.elements.nelements; ++e) {
    double lon, lat;
    TqCartXy2Geo(cart, m.elements.xc[e], m.elements.yc[e], lon, lat);
    lon *= kDeg, lat *= kDeg;
    double eta = 0.0;
    for (int k = 0; k < 6; ++k) {
      const double L = S[k] == 2 ? std::cos(lat) * std::cos(lat) : 2 * std::sin(lat) * std::cos(lat);
      eta += A[k] * F[k] * L * std::cos(S[k] * lon + W[k] * t + V[k] * kDeg);
    }
    EXPECT_NEAR(hd.forcing.tide.eta_eq[e], eta, 1e-12) << e;
  }
}

TEST(ForcingTide, ConstituentsOfTheSetupFile) {
  HdSetupFixture f;
  HdSolver s;
  SetupWithSolver(f,
                  kHd + HdSection("TIDAL_POTENTIAL", "type = 1\nnumber_of_constituents = 1\nperiod_scaling = 3600\n") +
                      HdSection("TIDAL_POTENTIAL.CONSTITUENT_1",
                                "name = \"M2\"\nspecies = 2\namplitude = 0.24\nperiod = 12.42\nearthtide = 0.69\n"
                                "nodal_number_1 = 1.0\nnodal_number_2 = -0.037\nphase = 30\n"),
                  Utm(), s);
  HdModule& hd = f.hd;
  const double t = 5000.0;
  UPDATETIDE(hd, t);
  const double d0 = DaysFromTideEpoch(2004, 1, 1, 0, 0, 0);
  const double T = (t / 86400.0 + d0) / 36525.0;
  const double N = (259.16 - 1934.14 * T + 0.0021 * T * T) * kDeg;
  const double A = 0.24 * 0.69 * (1.0 - 0.037 * std::cos(N));
  const double chi = 2 * std::numbers::pi * t / (12.42 * 3600.0) + 30.0 * kDeg;
  const double lat = hd.forcing.tide.lat[2], lon = hd.forcing.tide.lon[2];
  EXPECT_NEAR(hd.forcing.tide.eta_eq[2], A * std::cos(lat) * std::cos(lat) * std::cos(2 * lon + chi), 1e-12);
}

// DEPTH, ICE with ROUGHNESS and their fields from the setup file: the
// constant depth correction on every element, the wind factor between the
// cut-offs, the ice cover from the thickness and the surface drag
// coefficient of the roughness height; the lower cut-off defaults to the
// upper one.
TEST(ForcingSetup, DepthAndIceFromTheSetupFile) {
  HdSetupFixture f;
  HdSolver s;
  SetupWithSolver(f,
                  kHd + HdSection("DEPTH", "type = 1\nconstant_value = 0.25\n") +
                      HdSection("ICE", "type = 3\nc_cut_off_lower = 0.5\nc_cut_off = 0.9\nconstant_values = [0.7, 0.4]\n") +
                      HdSection("ICE.ROUGHNESS", "constant_value = 0.02\n"),
                  MakeMesh(3, 3, 10.0, 10.0, test::Flat(2.0)), s);
  HdModule& hd = f.hd;
  UpdateForcingHD(hd, s, f.meshes[0], 0.0, 30.0);
  for (int e = 1; e <= 9; ++e) {
    EXPECT_EQ(s.depth_correction[e], 0.25);
    EXPECT_NEAR(hd.forcing.ice.wind_factor[e], std::sqrt(0.5), 1e-15);
    EXPECT_EQ(hd.forcing.ice.cover[e], 1.0);
    // Manning number of the roughness height: M = 25.4 / k_s^(1/6).
    const double M = 25.4 / std::pow(0.02, 1.0 / 6.0);
    EXPECT_NEAR(hd.bed.K_surface[e], 9.81 / (M * M), 1e-15);
  }
  EXPECT_EQ(hd.ice_type, 3);

  HdSetupFixture g;
  HdSolver t;
  SetupWithSolver(g, kHd + HdSection("ICE", "type = 1\nc_cut_off = 0.8\nconstant_value = 0.85\n"),
                  MakeMesh(3, 3, 10.0, 10.0, test::Flat(2.0)), t);
  EXPECT_EQ(g.hd.forcing.ice.c_cut_off_lower, 0.8);
  UpdateForcingHD(g.hd, t, g.meshes[0], 0.0, 30.0);
  // Above the cut-off without thickness data: covered, no wind; no
  // roughness given: no surface drag.
  EXPECT_EQ(g.hd.forcing.ice.wind_factor[4], 0.0);
  EXPECT_EQ(g.hd.forcing.ice.cover[4], 1.0);
  EXPECT_EQ(g.hd.bed.K_surface[4], 0.0);
}

// A depth correction on separate geometry, velocity and elevation meshes
// is refused.
TEST(ForcingSetupDeath, DepthCorrectionOnSeparateMeshes) {
  HdSetupFixture f;
  const Mesh mesh = MakeMesh(3, 3, 10.0, 10.0, test::Flat(2.0));
  test::ExpectStop(
      [&] {
        f.Open(kHd + HdSection("SPACE", "number_of_2D_mesh_geometry = 2\n") + HdSection("DEPTH", "type = 1\n"));
        f.meshes = {mesh, mesh};
        SetupHD(f.hd, f.run, f.time, f.modules, f.meshes);
      },
      f.log_path, "SetupDepth do not support discretization=1");
}

// Every setup message of the forcings that a user can provoke.
TEST(ForcingSetupDeath, MessagesOfTheSetup) {
  const Mesh local = MakeMesh(3, 3, 10.0, 10.0, test::Flat(2.0));
  struct Case {
    std::string body;
    bool utm;
    std::string message;
  } cases[] = {
      {HdSection("WIND_FORCING", "type = 1\nformat = 2\n"), true, "Format not supported for wind conditions."},
      {HdSection("WIND_FORCING", "type = 1\nformat = 0\nneutral_pressure = 400\n"), true, "Invalid neutral pressure"},
      {HdSection("WIND_FORCING", "type = 1\nformat = 0\nneutral_pressure = 2000\n"), true, "Invalid neutral pressure"},
      {HdSection("WIND_FORCING", "type = 1\nformat = 0\n") + HdSection("WIND_FORCING.WIND_FRICTION", "type = 2\n"),
       true, "Wind friction type not"},
      {HdSection("WIND_FORCING", "type = 1\nformat = 0\nconstant_speed = -3\n"), true,
       "SetupWindHD: the wind speed must not be negative"},
      {HdSection("CORIOLIS", "type = 3\n"), true, "Type not supported for Coriolis forcing"},
      {HdSection("CORIOLIS", "type = 1\nlatitude = 91\n"), true, "wrong latitude specified for coriolis forcing"},
      {HdSection("CORIOLIS", ""), false, "NON-UTM not allowed in case of coriolis forcing"},
      {HdSection("CORIOLIS", "type = 1\ncoriolis_coefficient = 1e-4\n"), false,
       "NON-UTM not allowed in case of coriolis forcing"},
      {HdSection("TIDAL_POTENTIAL", "type = 4\n"), true, "Type not supported for tide conditions"},
      {HdSection("TIDAL_POTENTIAL", "type = 1\nformat = 2\n"), true, "Format not supported for tide conditions"},
      {HdSection("TIDAL_POTENTIAL", "type = 3\n"), false, "SetupTide: wrong projection"},
      {HdSection("TIDAL_POTENTIAL", "type = 1\nnumber_of_constituents = 1\n"), true,
       "SetupTide: section CONSTITUENT_1 missing"},
      {HdSection("TIDAL_POTENTIAL", "type = 1\nnumber_of_constituents = 1\n") +
           HdSection("TIDAL_POTENTIAL.CONSTITUENT_1", "species = 3\nperiod = 10\n"),
       true, "SetupTide: species = 3"},
      {HdSection("TIDAL_POTENTIAL", "type = 1\nnumber_of_constituents = 1\n") +
           HdSection("TIDAL_POTENTIAL.CONSTITUENT_1", "species = 2\n"),
       true, "SetupTide: period = 0 s"},
      {HdSection("DEPTH", "type = -1\n"), true, "Type not supported (type = -1"},
      {HdSection("DEPTH", "type = 1\nformat = 4\n"), true, "Format not supported (format = 4"},
      {HdSection("DEPTH", "type = 1\nformat = 3\n"), true, "Missing data file name: keyword file_name"},
      {HdSection("ICE", "type = 4\n"), true, "Type not supported for ice conditions."},
      {HdSection("ICE", "type = 1\nformat = 5\n"), true, "Format not supported for ice conditions."},
      {HdSection("ICE", "type = 1\nc_cut_off_lower = 0.95\n"), true, "Illegal lower cut off value"},
      {HdSection("ICE", "type = 2\nthickness_cut_off = -1\n"), true,
       "SetupIceHD: the thickness cut-off must not be negative"},
      {HdSection("ICE", "type = 2\n") + HdSection("ICE.ROUGHNESS", "format = 1\n"), true,
       "Format not supported for roughness."},
      {HdSection("ICE", "type = 2\n") + HdSection("ICE.ROUGHNESS", "type = 1\n"), true,
       "SetupIceHD: the ice roughness type is not supported"},
      {HdSection("ICE", "type = 2\n") + HdSection("ICE.ROUGHNESS", "constant_value = -0.1\n"), true,
       "SetupIceHD: the ice roughness of element"},
      {HdSection("RADIATION_STRESS", "type = 6\n"), true, "Type not supported for radiation stress variation."},
      {HdSection("RADIATION_STRESS", "type = 1\n"), true, "Format not supported for radiation stress."},
      {HdSection("RADIATION_STRESS", "type = 3\nformat = 3\n"), true, "Missing data file name: keyword file_name"},
      {HdSection("RADIATION_STRESS", "type = 1\nformat = 3\nsoft_time_interval = -5\n"), true,
       "SetupRadiationStressHD: the soft time interval must not be negative"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    HdSetupFixture f;
    const Mesh mesh = c.utm ? Utm() : local;
    test::ExpectStop(
        [&] {
          HdSolver s;
          SetupWithSolver(f, kHd + c.body, mesh, s);
        },
        f.log_path, c.message);
  }
}

}  // namespace
}  // namespace vhd
