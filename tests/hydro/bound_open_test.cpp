// Open boundaries on every element shape: a simple wave leaving through the
// absorbing boundaries (reflection against the exact answer, none), and
// discharge boundaries delivering the prescribed volume onto dry and wet
// beds.

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <numbers>
#include <string>
#include <vector>

#include "bound_support.hpp"

namespace vhd {
namespace {

using test::BoundCase;
using test::Channel;
using test::CodeSection;
using test::Flat;

constexpr double kG = 9.81;

const CellLayout kLayouts[] = {CellLayout::kQuadrilaterals, CellLayout::kRightTriangles, CellLayout::kMixed};

const char* LayoutName(CellLayout layout) {
  switch (layout) {
    case CellLayout::kQuadrilaterals: return "quadrilaterals";
    case CellLayout::kRightTriangles: return "right triangles";
    case CellLayout::kMixed: return "mixed";
    default: return "random triangles";
  }
}

struct Reflection {
  double incident = 0.0;   // crest of the incident wave at the gauge (m)
  double reflected = 0.0;  // largest level of what comes back, with its sign (m)
  int run_status = 0;
};

// A simple wave 10 mm high and 2 km long (50 elements) on 10 m of water,
// whose surface at rest lies `mean` above the datum, runs east in a channel
// 8 km long, closed in the west, with the boundary under test in the east.
// The gauge, 2.5 km from the boundary, sees the incident wave pass before
// anything reflected can reach it; every departure from the mean level it
// sees afterwards is reflection. Levels are cross-section means.
Reflection OutgoingWave(const std::string& east, CellLayout layout, int order, double mean) {
  const double H = 10.0, a = 0.01, lambda = 2000.0, dx = lambda / 50.0, x0 = 2000.0;
  const int nx = 200, ny = 3;
  const double L = nx * dx, c0 = std::sqrt(kG * H), x_gauge = L - 2500.0;
  BoundCase b;
  b.Make(Channel(nx, ny, dx, dx, Flat(H - mean), 1, 2, 1, 1, layout), 10.0, 160, east);
  test::SetScheme(b.c.hd, 1, order);
  auto wave = [&](double x, double) {
    return x > x0 && x < x0 + lambda ? a * std::pow(std::sin(std::numbers::pi * (x - x0) / lambda), 2) : 0.0;
  };
  auto eta0 = [&](double x, double y) { return mean + wave(x, y); };
  // Riemann invariant u - 2 sqrt(g h) of still water: nothing runs west.
  b.Start(eta0, [&](double x, double y) { return 2.0 * (std::sqrt(kG * (H + wave(x, y))) - c0); });

  const double t_passed = (x_gauge - x0) / c0;                       // tail of the incident wave
  const double t_back = (2.0 * L - x_gauge - x0 - lambda) / c0 - 20.0;  // earliest reflection
  Reflection r;
  for (int j = 1; j <= 160 && b.c.run_status >= 0; ++j) {
    const double t = 10.0 * j;
    test::RunTo(b.c, t);
    double sum = 0.0;
    int n = 0;
    for (int e = 1; e <= b.c.hd.state.nelements; ++e) {
      if (std::abs(b.c.mesh.elements.xc[e] - x_gauge) < dx) sum += b.c.hd.state.eta[e], ++n;
    }
    const double eta = sum / n - mean;
    if (t < t_passed) r.incident = std::max(r.incident, eta);
    if (t > t_back && std::abs(eta) > std::abs(r.reflected)) r.reflected = eta;
  }
  r.run_status = b.c.run_status;
  return r;
}

TEST(BoundOpen, OutgoingWaveLeavesOnEveryElementShape) {
  // The level boundaries prescribe the mean level, at the datum and off it.
  auto flather = [](const std::string& level) {
    return CodeSection(2, "type = 12\nconstant_value = " + level + "\n") +
           test::HdSection("BOUNDARY_CONDITIONS.CODE_2.DATA_2", "constant_values = [0.0, 0.0]\n");
  };
  auto weak = [](const std::string& level) { return CodeSection(2, "type = 10\nconstant_value = " + level + "\n"); };
  auto transmissive = [](const std::string&) { return CodeSection(2, "type = 9\n"); };
  struct Row {
    const char* name;
    std::function<std::string(const std::string&)> section;
    double bound;
  } rows[] = {{"weakly reflecting level (10)", weak, 0.02},
              {"Flather (12)", flather, 0.02},
              {"transmissive (9)", transmissive, 0.10}};
  for (const Row& row : rows) {
    for (double mean : {0.0, 1.3}) {
      for (CellLayout layout : kLayouts) {
        for (int order : {1, 2}) {
          const Reflection r = OutgoingWave(row.section(std::to_string(mean)), layout, order, mean);
          const std::string what = std::string(row.name) + ", mean level " + std::to_string(mean) + ", " +
                                   LayoutName(layout) + ", order " + std::to_string(order);
          ASSERT_GE(r.run_status, 0) << what;
          EXPECT_GT(r.incident, 0.8 * 0.01) << what;
          EXPECT_LT(std::abs(r.reflected) / r.incident, row.bound) << what << ": reflected " << r.reflected;
        }
      }
    }
  }
}

TEST(BoundOpen, TransmissiveBoundaryStaysStableUnderAPeriodicWave) {
  // A 1 cm wave of period 200 s enters through a weakly reflecting level
  // boundary in the west for an hour and leaves through the transmissive
  // boundary in the east: the levels stay within the wave's amplitude (a
  // standing wave of full reflection would double it).
  const double H = 10.0, a = 0.01, T = 200.0, dx = 40.0, w = 2.0 * std::numbers::pi / T;
  for (CellLayout layout : kLayouts) {
    for (int order : {1, 2}) {
      BoundCase b;
      test::WriteSeries(b.dir.file("wave.zrn0"), TimeAxis{}, 10.0, 362, [&](double t) { return a * std::sin(w * t); });
      b.Make(Channel(100, 3, dx, dx, Flat(H), 2, 3, 1, 1, layout), 60.0, 60,
             CodeSection(2, "type = 10\nformat = 1\nfile_name = \"wave.zrn0\"\nitem_number = 1\n"
                            "type_of_soft_start = 0\n") +
                 CodeSection(3, "type = 9\n"));
      test::SetScheme(b.c.hd, 1, order);
      b.Start([](double, double) { return 0.0; });
      double eta_max = 0.0;
      for (int step = 1; step <= 60 && b.c.run_status >= 0; ++step) {
        test::RunTo(b.c, 60.0 * step);
        for (int e = 1; e <= b.c.hd.state.nelements; ++e) eta_max = std::max(eta_max, std::abs(b.c.hd.state.eta[e]));
      }
      ASSERT_GE(b.c.run_status, 0) << LayoutName(layout) << ", order " << order;
      EXPECT_LT(eta_max, 1.1 * a) << LayoutName(layout) << ", order " << order;
    }
  }
}

TEST(BoundOpen, LevelBoundariesHoldALakeAtRestOffDatum) {
  // A basin over a bed sloping in x and y, open in the west and the east,
  // walls in the south and the north, at rest at a level above or below the
  // datum that both boundaries prescribe: nothing may move.
  auto bed = [](double x, double y) { return -10.0 + 0.002 * x + 0.003 * y; };
  auto level_section = [](int code, int type, double level) {
    const std::string value = std::to_string(level);
    std::string body = "type = " + std::to_string(type) + "\ntype_of_soft_start = 0\nconstant_value = " + value + "\n";
    if (type == 9) body = "type = 9\n";
    std::string text = CodeSection(code, body);
    if (type == 12)
      text += test::HdSection("BOUNDARY_CONDITIONS.CODE_" + std::to_string(code) + ".DATA_2",
                              "constant_values = [0.0, 0.0]\n");
    return text;
  };
  for (int type : {6, 10, 12, 9}) {
    for (double level : {1.3, -0.7}) {
      for (CellLayout layout : {CellLayout::kQuadrilaterals, CellLayout::kRightTriangles, CellLayout::kMixed,
                                CellLayout::kRandomTriangles}) {
        for (int order : {1, 2}) {
          BoundCase b;
          b.Make(Channel(20, 6, 50.0, 50.0, bed, 2, 3, 1, 1, layout), 50.0, 40,
                 level_section(2, type, level) + level_section(3, type, level));
          test::SetScheme(b.c.hd, 1, order);
          b.Start([level](double, double) { return level; });
          test::RunTo(b.c, 2000.0);
          const std::string what = "type " + std::to_string(type) + ", level " + std::to_string(level) + ", " +
                                   LayoutName(layout) + ", order " + std::to_string(order);
          ASSERT_GE(b.c.run_status, 0) << what;
          double umax = 0.0, deta = 0.0;
          const HdState& st = b.c.hd.state;
          for (int e = 1; e <= st.nelements; ++e) {
            umax = std::max({umax, std::abs(st.u[e]), std::abs(st.v[e])});
            deta = std::max(deta, std::abs(st.eta[e] - level));
          }
          EXPECT_LT(umax, 1e-10) << what;
          EXPECT_LT(deta, 1e-10) << what;
        }
      }
    }
  }
}

// Thin water draining down a slope of 5 % through an open boundary, second
// order with flooding and drying: its outflow is limited where an element
// is sent out more water than it holds. The run must not depend on the
// datum: the same case 30 m lower or higher drains the same volume.
TEST(BoundOpen, DrainingThroughAnOpenBoundaryDoesNotDependOnTheDatum) {
  for (int type : {9, 10}) {
    for (CellLayout layout : {CellLayout::kRandomTriangles, CellLayout::kQuadrilaterals}) {
      std::vector<double> base;
      long long base_steps = 0;
      for (double datum : {0.0, -30.0, 30.0}) {
        auto bed = [datum](double x, double) { return datum - 0.05 * x; };
        const std::string body =
            type == 9 ? "type = 9\n"
                      : "type = 10\ntype_of_soft_start = 0\nconstant_value = " + std::to_string(datum - 100.0) + "\n";
        BoundCase b;
        b.Make(Channel(20, 4, 10.0, 10.0, bed, 1, 2, 1, 1, layout), 5.0, 40, CodeSection(2, body));
        test::SetScheme(b.c.hd, 1, 2);
        test::SetFloodDry(b.c.hd, 0.005, 0.05, 0.1);
        b.Start([datum](double x, double) { return datum - 0.05 * x + 0.2 * std::exp(-x / 50.0); });
        const double v0 = test::Volume(b.c);
        std::vector<double> volumes;
        for (int k = 1; k <= 8; ++k) {
          test::RunTo(b.c, 5.0 * k);
          volumes.push_back(test::Volume(b.c) / v0);
        }
        const std::string what = "type " + std::to_string(type) + ", " + LayoutName(layout) + ", datum " +
                                 std::to_string(datum);
        ASSERT_GE(b.c.run_status, 0) << what;
        EXPECT_LT(volumes.back(), 0.5) << what;  // most of the water has left
        if (base.empty()) {
          base = volumes;
          base_steps = b.c.hd.n_steps;
          continue;
        }
        for (int k = 0; k < 8; ++k) EXPECT_NEAR(volumes[k], base[k], 1e-9) << what << ", t " << 5 * (k + 1);
        EXPECT_EQ(b.c.hd.n_steps, base_steps) << what;
      }
    }
  }
}

// ---- discharge onto dry and wet beds ----------------------------------------------------------

TEST(BoundOpen, DischargeBoundaryDeliversThePrescribedVolume) {
  // 1 m3/s for 100 s through the west side of a channel whose bed falls at
  // 1 % to the east, dry or under 1 m of water at the boundary, with every
  // Riemann solver. The central flux (type 0) runs onto the dry bed only:
  // without dissipation a disturbance on the wet channel of right triangles
  // grows at first order until the blow-up check stops the run, whatever the
  // boundary does.
  const double Q = 1.0, T = 100.0;
  for (int solver : {0, 1, 2, 3, 4}) {
    for (int approach : {1, 2, 3}) {
      for (double level : {0.0, 1.0}) {
        if (solver == 0 && level > 0) continue;
        for (CellLayout layout : kLayouts) {
          for (int order : {1, 2}) {
            BoundCase b;
            b.Make(Channel(30, 4, 10.0, 10.0, [](double x, double) { return -0.01 * x; }, 2, 1, 1, 1, layout), 10.0,
                   10,
                   CodeSection(2, "type = 7\napproach = " + std::to_string(approach) +
                                      "\nconstant_value = 1.0\ntype_of_soft_start = 0\n"));
            test::SetScheme(b.c.hd, solver, order);
            test::SetFloodDry(b.c.hd, 0.005, 0.05, 0.1);
            b.Start([&](double, double) { return level; });
            const double v0 = test::Volume(b.c);
            test::RunTo(b.c, T);
            const std::string what = "solver " + std::to_string(solver) + ", approach " + std::to_string(approach) +
                                     (level > 0 ? ", wet bed, " : ", dry bed, ") + LayoutName(layout) + ", order " +
                                     std::to_string(order);
            ASSERT_GE(b.c.run_status, 0) << what;
            const double entered = test::Volume(b.c) - v0 - b.c.hd.flood_dry.mass_correction.Value();
            EXPECT_NEAR(entered / (Q * T), 1.0, 0.01) << what;
          }
        }
      }
    }
  }
}

}  // namespace
}  // namespace vhd
