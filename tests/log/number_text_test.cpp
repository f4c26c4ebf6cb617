// The number-to-text rule of messages.

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <string>

#include "log/log.hpp"

namespace vhd {
namespace {

std::string Text(double x) { return SubstituteValue("%", x); }

TEST(NumberText, RightAdjustedInTheWidth) {
  EXPECT_EQ(NumberText(100.0), "       100");
  EXPECT_EQ(NumberText(1.25, 6), "  1.25");
  EXPECT_EQ(NumberText(-0.25, 20), std::string(15, ' ') + "-0.25");
  // A text longer than the width is kept whole.
  EXPECT_EQ(NumberText(-1.2345678912e10), "-1.2345678912E+10");
}

TEST(NumberText, FixedForm) {
  EXPECT_EQ(Text(100), "100");
  EXPECT_EQ(Text(30.0), "30");
  EXPECT_EQ(Text(1.25), "1.25");
  EXPECT_EQ(Text(-30.5), "-30.5");
  EXPECT_EQ(Text(1.0), "1");
  EXPECT_EQ(Text(-1.0), "-1");
  EXPECT_EQ(Text(2.0000004), "2");
  EXPECT_EQ(Text(123456.7890123), "123456.789012");
  EXPECT_EQ(Text(999999998.0), "999999998");
}

TEST(NumberText, Fractions) {
  EXPECT_EQ(Text(0.5), "0.5");
  EXPECT_EQ(Text(-0.25), "-0.25");
  EXPECT_EQ(Text(0.000002), "0.000002");
  EXPECT_EQ(Text(0.1234567), "0.123457");
  // Rounding up to one stays a number, not "0.1000000".
  EXPECT_EQ(Text(0.9999996), "1");
  EXPECT_EQ(Text(-0.9999996), "-1");
}

TEST(NumberText, ExponentFormAtBothEnds) {
  EXPECT_EQ(Text(0.000001), "1.E-06");  // not above the lower bound
  EXPECT_EQ(Text(1e-7), "1.E-07");
  EXPECT_EQ(Text(1.5e10), "1.5E+10");
  EXPECT_EQ(Text(-2.5e-8), "-2.5E-08");
  EXPECT_EQ(Text(1.23456789012345e200), "1.2345678901E+200");
  EXPECT_EQ(Text(1e-99), "1.E-99");
  EXPECT_EQ(Text(1e-120), "0");
  EXPECT_EQ(Text(-1e-101), "0");
  EXPECT_EQ(Text(0.0), "0");
}

TEST(NumberText, IntegersFromTheUpperBoundOnAreExponents) {
  EXPECT_EQ(SubstituteValue("%", 999999998), "999999998");
  EXPECT_EQ(SubstituteValue("%", 999999999), "9.99999999E+08");
  EXPECT_EQ(SubstituteValue("%", 1000000000), "1.E+09");
  EXPECT_EQ(SubstituteValue("%", -2147483647 - 1), "-2.147483648E+09");
  EXPECT_EQ(SubstituteValue("%", 12345678901LL), "1.2345678901E+10");
  EXPECT_EQ(SubstituteValue("%", -7), "-7");
}

TEST(NumberText, WidthMovesTheBounds) {
  // w = 6: exponent form from 99999 on and from 0.01 down.
  EXPECT_EQ(NumberText(99998, 6), " 99998");
  EXPECT_EQ(NumberText(99999, 6), "9.9999E+04");
  EXPECT_EQ(NumberText(0.01, 6), "1.E-02");
  EXPECT_EQ(NumberText(0.02, 6), "  0.02");
}

TEST(NumberText, NonFiniteValuesAreNamed) {
  EXPECT_EQ(Text(std::numeric_limits<double>::quiet_NaN()), "NaN");
  EXPECT_EQ(Text(-std::numeric_limits<double>::infinity()), "-Infinity");
}

}  // namespace
}  // namespace vhd
