// The PT step: release from the sources, the per-particle integration
// (current, drift, dispersion, settling, decay, ageing, erosion) and the
// element walk; the statistics.

#include <algorithm>
#include <cmath>
#include <string>

#include "core/omp.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"
#include "mesh/interpolation.hpp"
#include "particles/pt_module.hpp"
#include "particles/pt_random.hpp"

namespace vhd {

namespace {

constexpr double kNoValue = -1.0e30;  // delete value of the node routines (the 2WET form fills every node)
constexpr int kMaxWalkElements = 100000;

// Draws of one particle in one step (the counter's last key).
constexpr std::uint64_t kDrawHorizontal = 0;  // and 1
constexpr std::uint64_t kDrawVertical = 2;    // and 3
constexpr std::uint64_t kDrawRelease = 0;     // release step 0: placement

// Linear interpolation weights of the element's nodes at a point: in a
// triangle its area coordinates; in a quadrilateral those of the triangle
// (1, 2, 3) or (1, 3, 4) that holds the point, their mean when both do, the
// nearer one when neither does (the rule of CalcPointValue2D, with the
// weights formed once for all fields at the point).
struct NodeWeights {
  int n = 0;
  int node[4] = {0, 0, 0, 0};
  double w[4] = {0, 0, 0, 0};
  double Of(const Array1<double>& f) const {
    double r = 0.0;
    for (int j = 0; j < n; ++j) r += w[j] * f[node[j]];
    return r;
  }
};

NodeWeights WeightsAt(const Mesh& mesh, double x, double y, int e) {
  NodeWeights nw;
  const ElementTable& el = mesh.elements;
  nw.n = std::min(ElementNodeCount(el, e), 4);
  double px[4] = {}, py[4] = {};
  for (int j = 0; j < nw.n; ++j) {
    nw.node[j] = ElementNode(el, e, j + 1);
    px[j] = mesh.nodes.x[nw.node[j]] - mesh.nodes.x[nw.node[0]];
    py[j] = mesh.nodes.y[nw.node[j]] - mesh.nodes.y[nw.node[0]];
  }
  const double qx = x - mesh.nodes.x[nw.node[0]], qy = y - mesh.nodes.y[nw.node[0]];
  // Area coordinates (xi, eta) of q in the triangle (0, b, c); worst: the
  // smallest of the three.
  auto tri = [&](int b, int c, double& xi, double& eta) {
    const double det = px[b] * py[c] - px[c] * py[b];
    if (det == 0.0) {
      xi = eta = 0.0;
      return -1e300;
    }
    xi = (qx * py[c] - px[c] * qy) / det;
    eta = (px[b] * qy - qx * py[b]) / det;
    return std::min({xi, eta, 1.0 - xi - eta});
  };
  double xi1 = 0, eta1 = 0;
  const double worst1 = tri(1, 2, xi1, eta1);
  if (nw.n == 3) {
    nw.w[0] = 1.0 - xi1 - eta1, nw.w[1] = xi1, nw.w[2] = eta1;
    return nw;
  }
  double xi2 = 0, eta2 = 0;
  const double worst2 = tri(2, 3, xi2, eta2);
  constexpr double kTol = -1e-10;
  const bool in1 = worst1 >= kTol, in2 = worst2 >= kTol;
  const double f1 = in1 && in2 ? 0.5 : in1 ? 1.0 : in2 ? 0.0 : worst1 >= worst2 ? 1.0 : 0.0;
  const double f2 = 1.0 - f1;
  nw.w[0] = f1 * (1.0 - xi1 - eta1) + f2 * (1.0 - xi2 - eta2);
  nw.w[1] = f1 * xi1;
  nw.w[2] = f1 * eta1 + f2 * xi2;
  nw.w[3] = f2 * eta2;
  return nw;
}

// Signed distance measure of p from the edge (a, b), positive on the side of
// the point c (the element's centre).
struct Edge {
  double ax, ay, ex, ey, sign;
  double Side(double px, double py) const { return sign * (ex * (py - ay) - ey * (px - ax)); }
};

Edge MakeEdge(const Mesh& mesh, int f, double cx, double cy) {
  const int a = FaceNode(mesh.faces, f, 1), b = FaceNode(mesh.faces, f, 2);
  Edge g{mesh.nodes.x[a], mesh.nodes.y[a], mesh.nodes.x[b] - mesh.nodes.x[a], mesh.nodes.y[b] - mesh.nodes.y[a], 1.0};
  g.sign = g.Side(cx, cy) >= 0.0 ? 1.0 : -1.0;
  return g;
}

}  // namespace

int WalkPT(const PtModule& pt, const Array1<int>& wetdry, bool avoid_dry, int& e, double x0, double y0, double& x1,
           double& y1) {
  const Mesh& m = *pt.mesh;
  const ElementTable& el = m.elements;
  // Most moves end in the start element: the test on its node ring first.
  {
    const int nc = std::min(ElementNodeCount(el, e), 4);
    double nx[4], ny[4];
    for (int j = 0; j < nc; ++j) {
      const int k = ElementNode(el, e, j + 1);
      nx[j] = m.nodes.x[k];
      ny[j] = m.nodes.y[k];
    }
    const double orient = (nx[1] - nx[0]) * (ny[2] - ny[0]) - (nx[2] - nx[0]) * (ny[1] - ny[0]) > 0.0 ? 1.0 : -1.0;
    bool inside = true;
    for (int j = 0; j < nc && inside; ++j) {
      const int k = j + 1 == nc ? 0 : j + 1;
      const double ex = nx[k] - nx[j], ey = ny[k] - ny[j];
      inside = orient * (ex * (y1 - ny[j]) - ey * (x1 - nx[j])) >= -1.0e-12 * (ex * ex + ey * ey);
    }
    if (inside) return kWalkInside;
  }
  double px = x0, py = y0;
  const int e_start = e;
  for (int visited = 0; visited < kMaxWalkElements; ++visited) {
    const double cx = el.xc[e], cy = el.yc[e];
    const int nf = ElementFaceCount(el, e);
    double t_exit = 2.0;
    int f_exit = 0;
    Edge g_exit{};
    for (int j = 1; j <= nf; ++j) {
      const int f = ElementFace(el, e, j);
      const Edge g = MakeEdge(m, f, cx, cy);
      const double s1 = g.Side(x1, y1);
      const double tol = 1.0e-12 * (g.ex * g.ex + g.ey * g.ey);
      if (s1 >= -tol) continue;  // the target is on the inner side of this face
      const double s0 = std::max(g.Side(px, py), 0.0);
      const double t = s0 / (s0 - s1);
      if (t < t_exit) {
        t_exit = t;
        f_exit = f;
        g_exit = g;
      }
    }
    if (f_exit == 0) return kWalkInside;
    double xc = px + t_exit * (x1 - px), yc = py + t_exit * (y1 - py);
    const FaceTable& fa = m.faces;
    const int other = fa.element1[f_exit] == e ? fa.element2[f_exit] : fa.element1[f_exit];
    const bool open = other == 0 && fa.code[f_exit] >= 2;
    if (open) {
      x1 = xc;
      y1 = yc;
      return kWalkLost;
    }
    if (other == 0 || (avoid_dry && wetdry[other] == kDry)) {
      // The move ends on the face; a crossing point that rounding put
      // outside goes back towards the centre until it is inside.
      for (double frac = 1.0e-12; g_exit.Side(xc, yc) < 0.0 && frac < 1.0; frac *= 16.0) {
        xc += frac * (cx - xc);
        yc += frac * (cy - yc);
      }
      x1 = xc;
      y1 = yc;
      return kWalkClosed;
    }
    e = other;
    px = xc;
    py = yc;
  }
  // The walk did not end: the search tree decides.
  const int found = FindElementID2DSearchTree(x1, y1, m, pt.tree);
  if (found > 0 && !(avoid_dry && wetdry[found] == kDry)) {
    e = found;
    return kWalkSearched;
  }
  e = e_start;
  x1 = x0;
  y1 = y0;
  return kWalkNotFound;
}

double WindDriftAnglePT(const PtDriftProfile& drift, double w) {
  return drift.wind_drift_angle_parameter * std::exp(-3.0e-9 * w * w * w / (kPhysical.g * drift.kinematic_viscosity));
}

void WindDriftPT(const PtDriftProfile& drift, double wx, double wy, double s, double& ud, double& vd) {
  const double w = std::hypot(wx, wy);
  double factor = drift.wind_drift_factor * std::max(0.0, 1.0 - s / drift.depth_of_wind_influence);
  if (s <= 0.0) factor += drift.wind_weight;
  // Turned clockwise (to the right of the wind) by the deflection angle.
  const double theta = WindDriftAnglePT(drift, w) * kDegToRad;
  const double c = std::cos(theta), sn = std::sin(theta);
  ud = factor * (wx * c + wy * sn);
  vd = factor * (-wx * sn + wy * c);
}

namespace {

// Factor of the logarithmic current profile at height zb above the bed in
// water of depth h: u(zb) = U * factor, with U the depth-averaged current.
// z0 from the roughness Reynolds number of u* (a few fixed-point rounds: u*
// depends on z0 through the depth average of the profile).
double LogProfileFactor(const PtDriftProfile& d, double speed, double h, double zb) {
  const double ks = d.bed_roughness, nu = d.kinematic_viscosity;
  double z0 = ks / 30.0;
  for (int it = 0; it < 4; ++it) {
    const double ustar = std::max(speed * 0.4 / std::max(std::log(h / z0) - 1.0, 1.0), 1.0e-12);
    const double re = ustar * ks / nu;
    if (re < 5.0) z0 = nu / (9.0 * ustar);
    else if (re > 70.0) z0 = ks / 30.0;
    else z0 = ks / 30.0 * (1.0 - std::exp(-re / 27.0)) + nu / (9.0 * ustar);
    z0 = std::min(z0, 0.1 * h);
  }
  const double mean = std::log(h / z0) - 1.0;
  if (mean <= 0.0) return 1.0;
  return std::max(0.0, std::log(std::max(zb, z0) / z0)) / mean;
}

// Metres to mesh units at latitude y (radians on a "LONG/LAT" mesh).
void MetresToMesh(const PtModule& pt, double y, double& dx, double& dy) {
  if (!pt.geographic) return;
  dx /= kMeshEarthRadius * std::cos(y);
  dy /= kMeshEarthRadius;
}

// Position of a moving source at time t.
void SourcePosition(const PtSource& s, double t, double& x, double& y, double& z) {
  const std::size_t n = s.times.size();
  if (n == 1 || t <= s.times.front()) {
    x = s.xs.front(), y = s.ys.front(), z = s.zs.front();
    return;
  }
  if (t >= s.times.back()) {
    x = s.xs.back(), y = s.ys.back(), z = s.zs.back();
    return;
  }
  std::size_t i = 1;
  while (s.times[i] < t) ++i;
  const double w = (t - s.times[i - 1]) / (s.times[i] - s.times[i - 1]);
  x = s.xs[i - 1] + w * (s.xs[i] - s.xs[i - 1]);
  y = s.ys[i - 1] + w * (s.ys[i] - s.ys[i - 1]);
  z = s.zs[i - 1] + w * (s.zs[i] - s.zs[i - 1]);
}

// Places a new particle; false when the point is outside the mesh.
bool Release(PtModule& pt, const HdState& hd, int source, int cls, double x, double y, double z, int vertical_type,
             double mass, int e_hint) {
  const int e = e_hint > 0 ? e_hint : FindElementID2DSearchTree(x, y, *pt.mesh, pt.tree);
  if (e == 0) return false;
  Particle& p = pt.particles[++pt.nparticles];
  const int id = pt.nparticles;
  p = Particle{};
  p.state = kParticleSuspended;
  p.element = e;
  p.cls = cls;
  p.source = source;
  p.x = x;
  p.y = y;
  const NodeWeights nw = WeightsAt(*pt.mesh, x, y, e);
  const double bed = nw.Of(pt.bed_node);
  const double surface = hd.wetdry[e] == kDry ? bed : nw.Of(pt.eta_node);
  switch (vertical_type) {
    case 0: p.z = std::clamp(z, bed, std::max(bed, surface)); break;
    case 1: p.z = std::max(bed, surface); break;
    case 2: p.z = bed; break;
    default:
      p.z = bed + RandomUniformPT(pt.seed, static_cast<std::uint64_t>(id), 0, kDrawRelease + 2) *
                      std::max(0.0, surface - bed);
  }
  p.mass = mass;
  pt.stats.from_sources += 1;
  pt.stats.amount_sources[static_cast<std::size_t>(cls)] += mass;
  return true;
}

void ReleaseSources(PtModule& pt, const HdState& hd, int n) {
  const double t_start = (n - 1) * pt.dt;
  bool misplaced = false;
  for (std::size_t si = 0; si < pt.sources.size(); ++si) {
    const PtSource& s = pt.sources[si];
    const int source = static_cast<int>(si) + 1;
    if (!s.include) continue;
    if (s.type == kSourceFile) {
      for (const PtSource::FileParticle& fp : s.file_particles)
        if (fp.step == n && pt.classes[static_cast<std::size_t>(fp.cls - 1)].include)
          misplaced |= !Release(pt, hd, source, fp.cls, fp.x, fp.y, fp.z, 0, fp.mass, 0);
      continue;
    }
    if (n < s.first_step || n > s.last_step) continue;
    for (std::size_t k = 1; k <= s.classes.size(); ++k) {
      const PtSourceClass& sc = s.classes[k - 1];
      if (!pt.classes[k - 1].include) continue;
      const int cls = static_cast<int>(k);
      for (int i = 0; i < sc.number_of_particles_per_timestep; ++i) {
        const std::uint64_t id = static_cast<std::uint64_t>(pt.nparticles) + 1;
        double x = 0, y = 0, z = 0;
        int e = 0;
        if (s.type == kSourcePoint) {
          SourcePosition(s, t_start, x, y, z);
        } else if (!s.tri.empty()) {
          // A random point of the area: a triangle by its area, then uniform in it.
          const double r = RandomUniformPT(pt.seed, id, 0, kDrawRelease);
          const std::size_t tri =
              static_cast<std::size_t>(std::lower_bound(s.tri_cumulative.begin(), s.tri_cumulative.end(), r) -
                                       s.tri_cumulative.begin());
          const double* c = &s.tri[6 * std::min(tri, s.tri_cumulative.size() - 1)];
          double a = RandomUniformPT(pt.seed, id, 0, kDrawRelease + 1);
          double b = RandomUniformPT(pt.seed, id, 0, kDrawRelease + 3);
          if (a + b > 1.0) a = 1.0 - a, b = 1.0 - b;
          x = c[0] + a * (c[2] - c[0]) + b * (c[4] - c[0]);
          y = c[1] + a * (c[3] - c[1]) + b * (c[5] - c[1]);
        } else {
          const std::size_t j = static_cast<std::size_t>(i) % s.px.size();
          x = s.px[j];
          y = s.py[j];
          e = s.pelement[j];
        }
        misplaced |= !Release(pt, hd, source, cls, x, y, z, s.vertical_type, sc.type_value, e);
      }
    }
  }
  if (misplaced) Warning("Source, particle placed out of domain");
}

}  // namespace

void UpdateInitStepPT(PtModule& pt, const HdState& hd) {
  CALCNODEVALUES2WETPL2D(*pt.mesh, hd.u, hd.wetdry, pt.u0, kNoValue, kModeScalar);
  CALCNODEVALUES2WETPL2D(*pt.mesh, hd.v, hd.wetdry, pt.v0, kNoValue, kModeScalar);
  pt.have_start_current = true;
}

void StepPT(PtModule& pt, const HdState& hd, int n) {
  StartTiming(pt.timing, kPtTimerTotal);
  StartTiming(pt.timing, kPtTimerStep);
  const Mesh& mesh = *pt.mesh;
  StartTiming(pt.timing, kPtTimerForcings);
  if (!pt.have_start_current) UpdateInitStepPT(pt, hd);
  CALCNODEVALUES2WETPL2D(mesh, hd.u, hd.wetdry, pt.u1, kNoValue, kModeScalar);
  CALCNODEVALUES2WETPL2D(mesh, hd.v, hd.wetdry, pt.v1, kNoValue, kModeScalar);
  CALCNODEVALUES2WETPL2D(mesh, hd.eta, hd.wetdry, pt.eta_node, kNoValue, kModeScalar);
  if (pt.wind) {
    const double t_mid = (n - 0.5) * pt.dt;
    pt.wind_x = FemDataValue(pt.wind_spec, 1, t_mid);
    pt.wind_y = FemDataValue(pt.wind_spec, 2, t_mid);
  }
  StopTiming(pt.timing, kPtTimerForcings);

  ReleaseSources(pt, hd, n);

  StartTiming(pt.timing, kPtTimerTracks);
  const double dt = pt.dt;
  const PtDriftProfile& drift = pt.drift;
  const bool log_profile = drift.type == 1 || drift.type == 3;
  const bool has_drift = drift.type >= 1 && drift.type <= 5 && pt.wind;
  const int np = pt.nparticles;
  long long lost = 0, dead = 0, searched = 0;
#pragma omp parallel for schedule(static) reduction(+ : lost, dead, searched)
  for (int i = 1; i <= np; ++i) {
    Particle& p = pt.particles[i];
    if (p.state != kParticleSuspended && p.state != kParticleSedimented) continue;
    const PtClass& c = pt.classes[static_cast<std::size_t>(p.cls - 1)];
    const std::uint64_t id = static_cast<std::uint64_t>(i);
    p.age += dt;
    if (p.age > c.maximum_particle_age) {
      p.state = kParticleDead;
      ++dead;
      continue;
    }
    int e = p.element;
    const double h = hd.h[e];
    const NodeWeights wa = WeightsAt(mesh, p.x, p.y, e);
    const double bed = wa.Of(pt.bed_node);
    const double surface = std::max(bed, wa.Of(pt.eta_node));
    if (p.state == kParticleSedimented) {
      if (c.erosion && hd.wetdry[e] == kWet && !hd.tau_x.empty() &&
          std::hypot(hd.tau_x[e], hd.tau_y[e]) > c.critical_shear) {
        p.state = kParticleSuspended;
      } else {
        p.u = p.v = p.w = 0.0;
        p.mass *= std::exp(-c.decay_rate * dt);
        continue;
      }
    }
    // Heun's method: velocity at the start position (start current), at the
    // predicted position (end current), their mean.
    const double zb = p.z - bed;
    double factor = 1.0;
    if (log_profile && h > 0.0) {
      const double speed = std::hypot(hd.u[e], hd.v[e]);
      factor = LogProfileFactor(drift, speed, h, zb);
    }
    const double ua = factor * wa.Of(pt.u0), va = factor * wa.Of(pt.v0);
    double dxa = ua * dt, dya = va * dt;
    MetresToMesh(pt, p.y, dxa, dya);
    double xp = p.x + dxa, yp = p.y + dya;
    int ep = e;
    const int wp = WalkPT(pt, hd.wetdry, c.flood_dry_type == 1, ep, p.x, p.y, xp, yp);
    // A predicted position that left the water takes the end current at the
    // start position.
    const NodeWeights wb =
        wp == kWalkInside || wp == kWalkSearched ? WeightsAt(mesh, xp, yp, ep) : wa;
    const double ub = factor * wb.Of(pt.u1), vb = factor * wb.Of(pt.v1);
    double u = 0.5 * (ua + ub), v = 0.5 * (va + vb);
    if (has_drift) {
      double ud = 0, vd = 0;
      WindDriftPT(drift, pt.wind_x, pt.wind_y, surface - p.z, ud, vd);
      u += ud;
      v += vd;
    }
    double dx = u * dt, dy = v * dt;
    // Dispersion: a random walk step sqrt(2 D dt) r with r standard normal;
    // none where the water column has no height.
    const double column = surface - bed;
    if (c.horizontal_dispersion > 0.0 && column > 0.0) {
      double r1 = 0, r2 = 0;
      RandomNormalPairPT(pt.seed, id, static_cast<std::uint64_t>(n), kDrawHorizontal, r1, r2);
      const double step = std::sqrt(2.0 * c.horizontal_dispersion * dt);
      dx += r1 * step;
      dy += r2 * step;
    }
    double w = -c.settling_velocity;
    double z = p.z + w * dt;
    if (c.vertical_dispersion > 0.0 && column > 0.0) {
      double r3 = 0, r4 = 0;
      RandomNormalPairPT(pt.seed, id, static_cast<std::uint64_t>(n), kDrawVertical, r3, r4);
      z += r3 * std::sqrt(2.0 * c.vertical_dispersion * dt);
      // Reflected at the surface and, without settling, at the bed.
      if (z > surface) z = std::max(bed, 2.0 * surface - z);
      if (z < bed && c.settling_velocity <= 0.0) z = std::min(surface, 2.0 * bed - z);
    }
    MetresToMesh(pt, p.y, dx, dy);
    double x1 = p.x + dx, y1 = p.y + dy;
    const int status = WalkPT(pt, hd.wetdry, c.flood_dry_type == 1, e, p.x, p.y, x1, y1);
    p.move_status = status;
    p.u = u;
    p.v = v;
    p.w = (z - p.z) / dt;
    if (status == kWalkSearched) ++searched;
    if (status == kWalkLost) {
      p.x = x1;
      p.y = y1;
      p.state = kParticleLost;
      ++lost;
      continue;
    }
    p.x = x1;
    p.y = y1;
    p.element = e;
    const NodeWeights w1 = WeightsAt(mesh, p.x, p.y, e);
    const double bed1 = w1.Of(pt.bed_node);
    const double surface1 = std::max(bed1, w1.Of(pt.eta_node));
    if (z <= bed1 && c.settling_velocity > 0.0) {
      z = bed1;
      p.state = kParticleSedimented;
    }
    p.z = std::clamp(z, bed1, surface1);
    p.mass *= std::exp(-c.decay_rate * dt);
  }
  std::swap(pt.u0, pt.u1);
  std::swap(pt.v0, pt.v1);
  pt.t_state = n * dt;
  pt.stats.lost_boundary += lost;
  pt.stats.dead += dead;
  pt.stats.walk_searched += searched;
  if (searched > 0)
    Warning("Did not find an element for the particle. Global search      applied.");
  pt.stats.max_active = std::max(pt.stats.max_active, ActiveParticlesPT(pt));
  StopTiming(pt.timing, kPtTimerTracks);
  StopTiming(pt.timing, kPtTimerStep);
  StopTiming(pt.timing, kPtTimerTotal);
}

long long ActiveParticlesPT(const PtModule& pt) {
  long long active = 0;
  for (int i = 1; i <= pt.nparticles; ++i) {
    const int s = pt.particles[i].state;
    if (s == kParticleSuspended || s == kParticleSedimented) ++active;
  }
  return active;
}

void PrintStatisticsPT(const PtModule& pt) {
  long long suspended = 0, sedimented = 0;
  const std::size_t nc = pt.classes.size() + 1;
  std::vector<double> in_domain(nc, 0.0), lost(nc, 0.0), aged(nc, 0.0), decayed(nc, 0.0);
  for (int i = 1; i <= pt.nparticles; ++i) {
    const Particle& p = pt.particles[i];
    const std::size_t k = static_cast<std::size_t>(p.cls);
    if (p.state == kParticleSuspended) ++suspended;
    if (p.state == kParticleSedimented) ++sedimented;
    if (p.state == kParticleSuspended || p.state == kParticleSedimented) in_domain[k] += p.mass;
    if (p.state == kParticleLost) lost[k] += p.mass;
    if (p.state == kParticleDead) aged[k] += p.mass;
  }
  // What decay removed: released minus what is left anywhere.
  for (std::size_t k = 1; k < nc; ++k)
    decayed[k] = pt.stats.amount_sources[k] - in_domain[k] - lost[k] - aged[k];
  WriteLogLine("");
  WriteBanner("Particle Tracking Statistics");
  WriteValueLine("Number of particles from sources          : %", pt.stats.from_sources);
  WriteValueLine("Number of dynamic spawned particles       : %", 0LL);
  WriteValueLine("Maximum number of active particles        : %", pt.stats.max_active);
  WriteValueLine("Number of suspended particles             : %", suspended);
  WriteValueLine("Number of sedimented particles            : %", sedimented);
  WriteValueLine("Number of particles lost at boundary      : %", pt.stats.lost_boundary);
  WriteValueLine("Number of dead particles                  : %", pt.stats.dead);
  WriteValueLine("Number of particles moved to other domain : %", pt.stats.moved_other_domain);
  WriteValueLine("Maximum number of allocated particles     : %", static_cast<long long>(pt.capacity));
  for (std::size_t k = 1; k < nc; ++k) {
    WriteLogLine(SubstituteValue("Class %", static_cast<int>(k)));
    WriteValueLine("Total amount from sources                 : %", pt.stats.amount_sources[k]);
    WriteValueLine("Total amount from other domains           : %", 0.0);
    WriteValueLine("Total amount in domain                    : %", in_domain[k]);
    WriteValueLine("Total amount lost at boundary             : %", lost[k]);
    WriteValueLine("Total amount lost due to ageing           : %", aged[k]);
    WriteValueLine("Total amount lost due to process          : %", decayed[k]);
    WriteValueLine("Total amount moved to other domain        : %", 0.0);
  }
}

}  // namespace vhd
