// Precipitation, evaporation and point sources in closed basins: the volume
// they add or take against the exact r t A and Q t, on wet, flooded and dry
// elements of triangle, quadrilateral and mixed meshes over steep terrain;
// connected pairs, moving sources, the source result file and the messages
// of the setup.

#include <gtest/gtest.h>

#include <cmath>
#include <numbers>
#include <string>
#include <vector>

#include "bound_support.hpp"
#include "hydro/forcing_precipitation.hpp"
#include "hydro/sources.hpp"

namespace vhd::test {
namespace {

constexpr double kRain = 2400.0;              // mm/day: 100 mm/h
constexpr double kRainRate = 0.1 / 3600.0;    // m/s

// 12 x 6 cells of 50 m: a basin 2 m deep for x < 250, a steep slope up to a
// plateau 1 m above datum from x = 350.
double Bed(double x, double) {
  if (x < 250.0) return -2.0;
  if (x > 350.0) return 1.0;
  return -2.0 + 3.0 * (x - 250.0) / 100.0;
}

// Two basins 2 m deep separated by a ridge 5 m high (the nodes at x = 250
// and 300; the elements next to it slope up above the water).
double TwoBasins(double x, double) { return x > 225.0 && x < 325.0 ? 5.0 : -2.0; }

struct SourceCase {
  ~SourceCase() {
    SktClose();
    CloseLogFile();
  }
  // Mesh, settings and the sections of setup_text (inside the HD module).
  void Make(CellLayout layout, int order, const std::string& setup_text,
            double (*bed)(double, double) = Bed, int nsteps = 10) {
    MakeCase(c, RectSpec(12, 6, 50.0, 50.0, bed, layout), 60.0);
    SetScheme(c.hd, 1, order);
    SetFloodDry(c.hd, 0.005, 0.05, 0.1);
    c.hd.time_axis.dt = 60.0;
    c.hd.time_axis.last_step = nsteps;
    WriteTextFile(setup_path, "[VantorHD]\n" + setup_text);
    SktOpenFile(setup_path, true);
    SktOpenTarget("VantorHD");
    SktOpenSection("HYDRODYNAMIC_MODULE", kNoIndex, nullptr, false);
    SetupPrecipitationHD(c.hd, c.mesh);
    SetupSourcesHD(c.hd, c.mesh);
    SktCloseSection();
  }
  // Surface 0 in the basin, a film of `film` m on the slope and plateau.
  void Start(double film = 0.0) {
    StartCase(c, [&](double x, double y) { return std::max(0.0, Bed(x, y) > -0.5 ? Bed(x, y) + film : 0.0); });
  }
  double VolumeWhere(bool (*inside)(double)) const {
    double v = 0.0;
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e)
      if (inside(c.mesh.elements.xc[e])) v += c.hd.state.h[e] * c.mesh.elements.area[e];
    return v;
  }
  std::string Log() const { return JoinedLog(log_path); }
  double MinDepth() const {
    double m = 1e300;
    for (int e = 1; e <= c.hd.state.nelements_owned; ++e) m = std::min(m, c.hd.state.h[e]);
    return m;
  }
  TempDir dir;
  std::string setup_path = dir.file("model.toml");
  std::string log_path = dir.file("model.log");
  SwCase c;
};

double Rained(const SwCase& c) {
  ExactSum p, e;
  PrecipitationVolumesHD(c.hd.precipitation, c.hd.state.nelements_owned, p, e);
  return p.Value();
}
double Evaporated(const SwCase& c) {
  ExactSum p, e;
  PrecipitationVolumesHD(c.hd.precipitation, c.hd.state.nelements_owned, p, e);
  return e.Value();
}

std::string Rain(const std::string& keys, const std::string& precipitation, const std::string& evaporation = "") {
  std::string s = HdSection("PRECIPITATION_EVAPORATION", keys);
  if (!precipitation.empty()) s += HdSection("PRECIPITATION_EVAPORATION.PRECIPITATION", precipitation);
  if (!evaporation.empty()) s += HdSection("PRECIPITATION_EVAPORATION.EVAPORATION", evaporation);
  return s;
}

std::string Source(int n, const std::string& keys) { return HdSection("SOURCES.SOURCE_" + std::to_string(n), keys); }
std::string Sources(int n, const std::string& keys = "") {
  return HdSection("SOURCES", "number_of_sources = " + std::to_string(n) + "\n" + keys);
}

struct Scheme {
  CellLayout layout;
  int order;
};
const Scheme kSchemes[] = {{CellLayout::kQuadrilaterals, 1},
                           {CellLayout::kRandomTriangles, 2},
                           {CellLayout::kMixed, 2}};

// Uniform rain on a flat wet basin and on a flat dry plain raises every
// element by r t; the whole area gains r t A, booked as precipitation.
TEST(Precipitation, RainRaisesWetAndDryElementsByRateTimesTime) {
  for (const Scheme& s : kSchemes) {
    for (const double eta0 : {0.0, -2.0}) {
      SCOPED_TRACE(std::to_string(static_cast<int>(s.layout) * 10 + s.order) + (eta0 < 0 ? " dry" : " wet"));
      SourceCase k;
      k.Make(s.layout, s.order,
             Rain("type_of_precipitation = 1\n", "format = 0\nconstant_value = " + std::to_string(kRain) + "\n"),
             [](double, double) { return -2.0; });
      StartCase(k.c, [eta0](double, double) { return eta0; });
      const HdState& st = k.c.hd.state;
      EXPECT_EQ(st.wetdry[1], eta0 < 0 ? kDry : kWet);
      const Array1<double> h0 = st.h;
      const double t = 600.0;
      RunTo(k.c, t);
      double area = 0.0;
      for (int e = 1; e <= st.nelements_owned; ++e) {
        // Round-off of some hundred sub-steps added to a depth of 2 m.
        EXPECT_NEAR(st.h[e] - h0[e], kRainRate * t, 1e-13) << "element " << e;
        area += k.c.mesh.elements.area[e];
      }
      EXPECT_NEAR(Rained(k.c), kRainRate * t * area, 1e-12 * area);
      EXPECT_EQ(Evaporated(k.c), 0.0);
    }
  }
}

// Rain on steep dry terrain with a thin film: the water runs down, the total
// grows by exactly r t A, no depth is negative and nothing is cut.
TEST(Precipitation, RainOnSteepDryTerrainKeepsEveryDrop) {
  for (const Scheme& s : kSchemes) {
    SCOPED_TRACE(static_cast<int>(s.layout) * 10 + s.order);
    SourceCase k;
    k.Make(s.layout, s.order,
           Rain("type_of_precipitation = 1\n", "format = 0\nconstant_value = " + std::to_string(10 * kRain) + "\n"));
    k.Start(0.002);
    const double v0 = Volume(k.c);
    double area = 0.0;
    for (int e = 1; e <= k.c.hd.state.nelements_owned; ++e) area += k.c.mesh.elements.area[e];
    RunTo(k.c, 600.0);
    const double defect = k.c.hd.flood_dry.mass_correction.Value();
    EXPECT_NEAR(Volume(k.c) - v0 - defect, 10 * kRainRate * 600.0 * area, 1e-12 * v0);
    EXPECT_GE(k.MinDepth(), 0.0);
    EXPECT_EQ(defect, 0.0);
  }
}

// Evaporation of 100 mm/h from a film of 1 mm (net precipitation of -2400
// mm/day, or evaporation beside a precipitation of 0) dries every element to
// exactly 0 after 36 s and takes no more than was there.
TEST(Precipitation, EvaporationBeyondTheWaterDriesToZero) {
  const std::string forms[] = {
      Rain("type_of_precipitation = 2\n", "format = 0\nconstant_value = " + std::to_string(-kRain) + "\n"),
      Rain("type_of_precipitation = 1\ntype_of_evaporation = 1\n", "format = 0\nconstant_value = 0.0\n",
           "constant_value = " + std::to_string(kRain) + "\n"),
      Rain("type_of_evaporation = 1\n", "", "format = 0\nconstant_value = " + std::to_string(kRain) + "\n")};
  for (const std::string& form : forms) {
    SCOPED_TRACE(form);
    SourceCase k;
    k.Make(CellLayout::kMixed, 2, form, [](double, double) { return -1.0; });
    StartCase(k.c, [](double, double) { return -0.999; });
    const double v0 = Volume(k.c);
    RunTo(k.c, 120.0);
    for (int e = 1; e <= k.c.hd.state.nelements_owned; ++e) {
      EXPECT_EQ(k.c.hd.state.h[e], 0.0) << e;
      EXPECT_EQ(k.c.hd.state.wetdry[e], kDry) << e;
    }
    EXPECT_NEAR(Evaporated(k.c), -v0, 1e-12 * v0);
    EXPECT_EQ(k.c.hd.flood_dry.mass_correction.Value(), 0.0);
    EXPECT_EQ(Rained(k.c), 0.0);
  }
}

// Linear soft start over T: the depth after T is r T / 2; a time series
// (format 1) of a rate rising linearly gives its integral.
TEST(Precipitation, SoftStartAndTimeSeries) {
  {
    SourceCase k;
    k.Make(CellLayout::kQuadrilaterals, 1,
           Rain("type_of_precipitation = 1\n",
                "format = 0\nconstant_value = " + std::to_string(kRain) + "\nsoft_time_interval = 600.0\n"),
           [](double, double) { return -1.0; });
    StartCase(k.c, [](double, double) { return 0.0; });
    RunTo(k.c, 600.0);
    // The rate of a sub-step is taken at its end: the sum over n sub-steps of
    // r (i / n) dt exceeds r T / 2 by r dt / 2.
    const double dt = k.c.hd.dt_last;
    EXPECT_NEAR(k.c.hd.state.h[1] - 1.0, kRainRate * 600.0 / 2 + kRainRate * dt / 2, 1e-12);
  }
  {
    SourceCase k;
    const std::string file = k.dir.file("rain.zrn0");
    TimeAxis time;
    WriteSeries(file, time, 60.0, 11, [](double t) { return kRain * t / 600.0; });
    k.Make(CellLayout::kQuadrilaterals, 1,
           Rain("type_of_precipitation = 1\n", "format = 1\nfile_name = \"" + file + "\"\n"),
           [](double, double) { return -1.0; });
    StartCase(k.c, [](double, double) { return 0.0; });
    RunTo(k.c, 600.0);
    const double dt = k.c.hd.dt_last;
    EXPECT_NEAR(k.c.hd.state.h[1] - 1.0, kRainRate * 600.0 / 2 + kRainRate * dt / 2, 1e-12);
  }
}

// A rain field varying in the domain (format 3, a grid of a rate linear in
// x) gives every element of a dry plain the rate at its centre times t.
TEST(Precipitation, RainFieldVaryingInTheDomain) {
  for (const Scheme& s : kSchemes) {
    SCOPED_TRACE(static_cast<int>(s.layout) * 10 + s.order);
    SourceCase k;
    const std::string file = k.dir.file("rain.zrn2");
    {
      ZrnFile f;
      TimeAxis time;
      ASSERT_EQ(zrnHeaderCreate(f, file, kZrnFileData, "rain field"), 0);
      ASSERT_EQ(zrnSetEqCalendarAxis(f, zrnDateTime(time.start), 600.0), 0);
      ASSERT_EQ(zrnSetItemInfo(f, 1, "Rain", kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble), 0);
      ASSERT_EQ(zrnSetItemAxisEqD2(f, 1, 13, 7, 0.0, 0.0, 50.0, 50.0), 0);
      ASSERT_EQ(zrnFileCreate(f), 0);
      std::vector<double> v;
      for (int j = 0; j < 7; ++j)
        for (int i = 0; i < 13; ++i) v.push_back(kRain * i * 50.0 / 600.0);
      for (int step = 0; step < 2; ++step) ASSERT_EQ(zrnWriteItemTimeStep(f, 0.0, v.data(), 91), 0);
      ASSERT_EQ(zrnFileClose(f), 0);
    }
    k.Make(s.layout, s.order, Rain("type_of_precipitation = 1\n", "format = 3\nfile_name = \"" + file + "\"\n"),
           [](double, double) { return -2.0; }, 10);
    StartCase(k.c, [](double, double) { return -2.0; });
    RunTo(k.c, 600.0);
    for (int e = 1; e <= k.c.hd.state.nelements_owned; ++e)
      EXPECT_NEAR(k.c.hd.state.h[e], kRainRate * k.c.mesh.elements.xc[e] / 600.0 * 600.0, 1e-14) << e;
  }
}

// Rain and sources give the same bits on 1 and 2 threads.
TEST(Sources, ThreadsAgreeBitwise) {
  std::vector<double> depths[2];
  for (int threads : {1, 2}) {
    SourceCase k;
    k.Make(CellLayout::kMixed, 2,
           Rain("type_of_precipitation = 1\ntype_of_evaporation = 1\n",
                "format = 0\nconstant_value = " + std::to_string(kRain) + "\n", "constant_value = 4800.0\n") +
               Sources(3) + Source(1, "coordinates = [525.0, 125.0]\nconstant_value = 10.0\n") +
               Source(2, "type = 3\nconnected_source = 3\ncoordinates = [125.0, 125.0]\nconstant_values = [4.0, 1.0, 0.5]\n") +
               Source(3, "type = 5\ncoordinates = [175.0, 275.0]\n"));
    k.Start(0.003);
    OmpSetThreads(threads);
    RunTo(k.c, 300.0);
    OmpSetThreads(1);
    for (int e = 1; e <= k.c.hd.state.nelements_owned; ++e) depths[threads - 1].push_back(k.c.hd.state.h[e]);
  }
  EXPECT_EQ(depths[0], depths[1]);
}

// Brute-force point-in-element test (convex elements, counter-clockwise or
// clockwise), independent of the search tree.
bool Inside(const Mesh& mesh, int e, double x, double y) {
  const ElementTable& E = mesh.elements;
  const int n = ElementNodeCount(E, e);
  int pos = 0, neg = 0;
  for (int j = 1; j <= n; ++j) {
    const int a = ElementNode(E, e, j), b = ElementNode(E, e, j % n + 1);
    const double cross = (mesh.nodes.x[b] - mesh.nodes.x[a]) * (y - mesh.nodes.y[a]) -
                         (mesh.nodes.y[b] - mesh.nodes.y[a]) * (x - mesh.nodes.x[a]);
    pos += cross > 1e-9, neg += cross < -1e-9;
  }
  return pos == 0 || neg == 0;
}

int ElementAt(const Mesh& mesh, double x, double y) {
  for (int e = 1; e <= mesh.elements.nelements; ++e)
    if (Inside(mesh, e, x, y)) return e;
  return 0;
}

// A 10 m3/s source adds 10 t m3 whether its element is wet, flooded or dry,
// on every layout, and the inflow is booked.
TEST(Sources, SourceAddsItsVolumeWhateverTheElementState) {
  struct Place {
    const char* state;
    double x, y, film;
  } places[] = {{"wet", 125.0, 125.0, 0.0}, {"dry", 525.0, 125.0, 0.0}, {"flooded", 525.0, 125.0, 0.02}};
  for (const Scheme& s : kSchemes) {
    for (const Place& p : places) {
      SCOPED_TRACE(std::string(p.state) + " " + std::to_string(static_cast<int>(s.layout) * 10 + s.order));
      SourceCase k;
      k.Make(s.layout, s.order,
             Sources(1) + Source(1, "type = 1\ncoordinates = [" + std::to_string(p.x) + ", " + std::to_string(p.y) +
                                        "]\nformat = 0\nconstant_value = 10.0\n"));
      k.Start(p.film);
      const int e = k.c.hd.sources.sources[0].element;
      ASSERT_EQ(e, ElementAt(k.c.mesh, p.x, p.y));
      const int code = k.c.hd.state.wetdry[e];
      EXPECT_EQ(code, std::string(p.state) == "wet" ? kWet : std::string(p.state) == "dry" ? kDry : kFlooded);
      const double v0 = Volume(k.c);
      RunTo(k.c, 300.0);
      const double defect = k.c.hd.flood_dry.mass_correction.Value();
      EXPECT_NEAR(Volume(k.c) - v0 - defect, 3000.0, 1e-12 * v0);
      EXPECT_NEAR(k.c.hd.sources.inflow.Value(), 3000.0, 1e-9);
      EXPECT_EQ(k.c.hd.sources.outflow.Value(), 0.0);
      EXPECT_EQ(defect, 0.0);
      EXPECT_GE(k.MinDepth(), 0.0);
    }
  }
}

// A sink takes no more than there is: on a dry element nothing, on a film
// the film; the depth never goes negative and the outflow booked is what
// left.
TEST(Sources, SinkTakesNoMoreThanThereIs) {
  for (const Scheme& s : kSchemes) {
    SCOPED_TRACE(static_cast<int>(s.layout) * 10 + s.order);
    SourceCase k;
    k.Make(s.layout, s.order,
           Sources(2) + Source(1, "coordinates = [525.0, 125.0]\nconstant_value = -10.0\n") +
               Source(2, "coordinates = [125.0, 125.0]\nconstant_value = -1.0\n"));
    k.Start(0.003);
    const double v0 = Volume(k.c);
    RunTo(k.c, 300.0);
    EXPECT_GE(k.MinDepth(), 0.0);
    const double out = k.c.hd.sources.outflow.Value();
    // The film of the plateau element (at most 0.003 m on 2500 m2, or half
    // of a triangle's) and the 300 m3 of the wet sink.
    EXPECT_LT(out, -300.0);
    EXPECT_GT(out, -300.0 - 0.003 * 2500.0 - 1e-9);
    EXPECT_NEAR(Volume(k.c) - v0 - k.c.hd.flood_dry.mass_correction.Value(), out, 1e-12 * v0);
    EXPECT_EQ(k.c.hd.sources.inflow.Value(), 0.0);
  }
}

bool West(double x) { return x < 250.0; }
bool East(double x) { return x > 300.0; }

// A connected pair moves water from the western basin to the eastern one,
// no net change; once the western basin (a film) runs out, the transfer
// stops at what was there.
TEST(Sources, ConnectedPairMovesWaterWithoutNetChange) {
  struct Case {
    double q, film;
  } cases[] = {{5.0, 2.0}, {-5.0, 2.0}, {50.0, 0.01}};
  for (const Scheme& s : kSchemes) {
    for (const Case& cs : cases) {
      SCOPED_TRACE(std::to_string(cs.q) + " " + std::to_string(static_cast<int>(s.layout) * 10 + s.order));
      SourceCase k;
      k.Make(s.layout, s.order,
             Sources(2) +
                 Source(1, "type = 3\nconnected_source = 2\ncoordinates = [125.0, 125.0]\nconstant_values = [" +
                               std::to_string(cs.q) + ", 0.0, 0.0]\n") +
                 Source(2, "type = 5\ncoordinates = [425.0, 175.0]\n"),
             TwoBasins);
      const double film = cs.film;
      StartCase(k.c, [film](double x, double) { return x < 250.0 ? film - 2.0 : 0.0; });
      const double v0 = Volume(k.c), w0 = k.VolumeWhere(West), e0 = k.VolumeWhere(East);
      RunTo(k.c, 300.0);
      const double defect = k.c.hd.flood_dry.mass_correction.Value();
      EXPECT_NEAR(Volume(k.c) - defect, v0, 1e-12 * v0);
      EXPECT_EQ(defect, 0.0);
      const double moved = k.VolumeWhere(East) - e0;
      EXPECT_NEAR(w0 - k.VolumeWhere(West), moved, 1e-12 * v0);
      if (cs.film > 1.0) {
        EXPECT_NEAR(moved, cs.q * 300.0, 1e-9 * v0);
      } else {
        EXPECT_GT(moved, 0.0);
        EXPECT_LE(moved, w0 * (1 + 1e-12));
      }
      EXPECT_NEAR(k.c.hd.sources.inflow.Value(), std::abs(moved), 1e-9 * v0);
      EXPECT_NEAR(k.c.hd.sources.outflow.Value(), -std::abs(moved), 1e-9 * v0);
      EXPECT_GE(k.MinDepth(), 0.0);
    }
  }
}

// A moving source read from a file is found, at every sub-step, in the
// element that holds its position on its track.
TEST(Sources, MovingSourceIsFoundAlongItsTrack) {
  for (CellLayout layout : {CellLayout::kRandomTriangles, CellLayout::kMixed}) {
    SourceCase k;
    const std::string file = k.dir.file("track.zrn0");
    const auto x = [](double t) { return 10.0 + 0.9 * t; };
    const auto y = [](double t) { return 20.0 + 0.45 * t; };
    {
      ZrnFile f;
      TimeAxis time;
      ASSERT_EQ(zrnHeaderCreate(f, file, kZrnFileData, "track"), 0);
      ASSERT_EQ(zrnSetEqCalendarAxis(f, zrnDateTime(time.start), 60.0), 0);
      for (int i = 1; i <= 2; ++i) {
        ASSERT_EQ(zrnSetItemInfo(f, i, i == 1 ? "x" : "y", kUvqItemUndefined, kUvqUnitUndefined, kZrnDouble), 0);
        ASSERT_EQ(zrnSetItemAxisEqD0(f, i), 0);
      }
      ASSERT_EQ(zrnFileCreate(f), 0);
      for (int s = 0; s <= 10; ++s) {
        const double vx = x(60.0 * s), vy = y(60.0 * s);
        ASSERT_EQ(zrnWriteItemTimeStep(f, 0.0, &vx, 1), 0);
        ASSERT_EQ(zrnWriteItemTimeStep(f, 0.0, &vy, 1), 0);
      }
      ASSERT_EQ(zrnFileClose(f), 0);
    }
    k.Make(layout, 1,
           Sources(1) + Source(1, "format_coordinates = 1\nfile_name_coordinates = \"" + file +
                                      "\"\nitem_numbers_coordinates = [1, 2]\nconstant_value = 1.0\n"));
    k.Start();
    const SourceRecord& s = k.c.hd.sources.sources[0];
    EXPECT_EQ(s.element, ElementAt(k.c.mesh, x(0), y(0)));
    std::vector<int> visited;
    for (double t = 7.0; t <= 600.0; t += 7.0) {
      UpdateSourcesHD(k.c.hd, k.c.solver, k.c.mesh, t, 7.0);
      ASSERT_TRUE(Inside(k.c.mesh, s.element, x(t), y(t))) << "t " << t;
      if (visited.empty() || visited.back() != s.element) visited.push_back(s.element);
    }
    EXPECT_GT(visited.size(), 10u);
  }
}

// The result file holds one item per included source with the discharge of
// each output step.
TEST(Sources, ResultFileHoldsTheDischarges) {
  SourceCase k;
  const std::string out = k.dir.file("sources.zrn0");
  k.Make(CellLayout::kQuadrilaterals, 1,
         Sources(3, "output_type = 1\noutput_file_name = \"" + out + "\"\noutput_frequency = 2\n") +
             Source(1, "coordinates = [125.0, 125.0]\nconstant_value = 10.0\n") +
             Source(2, "include = 0\ncoordinates = [-1000.0, 0.0]\n") +
             Source(3, "coordinates = [525.0, 125.0]\nconstant_value = -4.0\n"));
  k.Start();
  OpenSourceOutputHD(k.c.hd);
  WriteSourceOutputHD(k.c.hd, 0, 0.0);
  for (int n = 1; n <= 4; ++n) {
    RunTo(k.c, 60.0 * n);
    WriteSourceOutputHD(k.c.hd, n, 60.0 * n);
  }
  CloseSourcesHD(k.c.hd);
  ZrnFile f;
  ASSERT_EQ(zrnFileRead(f, out), 0);
  int nitems = 0;
  zrnGetNoOfItems(f, nitems);
  EXPECT_EQ(nitems, 2);
  std::vector<double> q1, q3;
  int item;
  double time, v;
  for (int r = 0; r < 6; ++r) {
    ASSERT_EQ(zrnReadItemTimeStep(f, item, time, &v, 1), 0);
    (item == 1 ? q1 : q3).push_back(v);
  }
  zrnFileClose(f);
  EXPECT_THAT(q1, testing::ElementsAre(10.0, 10.0, 10.0));
  // The sink on the dry plateau: -4 asked at the start, nothing to take later.
  EXPECT_THAT(q3, testing::ElementsAre(-4.0, 0.0, 0.0));
}

// Every message of the setup a user can provoke.
TEST(SourcesDeath, SetupMessages) {
  const std::string at = "coordinates = [125.0, 125.0]\n";
  struct Case {
    std::string text, message;
  } cases[] = {
      {Sources(1) + Source(1, "type = 6\n" + at), "Type not supported for sources (type 6 in"},
      {Sources(1) + Source(1, "type = 4\ninterpolation_type = 1\n" + at), "Type of vertical position must be 2, 3 or 4"},
      {Sources(1) + Source(1, "type = 4\ninterpolation_type = 2\ndiameter = 0.0\n" + at),
       "diameter = 0 in VantorHD/HYDRODYNAMIC_MODULE/SOURCES/SOURCE_1 must be greater than 0"},
      {Sources(1) + Source(1, "type = 4\ninterpolation_type = 2\ntheta = 95.0\n" + at), "theta lie in -90 to 90"},
      {Sources(2) + Source(1, "type = 3\nconnected_source = 3\n" + at) + Source(2, "type = 5\n" + at),
       "Illegal source number (connected_source 3"},
      {Sources(2) + Source(1, "type = 3\nconnected_source = 1\n" + at) + Source(2, "type = 5\n" + at),
       "Illegal source number (connected_source 1"},
      {Sources(3) + Source(1, "type = 3\nconnected_source = 3\n" + at) +
           Source(2, "type = 3\nconnected_source = 3\n" + at) + Source(3, "type = 5\n" + at),
       "Source no. 3 is connected to more than one source (1 and 2)"},
      {Sources(2) + Source(1, "type = 3\nconnected_source = 2\n" + at) + Source(2, "include = 0\n"),
       "Connected source not included"},
      {Sources(1) + Source(1, "type = 2\nformat = 4\n" + at), "The format=4 is not allowed for the present type of source"},
      {Sources(2) + Source(1, "type = 3\nconnected_source = 2\nformat = 4\n" + at) + Source(2, "type = 5\n" + at),
       "The format=4 is not allowed for the present type of source"},
      {Sources(1) + Source(1, "coordinates = [900.0, 125.0]\n"), "Point outside domain (source 1, SOURCE_1 at x = 900"},
      {Sources(1) + Source(1, "type = 1\n"), "coordinates (x, y) are missing in VantorHD/HYDRODYNAMIC_MODULE/SOURCES/SOURCE_1"},
      {Sources(1) + Source(1, "format_coordinates = 2\n" + at), "Format not supported for source coordinates"},
      {Sources(1) + Source(1, "format_coordinates = 1\n"), "file_name_coordinates is missing"},
      {Sources(-1), "number_of_sources = -1"},
      {Sources(1, "output_type = 1\noutput_frequency = 0\n") + Source(1, at), "output_frequency = 0"},
      {Rain("type_of_precipitation = 1\n", "format = 2\nfile_name = \"x.zrnu\"\n"),
       "Format not supported for precipitation (format 2 in VantorHD/HYDRODYNAMIC_MODULE/PRECIPITATION_EVAPORATION/"
       "PRECIPITATION"},
      {Rain("type_of_evaporation = 1\n", "", "format = 4\n"), "Format not supported for evaporation (format 4"},
      {Rain("type_of_precipitation = 3\n", ""), "Type not supported for precipitation (type_of_precipitation 3"},
      {Rain("type_of_evaporation = 3\n", ""), "Type not supported for evaporation (type_of_evaporation 3"},
      {Rain("type_of_precipitation = 1\n", ""), "Section: PRECIPITATION"},
      {Rain("type_of_precipitation = 1\n", "constant_value = 1.0\n"), "file_name is missing"},
      {Rain("type_of_precipitation = 1\n", "format = 0\nsoft_time_interval = -1.0\n"), "soft_time_interval = -1"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.message);
    SourceCase k;
    ExpectStop([&] { k.Make(CellLayout::kQuadrilaterals, 1, c.text); }, k.log_path, c.message);
  }
}

// The near-field jet in still water: the momentum flux stays Q w0, the
// discharge grows linearly, dilution 1 + 4 alpha s / D at every section end
// (0.28 s / D far out), straight along sigma at mid-depth.
TEST(Jets, StillWaterDilutionOfARoundJet) {
  SourceRecord s;
  s.type = kSourceJet;
  s.x = 100.0, s.y = 200.0;
  s.values_new[0] = 0.5;
  JetModel& j = s.jet;
  j.diameter = 0.3, j.sigma = 30.0, j.maximum_distance = 60.0, j.entrainment = 0.07, j.number_of_sections = 4;
  j.points.resize(4);
  RunJetModel(s, 0.0, 0.0, -10.0, 0.0, 1.0, 1.0);
  for (int k = 0; k < 4; ++k) {
    const JetPoint& p = j.points[static_cast<std::size_t>(k)];
    const double dist = 15.0 * (k + 1);
    EXPECT_NEAR(p.distance, dist, 1e-12);
    EXPECT_NEAR(p.dilution, 1.0 + 4.0 * 0.07 * dist / 0.3, 1e-10);
    EXPECT_NEAR(p.discharge, 0.5 * p.dilution, 1e-10);
    EXPECT_NEAR(p.x, 100.0 + dist * std::sin(30.0 * kDegToRad), 1e-9);
    EXPECT_NEAR(p.y, 200.0 + dist * std::cos(30.0 * kDegToRad), 1e-9);
    EXPECT_NEAR(p.z, -5.0, 1e-12);
    // Momentum flux Q w of the top-hat jet: the width follows from it.
    const double w0 = 0.5 / (0.25 * std::numbers::pi * 0.09);
    const double w = 0.5 * w0 / p.discharge;
    EXPECT_NEAR(p.width, 2.0 * std::sqrt(p.discharge / (std::numbers::pi * w)), 1e-12);
    EXPECT_EQ(p.stop, kJetStopDistance);
  }
  // The jet's own water leaves with its momentum flux: Q0 u = Q w (excess).
  EXPECT_NEAR(std::hypot(j.release_u, j.release_v), 0.5 / (0.25 * std::numbers::pi * 0.09), 1e-9);
}

// In a cross current the jet bends with it, entrains more than in still
// water, and stops where its excess velocity falls below epsilon times the
// ambient speed; a jet rising at theta meets the surface.
TEST(Jets, CrossCurrentBendsAndStopsTheJet) {
  SourceRecord s;
  s.type = kSourceJet;
  s.values_new[0] = 0.2;
  JetModel& j = s.jet;
  j.diameter = 0.2, j.sigma = 0.0, j.maximum_distance = 500.0, j.number_of_sections = 5;
  j.points.resize(5);
  RunJetModel(s, 0.5, 0.0, -20.0, 0.0, 1.0, 1.0);
  const JetPoint& end = j.points.back();
  EXPECT_EQ(end.stop, kJetStopAmbient);
  EXPECT_LT(end.distance, 500.0);
  EXPECT_GT(end.x, end.y);  // carried east more than it went north
  EXPECT_GT(end.dilution, 10.0);
  // Momentum: the entrained water brings u_a, so Q (w - u_a) keeps its start
  // value and the water released carries exactly the jet's momentum flux,
  // Q0 w0 northwards.
  const double w0 = 0.2 / (0.25 * std::numbers::pi * 0.04);
  EXPECT_NEAR(j.release_u, 0.0, 1e-9 * w0);
  EXPECT_NEAR(j.release_v, w0, 1e-9 * w0);

  j.theta = 45.0;
  RunJetModel(s, 0.0, 0.0, -20.0, 0.0, 1.0, 1.0);
  EXPECT_EQ(j.points.back().stop, kJetStopSurface);
  EXPECT_NEAR(j.points.back().z, 0.0, 1e-12);
  // Within one step (1 m) of the path to the surface, 10 m above mid-depth.
  EXPECT_NEAR(j.points.back().distance, 10.0 * std::sqrt(2.0), 1.0);
}

// A jet in a basin: its water enters where the jet ends, the volume grows by
// Q t, and the log reports the near field; a jet aimed at the dry plateau
// warns and puts its water in at the source.
TEST(Jets, JetReleasesAtItsEndAndReportsInTheLog) {
  struct Case {
    double x, sigma, distance;
    const char* warning;  // empty: the jet ends in water
  } cases[] = {{25.0, 90.0, 150.0, ""},
               {125.0, 90.0, 400.0, "Position of jet 1 on land"},
               {125.0, 0.0, 400.0, "Position of jet 1 outside domain"}};
  for (const Case& cs : cases) {
    SCOPED_TRACE(cs.warning);
    SourceCase k;
    k.Make(CellLayout::kMixed, 2,
           Sources(1) + Source(1, "type = 4\ninterpolation_type = 2\ncoordinates = [" + std::to_string(cs.x) +
                                      ", 125.0]\nsigma = " + std::to_string(cs.sigma) +
                                      "\nmaximum_distance = " + std::to_string(cs.distance) +
                                      "\ndiameter = 0.5\nconstant_values = [2.0, 0.0, 0.0]\n"));
    k.Start();
    const double v0 = Volume(k.c);
    RunTo(k.c, 120.0);
    const SourceRecord& s = k.c.hd.sources.sources[0];
    const JetPoint& end = s.jet.points.back();
    EXPECT_NEAR(Volume(k.c) - v0, 240.0, 1e-12 * v0);
    const std::string log = k.Log();
    EXPECT_NE(log.find("Source information"), std::string::npos);
    EXPECT_NE(log.find("Point 5"), std::string::npos);
    EXPECT_NE(log.find("Dilution factor"), std::string::npos);
    EXPECT_NE(log.find("upstream distance"), std::string::npos);
    if (*cs.warning) {
      EXPECT_NE(log.find(std::string("(s). ") + cs.warning), std::string::npos) << log;
      EXPECT_EQ(s.jet.end_element, s.element);
    } else {
      EXPECT_EQ(log.find("Position of jet"), std::string::npos) << log;
      EXPECT_EQ(s.jet.end_element, ElementAt(k.c.mesh, end.x, end.y));
      EXPECT_NE(s.jet.end_element, s.element);
    }
  }
}

// An excluded source is not located and may lie outside the mesh.
TEST(Sources, ExcludedSourceIsNotLocated) {
  SourceCase k;
  k.Make(CellLayout::kQuadrilaterals, 1, Sources(1) + Source(1, "include = 0\ncoordinates = [-500.0, 0.0]\n"));
  EXPECT_EQ(k.c.hd.sources.sources[0].element, 0);
  EXPECT_FALSE(k.c.hd.sources.sources[0].include);
}

}  // namespace
}  // namespace vhd::test
