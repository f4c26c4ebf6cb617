#pragma once
// Exact sums of doubles, so that a global sum (volumes, budgets, boundary
// discharges) has the same bits for any order of its terms: any number of
// threads, any number of processes, any element numbering.
//
// Every finite double is an integer multiple of 2^-1074. ExactSum holds the
// sum of its terms exactly as such an integer, in base-2^32 limbs kept in
// 64-bit integers (two's complement over the limbs, the top limb signed after
// Normalise). A term adds its 53-bit mantissa into at most three limbs;
// carries are propagated every 2^30 terms, so no limb overflows. Two sums
// merge exactly by adding their limbs (also across processes: an integer sum
// of normalised limbs, SumOverProcesses). Value() rounds the exact integer to
// a double, deterministically (from the most significant limb down). A term
// that is not finite makes the value NaN (or the infinity of its sign when
// all non-finite terms are infinities of one sign).
//
// Cost: a few nanoseconds a term; for sums over elements at output times and
// over boundary faces every step, not for the face loop.

#include <array>
#include <cstdint>

#include "core/run.hpp"

namespace vhd {

class ExactSum {
 public:
  static constexpr int kLimbs = 68;  // 2^-1074 .. 2^1102: every finite double and its carries

  void Add(double x);
  void Add(const ExactSum& other) { Merge(other, 1); }
  void Subtract(const ExactSum& other) { Merge(other, -1); }
  ExactSum& operator+=(double x) {
    Add(x);
    return *this;
  }
  // Propagates the carries: every limb but the top one in [0, 2^32).
  void Normalise();
  double Value() const;
  void Clear() { *this = ExactSum(); }

  // The sum over all processes (every process passes its own; every process
  // gets the total). Nothing happens with a single process.
  void SumOverProcesses(const RunControl& run);

 private:
  void Merge(const ExactSum& other, int sign);  // sign +1 or -1

  std::array<std::int64_t, kLimbs> limb_{};
  int pending_ = 0;  // terms added since the last normalisation
  // Non-finite terms: bit 0 +inf, bit 1 -inf, bit 2 NaN.
  int special_ = 0;
};

}  // namespace vhd
