// Boundary-condition setup: the face list and its value pairs, cyclic pairs,
// tilting points, the corrections of the boundary update on prescribed
// states and forcing fields, and the refusals of bad setups.

#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "bound_support.hpp"
#include "hydro/bound.hpp"

namespace vhd {
namespace {

using test::BoundCase;
using test::Channel;
using test::CodeSection;
using test::Flat;

double Level0(double, double) { return 0.0; }

// ---- face list and values ------------------------------------------------------------

TEST(BoundSetup, FaceListFollowsTheCodesWithTheValuesOfEachType) {
  BoundCase b;
  // West 2 (Flather with a discharge constraint), east 3 (Flather without),
  // south 4 (velocity), north land.
  b.Make(Channel(6, 4, 10.0, 10.0, Flat(5.0), 2, 3, 4, 1), 10.0, 10,
         CodeSection(2, "type = 12\ntype_interpolation_constrain = 1\ntype_of_data = 1\n"
                        "constant_values = [0.1, 0.2, 0.3, 4.0]\ntype_of_soft_start = 0\n") +
             CodeSection(3, "type = 12\nconstant_value = 0.5\n[VantorHD.HYDRODYNAMIC_MODULE.BOUNDARY_CONDITIONS."
                            "CODE_3.DATA_2]\nconstant_values = [1.0, 2.0]\n") +
             CodeSection(4, "type = 4\nconstant_values = [0.5, 0.0]\n"));
  const HdBoundary& bc = b.c.hd.boundary;
  ASSERT_EQ(bc.ncodes, 4);
  const int nfaces[] = {6, 4, 4, 6}, nvalues[] = {2, 8, 6, 4};  // code 1: the north side
  ASSERT_EQ(bc.faces.size(), bc.codes[1].nfaces + 4 + 4 + 6);
  int k = 0;
  for (int code = 1; code <= 4; ++code) {
    EXPECT_EQ(b.NFaces(code), nfaces[code - 1]);
    EXPECT_EQ(bc.codes[code].first_face, k + 1);
    EXPECT_EQ(b.Face(code, 1).nvalues, nvalues[code - 1]);
    for (int j = 1; j <= b.NFaces(code); ++j) {
      const BoundaryFaceCondition& fc = bc.faces[++k];
      EXPECT_EQ(fc.code, code);
      EXPECT_EQ(b.c.mesh.faces.code[fc.face], code);
      EXPECT_EQ(fc.element, b.c.mesh.faces.element1[fc.face]);
      EXPECT_EQ(bc.face_condition[fc.face], k);
    }
  }
  // Every key of a code is logged, with its default when absent.
  EXPECT_NE(b.Log().find("type_of_pressure_correction"), std::string::npos);
}

TEST(BoundSetup, UpdatesShiftNewValuesIntoOldOnes) {
  BoundCase b;
  // A level rising linearly over 100 s from 0 (soft start type 1).
  b.Make(Channel(4, 2, 10.0, 10.0, Flat(5.0), 2, 1), 10.0, 20,
         CodeSection(2, "type = 6\nconstant_value = 1.0\ntype_of_soft_start = 1\nsoft_time_interval = 100.0\n"));
  b.Start(Level0);
  const BoundaryFaceCondition& fc = b.Face(2, 1);
  EXPECT_DOUBLE_EQ(NewValue(fc, 1), 0.0);
  EXPECT_DOUBLE_EQ(OldValue(fc, 1), 0.0);
  UpdateBoundaryValuesHD(b.c.hd, b.c.mesh, 30.0);
  EXPECT_DOUBLE_EQ(NewValue(fc, 1), 0.3);
  EXPECT_DOUBLE_EQ(OldValue(fc, 1), 0.0);
  UpdateBoundaryValuesHD(b.c.hd, b.c.mesh, 50.0);
  EXPECT_DOUBLE_EQ(NewValue(fc, 1), 0.5);
  EXPECT_DOUBLE_EQ(OldValue(fc, 1), 0.3);
}

TEST(BoundSetup, CyclicFacesPairInOppositeOrderWithThePartnerElement) {
  BoundCase b;
  b.Make(Channel(5, 3, 10.0, 10.0, Flat(5.0), 2, 3), 10.0, 10,
         CodeSection(2, "type = 15\ncode_cyclic = 3\n") + CodeSection(3, "type = 15\n"));
  const Mesh& m = b.c.mesh;
  for (int code : {2, 3}) {
    ASSERT_EQ(b.NFaces(code), 3);
    for (int j = 1; j <= 3; ++j) {
      const BoundaryFaceCondition& fc = b.Face(code, j);
      const int partner = static_cast<int>(fc.values[0]);
      EXPECT_EQ(fc.values[1], fc.values[0]);
      // The partner element sits at the same y across the channel.
      EXPECT_NEAR(m.elements.yc[partner], m.elements.yc[fc.element], 1e-9);
      EXPECT_NEAR(std::abs(m.elements.xc[partner] - m.elements.xc[fc.element]), 40.0, 1e-9);
    }
  }
}

// ---- tilting points and the along-boundary integration ------------------------------------

// A level boundary on the west side (5 faces of 10 m running south along
// x = 0), bed depth per face set by bed(y).
void MakeTilt(BoundCase& b, const std::string& keys, std::function<double(double, double)> bed = Flat(4.0)) {
  b.Make(Channel(3, 5, 10.0, 10.0, std::move(bed), 2, 1), 10.0, 10,
         CodeSection(2, "type = 6\nconstant_value = 0.0\ntype_of_soft_start = 0\n" + keys));
}

TEST(BoundSetup, TiltingPointChoices) {
  auto deep_at_y25 = [](double, double y) { return -4.0 - (std::abs(y - 25.0) < 6.0 ? 1.0 : 0.0); };
  struct Row {
    std::string keys;
    int point;
  } rows[] = {{"type_of_wind_correction = 1\n", 3},  // deepest face: centre y = 25, third from the north
              {"type_of_wind_correction = 1\ntype_of_tilting_point = 2\n", 1},
              {"type_of_coriolis_correction = 1\ntype_of_tilting_point = 3\n", 5},
              {"type_of_wind_correction = 1\ntype_of_tilting_point = 4\npoint_tilting = 4\n", 4}};
  for (const Row& r : rows) {
    BoundCase b;
    MakeTilt(b, r.keys, deep_at_y25);
    EXPECT_EQ(b.c.hd.boundary.codes[2].point_tilting, r.point) << r.keys;
  }
}

TEST(BoundSetup, WindTiltingIntegratesTheSlopeAlongTheBoundary) {
  // Uniform depth 4 m, a kinematic wind stress of 1e-4 m2/s2 blowing south
  // (along the boundary walk): the level slope is tau / (g h) along the walk,
  // zero at the first face.
  BoundCase b;
  MakeTilt(b, "type_of_wind_correction = 1\ntype_of_tilting_point = 2\n");
  b.Start(Level0);
  HdModule& hd = b.c.hd;
  const double tau = 1e-4;
  for (int e = 1; e <= hd.state.nelements; ++e) hd.boundary.forcing.wind_y[e] = -tau;
  UpdateBoundaryValuesHD(hd, b.c.mesh, 10.0);
  for (int j = 1; j <= b.NFaces(2); ++j) {
    EXPECT_NEAR(OldValue(b.Face(2, j), 1), tau / (kPhysical.g * 4.0) * 10.0 * (j - 1), 1e-15) << "face " << j;
    EXPECT_DOUBLE_EQ(NewValue(b.Face(2, j), 1), 0.0);  // the data value stays as read
  }
}

TEST(BoundSetup, CoriolisTiltingBalancesTheNormalFlux) {
  // Inflow across the west boundary (u = 0.5 m/s, h = 4 m) with f = 1e-4:
  // geostrophic slope -f q_n / (g h) along the walk (q_n = -2 m2/s outward),
  // zero at the third face.
  BoundCase b;
  MakeTilt(b, "type_of_coriolis_correction = 1\ntype_of_tilting_point = 4\npoint_tilting = 3\n");
  b.Start(Level0, [](double, double) { return 0.5; });
  HdModule& hd = b.c.hd;
  for (int e = 1; e <= hd.state.nelements; ++e) hd.boundary.forcing.coriolis[e] = 1e-4;
  UpdateBoundaryValuesHD(hd, b.c.mesh, 10.0);
  const double slope = -1e-4 * (-2.0) / (kPhysical.g * 4.0);
  for (int j = 1; j <= b.NFaces(2); ++j) EXPECT_NEAR(OldValue(b.Face(2, j), 1), slope * 10.0 * (j - 3), 1e-15);
}

TEST(BoundSetup, RadiationStressStepsAreZeroAtTheDeepestFace) {
  BoundCase b;
  MakeTilt(b, "", [](double, double y) { return y > 40.0 ? -6.0 : -4.0; });  // deepest: first face (north)
  b.Start(Level0);
  HdModule& hd = b.c.hd;
  const double F = 2e-4;  // force per unit area / rho, along the walk (south)
  for (int e = 1; e <= hd.state.nelements; ++e) hd.boundary.forcing.radiation_y[e] = -F;
  UpdateBoundaryValuesHD(hd, b.c.mesh, 10.0);
  double node = 0.0, expected_first = 0.0;
  for (int j = 1; j <= b.NFaces(2); ++j) {
    const BoundaryFaceCondition& fc = b.Face(2, j);
    const double rise = F / (kPhysical.g * hd.state.h[fc.element]) * 10.0;
    const double face = node + 0.5 * rise;
    node += rise;
    if (j == 1) expected_first = face;
    EXPECT_NEAR(OldValue(fc, 1), face - expected_first, 1e-15) << "face " << j;
  }
}

// ---- discharge distribution and Flather constraint ---------------------------------------

TEST(BoundSetup, DischargeIsSharedByDepthToTheFiveThirdsAndCarriedExactly) {
  BoundCase b;
  // West boundary over a bed that deepens to the north: 2, 3, 4, 5 m.
  b.Make(Channel(3, 4, 10.0, 10.0, [](double, double y) { return -(2.0 + std::floor(y / 10.0 - 1e-9)); }, 2, 1),
         10.0, 10, CodeSection(2, "type = 7\nconstant_value = 30.0\ntype_of_soft_start = 0\n"));
  b.Start(Level0);
  const auto weight = [&](int j) { return std::pow(b.c.hd.state.d[b.Face(2, j).element], 5.0 / 3.0); };
  double carried = 0.0, weight_sum = 0.0;
  for (int j = 1; j <= b.NFaces(2); ++j) {
    carried += OldValue(b.Face(2, j), 1) * b.c.mesh.faces.length[b.Face(2, j).face];
    weight_sum += weight(j) * 10.0;
  }
  EXPECT_NEAR(carried, 30.0, 1e-12);
  for (int j = 1; j <= b.NFaces(2); ++j) EXPECT_NEAR(OldValue(b.Face(2, j), 1), 30.0 * weight(j) / weight_sum, 1e-12);
}

TEST(BoundSetup, DischargeOverADryBoundarySpreadsEvenly) {
  BoundCase b;
  b.Make(Channel(3, 4, 10.0, 10.0, [](double, double) { return 1.0; }, 2, 1), 10.0, 10,
         CodeSection(2, "type = 7\nconstant_value = 8.0\ntype_of_soft_start = 0\n"));
  b.Start([](double, double) { return 1.0; });  // the bed is dry
  for (int j = 1; j <= b.NFaces(2); ++j) EXPECT_DOUBLE_EQ(OldValue(b.Face(2, j), 1), 8.0 / 40.0);
}

TEST(BoundSetup, FlatherConstraintScalesOrShiftsTheVelocitiesToTheDischarge) {
  // Flather boundary on the west side (outward normal -x), level 0 over 5 m,
  // data velocity (u, v) and a prescribed discharge Qs; constrain 1 scales,
  // 2 shifts. Without a data velocity there is nothing to scale.
  struct Row {
    int constrain;
    const char* values;
    double Q, vsum;
  } rows[] = {{1, "[0.0, 0.2, 0.1, 60.0]", 60.0, 4 * 0.1 * 60.0 / 40.0},  // both components scaled
              {2, "[0.0, 0.2, 0.1, 60.0]", 60.0, 0.4},                    // the normal one shifted
              {1, "[0.0, 0.0, 0.3, 60.0]", 0.0, 4 * 0.3}};
  for (const Row& r : rows) {
    SCOPED_TRACE(r.values);
    BoundCase b;
    b.Make(Channel(3, 4, 10.0, 10.0, Flat(5.0), 2, 1), 10.0, 10,
           CodeSection(2, "type = 12\ntype_of_data = 1\ntype_interpolation_constrain = " + std::to_string(r.constrain) +
                              "\nconstant_values = " + r.values + "\ntype_of_soft_start = 0\n"));
    b.Start(Level0);
    double Q = 0.0, vsum = 0.0;
    for (int j = 1; j <= b.NFaces(2); ++j) {
      Q += OldValue(b.Face(2, j), 2) * 5.0 * 10.0;  // -u.n h L with n = (-1, 0)
      vsum += OldValue(b.Face(2, j), 3);
    }
    if (r.Q == 0.0) {  // left alone
      EXPECT_EQ(Q, 0.0);
      EXPECT_DOUBLE_EQ(vsum, r.vsum);
    } else {
      EXPECT_NEAR(Q, r.Q, 1e-10);
      EXPECT_NEAR(vsum, r.vsum, 1e-12);
    }
  }
}

TEST(BoundSetup, DischargeCelerityJoinsTheDischargeWithTheCharacteristic) {
  const double g = 9.81;
  for (double q : {-3.0, -0.5, 0.0, 0.5, 2.0, 10.0}) {
    for (double R : {0.0, 5.0, 12.0, 20.0}) {
      const double c = DischargeCelerity(q, R, g);
      const double f = (2 * c - R) * c * c - g * q;
      if (c > R / 3.0 + 1e-9) {
        EXPECT_NEAR(f, 0.0, 1e-9 * (1 + std::abs(g * q))) << "q " << q << " R " << R;
      } else {
        EXPECT_GE(f, -1e-9) << "q " << q << " R " << R;  // no subcritical root: critical
      }
    }
  }
}

// ---- bad setups -----------------------------------------------------------------------------

TEST(BoundSetupDeath, BadSetupsStopWithTheirMessages) {
  const std::string pair = CodeSection(2, "type = 15\ncode_cyclic = 3\n") + CodeSection(3, "type = 15\n");
  struct Case {
    RectangleMeshSpec spec;
    std::string sections, message;
  };
  std::vector<Case> cases = {
      // Code 2 on both ends of the channel: two separate stretches.
      {Channel(4, 3, 10.0, 10.0, Flat(2.0), 2, 2), CodeSection(2, "type = 6\ntype_of_coriolis_correction = 1\n"),
       "SetupBoundCondHD: Only one section allowed when coriolis/wind correction is included"},
      // South side (code 2) of 11 faces against the west side (code 3) of 10.
      {Channel(11, 10, 10.0, 10.0, Flat(2.0), 3, 1, 2, 1), pair,
       "SetupBoundCondHD: The number of faces must be the same"},
      // Ten faces each, of 10 m and of 10.5 m.
      {Channel(10, 10, 10.0, 10.5, Flat(2.0), 3, 1, 2, 1), pair,
       "SetupBoundCondHD: Length of faces must be identical"},
      {Channel(4, 4, 10.0, 10.0, Flat(2.0), 2, 1), CodeSection(2, "type = 15\n"),
       "SetupBoundCondHD: Cyclic boundary not identified"},
  };
  for (int type : {3, 8, 13, 14, 16, 0}) {
    cases.push_back({Channel(3, 3, 10.0, 10.0, Flat(2.0), 2, 1),
                     CodeSection(2, "type = " + std::to_string(type) + "\n"), "Format not supported for data input"});
  }
  for (int point : {0, 6}) {
    cases.push_back({Channel(3, 5, 10.0, 10.0, Flat(2.0), 2, 1),
                     CodeSection(2, "type = 10\ntype_of_wind_correction = 1\ntype_of_tilting_point = 4\npoint_tilting = " +
                                        std::to_string(point) + "\n"),
                     "SetupBoundCondHD: Illegal value of tilting point"});
  }
  for (const Case& c : cases) {
    SCOPED_TRACE(c.sections);
    BoundCase b;
    test::ExpectStop([&] { b.Make(c.spec, 10.0, 10, c.sections); }, b.log_path, c.message);
  }
}

}  // namespace
}  // namespace vhd
