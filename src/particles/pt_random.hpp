#pragma once
// Random numbers of the particle module: a counter-based generator. Every
// number is a pure function of (seed, particle id, step, draw), so a
// particle's numbers do not depend on which thread or process moves it nor on
// the order in which particles are moved; there is no generator state.
//
// The mixing function is the SplitMix64 finaliser applied to a counter built
// from the four keys: three rounds absorb seed, id and (step, draw).

#include <cmath>
#include <cstdint>

namespace vhd {

inline std::uint64_t MixPT(std::uint64_t z) {
  z = (z ^ (z >> 30)) * 0xbf58476d1ce4e5b9ULL;
  z = (z ^ (z >> 27)) * 0x94d049bb133111ebULL;
  return z ^ (z >> 31);
}

// 64 random bits for draw k of particle id at step n.
inline std::uint64_t RandomBitsPT(std::uint64_t seed, std::uint64_t id, std::uint64_t n, std::uint64_t k) {
  constexpr std::uint64_t kGolden = 0x9e3779b97f4a7c15ULL;
  std::uint64_t z = MixPT(seed * kGolden + 0x632be59bd9b4e019ULL);
  z = MixPT(z + id * kGolden);
  return MixPT(z + ((n << 8) | (k & 0xff)) * kGolden);
}

// Uniform in (0, 1): the top 53 bits, shifted by half a unit so that 0 never
// comes out.
inline double RandomUniformPT(std::uint64_t seed, std::uint64_t id, std::uint64_t n, std::uint64_t k) {
  return (static_cast<double>(RandomBitsPT(seed, id, n, k) >> 11) + 0.5) * 0x1.0p-53;
}

// Two independent standard normal numbers from draws k and k+1 (Box-Muller).
inline void RandomNormalPairPT(std::uint64_t seed, std::uint64_t id, std::uint64_t n, std::uint64_t k, double& r1,
                               double& r2) {
  const double u1 = RandomUniformPT(seed, id, n, k);
  const double u2 = RandomUniformPT(seed, id, n, k + 1);
  const double radius = std::sqrt(-2.0 * std::log(u1));
  const double angle = 6.283185307179586 * u2;
  r1 = radius * std::cos(angle);
  r2 = radius * std::sin(angle);
}

}  // namespace vhd
