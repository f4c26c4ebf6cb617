// Time-varying input input definitions: keywords and defaults, the soft start,
// interpolation in time, the coverage check and the table lookup.

#include "io/dataspec.hpp"

#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "test_support.hpp"

namespace vhd {
namespace {

class DataSpecSetup : public ::testing::Test {
 protected:
  void Open(const std::string& body) {
    test::WriteTextFile(setup_path, "[VantorHD]\n" + body);
    SktOpenFile(setup_path, true);
    SktOpenTarget("VantorHD");
  }
  void TearDown() override {
    SktClose();
    CloseLogFile();
  }
  test::TempDir dir;
  std::string setup_path = dir.file("model.toml");
};

TEST_F(DataSpecSetup, SingularFormsForOneComponentPluralForSeveral) {
  Open(R"([VantorHD.EMPTY]
[VantorHD.ONE]
constant_value = 3.0
reference_value = 1.0
type_of_soft_start = 1
soft_time_interval = 600
[VantorHD.TWO]
constant_values = [1.0, -2.0]
reference_values = [0.5, 0.25]
type_of_time_interpolation = 2
)");
  DataSpec empty, one, two;
  SktOpenSection("EMPTY");
  ReadDataSpec(empty, 1, {2.5});
  SktCloseSection();
  SktOpenSection("ONE");
  ReadDataSpec(one, 1);
  SktCloseSection();
  SktOpenSection("TWO");
  ReadDataSpec(two, 2, {9.0, 9.0});
  SktCloseSection();
  // Absent keywords take the defaults.
  EXPECT_EQ(empty.format, kDataConstant);
  EXPECT_EQ(empty.constant_values[1], 2.5);
  EXPECT_EQ(empty.item_numbers[1], 1);
  EXPECT_EQ(one.constant_values[1], 3.0);
  EXPECT_EQ(one.reference_values[1], 1.0);
  EXPECT_EQ(one.type_of_soft_start, kSoftStartLinear);
  EXPECT_EQ(one.soft_time_interval, 600.0);
  EXPECT_EQ(two.constant_values[1], 1.0);
  EXPECT_EQ(two.constant_values[2], -2.0);
  EXPECT_EQ(two.reference_values[2], 0.25);
  // One interpolation type for every component.
  EXPECT_EQ(two.time_interpolation[1], 2);
  EXPECT_EQ(two.time_interpolation[2], 2);
}

TEST_F(DataSpecSetup, FileFormatsReadTheirOwnKeywords) {
  Open(R"([VantorHD.SERIES]
format = 1
file_name = "tide.zrn0"
item_number = 3
type_of_space_interpolation = 5
constant_value = 7.0
[VantorHD.MAP]
format = 2
file_name = "data/wind.zrn2"
item_numbers = [2, 4]
type_of_space_interpolation = 1
)");
  DataSpec series, map;
  SktOpenSection("SERIES");
  ReadDataSpec(series, 1, {0.0}, {1});
  SktCloseSection();
  SktOpenSection("MAP");
  ReadDataSpec(map, 2);
  SktCloseSection();
  EXPECT_EQ(series.format, kDataFile);
  EXPECT_EQ(series.file_name, dir.file("tide.zrn0"));
  EXPECT_EQ(series.item_numbers[1], 3);
  // Neither the space interpolation (format 1) nor the constant is read.
  EXPECT_EQ(series.type_of_space_interpolation, 0);
  EXPECT_EQ(series.constant_values[1], 0.0);
  EXPECT_EQ(map.format, kDataFileOnce);
  EXPECT_EQ(map.file_name, dir.file("data/wind.zrn2"));
  EXPECT_EQ(map.item_numbers[1], 2);
  EXPECT_EQ(map.item_numbers[2], 4);
  EXPECT_EQ(map.type_of_space_interpolation, 1);
}

TEST_F(DataSpecSetup, UnknownFormatAndMissingFileNameStop) {
  Open("[VantorHD.BAD]\nformat = 5\n[VantorHD.NOFILE]\nformat = 3\n");
  const struct {
    const char* section;
    const char* message;
  } cases[] = {{"BAD", "Format not supported for data input"}, {"NOFILE", "file_name in section VantorHD/NOFILE"}};
  for (const auto& c : cases) {
    EXPECT_EXIT(
        {
          SktOpenSection(c.section);
          DataSpec spec;
          ReadDataSpec(spec, 1);
        },
        testing::ExitedWithCode(1), "");
    EXPECT_NE(test::ReadTextFile(dir.file("model.log")).find(c.message), std::string::npos) << c.section;
  }
}

TEST(SoftStart, SineAndLinearFactors) {
  const double T = 1800.0;
  EXPECT_NEAR(SoftStartFactor(kSoftStartSine, T, 0.0), 0.0, 1e-15);
  EXPECT_NEAR(SoftStartFactor(kSoftStartSine, T, T / 2), 0.5, 1e-15);
  EXPECT_NEAR(SoftStartFactor(kSoftStartSine, T, T), 1.0, 1e-15);
  EXPECT_NEAR(SoftStartFactor(kSoftStartSine, T, T / 4), (std::sin(-M_PI / 4) + 1) / 2, 1e-15);
  for (double t : {0.0, 100.0, 900.0, 1799.0, T})
    EXPECT_DOUBLE_EQ(SoftStartFactor(kSoftStartLinear, T, t), t / T);
  // Past the interval, for type 0 and for unknown types the factor is 1.
  EXPECT_EQ(SoftStartFactor(kSoftStartLinear, T, T + 1), 1.0);
  EXPECT_EQ(SoftStartFactor(kSoftStartNone, T, 10.0), 1.0);
  EXPECT_EQ(SoftStartFactor(3, T, 10.0), 1.0);
  // A zero interval means no soft start, whatever the type.
  for (int type : {kSoftStartSine, kSoftStartLinear}) EXPECT_EQ(SoftStartFactor(type, 0.0, 0.0), 1.0);
}

TEST(SoftStart, RisesFromTheReferenceUnlessSwitchedOff) {
  DataSpec spec;
  InitDataSpec(spec, 1, {2.0});
  spec.reference_values[1] = 1.0;
  EXPECT_DOUBLE_EQ(ApplySoftStart(spec, 1, 0.5, 2.0), 1.5);
  spec.no_soft_start[1] = 1;
  EXPECT_EQ(ApplySoftStart(spec, 1, 0.0, 2.0), 2.0);
}

TEST(TimeInterpolation, LinearAndCircular) {
  EXPECT_DOUBLE_EQ(InterpolateInTime(1, 2.0, 4.0, 0.25), 2.5);
  // Through north, and the result is not folded into 0..360.
  EXPECT_DOUBLE_EQ(InterpolateInTime(2, 350.0, 10.0, 0.5), 360.0);
  EXPECT_DOUBLE_EQ(InterpolateInTime(2, 10.0, 350.0, 0.5), 0.0);
  EXPECT_DOUBLE_EQ(InterpolateInTime(3, 10.0, 350.0, 0.25), 5.0);
  // Linear interpolation goes the long way; circular only when the short way is shorter.
  EXPECT_DOUBLE_EQ(InterpolateInTime(1, 350.0, 10.0, 0.5), 180.0);
  EXPECT_DOUBLE_EQ(InterpolateInTime(2, 0.0, 180.0, 0.5), 90.0);
}

TEST(Coverage, StartAndEndOfTheFile) {
  int status = -1;
  const double end = 86400.0;
  EXPECT_EQ(CheckDataCoverage(25, 0.0, end, 0.0, end, "a.zrn0", &status), 0);
  EXPECT_EQ(CheckDataCoverage(25, -3600.0, end + 3600, 0.0, end, "a.zrn0", &status), 0);
  EXPECT_EQ(CheckDataCoverage(25, 0.0, end - 5e-7, 0.0, end, "a.zrn0", &status), 0);
  EXPECT_EQ(CheckDataCoverage(25, 0.0, end - 0.5, 0.0, end, "a.zrn0", &status), 2);
  EXPECT_EQ(CheckDataCoverage(25, 1.0, end, 0.0, end, "a.zrn0", &status), 2);
  EXPECT_EQ(status, 2);
  // One step covers only a simulation of one instant.
  EXPECT_EQ(CheckDataCoverage(1, 0.0, 0.0, 0.0, 0.0, "a.zrn0", &status), 0);
  EXPECT_EQ(CheckDataCoverage(1, 0.0, 0.0, 0.0, 30.0, "a.zrn0", &status), 1);
}

TEST(Coverage, RefusalsAreFatalWithoutStatus) {
  EXPECT_FATAL(CheckDataCoverage(3, 0.0, 99.5, 0.0, 100.0, "/data/late.zrn0"),
               "Fatal error: The data does not cover the entire simulation: /data/late.zrn0");
  EXPECT_FATAL(CheckDataCoverage(1, 0.0, 0.0, 0.0, 100.0, "one.zrn0"),
               "The data does not cover the entire simulation - only one time step in file");
}

TEST(TableLookup, ClampsInterpolatesAndInverts) {
  const std::vector<double> x{0.0, 1.0, 3.0, 6.0};
  const std::vector<double> y{10.0, 12.0, 13.0, 19.0};
  EXPECT_EQ(TableLookup(x, y, -5.0), 10.0);
  EXPECT_EQ(TableLookup(x, y, 9.0), 19.0);
  EXPECT_DOUBLE_EQ(TableLookup(x, y, 2.0), 12.5);
  EXPECT_DOUBLE_EQ(TableLookup(x, y, 5.0), 17.0);
  for (double v : x) EXPECT_DOUBLE_EQ(TableLookupInverse(x, y, TableLookup(x, y, v)), v);
  EXPECT_DOUBLE_EQ(TableLookupInverse(x, y, 16.0), 4.5);
  EXPECT_EQ(TableLookupInverse(x, y, 0.0), 0.0);
  const std::vector<double> one_x{4.0}, one_y{7.0};
  for (double v : {-1.0, 4.0, 9.0}) EXPECT_EQ(TableLookup(one_x, one_y, v), 7.0);
}

TEST(TableLookup, AJumpTakesTheLastPair) {
  // x = 1 twice: a step of the table; at the step the later pair holds.
  const std::vector<double> x{0.0, 1.0, 1.0, 2.0};
  const std::vector<double> y{0.0, 1.0, 5.0, 6.0};
  EXPECT_DOUBLE_EQ(TableLookup(x, y, 0.5), 0.5);
  EXPECT_DOUBLE_EQ(TableLookup(x, y, 1.0), 5.0);
  EXPECT_DOUBLE_EQ(TableLookup(x, y, 1.5), 5.5);
}

}  // namespace
}  // namespace vhd
