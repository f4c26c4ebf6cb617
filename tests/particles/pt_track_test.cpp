// Track files: the XML file parsed back (exactly the selected particles,
// steps and variables; degrees on a "LONG/LAT" mesh; compressed; the style
// sheet), the CF trajectory file opened in xarray, the encoding names, and
// the seed.

#include <gtest/gtest.h>

#include <filesystem>

#include "pt_support.hpp"

namespace vhd::test {
namespace {

std::string OutputText(const std::string& file, const std::string& track_keys, const std::string& output_keys = "") {
  return kPtPath + "OUTPUTS]\nnumber_of_outputs = 1\n" + kPtPath + "OUTPUTS.OUTPUT_1]\nfile_name = \"" + file +
         "\"\n" + output_keys + kPtPath + "OUTPUTS.OUTPUT_1.PARTICLE_TRACK]\n" + track_keys;
}

// Checks an XML track file with Python's parser; prints one line per time
// step: "nr count ids..." and, first, the variable codes of class 1.
const char* kParseXml = R"PY(
import gzip, sys, xml.etree.ElementTree as ET
path = sys.argv[1]
data = gzip.open(path).read() if path.endswith('.gz') else open(path, 'rb').read()
root = ET.fromstring(data)
assert root.tag == 'qrvdata', root.tag
attr = root.find('DataAttributes')
assert attr.find('Engine').text == 'VantorPT.exe'
cls = root.find('ParticleClassDefinition')
codes = [v.find('code').text for v in cls.findall('var')]
assert int(cls.find('NrVariables').text) == len(codes)
print('vars', ' '.join(codes), cls.find('var').find('UVQUnit').text)
for ts in root.findall('TimeStep'):
    pc = ts.find('ParticleClass')
    parts = pc.findall('Particle')
    vals = [''.join(p.itertext()).split() for p in parts]
    assert all(len(v) == len(codes) for v in vals)
    print(ts.get('nr'), ts.find('DateTime').text.replace(' ', 'T'), len(parts),
          ' '.join(p.get('Nr') for p in parts))
    print('first', ' '.join(vals[0][:2]) if vals else '')
)PY";

TEST(ParticleTrackFile, XmlHoldsExactlyTheSelectedParticlesStepsAndVariables) {
  const Mesh mesh = MakeMesh(20, 20, 10.0, 10.0, Flat(5.0));
  FlowCase flow;
  flow.u = [](double, double) { return 0.1; };
  const HdState state = MakeState(mesh, flow);
  PtFixture f;
  const std::string file = f.dir.file("tracks.xml");
  // 4 particles a step from one point; steps 2, 5, 8; particles 2, 5, 8, ...
  f.Setup(PtModuleText("", kPtPath + "SOURCES]\nnumber_of_Sources = 1\n" + kPtPath +
                               "SOURCES.SOURCE_1]\ntype = 1\ncoordinate_type = \"NON-UTM\"\n"
                               "coordinates = [50.0, 100.0, 0.0]\n" +
                               kPtPath + "SOURCES.SOURCE_1.CLASS_1]\nnumber_of_particles_per_timestep = 4\n" +
                               OutputText(file,
                                          "first_particle = 2\nlast_particle = 30\nparticle_frequency = 3\n"
                                          "INCLUDE_XSL = true\nHORIZONTAL_SPEED = true\nAGE = true\n",
                                          "first_time_step = 2\nlast_time_step = 8\ntime_step_frequency = 3\n")),
          mesh, 60.0, 10);
  OpenOutputsPT(f.pt);
  f.Run(state, 1, 10);
  CloseOutputsPT(f.pt);
  EXPECT_TRUE(std::filesystem::exists(f.dir.file("QRVRenderParticelTrack.xsl")));
  EXPECT_NE(ReadTextFile(f.dir.file("QRVRenderParticelTrack.xsl")).find("'v0.4a'"), std::string::npos);
  const std::string xml = ReadTextFile(file);
  EXPECT_EQ(xml.rfind("<?xml version=\"1.0\" encoding=", 0), 0u);
  EXPECT_NE(xml.find("<?xml-stylesheet type=\"text/xsl\" href=\"QRVRenderParticelTrack.xsl\"?>"), std::string::npos);
  std::string out;
  ASSERT_EQ(RunPython(f.dir, kParseXml, file, out), 0) << out;
  const std::vector<std::string> lines = SplitLines(out);
  ASSERT_EQ(lines.size(), 7u) << out;
  EXPECT_EQ(lines[0], "vars x y z STATE_VARIABLE_1 hspeed age uvqUmeter");
  // Step 2: particles 1..8 exist; selected 2, 5, 8. Step 5: 1..20. Step 8: 1..32, up to 30.
  EXPECT_EQ(lines[1], "2 2004-01-01T00:02:00 3 2 5 8");
  EXPECT_EQ(lines[2], "first 62 100");  // released at step 1, 120 s at 0.1 m/s
  EXPECT_EQ(lines[3], "5 2004-01-01T00:05:00 7 2 5 8 11 14 17 20");
  EXPECT_EQ(lines[5], "8 2004-01-01T00:08:00 10 2 5 8 11 14 17 20 23 26 29");
}

// A "LONG/LAT" mesh: positions in degrees; a compressed file is gzip.
TEST(ParticleTrackFile, GeographicMeshWritesDegreesCompressed) {
  RectangleMeshSpec spec;
  spec.x0 = 10.0 * kDegToRad, spec.x1 = 10.2 * kDegToRad;
  spec.y0 = 55.0 * kDegToRad, spec.y1 = 55.1 * kDegToRad;
  spec.nx = 20, spec.ny = 10;
  spec.layout = CellLayout::kMixed;
  spec.projection = "LONG/LAT";
  spec.bed = Flat(8.0);
  Mesh mesh;
  GenerateRectangleMesh(spec, mesh);
  SetupMeshGeometry(mesh);
  const HdState state = MakeState(mesh, FlowCase{});
  PtFixture f;
  const std::string file = f.dir.file("tracks.xml.gz");
  f.Setup(PtModuleText("", kPtPath + "SOURCES]\nnumber_of_Sources = 1\n" + kPtPath +
                               "SOURCES.SOURCE_1]\ntype = 1\ncoordinate_type = \"LONG/LAT\"\n"
                               "coordinates = [10.05, 55.05, 0.0]\ninitial_source = true\n" +
                               kPtPath + "SOURCES.SOURCE_1.CLASS_1]\nnumber_of_particles_per_timestep = 1\n" +
                               OutputText(file, "COMPRESSED = true\n")),
          mesh, 60.0, 2);
  OpenOutputsPT(f.pt);
  f.Run(state, 1, 2);
  CloseOutputsPT(f.pt);
  const std::string raw = ReadTextFile(file);
  ASSERT_GE(raw.size(), 2u);
  EXPECT_EQ(static_cast<unsigned char>(raw[0]), 0x1f);  // gzip
  std::string out;
  ASSERT_EQ(RunPython(f.dir, kParseXml, file, out), 0) << out;
  const std::vector<std::string> lines = SplitLines(out);
  ASSERT_EQ(lines.size(), 5u) << out;
  EXPECT_EQ(lines[0], "vars x y z STATE_VARIABLE_1 uvqUdegree");
  EXPECT_EQ(lines[4], "first 10.05 55.05");
}

// The CF trajectory file opens in xarray with its feature type, one
// trajectory per selected particle and one observation per particle and step.
TEST(ParticleTrackFile, NetcdfTrajectoryOpensInXarray) {
  const Mesh mesh = MakeMesh(20, 20, 10.0, 10.0, Flat(5.0));
  FlowCase flow;
  flow.v = [](double, double) { return 0.05; };
  const HdState state = MakeState(mesh, flow);
  PtFixture f;
  const std::string file = f.dir.file("tracks.nc");
  f.Setup(PtModuleText("", PointSource(100.0, 20.0, 5) + OutputText(file, "AGE = true\nparticle_frequency = 2\n")),
          mesh, 60.0, 6);
  OpenOutputsPT(f.pt);
  f.Run(state, 1, 6);
  CloseOutputsPT(f.pt);
  const char* script = R"PY(
import sys, xarray as xr, numpy as np
ds = xr.open_dataset(sys.argv[1])
assert ds.attrs['featureType'] == 'trajectory'
assert ds['trajectory'].attrs['cf_role'] == 'trajectory_id'
print(list(ds['trajectory'].values), ds.sizes['obs'])
idx = ds['trajectory_index'].values
last = ds['y'].values[idx == 0][-1]
print('%.6f %.1f' % (last, ds['age'].values[idx == 0][-1]))
)PY";
  std::string out;
  ASSERT_EQ(RunPython(f.dir, script, file, out), 0) << out;
  const std::vector<std::string> lines = SplitLines(out);
  ASSERT_EQ(lines.size(), 2u) << out;
  EXPECT_EQ(lines[0], "[1, 3, 5] 18");
  EXPECT_EQ(lines[1], "38.000000 360.0");
}

