// HD module setup: the presets that depend on other settings, legacy and
// stored codes, metric arrays of geographic meshes, and the setup errors with
// their texts.

#include <gtest/gtest.h>

#include <cmath>
#include <string>

#include "hydro/hd_module.hpp"
#include "setup_support.hpp"

namespace vhd {
namespace {

using test::HdSection;
using test::HdSetupFixture;
using test::kHd;
using test::MakeMesh;

Mesh Small() { return MakeMesh(2, 2, 1.0, 1.0); }

TEST(SetupHD, DefaultsOfAMinimalSetup) {
  HdSetupFixture f;
  // First order ignores the reconstruction keys.
  f.Setup(kHd + HdSection("SOLUTION_TECHNIQUE", "gradient_limiter = 3\n"),
          MakeMesh(4, 3, 10.0, 10.0, test::Flat(2.0)));
  const HdModule& hd = f.hd;
  // Flooding and drying off: every depth 0, no CFL correction, explicit drag.
  EXPECT_EQ(hd.flood_dry.drying_depth, 0.0);
  EXPECT_EQ(hd.flood_dry.flooding_depth, 0.0);
  EXPECT_EQ(hd.flood_dry.mass_depth, 0.0);
  EXPECT_EQ(hd.time_step.CFL_correction_HD, 0);
  EXPECT_EQ(hd.solution.bed_resistance_discretization, 1);
  // First-order presets.
  const HdSolutionTechnique& st = hd.solution;
  EXPECT_EQ(st.gradient_limiter, 0);
  EXPECT_EQ(st.face_value_limiter, 0);
  EXPECT_FALSE(st.preserve_dU);
  EXPECT_EQ(st.face_average_d, 0);
  EXPECT_FALSE(st.face_limit_dry);
  EXPECT_EQ(st.s_blend, 0.0);
  // Time-step control of a 30 s overall step.
  EXPECT_DOUBLE_EQ(hd.time_step.dt_min_HD, 0.01);
  EXPECT_EQ(hd.time_step.dt_max_HD, 30.0);
  EXPECT_DOUBLE_EQ(hd.time_step.dt_min_AD, 0.01);
  EXPECT_EQ(hd.time_step.dt_max_AD, 30.0);
  // Bed resistance: Manning number 32 stored as code 3; eddy viscosity 0.002.
  EXPECT_EQ(hd.bed.type, kBedManning);
  EXPECT_DOUBLE_EQ(hd.bed.K[1], 9.81 / (32.0 * 32.0));
  EXPECT_EQ(hd.eddy.horizontal.type, kEddyConstant);
  EXPECT_EQ(hd.eddy.horizontal.value.values[12], 0.002);
  // State: every element wet, d from the bed level.
  ASSERT_EQ(hd.state.nelements, 12);
  for (int e = 1; e <= 12; ++e) {
    EXPECT_EQ(hd.state.wetdry[e], kWet);
    EXPECT_DOUBLE_EQ(hd.state.d[e], 2.0);
  }
  // No metric factors on a Cartesian mesh; velocity gradients only with eddy
  // viscosity.
  EXPECT_TRUE(hd.state.cos_lat.empty() && hd.state.tan_lat.empty());
  EXPECT_EQ(hd.state.ux.empty(), hd.eddy.horizontal.type == 0);
}

TEST(SetupHD, SmallOverallStepScalesTheMinimumStep) {
  HdSetupFixture f;
  f.Setup(kHd, Small(), 0.5);
  EXPECT_DOUBLE_EQ(f.hd.time_step.dt_min_HD, 0.005);
  EXPECT_DOUBLE_EQ(f.hd.time_step.dt_min_AD, 0.005);
  EXPECT_EQ(f.hd.time_step.dt_max_HD, 0.5);
}

TEST(SetupHD, FloodAndDryPresetsDepthsAndCorrectionsOfTypeOneOnly) {
  for (int type : {1, 2}) {
    SCOPED_TRACE(type);
    HdSetupFixture f;
    f.Setup(kHd + HdSection("FLOOD_AND_DRY", "type = " + std::to_string(type) + "\n"), Small());
    EXPECT_DOUBLE_EQ(f.hd.flood_dry.drying_depth, 0.005);
    EXPECT_DOUBLE_EQ(f.hd.flood_dry.flooding_depth, 0.05);
    EXPECT_DOUBLE_EQ(f.hd.flood_dry.mass_depth, 0.1);
    EXPECT_EQ(f.hd.flood_dry.maximum_number_of_iterations, 10);
    EXPECT_EQ(f.hd.time_step.CFL_correction_HD, type == 1 ? 1 : 0);
    EXPECT_EQ(f.hd.solution.bed_resistance_discretization, type == 1 ? 2 : 1);
  }
}

TEST(SetupHD, SecondOrderPresetsAndReadsTheReconstructionKeys) {
  HdSetupFixture f;
  f.Setup(kHd + HdSection("SOLUTION_TECHNIQUE",
                          "scheme_of_time_integration = 2\nscheme_of_space_discretization_horizontal = 2\n"
                          "gradient_limiter = 3\nface_average_d = 2\ntype_of_filtering = 1\n"
                          "type_of_Riemann_solver = 3\ntype_of_entropy_fix = 0\n"),
          Small());
  const HdSolutionTechnique& st = f.hd.solution;
  EXPECT_EQ(st.gradient_limiter, 3);
  EXPECT_EQ(st.face_value_limiter, 2);
  EXPECT_TRUE(st.preserve_dU);
  EXPECT_EQ(st.face_average_d, 2);
  EXPECT_TRUE(st.face_limit_dry);
  EXPECT_EQ(st.s_blend, 1.0);
  EXPECT_DOUBLE_EQ(st.filtering_coefficient, 0.01);
  // The entropy fix is read with the Roe solver only.
  EXPECT_EQ(st.type_of_entropy_fix, 1);
}

TEST(SetupHD, FormulationMappingByDimension) {
  EXPECT_EQ(MapFormulationHD(4, 2), 1);
  EXPECT_EQ(MapFormulationHD(4, 3), 1);
  EXPECT_EQ(MapFormulationHD(5, 3), 3);
  EXPECT_EQ(MapFormulationHD(6, 3), 2);
  EXPECT_EQ(MapFormulationHD(5, 2), 5);  // refused later in 2D
  EXPECT_EQ(MapFormulationHD(2, 3), 2);
  // The legacy hydrostatic code read from a setup file.
  HdSetupFixture f;
  f.Setup(kHd + HdSection("EQUATION", "formulation = 4\n"), Small());
  EXPECT_EQ(f.hd.formulation, 1);
}

TEST(SetupHD, StoredBedResistanceAndEddyCodes) {
  {
    HdSetupFixture f;
    f.Setup(kHd + HdSection("BED_RESISTANCE", "type = 5\n"), Small());
    EXPECT_EQ(f.hd.bed.type, kBedRoughness);
    // ks = 0.05 m gives M = 25.4 / 0.05^(1/6) = 41.85 before K = g / M^2.
    EXPECT_NEAR(std::sqrt(9.81 / f.hd.bed.K[1]), 41.85, 0.005);
  }
  {
    HdSetupFixture f;
    f.Setup(kHd + HdSection("BED_RESISTANCE", "type = 7\n"), Small());
    EXPECT_EQ(f.hd.bed.type, kBedWaveRoughness);
  }
  {
    HdSetupFixture f;
    f.Setup(kHd + HdSection("BED_RESISTANCE", "type = 3\n") +
                HdSection("BED_RESISTANCE.CHEZY_NUMBER", "constant_value = 50.0\n"),
            Small());
    EXPECT_EQ(f.hd.bed.type, kBedChezy);
    EXPECT_DOUBLE_EQ(f.hd.bed.K[4], 9.81 / 2500.0);
  }
  {
    HdSetupFixture f;
    f.Setup(kHd + HdSection("EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY", "type = 3\n"), Small());
    EXPECT_EQ(f.hd.eddy.horizontal.type, kEddySmagorinsky);
    EXPECT_DOUBLE_EQ(f.hd.eddy.horizontal.value.values[1], 0.28);
  }
}

TEST(SetupHD, GeographicMeshGetsMetricArrays) {
  HdSetupFixture f;
  // One degree square cells north of 50 degrees latitude, held in radians.
  const double deg = kDegToRad;
  f.Setup(kHd, MakeMesh(3, 2, deg, deg, test::Flat(10.0), CellLayout::kQuadrilaterals, "LONG/LAT", 5.0 * deg,
                        50.0 * deg));
  EXPECT_EQ(f.hd.projection, 2);
  EXPECT_EQ(f.hd.metric_radius, 6366707.0);
  const Mesh& mesh = f.meshes[0];
  for (int e = 1; e <= f.hd.state.nelements; ++e) {
    EXPECT_NEAR(f.hd.state.cos_lat[e], std::cos(mesh.elements.yc[e]), 1e-14);
    EXPECT_NEAR(f.hd.state.tan_lat[e], std::tan(mesh.elements.yc[e]), 1e-14);
  }
}

// One setup error of each kind, with its text.
TEST(SetupHDDeath, SetupErrorsStopWithTheirMessages) {
  const std::string bed = HdSection("BED_RESISTANCE", "type = ");
  const std::string eddy = HdSection("EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY", "type = ");
  const std::string solution = kHd + HdSection("SOLUTION_TECHNIQUE", "");
  struct Case {
    std::string body, message;
    int ndim = 2, mode = 2;
    bool gpu = false;
  } cases[] = {
      {kHd, "Fatal error: mode is illegal", 2, 1},
      {kHd, "3D hydrodynamics is not available", 3},
      {kHd + HdSection("EQUATION", "formulation = 2\n"), "SetupEquationHD: formulation = 2"},
      {kHd + bed + "1\n", "Fatal error: Type not supported for bed resistance"},
      {kHd + bed + "8\n", "Fatal error: Type not supported for bed resistance"},
      {kHd + bed + "4\n" + HdSection("BED_RESISTANCE.MANNING_NUMBER", "format = 1\n"),
       "Format not supported for Manning number."},
      {kHd + bed + "6\n" + HdSection("BED_RESISTANCE.DIRECTIONAL_ROUGHNESS", "format = 3\n"),
       "Format not supported for directional roughness."},
      {kHd + HdSection("BED_RESISTANCE.MANNING_NUMBER", "constant_value = 0.0\n"),
       "SetupBedResistanceHD: Manning number"},
      {kHd + eddy + "2\n", "Fatal error: Type not supported for eddy viscosity"},
      {kHd + eddy + "3\n" +
           HdSection("EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY.SMAGORINSKY_FORMULATION", "format = 1\n"),
       "Wrong format for Smagorinsky formulation."},
      {kHd + eddy + "5\n", "needs the 3D turbulence model"},
      {solution + "type_of_Riemann_solver = 5\n", "SetupSolutionMethodHD: type_of_Riemann_solver = 5"},
      {solution + "dt_min_HD = 0.0\n", "dt_min_HD"},
      {solution + "dt_max_HD = 0.001\n", "dt_max_HD"},
      {kHd + HdSection("FLOOD_AND_DRY", "type = 1\ndrying_depth = 0.2\n"), "SetupFloodDryHD: the depths"},
      {kHd + HdSection("INITIAL_CONDITIONS", "type = 4\n"), "Type not supported for initial conditions"},
      {solution + "type_of_Riemann_solver = 2\n", "This type of Riemann solver is not available using GPU", 2, 2,
       true},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    HdSetupFixture f;
    f.modules.hd = c.mode;
    if (c.gpu) f.run.gpu_devices = {0};
    f.ExpectSetupStops(c.body, Small(), c.message, c.ndim);
  }
}

// Sections of features this build does not have: switched on they stop the
// setup naming the feature and the section; switched off they are skipped,
// keys and all.
TEST(SetupHDDeath, FeaturesNotInTheBuildStopTheRunWhenSwitchedOn) {
  const std::string na = " is not available in this build (";
  struct Case {
    std::string section, keys, message;
  } cases[] = {
      {"PRECIPITATION_EVAPORATION", "type_of_evaporation = 2\n", "heat exchange" + na + "type_of_evaporation = 2"},
      {"RADIATION_STRESS", "type = 2\n", "Radiation stress from the wave module" + na + "type = 2"},
      {"INFILTRATION", "type = 1\n", "Infiltration" + na},
      {"TEMPERATURE_SALINITY_MODULE", "salinity_mode = 2\n", "Temperature and salinity" + na + "salinity_mode = 2"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.section);
    HdSetupFixture f;
    f.ExpectSetupStops(kHd + HdSection(c.section, c.keys), Small(), c.message);
  }
}

TEST(SetupHD, FeaturesSwitchedOffAreSkipped) {
  HdSetupFixture f;
  f.Setup(kHd + HdSection("WIND_FORCING", "type = 0\nconstant_speed = 10.0\n") +
              HdSection("CORIOLIS", "type = 0\n") + HdSection("SOURCES", "number_of_sources = 0\n") +
              HdSection("SOURCES.SOURCE_1", "type = 1\n") +
              HdSection("PRECIPITATION_EVAPORATION", "type_of_precipitation = 0\n"),
          Small());
  SktReportUnusedKeywords();
  const std::string log = f.Log();
  EXPECT_NE(log.find("Section: WIND_FORCING"), std::string::npos) << log;
  EXPECT_NE(log.find("number_of_sources : 0"), std::string::npos) << log;
  EXPECT_EQ(log.find("Warning"), std::string::npos) << log;
}

}  // namespace
}  // namespace vhd
