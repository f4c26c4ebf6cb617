// Forcings of the HD step: the mesh-dependent data made once (Coriolis
// parameter, north rotation, geographic positions, gradient weights), the
// wind update (UPDATEWIND of PROPERTYWIND) and the momentum sources of the
// owned elements (see forcing.hpp for the terms).

#include <algorithm>
#include <cmath>
#include <numbers>
#include <string>

#include "core/omp.hpp"
#include "hydro/forcing.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "log/log.hpp"
#include "mesh/cartography.hpp"
#include "mesh/femdata.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

constexpr double kDeg = std::numbers::pi / 180.0;

// Geographic longitude and latitude (rad) of the point (x, y) of the mesh;
// false when the mesh's coordinates have no geographic reference.
bool MeshPointGeographic(const Mesh& mesh, const CTqCartography& cart, double x, double y, double& lon,
                         double& lat) {
  if (IsGeographic(mesh.projection)) {
    lon = x, lat = y;
    return true;
  }
  if (!cart.established) return false;
  int status = 0;
  TqCartXy2Geo(cart, x, y, lon, lat, &status);
  lon *= kDeg, lat *= kDeg;
  return status == kCartOk;
}

void MakeCartography(const Mesh& mesh, CTqCartography& cart) {
  if (IsGeographic(mesh.projection) || IsNonUtm(mesh.projection)) return;
  int status = 0;
  TqCartCreate(cart, mesh.projection, 0.0, 0.0, 0.0, &status);
  if (status != kCartOk) cart.established = false;
}

void PrepareCoriolis(HdModule& hd, const Mesh& mesh, const CTqCartography& cart) {
  HdCoriolis& c = hd.forcing.coriolis;
  const int ne = mesh.elements.nelements;
  c.f.assign(ne, 0.0);
  if (c.type == 0) return;
  if (IsNonUtm(mesh.projection)) FatalError("NON-UTM not allowed in case of coriolis forcing");
  const double omega2 = 2.0 * kPhysical.earth_rotation;
  if (c.type == 1) {
    if (!c.coefficient_given) {
      if (!c.latitude_given) {
        // The centre of the bounding box of the whole mesh (over every process).
        double xmin = 1e300, xmax = -1e300, ymin = 1e300, ymax = -1e300;
        for (int n = 1; n <= mesh.nodes.nnodes; ++n) {
          xmin = std::min(xmin, mesh.nodes.x[n]), xmax = std::max(xmax, mesh.nodes.x[n]);
          ymin = std::min(ymin, mesh.nodes.y[n]), ymax = std::max(ymax, mesh.nodes.y[n]);
        }
        if (hd.subdomain) {
          xmax = MaxOverProcesses(xmax, *hd.subdomain), xmin = -MaxOverProcesses(-xmin, *hd.subdomain);
          ymax = MaxOverProcesses(ymax, *hd.subdomain), ymin = -MaxOverProcesses(-ymin, *hd.subdomain);
        }
        double lon = 0, lat = 0;
        if (!MeshPointGeographic(mesh, cart, 0.5 * (xmin + xmax), 0.5 * (ymin + ymax), lon, lat)) {
          FatalError("NON-UTM not allowed in case of coriolis forcing (the centre of the mesh has no latitude in " +
                     mesh.projection + ")");
        }
        c.latitude = lat / kDeg;
        WriteValueLine("Coriolis forcing, latitude of the mesh centre (degrees) : %", c.latitude);
      }
      c.coefficient = omega2 * std::sin(c.latitude * kDeg);
    }
    for (int e = 1; e <= ne; ++e) c.f[e] = c.coefficient;
    return;
  }
  for (int e = 1; e <= ne; ++e) {
    double lon = 0, lat = 0;
    if (!MeshPointGeographic(mesh, cart, mesh.elements.xc[e], mesh.elements.yc[e], lon, lat)) {
      FatalError("NON-UTM not allowed in case of coriolis forcing (element " + std::to_string(mesh.elements.id[e]) +
                 " has no latitude in " + mesh.projection + ")");
    }
    c.f[e] = omega2 * std::sin(lat);
  }
}

// Rotation from true north to the mesh's y axis per element (projected
// meshes whose grid north is not true north).
void PrepareNorth(HdWindForcing& w, const Mesh& mesh, const CTqCartography& cart) {
  if (!cart.established) return;
  const int ne = mesh.elements.nelements;
  w.north_cos.assign(ne, 1.0);
  w.north_sin.assign(ne, 0.0);
  bool turned = false;
  for (int e = 1; e <= ne; ++e) {
    double angle = 0.0;
    int status = 0;
    TqCartGetTrueNorth(cart, mesh.elements.xc[e], mesh.elements.yc[e], angle, &status);
    if (status != kCartOk) angle = 0.0;
    w.north_cos[e] = std::cos(angle * kDeg);
    w.north_sin[e] = std::sin(angle * kDeg);
    turned = turned || angle != 0.0;
  }
  if (!turned) {
    w.north_cos.clear();
    w.north_sin.clear();
  }
}

