// Exact sums: the same bits for any order and any split of the terms, and
// the right value where a plain sum loses it.

#include "parallel/exact_sum.hpp"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <random>
#include <vector>

namespace vhd {
namespace {

double Sum(const std::vector<double>& terms) {
  ExactSum s;
  for (double x : terms) s += x;
  return s.Value();
}

TEST(ExactSum, AnyOrderAndAnySplitGiveTheSameBits) {
  // Terms over 40 decades, both signs, and subnormal ones.
  std::mt19937_64 random(7);
  std::uniform_real_distribution<double> mantissa(-1.0, 1.0);
  std::vector<double> terms;
  for (int i = 0; i < 20000; ++i) terms.push_back(mantissa(random) * std::pow(10.0, static_cast<int>(random() % 40) - 20));
  terms.push_back(4.9e-324);
  terms.push_back(-1.5e-310);
  const double reference = Sum(terms);
  // A sum sorted by magnitude in long double is as close as the double can be.
  std::vector<double> sorted = terms;
  std::sort(sorted.begin(), sorted.end(), [](double a, double b) { return std::fabs(a) < std::fabs(b); });
  long double careful = 0;
  for (double x : sorted) careful += x;
  EXPECT_NEAR(reference, static_cast<double>(careful), 1e-15 * std::fabs(reference));

  for (int trial = 0; trial < 3; ++trial) {
    std::shuffle(terms.begin(), terms.end(), random);
    EXPECT_EQ(Sum(terms), reference);
    // Split at a random place, summed apart and merged, as threads and
    // processes do.
    const std::size_t cut = random() % terms.size();
    ExactSum a, b;
    for (std::size_t i = 0; i < terms.size(); ++i) (i < cut ? a : b) += terms[i];
    a.Add(b);
    EXPECT_EQ(a.Value(), reference);
  }
}

TEST(ExactSum, CancellationKeepsWhatAPlainSumLoses) {
  EXPECT_EQ(Sum({1e300, 1.0, -1e300}), 1.0);
  EXPECT_EQ(Sum({-2.0, 0.25}), -1.75);
  // The doubles nearest 0.1, 0.2 and 0.3 sum to 2^-55 exactly; added in
  // order they give 2^-54.
  EXPECT_EQ(Sum({0.1, 0.2, -0.3}), std::ldexp(1.0, -55));
  ExactSum a, b;
  a += 5.0;
  a += 1e-20;
  b += 5.0;
  a.Subtract(b);
  EXPECT_EQ(a.Value(), 1e-20);
  EXPECT_EQ(ExactSum().Value(), 0.0);
}

TEST(ExactSum, TermsThatAreNotFiniteShowInTheValue) {
  const double inf = std::numeric_limits<double>::infinity();
  EXPECT_EQ(Sum({1.0, inf}), inf);
  EXPECT_EQ(Sum({1.0, -inf}), -inf);
  EXPECT_TRUE(std::isnan(Sum({inf, -inf})));
  EXPECT_TRUE(std::isnan(Sum({1.0, std::numeric_limits<double>::quiet_NaN()})));
}

}  // namespace
}  // namespace vhd
