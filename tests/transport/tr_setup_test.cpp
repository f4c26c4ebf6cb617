// Setup of the transport module: defaults, what the sections give the
// solver, and every message of the setup a user can provoke.

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "../hydro/setup_support.hpp"
#include "transport/tr_module.hpp"

namespace vhd::test {
namespace {

// 8 x 4 cells of 100 m, 5 m deep; the west side is boundary code 2 and the
// east side code 3, open or closed as the HD setup says.
Mesh BasinMesh() {
  RectangleMeshSpec spec = RectSpec(8, 4, 100.0, 100.0, Flat(5.0), CellLayout::kMixed);
  spec.code_west = 2;
  spec.code_east = 3;
  Mesh mesh;
  GenerateRectangleMesh(spec, mesh);
  SetupMeshGeometry(mesh);
  return mesh;
}

// HD sections: level boundaries at both ends and one source in the middle.
const std::string kFlow = kHd +
                          HdSection("BOUNDARY_CONDITIONS.CODE_2", "type = 6\nformat = 0\nconstant_value = 0.0\n") +
                          HdSection("BOUNDARY_CONDITIONS.CODE_3", "type = 6\nformat = 0\nconstant_value = 0.0\n") +
                          HdSection("SOURCES", "number_of_sources = 1\n") +
                          HdSection("SOURCES.SOURCE_1",
                                    "type = 1\ncoordinates = [410.0, 190.0]\nformat = 0\nconstant_value = 1.0\n");
// The same with the two ends paired as a cyclic boundary.
const std::string kCyclicFlow = kHd + HdSection("BOUNDARY_CONDITIONS.CODE_2", "type = 15\n") +
                                HdSection("BOUNDARY_CONDITIONS.CODE_3", "type = 15\n");

std::string Tr(const std::string& path, const std::string& keys) {
  return "[VantorHD.TRANSPORT_MODULE" + (path.empty() ? std::string() : "." + path) + "]\n" + keys;
}
const std::string kTr = Tr("", "mode = 2\n");

class TrSetupFixture : public HdSetupFixture {
 public:
  void SetupBoth(const std::string& body, const Mesh& mesh, int ndim_tr = 2, int hd_mode = 2) {
    modules.tr = 2;
    modules.hd = hd_mode;
    Setup(body, mesh);
    ModuleSelection selection = modules;
    selection.ndim = ndim_tr;
    SetupStructureTR(tr, hd, mesh, time, selection);
  }
  TrModule tr;
};

TEST(TransportSetup, FirstComponentWithoutKeysTakesTheDefaults) {
  TrSetupFixture f;
  const Mesh mesh = BasinMesh();
  f.SetupBoth(kFlow + kTr, mesh);
  ASSERT_EQ(f.tr.number_of_components, 1);
  const TrComponent& c = f.tr.components[1];
  EXPECT_EQ(c.name, "COMPONENT_1");
  EXPECT_EQ(c.description, "Concentration - component 1");
  EXPECT_EQ(c.type, 2);
  EXPECT_EQ(c.dimension, 3);
  EXPECT_EQ(c.UVQ_type, 100201);
  EXPECT_EQ(c.UVQ_unit, 99000);
  EXPECT_EQ(c.minimum_value, -1e10);
  EXPECT_EQ(c.maximum_value, 1e10);
  EXPECT_EQ(f.tr.data[1].ad.minimum, -1e10);
  EXPECT_EQ(f.tr.data[1].ad.maximum, 1e10);
  EXPECT_EQ(f.tr.start_time_step, 0);
  EXPECT_EQ(f.tr.type2_3d, std::vector<int>{1});
  // No data at the open boundaries: inflow carries the inner concentration.
  for (int k = 1; k <= f.hd.boundary.faces.size(); ++k) EXPECT_EQ(f.tr.data[1].ad.boundary_type[k], kAdBoundaryNone);
  EXPECT_NE(f.Log().find("Section: TRANSPORT_MODULE"), std::string::npos);
}

TEST(TransportSetup, ComponentsSourcesBoundariesAndStartStep) {
  TrSetupFixture f;
  const Mesh mesh = BasinMesh();
  f.time.last_step = 100;
  const std::string body =
      kFlow + kTr + Tr("TIME", "start_time_step = 4\n") + Tr("COMPONENTS", "number_of_components = 3\n") +
      Tr("COMPONENTS.COMPONENT_1", "name = \"Dye\"\nUVQ_type = 100007\nUVQ_unit = 2200\nminimum_value = 0.0\n") +
      Tr("COMPONENTS.COMPONENT_2", "name = \"Age\"\ntype = 1\ndimension = 2\n") +
      Tr("COMPONENTS.COMPONENT_3", "name = \"Salt\"\ndimension = 2\nmaximum_value = 40.0\n") +
      Tr("SOURCES.COMPONENT_1.SOURCE_1", "type = 2\nformat = 0\nconstant_value = 5.0\n") +
      Tr("DECAY.COMPONENT_3", "type = 1\nformat = 0\nconstant_value = 1e-4\n") +
      Tr("BOUNDARY_CONDITIONS.CODE_2.COMPONENT_1", "type = 2\nformat = 0\nconstant_value = 3.0\n") +
      Tr("BOUNDARY_CONDITIONS.CODE_3.COMPONENT_3", "type = 3\nformat = 0\nconstant_value = 30.0\n");
  f.SetupBoth(body, mesh);
  EXPECT_EQ(f.tr.start_time_step, 4);
  EXPECT_DOUBLE_EQ(f.tr.start_time, 120.0);
  // The concentration pair of the old unit library becomes the component's.
  EXPECT_EQ(f.tr.components[1].UVQ_type, 100201);
  EXPECT_EQ(f.tr.components[1].UVQ_unit, 99000);
  EXPECT_EQ(f.tr.type2_3d, std::vector<int>{1});
  EXPECT_EQ(f.tr.type1_2d, std::vector<int>{2});
  EXPECT_EQ(f.tr.type2_2d, std::vector<int>{3});
  EXPECT_EQ(f.tr.data[3].ad.maximum, 40.0);
  ASSERT_EQ(f.tr.data[1].sources.size(), 1u);
  EXPECT_EQ(f.tr.data[1].sources[0].type, 2);
  EXPECT_EQ(f.tr.data[3].decay_type, 1);
  EXPECT_EQ(f.tr.data[3].decay.constant_value, 1e-4);
  const HdBoundary& bc = f.hd.boundary;
  for (int code = 2; code <= 3; ++code) {
    const BoundaryCondition& b = bc.codes[code];
    ASSERT_GT(b.nfaces, 0);
    for (int j = 0; j < b.nfaces; ++j) {
      const int k = b.first_face + j;
      EXPECT_EQ(f.tr.data[1].ad.boundary_type[k], code == 2 ? kAdBoundaryValue : kAdBoundaryNone);
      EXPECT_EQ(f.tr.data[2].ad.boundary_type[k], kAdBoundaryNone);
      EXPECT_EQ(f.tr.data[3].ad.boundary_type[k], code == 3 ? kAdBoundaryValue : kAdBoundaryNone);
    }
  }
}

TEST(TransportSetup, KeysReadNowhereAreReported) {
  TrSetupFixture f;
  const Mesh mesh = BasinMesh();
  // No decay: its rate is not read; a misspelt component key.
  f.SetupBoth(kFlow + kTr + Tr("DECAY.COMPONENT_1", "type = 0\nconstant_value = 1e-3\n") +
                  Tr("COMPONENTS.COMPONENT_1", "minimum_valeu = 0.0\n"),
              mesh);
  SktReportUnusedKeywords();
  const std::string log = f.Log();
  EXPECT_NE(log.find("constant_value"), std::string::npos) << log;
  EXPECT_NE(log.find("minimum_valeu"), std::string::npos) << log;
  EXPECT_NE(log.find("did you mean minimum_value"), std::string::npos) << log;
}

TEST(TransportSetup, CyclicBoundaryFollowsTheFlowsPairs) {
  TrSetupFixture f;
  const Mesh mesh = BasinMesh();
  f.SetupBoth(kCyclicFlow + kTr + Tr("BOUNDARY_CONDITIONS.CODE_2.COMPONENT_1", "type = 6\n") +
                  Tr("BOUNDARY_CONDITIONS.CODE_3.COMPONENT_1", "type = 6\ncode_cyclic = 2\n"),
              mesh);
  EXPECT_EQ(f.tr.data[1].codes[2].partner, 3);
  EXPECT_EQ(f.tr.data[1].codes[3].partner, 2);
}

struct MessageCase {
  const char* name;
  std::string body;
  std::string message;
  int ndim_tr = 2;
  int hd_mode = 2;
};

class TransportSetupMessages : public testing::TestWithParam<MessageCase> {};

TEST_P(TransportSetupMessages, StopsTheRun) {
  const MessageCase& c = GetParam();
  TrSetupFixture f;
  const Mesh mesh = BasinMesh();
  ExpectStop([&] { f.SetupBoth(c.body, mesh, c.ndim_tr, c.hd_mode); }, f.log_path, c.message);
}

INSTANTIATE_TEST_SUITE_P(
    Table, TransportSetupMessages,
    testing::Values(
        MessageCase{"Mode", kFlow + Tr("", "mode = 1\n"), "mode is illegal (mode = 1"},
        MessageCase{"StartStep", kFlow + kTr + Tr("TIME", "start_time_step = -1\n"),
                    "Illegal start time step (start_time_step = -1 in VantorHD/TRANSPORT_MODULE/TIME)"},
        MessageCase{"NoComponents", kFlow + kTr + Tr("COMPONENTS", "number_of_components = 0\n"),
                    "Number of components must be a positive number"},
        MessageCase{"ComponentType", kFlow + kTr + Tr("COMPONENTS.COMPONENT_1", "type = 3\n"),
                    "SetupEquationTR: Type not supported for components (type = 3"},
        MessageCase{"SameNames", kFlow + kTr + Tr("COMPONENTS", "number_of_components = 2\n") +
                                     Tr("COMPONENTS.COMPONENT_2", "name = \"COMPONENT_1\"\n"),
                    "components 1 and 2 have the same name"},
        MessageCase{"AD2D", kFlow + kTr + Tr("COMPONENTS.COMPONENT_1", "dimension = 2\n"),
                    "SetupEquationTR: AD2D state variables not allowed", 3},
        MessageCase{"Formulation", kFlow + kTr + Tr("EQUATION", "formulation = 2\n"),
                    "SetupEquationTR: Type not supported for formulation (formulation = 2"},
        MessageCase{"MeshNumber", kFlow + kTr + Tr("SPACE", "number_of_2D_mesh_velocity = 2\n"),
                    "number_of_2D_mesh_velocity = 2 in VantorHD/TRANSPORT_MODULE/SPACE"},
        MessageCase{"FlowFromInput", "[VantorHD.HYDRODYNAMIC_MODULE]\nmode = 1\n" + kTr,
                    "Flow data from input not possible", 2, 1},
        MessageCase{"DispersionType", kFlow + kTr + Tr("DISPERSION.COMPONENT_1.HORIZONTAL_DISPERSION", "type = 5\n"),
                    "Type not supported for dispersion (type = 5"},
        MessageCase{"DispersionFormat",
                    kFlow + kTr + Tr("DISPERSION.COMPONENT_1.HORIZONTAL_DISPERSION", "type = 1\n") +
                        Tr("DISPERSION.COMPONENT_1.HORIZONTAL_DISPERSION.SCALED_EDDY_VISCOSITY", "format = 1\n"),
                    "Format not supported for dispersion (format = 1"},
        MessageCase{"DispersionCoefficientFormat",
                    kFlow + kTr + Tr("DISPERSION.COMPONENT_1.HORIZONTAL_DISPERSION", "type = 2\n") +
                        Tr("DISPERSION.COMPONENT_1.HORIZONTAL_DISPERSION.DISPERSION_COEFFICIENT", "format = 1\n"),
                    "Format not supported for dispersion coef."},
        MessageCase{"DecayFormat", kFlow + kTr + Tr("DECAY.COMPONENT_1", "type = 1\nformat = 1\n"),
                    "Format not supported for decay (format in VantorHD/TRANSPORT_MODULE/DECAY/COMPONENT_1)"},
        MessageCase{"DecayType", kFlow + kTr + Tr("DECAY.COMPONENT_1", "type = 2\n"),
                    "Type not supported for decay (type = 2"},
        MessageCase{"PrecipitationFormat",
                    kFlow + kTr + Tr("PRECIPITATION_EVAPORATION.COMPONENT_1", "type_of_precipitation = 1\n") +
                        Tr("PRECIPITATION_EVAPORATION.COMPONENT_1.PRECIPITATION", "format = 4\n"),
                    "Format not supported for precipitation (format = 4"},
        MessageCase{"EvaporationFormat",
                    kFlow + kTr + Tr("PRECIPITATION_EVAPORATION.COMPONENT_1", "type_of_evaporation = 1\n") +
                        Tr("PRECIPITATION_EVAPORATION.COMPONENT_1.EVAPORATION", "format = 7\n"),
                    "Format not supported for evaporation (format = 7"},
        MessageCase{"EvaporationType",
                    kFlow + kTr + Tr("PRECIPITATION_EVAPORATION.COMPONENT_1", "type_of_evaporation = 3\n"),
                    "Type not supported for evaporation (type_of_evaporation = 3"},
        MessageCase{"InfiltrationFormat",
                    kFlow + kTr + Tr("INFILTRATION.COMPONENT_1", "type_of_infiltration = 1\n") +
                        Tr("INFILTRATION.COMPONENT_1.INFILTRATION", "format = 5\n"),
                    "Format not supported for infiltration. (format = 5"},
        MessageCase{"SourceType", kFlow + kTr + Tr("SOURCES.COMPONENT_1.SOURCE_1", "type = 3\n"),
                    "Type not supported for sources (type = 3 in VantorHD/TRANSPORT_MODULE/SOURCES/COMPONENT_1/SOURCE_1)"},
        MessageCase{"SourceFormat", kFlow + kTr + Tr("SOURCES.COMPONENT_1.SOURCE_1", "format = 3\n"),
                    "SetupSourceAD: Not implemented"},
        MessageCase{"InitialType", kFlow + kTr + Tr("INITIAL_CONDITIONS.COMPONENT_1", "type = 2\n"),
                    "Initial condition type not supported (type = 2"},
        MessageCase{"InitialFormat", kFlow + kTr + Tr("INITIAL_CONDITIONS.COMPONENT_1", "format = 1\n"),
                    "Initial condition format not supported"},
        MessageCase{"BoundaryType", kFlow + kTr + Tr("BOUNDARY_CONDITIONS.CODE_2.COMPONENT_1", "type = 4\n"),
                    "Format not supported for data input (type = 4 in "
                    "VantorHD/TRANSPORT_MODULE/BOUNDARY_CONDITIONS/CODE_2/COMPONENT_1)"},
        MessageCase{"CyclicOnlyInTransport",
                    kFlow + kTr + Tr("BOUNDARY_CONDITIONS.CODE_2.COMPONENT_1", "type = 6\n"),
                    "SetupBoundCondTR: the flow boundary of code 2 is not cyclic"},
        MessageCase{"CyclicOnlyInFlow", kCyclicFlow + kTr, "SetupBoundCondTR: the flow boundary of code 2 is cyclic"},
        MessageCase{"CyclicPartner",
                    kCyclicFlow + kTr + Tr("BOUNDARY_CONDITIONS.CODE_2.COMPONENT_1", "type = 6\ncode_cyclic = 7\n") +
                        Tr("BOUNDARY_CONDITIONS.CODE_3.COMPONENT_1", "type = 6\n"),
                    "SetupBoundCondTR: Cyclic boundary not identified"}),
    [](const testing::TestParamInfo<MessageCase>& info) { return std::string(info.param.name); });

}  // namespace
}  // namespace vhd::test