void PrepareWind(HdModule& hd, const Mesh& mesh, const CTqCartography& cart) {
  HdWindForcing& w = hd.forcing.wind;
  const int ne = mesh.elements.nelements;
  PrepareNorth(w, mesh, cart);
  FemDataRequest request;
  if (w.format == 3) {
    request.expect = FemDataExpect::kArea;
    request.location = FemDataLocation::kElements;
    request.mesh = &mesh;
    w.map_p.assign(ne, 0.0);
    w.map_u.assign(ne, 0.0);
    w.map_v.assign(ne, 0.0);
  } else {
    request.expect = FemDataExpect::kPoint;
    request.location = FemDataLocation::kPoints;
  }
  if (w.format != 0) FemDataOpen(w.data, request, hd.time_axis);
  w.pressure.assign(ne, w.neutral_pressure);
}

void PrepareTide(HdModule& hd, const Mesh& mesh, const CTqCartography& cart) {
  HdTidalPotential& tp = hd.forcing.tide;
  const int ne = mesh.elements.nelements;
  tp.eta_eq.assign(ne, 0.0);
  tp.grad_x.assign(ne, 0.0);
  tp.grad_y.assign(ne, 0.0);
  if (tp.type == 2) {
    FemDataRequest request;
    request.expect = FemDataExpect::kArea;
    request.location = FemDataLocation::kElements;
    request.mesh = &mesh;
    FemDataOpen(tp.data, request, hd.time_axis);
    return;
  }
  tp.lat.assign(ne, 0.0);
  tp.lon.assign(ne, 0.0);
  for (int e = 1; e <= ne; ++e) {
    if (!MeshPointGeographic(mesh, cart, mesh.elements.xc[e], mesh.elements.yc[e], tp.lon[e], tp.lat[e])) {
      FatalError("SetupTide: wrong projection (" + mesh.projection + " has no geographic coordinates)");
    }
  }
  tp.amp.assign(tp.constituents.size(), 0.0);
  tp.arg.assign(tp.constituents.size(), 0.0);
}

// Weights of the face-difference gradient of every element.
void PrepareGradient(HdForcing& fc, const Mesh& mesh, int nlocal) {
  const ElementTable& E = mesh.elements;
  const FaceTable& F = mesh.faces;
  const int ne = E.nelements;
  const int nslots = E.face_start[ne + 1] - 1;
  fc.grad_neighbour.assign(nslots, 0);
  fc.grad_wx.assign(nslots, 0.0);
  fc.grad_wy.assign(nslots, 0.0);
  for (int e = 1; e <= ne; ++e) {
    const double a2 = 2.0 * ElementAreaMetres(mesh, e);
    for (int j = 1; j <= ElementFaceCount(E, e); ++j) {
      const int k = E.face_start[e] + j - 1;
      const int f = ElementFace(E, e, j);
      const bool first = F.element1[f] == e;
      const int nb = first ? F.element2[f] : F.element1[f];
      if (nb <= 0 || nb > nlocal) continue;
      double nx, ny, len;
      FaceMetres(mesh, f, nx, ny, len);
      const double sign = first ? 1.0 : -1.0;
      fc.grad_neighbour[k] = nb;
      fc.grad_wx[k] = sign * nx * len / a2;
      fc.grad_wy[k] = sign * ny * len / a2;
    }
  }
}

// Face-difference gradient of q at element e.
inline void Gradient(const HdForcing& fc, const ElementTable& E, const double* q, int e, double& gx, double& gy) {
  gx = 0.0, gy = 0.0;
  const double qe = q[e];
  for (int k = E.face_start[e]; k < E.face_start[e + 1]; ++k) {
    const int nb = fc.grad_neighbour[k];
    const double dq = nb > 0 ? q[nb] - qe : 0.0;
    gx += fc.grad_wx[k] * dq;
    gy += fc.grad_wy[k] * dq;
  }
}

// Whether a map value is given (not the file's delete value, a number).
inline bool MapValueGiven(double x, double del) { return x != del && std::isfinite(x); }

}  // namespace

double WindFrictionHD(const HdWindForcing& w, double speed) {
  if (w.friction_type == 0) return w.constant_friction;
  const double c = w.friction_low + (w.friction_high - w.friction_low) * (speed - w.speed_low) /
                                        (w.speed_high - w.speed_low);
  return std::clamp(c, std::min(w.friction_low, w.friction_high), std::max(w.friction_low, w.friction_high));
}

