// Near-field model of jet sources (see sources.hpp) and its report in the log.

#include <algorithm>
#include <cmath>
#include <numbers>

#include "hydro/sources.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

// Fine steps per section of the jet's path.
constexpr int kStepsPerSection = 100;

}  // namespace

void RunJetModel(SourceRecord& s, double u_a, double v_a, double z_bed, double z_surface, double metres_x,
                 double metres_y) {
  JetModel& j = s.jet;
  const double q0 = s.values_new[0];
  const double w0 = q0 / (0.25 * std::numbers::pi * j.diameter * j.diameter);
  const double a = (j.sigma + j.north) * kDegToRad, th = j.theta * kDegToRad;
  // Jet velocity (x, y in the mesh's axes, z up); released at mid-depth.
  double wx = w0 * std::cos(th) * std::sin(a), wy = w0 * std::cos(th) * std::cos(a), wz = w0 * std::sin(th);
  double q = q0, x = s.x, y = s.y, z = 0.5 * (z_bed + z_surface), dist = 0.0;
  const double ambient = std::hypot(u_a, v_a);
  const int n = j.number_of_sections;
  const double ds = j.maximum_distance / (static_cast<double>(n) * kStepsPerSection);
  int stop = kJetStopDistance;
  for (int k = 0; k < n; ++k) {
    for (int i = 0; i < kStepsPerSection && stop == kJetStopDistance; ++i) {
      const double ex = wx - u_a, ey = wy - v_a, ez = wz;
      const double excess = std::sqrt(ex * ex + ey * ey + ez * ez);
      if (excess < j.gamma) {
        stop = kJetStopVelocity;
        break;
      }
      if (ambient > 0 && excess < j.epsilon * ambient) {
        stop = kJetStopAmbient;
        break;
      }
      const double speed = std::sqrt(wx * wx + wy * wy + wz * wz);
      const double b = std::sqrt(q / (std::numbers::pi * speed));
      // Move along the jet, then entrain: the new water brings the ambient
      // momentum.
      x += wx / speed * ds / metres_x;
      y += wy / speed * ds / metres_y;
      z += wz / speed * ds;
      dist += ds;
      const double dq = 2.0 * std::numbers::pi * b * j.entrainment * excess * ds;
      wx = (q * wx + dq * u_a) / (q + dq);
      wy = (q * wy + dq * v_a) / (q + dq);
      wz = q * wz / (q + dq);
      q += dq;
      if (z > z_surface || z < z_bed) {
        z = std::clamp(z, z_bed, z_surface);
        stop = kJetStopSurface;
      }
    }
    JetPoint& p = j.points[static_cast<std::size_t>(k)];
    const double speed = std::sqrt(wx * wx + wy * wy + wz * wz);
    p.x = x, p.y = y, p.z = z;
    p.discharge = q;
    p.width = 2.0 * std::sqrt(q / (std::numbers::pi * speed));
    p.dilution = q / q0;
    p.distance = dist;
    p.stop = stop;
  }
  // The jet's own water leaves the near field with the ambient velocity and
  // the jet's excess momentum.
  const double qe = j.points.back().discharge;
  j.release_u = u_a + qe * (wx - u_a) / q0;
  j.release_v = v_a + qe * (wy - v_a) / q0;
}

}  // namespace vhd
