#pragma once
// Small helpers shared by the gradient, limiter and interpolation kernels.

#include <algorithm>
#include <cmath>
#include <type_traits>

#include "core/array1.hpp"

namespace vhd::detail {

// Element and face flags: an empty array means "all active" / "all open".
// Element e is active when its flag equals 1 (the wet code: 1 wet, 0 dry,
// 2 flooded); face f is open when its flag is positive.
struct FlagView {
  const int* element = nullptr;
  const int* face = nullptr;

  FlagView(const Array1<int>& element_flags, const Array1<int>& face_flags)
      : element(element_flags.empty() ? nullptr : element_flags.data()),
        face(face_flags.empty() ? nullptr : face_flags.data()) {}
  bool Active(int e) const { return element == nullptr || element[e] == 1; }
  bool Open(int f) const { return face == nullptr || face[f] > 0; }
};

// Difference b - a of two x coordinates; on a geographic mesh (radians) the
// difference is taken the short way round the globe.
inline double DeltaX(double a, double b, bool geographic) {
  double d = b - a;
  if (geographic) {
    constexpr double kPi = 3.14159265358979323846;
    if (d > kPi) d -= 2 * kPi;
    else if (d < -kPi) d += 2 * kPi;
  }
  return d;
}

// Multi-field kernels are compiled for a fixed number of fields, so that the
// per-field sums live in registers. Calls run(std::integral_constant<int, n>,
// first) for consecutive groups of n <= kFieldGroup fields starting at first.
inline constexpr int kFieldGroup = 4;

template <class Run>
void ForFieldGroups(int count, Run&& run) {
  for (int first = 0; first < count; first += kFieldGroup) {
    switch (std::min(kFieldGroup, count - first)) {
      case 1: run(std::integral_constant<int, 1>(), first); break;
      case 2: run(std::integral_constant<int, 2>(), first); break;
      case 3: run(std::integral_constant<int, 3>(), first); break;
      default: run(std::integral_constant<int, 4>(), first); break;
    }
  }
}

}  // namespace vhd::detail