void WindComponentsHD(double speed, double direction, double& u, double& v) {
  u = -speed * std::sin(direction * kDeg);
  v = -speed * std::cos(direction * kDeg);
}

void PrepareForcingHD(HdModule& hd, const Mesh& mesh, HdSolver& solver) {
  HdForcing& fc = hd.forcing;
  fc.prepared = false;
  if (!ForcingActiveHD(hd)) return;
  HdState& st = hd.state;
  const int ne = mesh.elements.nelements;
  CTqCartography cart;
  MakeCartography(mesh, cart);
  try {
    PrepareCoriolis(hd, mesh, cart);
    if (fc.wind.type > 0) PrepareWind(hd, mesh, cart);
    if (fc.tide.type > 0) PrepareTide(hd, mesh, cart);
    PrepareForcingFieldsHD(hd, solver, ne);
    PrepareGradient(fc, mesh, st.nelements_local > 0 ? st.nelements_local : ne);
    BoundaryForcingFields& ff = hd.boundary.forcing;
    for (Array1<double>* a : {&ff.coriolis, &ff.wind_x, &ff.wind_y, &ff.pressure_x, &ff.pressure_y,
                              &ff.radiation_x, &ff.radiation_y}) {
      if (a->size() != ne) a->assign(ne, 0.0);
    }
    for (int e = 1; e <= ne; ++e) ff.coriolis[e] = fc.coriolis.f[e];
    if (!SourcesActive(solver)) {
      solver.src_h.assign(ne, 0.0);
      solver.src_P.assign(ne, 0.0);
      solver.src_Q.assign(ne, 0.0);
    }
  } catch (const std::bad_alloc&) {
    FatalError("PrepareForcingHD: Out of memory");
  }
  fc.prepared = true;
}

void UPDATEWIND(HdModule& hd, double t) {
  HdWindForcing& w = hd.forcing.wind;
  const int nown = hd.state.nelements_owned;
  const double s = SoftStartFactor(w.type_of_soft_start, w.soft_time_interval, t);
  w.soft = s;
  if (w.format != 3) {
    const bool constant = w.format == 0;
    double speed_read = constant ? w.constant_speed : FemDataValue(w.data, 1, t);
    double direction = constant ? w.constant_direction : FemDataValue(w.data, 2, t);
    // A series without a value at t (its delete value, or a step pair with
    // one) gives calm air, as a map does: the delete value is no wind.
    const double del = w.data.state.open ? w.data.state.file.delete_value : kZrnDefaultDeleteValue;
    if (!constant && (!MapValueGiven(speed_read, del) || !MapValueGiven(direction, del))) {
      speed_read = 0.0;
      direction = 0.0;
    }
    const double speed = s * speed_read;
    WindComponentsHD(speed, direction, w.u, w.v);
    w.stress_factor = WindFrictionHD(w, speed) / kWaterOverAirDensity * speed;
    return;
  }
  FemDataRead(w.data, 1, t, w.map_p);
  FemDataRead(w.data, 2, t, w.map_u);
  FemDataRead(w.data, 3, t, w.map_v);
  w.map_delete = w.data.state.open ? w.data.state.file.delete_value : kZrnDefaultDeleteValue;
  const double pn = w.neutral_pressure, del = w.map_delete;
  double* p = w.pressure.data();
  const double* mp = w.map_p.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) p[e] = MapValueGiven(mp[e], del) ? 100.0 * s * mp[e] + (1.0 - s) * pn : pn;
  // The pressure gradient reads the neighbours' pressure.
  if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&w.pressure});
}

void UpdateForcingHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t, double dt) {
  HdForcing& fc = hd.forcing;
  if (!fc.prepared) return;
  HdState& st = hd.state;
  BoundaryForcingFields& ff = hd.boundary.forcing;
  UpdateDepthCorrectionHD(hd, solver, t);
  if (fc.wind.type > 0) UPDATEWIND(hd, t);
  UpdateIceHD(hd, t);
  if (fc.tide.type > 0) UPDATETIDE(hd, t);
  UpdateRadiationStressHD(hd, t);

  const int nown = st.nelements_owned;
  const ElementTable& E = mesh.elements;
  const bool wind = fc.wind.type > 0;
  const bool pressure = wind && fc.wind.format == 3;
  const bool tide = fc.tide.type > 0;
  const bool coriolis = fc.coriolis.type > 0;
  const int waves = fc.radiation.type;
  const double g = kPhysical.g, rho = kPhysical.rho0;
  // Wind in thin water: scaled down by h^2 / (2 h_mass)^2 below 2 h_mass.
  const double hc = hd.flood_dry.type > 0 ? hd.flood_dry.mass_depth : 0.0;
  const double thin = hc > 0 ? 1.0 / (4.0 * hc * hc) : 0.0;
  // Wind stress: one wind for the mesh (formats 0, 1) or the map's per
  // element (format 3; calm where the map holds no value), turned to the
  // mesh axes.
  const HdWindForcing& w = fc.wind;
  const bool map = wind && w.format == 3;
  const bool turn = !w.north_cos.empty();
  const double *nc = w.north_cos.data(), *ns = w.north_sin.data();
  const double *mu = w.map_u.data(), *mv = w.map_v.data();
  const double ws = w.soft, wu = w.u, wv = w.v, wc = w.stress_factor, del = w.map_delete;
  const int* code = st.wetdry.data();
  const double *h = st.h.data(), *P = st.P.data(), *Q = st.Q.data();
  double *wx = ff.wind_x.data(), *wy = ff.wind_y.data();
  double *px = ff.pressure_x.data(), *py = ff.pressure_y.data();
  const double* p = fc.wind.pressure.data();
  const double* eq = fc.tide.eta_eq.data();
  double *tx = fc.tide.grad_x.data(), *ty = fc.tide.grad_y.data();
  const double* f = fc.coriolis.f.data();
  // Ice shelters the water from the wind by a factor on the wind components.
  const bool sheltered = wind && fc.ice.Concentration();
  const double* shelter = fc.ice.wind_factor.data();
  const HdRadiationStress& rs = fc.radiation;
  const double *sxx = rs.sxx.data(), *sxy = rs.sxy.data(), *syy = rs.syy.data();
  const double *fx = rs.fx.data(), *fy = rs.fy.data();
  double *rx = ff.radiation_x.data(), *ry = ff.radiation_y.data();
  double *src_P = solver.src_P.data(), *src_Q = solver.src_Q.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    double sx = 0.0, sy = 0.0;
    const double he = h[e];
    if (pressure) Gradient(fc, E, p, e, px[e], py[e]);
    if (tide) Gradient(fc, E, eq, e, tx[e], ty[e]);
    if (wind) {
      const double ca = turn ? nc[e] : 1.0, sa = turn ? ns[e] : 0.0;
      double tx_w, ty_w;
      const double a = sheltered ? shelter[e] : 1.0;
      if (map || a < 1.0) {
        const bool calm = map && (!MapValueGiven(mu[e], del) || !MapValueGiven(mv[e], del));
        const double u = calm ? 0.0 : a * (map ? ws * (mu[e] * ca + mv[e] * sa) : wu * ca + wv * sa);
        const double v = calm ? 0.0 : a * (map ? ws * (mv[e] * ca - mu[e] * sa) : wv * ca - wu * sa);
        const double speed = std::sqrt(u * u + v * v);
        const double c = WindFrictionHD(w, speed) / kWaterOverAirDensity * speed;
        tx_w = c * u, ty_w = c * v;
      } else {
        tx_w = wc * (wu * ca + wv * sa), ty_w = wc * (wv * ca - wu * sa);
      }
      wx[e] = tx_w, wy[e] = ty_w;
    }
    if (waves == 1) {
      // CALCRADIATIONSTRESS: F = -div S.
      double xx_x, xx_y, xy_x, xy_y, yy_x, yy_y;
      Gradient(fc, E, sxx, e, xx_x, xx_y);
      Gradient(fc, E, sxy, e, xy_x, xy_y);
      Gradient(fc, E, syy, e, yy_x, yy_y);
      rx[e] = -(xx_x + xy_y) / rho;
      ry[e] = -(xy_x + yy_y) / rho;
    } else if (waves == 3) {
      rx[e] = fx[e] / rho;
      ry[e] = fy[e] / rho;
    }
    if (code[e] == kWet) {
      if (wind) {
        const double scale = he < 2.0 * hc ? he * he * thin : 1.0;
        sx += scale * wx[e];
        sy += scale * wy[e];
      }
      if (pressure) {
        sx -= he * px[e] / rho;
        sy -= he * py[e] / rho;
      }
      if (tide) {
        sx += g * he * tx[e];
        sy += g * he * ty[e];
      }
      if (waves > 0) {
        sx += rx[e];
        sy += ry[e];
      }
      if (coriolis) {
        // Crank-Nicolson rotation by a = f dt: c - 1 = -a^2/2 / (1 + a^2/4).
        const double a = f[e] * dt;
        const double q = 1.0 / (1.0 + 0.25 * a * a);
        const double cm1 = -0.5 * a * a * q, sn = a * q;
        sx += (cm1 * P[e] + sn * Q[e]) / dt;
        sy += (cm1 * Q[e] - sn * P[e]) / dt;
      }
    }
    src_P[e] = sx;
    src_Q[e] = sy;
  }
}

}  // namespace vhd
