#include "parallel/exact_sum.hpp"

#define OMPI_SKIP_MPICXX 1
#include <mpi.h>

#include <bit>
#include <cmath>
#include <limits>

#include "parallel/message_passing.hpp"

namespace vhd {

namespace {

constexpr int kCarryEvery = 1 << 30;  // terms of at most 2^32 per limb before a carry pass

}  // namespace

void ExactSum::Add(double x) {
  const auto bits = std::bit_cast<std::uint64_t>(x);
  const int exponent = static_cast<int>((bits >> 52) & 0x7ff);
  const bool negative = (bits >> 63) != 0;
  if (exponent == 0x7ff) {
    special_ |= (bits & ((std::uint64_t{1} << 52) - 1)) != 0 ? 4 : (negative ? 2 : 1);
    return;
  }
  std::uint64_t mantissa = bits & ((std::uint64_t{1} << 52) - 1);
  if (mantissa == 0 && exponent == 0) return;
  if (exponent > 0) mantissa |= std::uint64_t{1} << 52;
  // x = mantissa * 2^(position - 1074)
  const int position = exponent > 0 ? exponent - 1 : 0;
  const int i = position >> 5;
  const unsigned __int128 v = static_cast<unsigned __int128>(mantissa) << (position & 31);
  const auto part = [&](int k) { return static_cast<std::int64_t>((v >> (32 * k)) & 0xffffffffu); };
  if (negative) {
    limb_[i] -= part(0), limb_[i + 1] -= part(1), limb_[i + 2] -= part(2);
  } else {
    limb_[i] += part(0), limb_[i + 1] += part(1), limb_[i + 2] += part(2);
  }
  if (++pending_ >= kCarryEvery) Normalise();
}

void ExactSum::Merge(const ExactSum& other, int sign) {
  ExactSum o = other;
  o.Normalise();
  Normalise();
  for (int i = 0; i < kLimbs; ++i) limb_[i] += sign * o.limb_[i];
  pending_ = 1;
  // Subtracted, an infinity changes its sign (inf - inf is NaN).
  special_ |= sign > 0 ? o.special_ : (o.special_ & 4) | ((o.special_ & 1) << 1) | ((o.special_ & 2) >> 1);
}

void ExactSum::Normalise() {
  for (int i = 0; i + 1 < kLimbs; ++i) {
    const std::int64_t carry = limb_[i] >> 32;  // floor division by 2^32
    limb_[i] -= carry * (std::int64_t{1} << 32);
    limb_[i + 1] += carry;
  }
  pending_ = 0;
}

double ExactSum::Value() const {
  if (special_ != 0) {
    if (special_ == 1) return std::numeric_limits<double>::infinity();
    if (special_ == 2) return -std::numeric_limits<double>::infinity();
    return std::numeric_limits<double>::quiet_NaN();
  }
  ExactSum s = *this;
  s.Normalise();
  // A negative sum: its magnitude, whose limbs are all non-negative.
  const bool negative = s.limb_[kLimbs - 1] < 0;
  if (negative) {
    for (std::int64_t& l : s.limb_) l = -l;
    s.Normalise();
  }
  double r = 0.0;
  for (int i = kLimbs - 1; i >= 0; --i)
    if (s.limb_[i] != 0) r += std::ldexp(static_cast<double>(s.limb_[i]), 32 * i - 1074);
  return negative ? -r : r;
}

void ExactSum::SumOverProcesses(const RunControl& run) {
  if (run.nprocesses <= 1) return;
  Normalise();
  std::array<std::int64_t, kLimbs> total{};
  CheckMpiCall(MPI_Allreduce(limb_.data(), total.data(), kLimbs, MPI_INT64_T, MPI_SUM, MPI_COMM_WORLD));
  limb_ = total;
  int special = 0;
  CheckMpiCall(MPI_Allreduce(&special_, &special, 1, MPI_INT, MPI_BOR, MPI_COMM_WORLD));
  special_ = special;
  pending_ = 1;
}

}  // namespace vhd
