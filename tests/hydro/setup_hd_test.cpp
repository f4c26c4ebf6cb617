// HD module setup: defaults and the presets that depend on other settings,
// legacy codes, stored codes, metric arrays of geographic meshes, and the
// setup errors with their texts.

#include <gtest/gtest.h>

#include <cmath>
#include <string>

#include "hydro/hd_module.hpp"
#include "setup_support.hpp"

namespace vhd {
namespace {

using test::HdSetupFixture;
using test::MakeMesh;

const char* kHd = "[VantorHD.HYDRODYNAMIC_MODULE]\nmode = 2\n";

TEST(SetupHD, DefaultsOfAMinimalSetup) {
  HdSetupFixture f;
  f.Setup(kHd, MakeMesh(4, 3, 10.0, 10.0, [](double, double) { return -2.0; }));
  const HdModule& hd = f.hd;
  EXPECT_EQ(hd.formulation, 1);
  EXPECT_EQ(hd.time_formulation, 2);
  EXPECT_EQ(hd.mesh_flag, 2);
  EXPECT_EQ(hd.projection, 1);
  EXPECT_EQ(hd.metric_radius, 1.0);
  // Flooding and drying off: every depth 0, no CFL correction, explicit drag.
  EXPECT_EQ(hd.flood_dry.type, 0);
  EXPECT_EQ(hd.flood_dry.drying_depth, 0.0);
  EXPECT_EQ(hd.flood_dry.flooding_depth, 0.0);
  EXPECT_EQ(hd.flood_dry.mass_depth, 0.0);
  EXPECT_EQ(hd.time_step.CFL_correction_HD, 0);
  EXPECT_EQ(hd.solution.bed_resistance_discretization, 1);
  // First-order presets.
  const HdSolutionTechnique& st = hd.solution;
  EXPECT_EQ(st.scheme_of_time_integration, 1);
  EXPECT_EQ(st.scheme_of_space_discretization_horizontal, 1);
  EXPECT_EQ(st.gradient_calculation, 2);
  EXPECT_EQ(st.gradient_limiter, 0);
  EXPECT_EQ(st.face_value_limiter, 0);
  EXPECT_EQ(st.boundary_correction, 1);
  EXPECT_FALSE(st.preserve_dU);
  EXPECT_EQ(st.face_average_d, 0);
  EXPECT_FALSE(st.face_limit_dry);
  EXPECT_EQ(st.s_blend, 0.0);
  EXPECT_EQ(st.type_of_Riemann_solver, 1);
  EXPECT_EQ(st.type_of_entropy_fix, 1);
  EXPECT_EQ(st.type_of_land_condition, 2);
  // Time-step control of a 30 s overall step.
  EXPECT_EQ(hd.time_step.CFL_critical_HD, 1.0);
  EXPECT_DOUBLE_EQ(hd.time_step.dt_min_HD, 0.01);
  EXPECT_EQ(hd.time_step.dt_max_HD, 30.0);
  EXPECT_DOUBLE_EQ(hd.time_step.dt_min_AD, 0.01);
  EXPECT_EQ(hd.time_step.dt_max_AD, 30.0);
  EXPECT_EQ(hd.time_step.CFL_critical_substeps_AD, 0.8);
  EXPECT_EQ(hd.time_step.error_level, 0);
  EXPECT_EQ(hd.time_step.maximum_number_of_errors, 200);
  // Bed resistance: Manning number 32 stored as code 3; eddy viscosity 0.002.
  EXPECT_EQ(hd.bed.type, kBedManning);
  EXPECT_DOUBLE_EQ(hd.bed.K[1], 9.81 / (32.0 * 32.0));
  EXPECT_EQ(hd.eddy.horizontal.type, kEddyConstant);
  EXPECT_EQ(hd.eddy.horizontal.value.values[12], 0.002);
  EXPECT_EQ(hd.initial.type, 0);
  // State: every element wet, d from the bed level.
  EXPECT_EQ(hd.state.nelements, 12);
  for (int e = 1; e <= 12; ++e) {
    EXPECT_EQ(hd.state.wetdry[e], kWet);
    EXPECT_DOUBLE_EQ(hd.state.d[e], 2.0);
  }
  // No metric factors on a Cartesian mesh; velocity gradients only with eddy
  // viscosity.
  EXPECT_TRUE(hd.state.cos_lat.empty() && hd.state.tan_lat.empty());
  EXPECT_EQ(hd.state.ux.empty(), hd.eddy.horizontal.type == 0);
  EXPECT_EQ(hd.timing.name, "Hydrodynamics");
}

TEST(SetupHD, SmallOverallStepScalesTheMinimumStep) {
  HdSetupFixture f;
  f.Setup(kHd, MakeMesh(2, 2, 1.0, 1.0), 0.5);
  EXPECT_DOUBLE_EQ(f.hd.time_step.dt_min_HD, 0.005);
  EXPECT_DOUBLE_EQ(f.hd.time_step.dt_min_AD, 0.005);
  EXPECT_EQ(f.hd.time_step.dt_max_HD, 0.5);
}

TEST(SetupHD, FloodAndDryTypeOnePresetsDepthsAndCorrections) {
  HdSetupFixture f;
  f.Setup(std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.FLOOD_AND_DRY]\ntype = 1\n", MakeMesh(2, 2, 1.0, 1.0));
  EXPECT_DOUBLE_EQ(f.hd.flood_dry.drying_depth, 0.005);
  EXPECT_DOUBLE_EQ(f.hd.flood_dry.flooding_depth, 0.05);
  EXPECT_DOUBLE_EQ(f.hd.flood_dry.mass_depth, 0.1);
  EXPECT_EQ(f.hd.flood_dry.maximum_number_of_iterations, 10);
  EXPECT_EQ(f.hd.time_step.CFL_correction_HD, 1);
  EXPECT_EQ(f.hd.solution.bed_resistance_discretization, 2);
  const std::string log = f.Log();
  EXPECT_NE(log.find("drying_depth"), std::string::npos);
}

TEST(SetupHD, FloodAndDryTypeTwoKeepsTheExplicitDefaults) {
  HdSetupFixture f;
  f.Setup(std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.FLOOD_AND_DRY]\ntype = 2\n", MakeMesh(2, 2, 1.0, 1.0));
  EXPECT_EQ(f.hd.time_step.CFL_correction_HD, 0);
  EXPECT_EQ(f.hd.solution.bed_resistance_discretization, 1);
  EXPECT_DOUBLE_EQ(f.hd.flood_dry.mass_depth, 0.1);
}

TEST(SetupHD, SecondOrderPresetsAndReadsTheReconstructionKeys) {
  HdSetupFixture f;
  f.Setup(std::string(kHd) +
              "[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]\n"
              "scheme_of_time_integration = 2\n"
              "scheme_of_space_discretization_horizontal = 2\n"
              "gradient_limiter = 3\n"
              "face_average_d = 2\n"
              "type_of_filtering = 1\n"
              "type_of_Riemann_solver = 3\n"
              "type_of_entropy_fix = 0\n",
          MakeMesh(2, 2, 1.0, 1.0));
  const HdSolutionTechnique& st = f.hd.solution;
  EXPECT_EQ(st.scheme_of_time_integration, 2);
  EXPECT_EQ(st.gradient_calculation, 2);
  EXPECT_EQ(st.gradient_limiter, 3);
  EXPECT_EQ(st.face_value_limiter, 2);
  EXPECT_EQ(st.boundary_correction, 1);
  EXPECT_TRUE(st.preserve_dU);
  EXPECT_EQ(st.face_average_d, 2);
  EXPECT_TRUE(st.face_limit_dry);
  EXPECT_EQ(st.s_blend, 1.0);
  EXPECT_EQ(st.type_of_filtering, 1);
  EXPECT_DOUBLE_EQ(st.filtering_coefficient, 0.01);
  EXPECT_EQ(st.type_of_Riemann_solver, 3);
  // The entropy fix is read with the Roe solver only.
  EXPECT_EQ(st.type_of_entropy_fix, 1);
}

TEST(SetupHD, FirstOrderIgnoresReconstructionKeysWithoutIce) {
  HdSetupFixture f;
  f.Setup(std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]\ngradient_limiter = 3\n",
          MakeMesh(2, 2, 1.0, 1.0));
  EXPECT_EQ(f.hd.solution.gradient_limiter, 0);
}

TEST(SetupHD, LegacyFormulationFourIsHydrostatic) {
  HdSetupFixture f;
  f.Setup(std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.EQUATION]\nformulation = 4\n", MakeMesh(2, 2, 1.0, 1.0));
  EXPECT_EQ(f.hd.formulation, 1);
}

TEST(SetupHD, FormulationMappingByDimension) {
  EXPECT_EQ(MapFormulationHD(4, 2), 1);
  EXPECT_EQ(MapFormulationHD(4, 3), 1);
  EXPECT_EQ(MapFormulationHD(5, 3), 3);
  EXPECT_EQ(MapFormulationHD(6, 3), 2);
  EXPECT_EQ(MapFormulationHD(5, 2), 5);  // refused later in 2D
  EXPECT_EQ(MapFormulationHD(2, 3), 2);
}

TEST(SetupHD, StoredBedResistanceCodes) {
  const std::string rough = std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]\ntype = 5\n";
  {
    HdSetupFixture f;
    f.Setup(rough, MakeMesh(2, 2, 1.0, 1.0));
    EXPECT_EQ(f.hd.bed.type, kBedRoughness);
    // ks = 0.05 m gives M = 25.4 / 0.05^(1/6) = 41.85 before K = g / M^2.
    const double M = std::sqrt(9.81 / f.hd.bed.K[1]);
    EXPECT_NEAR(M, 41.85, 0.005);
  }
  {
    HdSetupFixture f;
    f.Setup(std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]\ntype = 7\n", MakeMesh(2, 2, 1.0, 1.0));
    EXPECT_EQ(f.hd.bed.type, kBedWaveRoughness);
  }
  {
    HdSetupFixture f;
    f.Setup(std::string(kHd) +
                "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]\ntype = 3\n"
                "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.CHEZY_NUMBER]\nconstant_value = 50.0\n",
            MakeMesh(2, 2, 1.0, 1.0));
    EXPECT_EQ(f.hd.bed.type, kBedChezy);
    EXPECT_DOUBLE_EQ(f.hd.bed.K[4], 9.81 / 2500.0);
  }
}

