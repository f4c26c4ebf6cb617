// The transport on the real HD solver: a uniform concentration stays uniform
// through a tidal cycle that floods and dries a beach, with an open boundary,
// sources, a connected pair and rain of the same concentration; the mass
// budget closes; a closed basin keeps its mass; 1 and 2 threads give the same
// bits.

#include <gtest/gtest.h>

#include <cstring>
#include <numbers>
#include <string>

#include "ad_case.hpp"

namespace vhd::test {
namespace {

// 20 x 6 cells of 50 m: 4 m deep in the west, a beach rising to 2 m above
// datum in the east.
double Beach(double x, double) { return x < 400.0 ? -4.0 : -4.0 + 6.0 * (x - 400.0) / 600.0; }

constexpr double kTidePeriod = 1800.0, kTideAmplitude = 1.0;

// The west side (code 2) takes the tide; a simple source, a withdrawing
// source and a connected pair; rain over the whole basin.
std::string TidalSetup(const std::string& tide_file) {
  return CodeSection(2, "type = 10\nformat = 1\nfile_name = \"" + tide_file +
                            "\"\nitem_number = 1\ntype_of_soft_start = 0\n") +
         HdSection("SOURCES", "number_of_sources = 4\n") +
         HdSection("SOURCES.SOURCE_1", "type = 1\ncoordinates = [225.0, 125.0]\nformat = 0\nconstant_value = 2.0\n") +
         HdSection("SOURCES.SOURCE_2", "type = 1\ncoordinates = [325.0, 225.0]\nformat = 0\nconstant_value = -1.0\n") +
         HdSection("SOURCES.SOURCE_3",
                   "type = 3\nconnected_source = 4\ncoordinates = [125.0, 75.0]\nconstant_values = [1.5, 0.0, 0.0]\n") +
         HdSection("SOURCES.SOURCE_4", "type = 5\ncoordinates = [725.0, 175.0]\n") +
         HdSection("PRECIPITATION_EVAPORATION", "type_of_precipitation = 1\n") +
         HdSection("PRECIPITATION_EVAPORATION.PRECIPITATION", "format = 0\nconstant_value = 2400.0\n");
}

struct TidalRun {
  double deviation = 0.0;      // largest |c - 1| over every sub-step
  double budget_defect = 0.0;  // |mass change - booked| / mass
  long long wet_changes = 0;   // elements that changed between dry and wet
  double drying_total = 0.0;
  double substeps = 0.0;       // transport sub-steps per HD sub-step
};

// cfl_ad: CFL_critical_AD; D: dispersion coefficient (m2/s).
TidalRun RunTidalCycle(CellLayout layout, int hd_order, const AdSolutionTechnique& technique, double c0,
                       double c_in, double cfl_ad = 1.0, double D = 0.0) {
  AdCase k;
  const std::string tide = k.dir.file("tide.zrn0");
  WriteSeries(tide, TimeAxis{}, 30.0, 64, [](double t) {
    return kTideAmplitude * std::sin(2.0 * std::numbers::pi * t / kTidePeriod);
  });
  RectangleMeshSpec spec = Channel(20, 6, 50.0, 50.0, Beach, 2, 1, 1, 1, layout);
  spec.jitter = 0.15;
  k.Make(spec, hd_order, 60.0, 31, TidalSetup(tide));
  SetFloodDry(k.c.hd, 0.005, 0.05, 0.1);
  k.c.hd.time_step.CFL_critical_AD = cfl_ad;
  k.Start(technique, [](double, double) { return 0.0; }, [&](double, double) { return c0; });
  if (D > 0) k.comp.dispersion.assign(k.c.hd.state.nelements, D);
  for (int i = 1; i <= k.comp.boundary_type.size(); ++i) {
    k.comp.boundary_type[i] = kAdBoundaryValue;
    k.comp.boundary_c[i] = c_in;
  }
  for (int s = 1; s <= k.comp.source_c.size(); ++s) k.comp.source_c[s] = c_in;
  k.comp.precipitation.type = kAdExchangeValue;
  k.comp.precipitation.constant_value = c_in;

  TidalRun r;
  Array1<int> codes = k.c.hd.state.wetdry;
  k.after_substep = [&] {
    r.deviation = std::max(r.deviation, k.Deviation(c_in));
    for (int e = 1; e <= k.c.hd.state.nelements_owned; ++e) {
      if ((codes[e] == kDry) != (k.c.hd.state.wetdry[e] == kDry)) ++r.wet_changes;
      codes[e] = k.c.hd.state.wetdry[e];
    }
  };
  for (int n = 1; n <= 30; ++n) k.Step();
  EXPECT_GE(k.c.run_status, 0);
  const double mass = k.Mass();
  r.budget_defect = std::abs(mass - k.mass0 - k.Booked()) / std::max(mass, k.mass0);
  for (int e = 1; e <= k.c.hd.state.nelements_owned; ++e) r.drying_total += std::abs(k.comp.drying_total[e]);
  r.substeps = static_cast<double>(k.substeps) / static_cast<double>(k.hd_steps);
  return r;
}

TEST(TransportFlow, UniformConcentrationStaysUniformThroughFloodingAndDrying) {
  // c = 1 everywhere, in the tide, the sources and the rain: every element
  // keeps 1 to 1e-12 over a whole tidal cycle that floods and dries the
  // beach, for both HD orders, every time integration and both AD orders;
  // the last row, with dispersion and a small CFL_critical_AD, splits the
  // HD sub-steps into several transport sub-steps.
  struct Row {
    int hd_order, time_integration, ad_order;
    double cfl_ad, D;
  } rows[] = {{1, 1, 1, 1.0, 0.0}, {1, 3, 2, 1.0, 0.0}, {2, 2, 2, 1.0, 0.0},
              {2, 3, 2, 1.0, 0.0}, {2, 1, 1, 1.0, 0.0}, {2, 3, 2, 0.05, 5.0}};
  for (const Row& row : rows) {
    SCOPED_TRACE("HD order " + std::to_string(row.hd_order) + ", AD scheme " + std::to_string(row.time_integration) +
                 "/" + std::to_string(row.ad_order) + ", CFL_critical_AD " + std::to_string(row.cfl_ad));
    const TidalRun r = RunTidalCycle(CellLayout::kMixed, row.hd_order, Technique(row.time_integration, row.ad_order),
                                     1.0, 1.0, row.cfl_ad, row.D);
    if (row.cfl_ad < 1.0) {
      EXPECT_GT(r.substeps, 1.5);
    }
    EXPECT_LT(r.deviation, 1e-12);
    EXPECT_GT(r.wet_changes, 20);  // the beach did flood and dry
    EXPECT_LT(r.budget_defect, 1e-12);
  }
}

TEST(TransportFlow, MassBudgetClosesWithSourcesBoundariesAndRain) {
  // Clean water (0) in the basin, 5 units in the tide, sources and rain: the
  // mass in the domain changes by exactly what the budget books (boundaries,
  // sources, rain, drying), to 1e-10 relative.
  for (int order : {1, 2}) {
    SCOPED_TRACE("order " + std::to_string(order));
    const TidalRun r = RunTidalCycle(CellLayout::kMixed, 2, Technique(3, order), 0.0, 5.0);
    EXPECT_LT(r.budget_defect, 1e-10);
  }
}

// A closed basin 3 m deep with a sloshing surface (0.3 m tilt) and a
// Gaussian patch: the mass stays the same to 1e-12 relative over 1,000 HD
// sub-steps, with dispersion and second order.
TEST(TransportFlow, ClosedBasinKeepsItsMass) {
  for (CellLayout layout : {CellLayout::kRandomTriangles, CellLayout::kQuadrilaterals, CellLayout::kMixed}) {
    SCOPED_TRACE(static_cast<int>(layout));
    AdCase k;
    RectangleMeshSpec spec = Channel(16, 8, 25.0, 25.0, Flat(3.0), 1, 1, 1, 1, layout);
    spec.jitter = 0.1;
    k.Make(spec, 2, 20.0, 1000, kHd);
    k.c.hd.time_step.dt_max_HD = 2.0;
    AdSolutionTechnique t = Technique(3, 2);
    k.Start(t, [](double x, double) { return 0.3 * (x - 200.0) / 200.0; },
            [](double x, double y) { return std::exp(-((x - 150) * (x - 150) + (y - 100) * (y - 100)) / 2000.0); });
    k.comp.dispersion.assign(k.c.hd.state.nelements, 0.5);
    while (k.hd_steps < 1000) k.Step();
    double clamp = 0.0;
    for (int e = 1; e <= k.c.hd.state.nelements_owned; ++e) clamp += k.comp.clamp_total[e];
    EXPECT_EQ(clamp, 0.0);
    EXPECT_LT(std::abs(k.Mass() - k.mass0) / k.mass0, 1e-12);
  }
}

// 1 and 2 threads give the same concentrations, bit for bit.
TEST(TransportFlow, OneAndTwoThreadsGiveTheSameBits) {
  Array1<double> result[2];
  for (int threads : {1, 2}) {
    AdCase k;
    const std::string tide = k.dir.file("tide.zrn0");
    WriteSeries(tide, TimeAxis{}, 30.0, 64, [](double t) { return std::sin(2.0 * std::numbers::pi * t / 1800.0); });
    k.Make(Channel(20, 6, 50.0, 50.0, Beach, 2, 1, 1, 1, CellLayout::kMixed), 2, 60.0, 31, TidalSetup(tide));
    SetFloodDry(k.c.hd, 0.005, 0.05, 0.1);
    k.Start(Technique(3, 2), [](double, double) { return 0.0; },
            [](double x, double) { return x < 500 ? 1.0 : 3.0; });
    k.comp.dispersion.assign(k.c.hd.state.nelements, 2.0);
    k.comp.source_c.assign(k.comp.source_c.size(), 10.0);
    k.comp.source_type[2] = kAdSourceExcess;
    k.comp.decay_constant = 1e-4;
    OmpSetThreads(threads);
    for (int n = 1; n <= 10; ++n) k.Step();
    OmpSetThreads(1);
    result[threads - 1] = k.comp.c;
  }
  ASSERT_EQ(result[0].size(), result[1].size());
  EXPECT_EQ(std::memcmp(result[0].data(), result[1].data(), sizeof(double) * (result[0].size() + 1)), 0);
}

}  // namespace
}  // namespace vhd::test
