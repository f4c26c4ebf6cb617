// The number-to-text rule of messages.

#include <gtest/gtest.h>

#include <limits>
#include <string>

#include "log/log.hpp"

namespace vhd {
namespace {

TEST(NumberText, RightAdjustedInTheWidth) {
  EXPECT_EQ(NumberText(100.0), "       100");
  EXPECT_EQ(NumberText(-0.25, 20), std::string(15, ' ') + "-0.25");
  // A text longer than the width is kept whole.
  EXPECT_EQ(NumberText(-1.2345678912e10), "-1.2345678912E+10");
  // w = 6: exponent form from 99999 on and from 0.01 down.
  EXPECT_EQ(NumberText(99998, 6), " 99998");
  EXPECT_EQ(NumberText(99999, 6), "9.9999E+04");
  EXPECT_EQ(NumberText(0.01, 6), "1.E-02");
  EXPECT_EQ(NumberText(0.02, 6), "  0.02");
}

TEST(NumberText, FixedFractionAndExponentForms) {
  const struct {
    double x;
    const char* text;
  } cases[] = {
      {30.0, "30"},
      {-30.5, "-30.5"},
      {2.0000004, "2"},
      {123456.7890123, "123456.789012"},
      {-0.25, "-0.25"},
      {0.000002, "0.000002"},
      {0.1234567, "0.123457"},
      {0.9999996, "1"},  // rounding up to one stays a number, not "0.1000000"
      {-0.9999996, "-1"},
      {0.000001, "1.E-06"},  // not above the lower bound
      {1.5e10, "1.5E+10"},
      {-2.5e-8, "-2.5E-08"},
      {1.23456789012345e200, "1.2345678901E+200"},
      {1e-99, "1.E-99"},
      {-1e-101, "0"},
      {0.0, "0"},
      {std::numeric_limits<double>::quiet_NaN(), "NaN"},
      {-std::numeric_limits<double>::infinity(), "-Infinity"},
  };
  for (const auto& c : cases) EXPECT_EQ(SubstituteValue("%", c.x), c.text) << c.text;
}

TEST(NumberText, IntegersFromTheUpperBoundOnAreExponents) {
  EXPECT_EQ(SubstituteValue("%", 999999998), "999999998");
  EXPECT_EQ(SubstituteValue("%", 999999999), "9.99999999E+08");
  EXPECT_EQ(SubstituteValue("%", 1000000000), "1.E+09");
  EXPECT_EQ(SubstituteValue("%", -2147483647 - 1), "-2.147483648E+09");
  EXPECT_EQ(SubstituteValue("%", 12345678901LL), "1.2345678901E+10");
}

}  // namespace
}  // namespace vhd