TEST(SetupHD, StoredEddyCodesAndSmagorinskyDefaults) {
  HdSetupFixture f;
  f.Setup(std::string(kHd) +
              "[VantorHD.HYDRODYNAMIC_MODULE.EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY]\ntype = 3\n",
          MakeMesh(2, 2, 1.0, 1.0));
  const HdEddyRecord& r = f.hd.eddy.horizontal;
  EXPECT_EQ(r.type, kEddySmagorinsky);
  EXPECT_DOUBLE_EQ(r.value.values[1], 0.28);
  EXPECT_EQ(r.minimum_eddy_viscosity, 0.0);
  EXPECT_EQ(r.maximum_eddy_viscosity, 1.0e10);
}

TEST(SetupHD, GeographicMeshGetsMetricArrays) {
  HdSetupFixture f;
  // One degree square cells north of 50 degrees latitude, held in radians.
  const double deg = kDegToRad;
  f.Setup(kHd, MakeMesh(3, 2, deg, deg, [](double, double) { return -10.0; }, CellLayout::kQuadrilaterals,
                        "LONG/LAT", 5.0 * deg, 50.0 * deg));
  EXPECT_EQ(f.hd.projection, 2);
  EXPECT_EQ(f.hd.metric_radius, 6366707.0);
  const Mesh& mesh = f.meshes[0];
  for (int e = 1; e <= f.hd.state.nelements; ++e) {
    EXPECT_NEAR(f.hd.state.cos_lat[e], std::cos(mesh.elements.yc[e]), 1e-14);
    EXPECT_NEAR(f.hd.state.tan_lat[e], std::tan(mesh.elements.yc[e]), 1e-14);
  }
}

