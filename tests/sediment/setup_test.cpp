// The setup of the sand-transport module: every key logged with its default,
// the grain diameter from a mesh data file, and every message a user can
// provoke in its sections.

#include <gtest/gtest.h>

#include <string>

#include "../hydro/setup_support.hpp"
#include "io/units.hpp"
#include "io/zrn.hpp"
#include "sediment/st_module.hpp"

namespace vhd {
namespace {

using test::kHd;
using test::MakeMesh;

// The sand sections of a setup: SAND_TRANSPORT_MODULE and, for each pair,
// the sub-section and its keys.
std::string Sand(const std::string& section = "", const std::string& keys = "") {
  std::string text = kHd + "[VantorHD.SAND_TRANSPORT_MODULE]\n";
  if (!section.empty()) text += "[VantorHD.SAND_TRANSPORT_MODULE." + section + "]\n" + keys;
  return text;
}

// HD setup on the mesh, then the sand setup in its section.
void SetupSand(test::HdSetupFixture& f, const std::string& body, const Mesh& mesh, StModule& st) {
  f.Setup(body, mesh);
  AllocateStateHD(f.hd, mesh);
  SktOpenSection("SAND_TRANSPORT_MODULE");
  SetupST(st, f.hd, mesh);
  SktCloseSection();
}

void WriteGrainFile(const std::string& name, const Mesh& mesh, double bad_value, int bad_element) {
  const int ne = mesh.elements.nelements;
  ZrnMeshData m;
  m.node_id = mesh.nodes.id;
  m.x = mesh.nodes.x;
  m.y = mesh.nodes.y;
  m.z = mesh.nodes.z;
  m.node_code = mesh.nodes.code;
  m.element_id = mesh.elements.id;
  m.element_type = mesh.elements.type;
  m.node_start = mesh.elements.node_start;
  m.node_list = mesh.elements.node_list;
  ZrnFile w;
  zrnHeaderCreate(w, name, kZrnFileMesh2D, "grain diameters");
  zrnSetMesh(w, m);
  zrnSetEqCalendarAxis(w, zrnDateTime({2004, 1, 1, 0, 0, 0}), 3600.0);
  for (int k = 1; k <= 2; ++k) {
    zrnSetItemInfo(w, k, "Item " + std::to_string(k), kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble);
    zrnSetItemAxisEqD4(w, k, kZrnLocationFace, ne);
  }
  zrnFileCreate(w);
  Array1<double> data(ne);
  for (int k = 1; k <= 2; ++k) {
    for (int e = 1; e <= ne; ++e) data[e] = e == bad_element && k == 2 ? bad_value : 1e-4 * k + 1e-6 * e;
    zrnWriteItemTimeStep(w, 0.0, data.begin(), ne);
  }
  zrnFileClose(w);
  zrnHeaderDestroy(w);
}

TEST(SandSetup, DefaultsAreReadAndLogged) {
  test::HdSetupFixture f;
  StModule st;
  const Mesh mesh = MakeMesh(4, 3, 10.0, 10.0, test::Flat(2.0), CellLayout::kMixed);
  SetupSand(f, Sand(), mesh, st);
  EXPECT_EQ(st.bed_load.formula, kBedLoadEngelundHansen);
  EXPECT_EQ(st.bed_load.critical_shields, 0.047);
  EXPECT_EQ(st.grain[1], 2e-4);
  EXPECT_EQ(st.morphology, 1);
  const std::string log = f.Log();
  for (const char* line :
       {"format : 0 (default)", "grain_diameter : 0.0002 (default)", "relative_density : 2.65 (default)",
        "porosity : 0.4 (default)", "bed_load_formula : 1 (default)", "bed_load_factor : 1 (default)",
        "streamwise_bedslope_factor : 5 (default)", "transverse_bedslope_factor : 1.25 (default)",
        "transverse_bedslope_exponent : 0.5 (default)", "critical_shields_parameter : 0.047 (default)",
        "type : 0 (default)", "type : 1 (default)", "morphological_factor : 1 (default)",
        "start_time : 0 (default)"})
    EXPECT_NE(log.find(line), std::string::npos) << line << "\n" << log;
}

TEST(SandSetup, GrainDiameterFromAMeshDataFile) {
  test::HdSetupFixture f;
  const Mesh mesh = MakeMesh(4, 3, 10.0, 10.0, test::Flat(2.0), CellLayout::kRandomTriangles);
  WriteGrainFile(f.dir.file("grain.zrnu"), mesh, 0.0, 0);
  StModule st;
  SetupSand(f, Sand("SEDIMENT_DATA", "format = 2\nfile_name = \"grain.zrnu\"\nitem_number_for_grain_diameter = 2\n"),
            mesh, st);
  for (int e = 1; e <= mesh.elements.nelements; ++e) EXPECT_DOUBLE_EQ(st.grain[e], 2e-4 + 1e-6 * e);
}

TEST(SandSetup, EveryMessage) {
  const Mesh mesh = MakeMesh(4, 3, 10.0, 10.0, test::Flat(2.0), CellLayout::kRandomTriangles);
  const std::string data = "SAND_TRANSPORT_MODULE/SEDIMENT_DATA";
  struct Case {
    std::string section, keys, message;
  };
  const Case cases[] = {
      {"SEDIMENT_DATA", "format = 1\n",
       "Format not supported for grain diameter: format = 1 in VantorHD/" + data + " (0 constant, 2 mesh data file)"},
      {"SEDIMENT_DATA", "grain_diameter = 0.0\n",
       "SetupSedimentDataST: grain_diameter = 0 in VantorHD/" + data + " must be greater than 0"},
      {"SEDIMENT_DATA", "format = 2\n", "SetupSedimentDataST: file_name missing in VantorHD/" + data},
      {"SEDIMENT_DATA", "format = 2\nfile_name = \"grain.zrnu\"\nitem_number_for_grain_diameter = 3\n",
       "grain.zrnu (it has 2 items)"},
      {"SEDIMENT_DATA", "format = 2\nfile_name = \"bad.zrnu\"\nitem_number_for_grain_diameter = 2\n",
       "bad.zrnu, item 2: the grain diameter of element 5 is -0.001; it must be greater than 0"},
      {"SEDIMENT_DATA", "relative_density = 1.0\n",
       "SetupSedimentDataST: relative_density = 1 in VantorHD/" + data + " must be greater than 1"},
      {"SEDIMENT_DATA", "porosity = 1.0\n",
       "SetupSedimentDataST: porosity = 1 in VantorHD/" + data + " must be at least 0 and less than 1"},
      {"SEDIMENT_DATA", "porosity = -0.1\n", "SetupSedimentDataST: porosity = -0.1 in VantorHD/" + data},
      {"BED_LOAD", "bed_load_factor = -1.0\n",
       "SetupBedLoadST: bed_load_factor = -1 in VantorHD/SAND_TRANSPORT_MODULE/BED_LOAD must not be negative"},
      {"BED_LOAD", "streamwise_bedslope_factor = -5.0\n", "SetupBedLoadST: streamwise_bedslope_factor = -5 in"},
      {"BED_LOAD", "transverse_bedslope_factor = -1.0\n", "SetupBedLoadST: transverse_bedslope_factor = -1 in"},
      {"BED_LOAD", "transverse_bedslope_exponent = -0.5\n",
       "SetupBedLoadST: transverse_bedslope_exponent = -0.5 in"},
      {"BED_LOAD", "critical_shields_parameter = 0.0\n",
       "SetupBedLoadST: critical_shields_parameter = 0 in VantorHD/SAND_TRANSPORT_MODULE/BED_LOAD must be greater "
       "than 0"},
      {"HELICAL_FLOW", "type = 2\n",
       "SetupHelicalFlowST: type = 2 in VantorHD/SAND_TRANSPORT_MODULE/HELICAL_FLOW is not supported (0 to 1)"},
      {"HELICAL_FLOW", "type = 1\ncoefficient = -7.0\n", "SetupHelicalFlowST: coefficient = -7 in"},
      {"MORPHOLOGY", "type = -1\n",
       "SetupMorphologyST: type = -1 in VantorHD/SAND_TRANSPORT_MODULE/MORPHOLOGY is not supported (0 to 1)"},
      {"MORPHOLOGY", "morphological_factor = -10.0\n", "SetupMorphologyST: morphological_factor = -10 in"},
      {"MORPHOLOGY", "start_time = -60.0\n",
       "SetupMorphologyST: start_time = -60 in VantorHD/SAND_TRANSPORT_MODULE/MORPHOLOGY must not be negative"},
      {"BED_LOAD", "bed_load_formula = 1.5\n", "bed_load_formula"},
  };
  for (const Case& c : cases) {
    test::HdSetupFixture f;
    WriteGrainFile(f.dir.file("grain.zrnu"), mesh, 0.0, 0);
    WriteGrainFile(f.dir.file("bad.zrnu"), mesh, -0.001, 5);
    StModule st;
    test::ExpectStop([&] { SetupSand(f, Sand(c.section, c.keys), mesh, st); }, f.log_path, c.message);
  }
}

TEST(SandSetup, GeographicMeshIsRefused) {
  test::HdSetupFixture f;
  const Mesh mesh = MakeMesh(4, 3, 0.01, 0.01, test::Flat(2.0), CellLayout::kMixed, "LONG/LAT", 10.0, 50.0);
  StModule st;
  test::ExpectStop([&] { SetupSand(f, Sand(), mesh, st); }, f.log_path,
                   "SetupST: the sand transport module needs a mesh in projected coordinates; the mesh is "
                   "geographic (LONG/LAT)");
}

TEST(SandSetup, FormulaOutsideTheFourWarns) {
  test::HdSetupFixture f;
  const Mesh mesh = MakeMesh(4, 3, 10.0, 10.0, test::Flat(2.0));
  StModule st;
  SetupSand(f, Sand("BED_LOAD", "bed_load_formula = 7\n"), mesh, st);
  EXPECT_NE(f.Log().find("Warning: bed_load_formula = 7 in VantorHD/SAND_TRANSPORT_MODULE/BED_LOAD selects none of "
                         "the formulas 1 to 4: there is no bed load"),
            std::string::npos)
      << f.Log();
}

}  // namespace
}  // namespace vhd
