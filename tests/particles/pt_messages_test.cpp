// Every setup message a user can provoke, one table row each: the setup
// text, and the message the run stops with (or warns with) in the log.

#include <gtest/gtest.h>

#include <ostream>

#include "pt_support.hpp"

namespace vhd::test {
namespace {

const std::string kSrc = kPtPath + "SOURCES]\nnumber_of_Sources = 1\n" + kPtPath + "SOURCES.SOURCE_1]\n";
const std::string kSrcClass = kPtPath + "SOURCES.SOURCE_1.CLASS_1]\n";
const std::string kGrid = kSrc + "type = 2\nformat = 2\ncoordinate_type = \"NON-UTM\"\n" + kPtPath +
                          "SOURCES.SOURCE_1.GRIDDED_SOURCE]\n";
const std::string kGeo = kSrc + "type = 2\nformat = 3\ncoordinate_type = \"NON-UTM\"\n" + kPtPath +
                         "SOURCES.SOURCE_1.GEOMETRIC_SOURCE]\n";
const std::string kGeoPoints = kPtPath + "SOURCES.SOURCE_1.GEOMETRIC_SOURCE.POINTS]\n";
const std::string kGeoElements = kPtPath + "SOURCES.SOURCE_1.GEOMETRIC_SOURCE.ELEMENTS]\n";
const std::string kFileSrc = kSrc + "type = 3\nformat = 5\ncoordinate_type = \"NON-UTM\"\nfile_name = ";
const std::string kPoint = "type = 1\ncoordinate_type = \"NON-UTM\"\ncoordinates = [50.0, 50.0, 0.0]\n";

struct MessageCase {
  const char* name;
  std::string module_keys;  // keys of PARTICLE_TRACKING_MODULE after mode
  std::string body;         // sections after the class
  std::string plaintext;    // contents of particles.txt beside the setup (when not empty)
  const char* message;
};

// The case's name in test output (instead of its bytes).
void PrintTo(const MessageCase& c, std::ostream* os) { *os << c.name; }

std::vector<MessageCase> Cases() {
  return {
      {"mode", "", "", "", "mode is illegal"},
      {"discretization", "discretization = 2\n", "", "", "Only finite volume discretization supported for PT"},
      {"classes", "", "", "", "Number of classes must be a positive number"},
      {"settling_type", "", ClassSection("SETTLING", "type = 3\n"), "", "Type not supported for settling"},
      {"settling_format", "", ClassSection("SETTLING", "type = 1\nformat = 1\n"), "",
       "Format not supported for settling"},
      {"vertical_eddy", "", ClassSection("DISPERSION.VERTICAL_DISPERSION", "type = 2\n"), "",
       "Vertical dispersion cannot use Eddy Viscosity formulation in VX7KX"},
      {"point_format", "", kSrc + "type = 1\nformat = 2\n", "", "Illegal format for point sources!"},
      {"area_format", "", kSrc + "type = 2\nformat = 0\n", "", "Illegal format for area sources!"},
      {"file_format", "", kSrc + "type = 3\nformat = 0\n", "", "Illegal format for file sources!"},
      {"source_type", "", kSrc + "type = 4\nformat = 0\n", "", "Unknown source type!"},
      {"track_replay", "", kSrc + "type = 3\nformat = 4\n", "", "Unknown source fromat!"},
      {"misplaced", "",
       kSrc + "type = 1\ncoordinate_type = \"NON-UTM\"\ncoordinates = [500.0, 50.0, 0.0]\nfail_on_misplaced = true\n",
       "", "Source, particle placed out of domain"},
      {"particles_format", "", kSrc + kPoint + kSrcClass + "format_particle = 1\n", "",
       "Unknown format for particles per time step"},
      {"grid_rows", "", kGrid + "origin = [10.0, 10.0]\nwidth = 10.0\nheight = 10.0\nrows = 0\n", "",
       "A gridded source must have at least one column/row"},
      {"grid_fillmode", "", kGrid + "origin = [10.0, 10.0]\nwidth = 10.0\nheight = 10.0\nfillmode = 3\n", "",
       "Unknown fillmode for gridded source"},
      {"grid_size", "", kGrid + "origin = [10.0, 10.0]\nwidth = 10.0\nheight = 10.0\nrows = 20000\ncolumns = 20000\n",
       "", "A gridded source has at most 100000000 points"},
      {"pool_size", "",
       kSrc + kPoint + kSrcClass + "number_of_particles_per_timestep = 2000000000\n", "",
       "at most 2000000000 can be tracked"},
      {"grid_format", "", kGrid + "format = 5\n", "", "Unknown format for gridded source!"},
      {"grid_outside", "", kGrid + "origin = [500.0, 500.0]\nwidth = 10.0\nheight = 10.0\n", "",
       "No valid point definitions found for gridded source!"},
      {"geo_points", "", kGeo + "npoints = 0\n", "", "A geometric source must have at least one point!"},
      {"geo_elements", "", kGeo + "npoints = 1\nnelements = 0\n", "",
       "A geometric source must have at least one element!"},
      {"geo_empty_element", "",
       kGeo + "npoints = 3\nnelements = 1\n" + kGeoPoints + "point = [[10.0, 10.0], [20.0, 10.0], [20.0, 20.0]]\n" +
           kGeoElements + "element = [[]]\n",
       "", "An element must have one point!"},
      {"geo_zero_area", "",
       kGeo + "npoints = 3\nnelements = 1\n" + kGeoPoints + "point = [[10.0, 10.0], [20.0, 10.0], [30.0, 10.0]]\n" +
           kGeoElements + "element = [[1, 2, 3]]\n",
       "", "Can not distribute particles to zero area element: E_1"},
      {"plain_missing", "", kFileSrc + "\"missing.txt\"\n", "", "An error occured when loading plaintext particle data"},
      {"plain_empty", "", kFileSrc + "\"particles.txt\"\n", "\n", "No particles defined in plaintext source"},
      {"plain_class", "", kFileSrc + "\"particles.txt\"\n", "1 5 50.0 50.0 0.0 1.0\n",
       "Wrong number of classes defined in plaintext source"},
      {"plain_garbage", "", kFileSrc + "\"particles.txt\"\n", "1 1 fifty 50.0 0.0 1.0\n",
       "unknown error while reading data from plaintext source"},
      {"drift_type", "", kPtPath + "DRIFT_PROFILE]\ntype = 7\n", "", "Driftprofile type not supported"},
      {"wind_type", "", kPtPath + "WIND_FORCING]\ntype = 2\n", "", "Type not supported for PT Wind forcing"},
      {"wind_format", "", kPtPath + "WIND_FORCING]\ntype = 1\nformat = 3\nfile_name = \"wind.zrn2\"\n", "",
       "Format not supported for PT wind forcing"},
      {"bed_roughness", "", kPtPath + "BED_ROUGHNESS]\nformat = 1\n", "", "Format not supported for bed roughness"},
      {"particle_frequency", "",
       kPtPath + "OUTPUTS]\nnumber_of_outputs = 1\n" + kPtPath + "OUTPUTS.OUTPUT_1]\nfile_name = \"t.xml\"\n" +
           kPtPath + "OUTPUTS.OUTPUT_1.PARTICLE_TRACK]\nparticle_frequency = 0\n",
       "", "Invalid particle frequency specified!"},
  };
}

class PtSetupMessage : public testing::TestWithParam<MessageCase> {};

TEST_P(PtSetupMessage, StopsWithTheMessage) {
  const MessageCase& c = GetParam();
  const Mesh mesh = MakeMesh(10, 10, 10.0, 10.0, Flat(5.0));
  PtFixture f;
  if (!c.plaintext.empty()) WriteTextFile(f.dir.file("particles.txt"), c.plaintext);
  std::string module = "[VantorHD.PARTICLE_TRACKING_MODULE]\nmode = 2\n" + c.module_keys;
  if (std::string(c.name) == "mode") module = "[VantorHD.PARTICLE_TRACKING_MODULE]\nmode = 1\n";
  const int nclasses = std::string(c.name) == "classes" ? 0 : 1;
  f.ExpectSetupStops(module + kPtPath + "CLASSES]\nnumber_of_classes = " + std::to_string(nclasses) + "\n" +
                         kPtPath + "CLASSES.CLASS_1]\nminimum_particle_mass = 0.5\nmaximum_particle_mass = 2.0\n" +
                         c.body,
                     mesh, c.message);
}

INSTANTIATE_TEST_SUITE_P(Table, PtSetupMessage, testing::ValuesIn(Cases()),
                         [](const testing::TestParamInfo<MessageCase>& i) { return i.param.name; });

// Warnings that let the run go on: clipped source values, a misplaced
// source without fail_on_misplaced.
TEST(PtSetupWarning, ClippedSourceValuesAndMisplacedSource) {
  const Mesh mesh = MakeMesh(10, 10, 10.0, 10.0, Flat(5.0));
  const struct {
    std::string body;
    const char* message;
  } cases[] = {
      {kSrc + kPoint + kSrcClass + "number_of_particles_per_timestep = 1\ntype_value = 0.1\n",
       "WARNING: At least one source value smaller than minimum, source value clipped!"},
      {kSrc + kPoint + kSrcClass + "number_of_particles_per_timestep = 1\ntype_value = 7.0\n",
       "WARNING: At least one source value larger than maximum, source value clipped!"},
      {kSrc + "type = 1\ncoordinate_type = \"NON-UTM\"\ncoordinates = [500.0, 50.0, 0.0]\n",
       "Source, particle placed out of domain"},
  };
  for (const auto& c : cases) {
    PtFixture f;
    f.Setup(PtModuleText("minimum_particle_mass = 0.5\nmaximum_particle_mass = 2.0\n", c.body), mesh, 10.0, 5);
    EXPECT_NE(JoinedLog(f.log_path).find(c.message), std::string::npos) << c.message;
  }
}

}  // namespace
}  // namespace vhd::test