// ---- setup errors ----------------------------------------------------------------------

class SetupHDDeath : public ::testing::Test {
protected:
  void ExpectStops(const std::string& body, const std::string& message, int ndim = 2, int mode = 2) {
    HdSetupFixture f;
    f.modules.hd = mode;
    EXPECT_EXIT(test::InChild([&] { f.Setup(body, MakeMesh(2, 2, 1.0, 1.0), 30.0, ndim); }),
                testing::ExitedWithCode(1), "");
    EXPECT_NE(f.Log().find(message), std::string::npos) << "log: " << f.Log();
  }
};

TEST_F(SetupHDDeath, ModeDifferentFromTheModuleSelection) {
  ExpectStops(kHd, "Fatal error: mode is illegal", 2, 1);
}

TEST_F(SetupHDDeath, ThreeDimensionalHydrodynamicsIsNotAvailable) {
  ExpectStops(kHd, "3D hydrodynamics is not available", 3);
}

TEST_F(SetupHDDeath, NonHydrostaticFormulationIn2D) {
  ExpectStops(std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.EQUATION]\nformulation = 2\n",
              "SetupEquationHD: formulation = 2");
}

TEST_F(SetupHDDeath, UnsupportedBedResistanceTypes) {
  for (const char* type : {"1", "8", "-1"}) {
    ExpectStops(std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]\ntype = " + type + "\n",
                "Fatal error: Type not supported for bed resistance");
  }
}