TEST(ParticleTrackFile, EncodingNamesOfCodePages) {
  const struct {
    int page;
    const char* name;
  } cases[] = {{1250, "windows-1250"}, {1258, "windows-1258"}, {28591, "iso-8859-1"}, {28599, "iso-8859-9"},
               {437, "US-ASCII"},      {850, "US-ASCII"},     {874, "US-ASCII"},     {65001, "utf-8"}};
  for (const auto& c : cases) EXPECT_EQ(XmlEncodingPT(c.page), c.name) << c.page;
  testing::internal::CaptureStdout();
  EXPECT_EQ(XmlEncodingPT(1200), "utf-8");
  EXPECT_NE(testing::internal::GetCapturedStdout().find("Warning, XML code '1200' page unkown"), std::string::npos);
}

// The seed key changes the random walk; the same seed repeats it.
TEST(ParticleTrackFile, SeedChangesTheTracks) {
  const Mesh mesh = MakeMesh(20, 20, 10.0, 10.0, Flat(5.0));
  const HdState state = MakeState(mesh, FlowCase{});
  double x[3];
  const int seeds[3] = {1, 1, 2};
  for (int k = 0; k < 3; ++k) {
    PtFixture f;
    f.Setup("[VantorHD.PARTICLE_TRACKING_MODULE]\nmode = 2\nseed = " + std::to_string(seeds[k]) + "\n" +
                kPtPath + "CLASSES]\nnumber_of_classes = 1\n" +
                ClassSection("DISPERSION.HORIZONTAL_DISPERSION", "type = 1\nconstant_value = 0.1\n") +
                PointSource(100.0, 100.0, 1),
            mesh, 10.0, 5);
    f.Run(state, 1, 5);
    x[k] = f.pt.particles[1].x;
  }
  EXPECT_EQ(x[0], x[1]);
  EXPECT_NE(x[0], x[2]);
}

}  // namespace
}  // namespace vhd::test