TEST_F(SetupHDDeath, UnsupportedBedResistanceFormats) {
  const std::string base = std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE]\ntype = ";
  ExpectStops(base + "4\n[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]\nformat = 1\n",
              "Format not supported for Manning number.");
  ExpectStops(base + "2\n[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.DRAG_COEFFICIENT]\nformat = 4\n",
              "Format not supported for drag coefficient.");
  ExpectStops(base + "3\n[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.CHEZY_NUMBER]\nformat = 1\n",
              "Format not supported for Chezy number.");
  ExpectStops(base + "5\n[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.ROUGHNESS]\nformat = 1\n",
              "Format not supported for roughness.");
  ExpectStops(base + "6\n[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.DIRECTIONAL_ROUGHNESS]\nformat = 3\n",
              "Format not supported for directional roughness.");
}

TEST_F(SetupHDDeath, ManningNumberZeroNamesTheElement) {
  ExpectStops(std::string(kHd) +
                  "[VantorHD.HYDRODYNAMIC_MODULE.BED_RESISTANCE.MANNING_NUMBER]\nconstant_value = 0.0\n",
              "SetupBedResistanceHD: Manning number");
}

TEST_F(SetupHDDeath, UnsupportedEddyTypesAndFormats) {
  const std::string base =
      std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY]\ntype = ";
  ExpectStops(base + "2\n", "Fatal error: Type not supported for eddy viscosity");
  ExpectStops(base + "7\n", "Fatal error: Type not supported for eddy viscosity");
  ExpectStops(base + "3\n[VantorHD.HYDRODYNAMIC_MODULE.EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY."
                     "SMAGORINSKY_FORMULATION]\nformat = 1\n",
              "Wrong format for Smagorinsky formulation.");
  ExpectStops(base + "1\n[VantorHD.HYDRODYNAMIC_MODULE.EDDY_VISCOSITY.HORIZONTAL_EDDY_VISCOSITY."
                     "CONSTANT_EDDY_FORMULATION]\nformat = 3\n",
              "Wrong format for constant formulation.");
  ExpectStops(base + "5\n", "needs the 3D turbulence model");
}

TEST_F(SetupHDDeath, SolutionTechniqueOutOfRange) {
  const std::string base = std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]\n";
  ExpectStops(base + "type_of_Riemann_solver = 5\n", "SetupSolutionMethodHD: type_of_Riemann_solver = 5");
  ExpectStops(base + "scheme_of_time_integration = 3\n", "scheme_of_time_integration = 3");
  ExpectStops(base + "dt_min_HD = 0.0\n", "dt_min_HD");
  ExpectStops(base + "dt_max_HD = 0.001\n", "dt_max_HD");
}

TEST_F(SetupHDDeath, FloodDryDepthsOutOfOrder) {
  ExpectStops(std::string(kHd) +
                  "[VantorHD.HYDRODYNAMIC_MODULE.FLOOD_AND_DRY]\ntype = 1\ndrying_depth = 0.2\n",
              "SetupFloodDryHD: the depths");
}

TEST_F(SetupHDDeath, UnknownInitialConditionType) {
  ExpectStops(std::string(kHd) + "[VantorHD.HYDRODYNAMIC_MODULE.INITIAL_CONDITIONS]\ntype = 4\n",
              "Type not supported for initial conditions");
}

TEST(SetupHD, GpuRefusesUnsupportedRiemannSolver) {
  HdSetupFixture f;
  f.run.gpu_devices = {0};
  EXPECT_EXIT(test::InChild([&] {
                f.Setup(std::string(kHd) +
                            "[VantorHD.HYDRODYNAMIC_MODULE.SOLUTION_TECHNIQUE]\ntype_of_Riemann_solver = 2\n",
                        MakeMesh(2, 2, 1.0, 1.0));
              }),
              testing::ExitedWithCode(1), "");
  EXPECT_NE(f.Log().find("This type of Riemann solver is not available using GPU"), std::string::npos);
}

}  // namespace
}  // namespace vhd
