#include "transport/ad_solver.hpp"

#include <algorithm>
#include <cmath>
#include <numbers>
#include <string>
#include <utility>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "log/log.hpp"
#include "mesh/mesh.hpp"
#include "parallel/subdomain.hpp"

namespace vhd {

namespace {

// One stage of a time integration:
//   m = (alpha m_base + (1 - alpha) m_prev + w R) / (1 + w dt k),
// R the mass change per area over the whole sub-step from the concentration
// of the previous stage; frac: the time of the stage's result as a fraction
// of the sub-step (its depth); weight: the factor with which the stage's
// increment (w R, the decay it removes, the clamp correction) enters the
// final mass, for the budgets (the weights times w sum to 1).
struct StageRule {
  double alpha, w, frac, weight;
};
constexpr StageRule kEuler[] = {{0.0, 1.0, 1.0, 1.0}};
constexpr StageRule kMidpoint[] = {{0.0, 0.5, 0.5, 0.0}, {1.0, 1.0, 1.0, 1.0}};
constexpr StageRule kSsp3[] = {
    {0.0, 1.0, 1.0, 1.0 / 6.0}, {0.75, 0.25, 0.5, 2.0 / 3.0}, {1.0 / 3.0, 2.0 / 3.0, 1.0, 1.0}};

// Threshold of the Barth-Jespersen limiter (concentration units).
constexpr double kLimiterEpsilon = 1e-12;

void CheckCode(const char* key, int value, int lo, int hi) {
  if (value < lo || value > hi)
    FatalError(std::string("Type not supported for ") + key + " (AD): " + std::to_string(value));
}

// Value of an exchange concentration at element e with concentration c.
double ExchangeValue(const AdExchange& x, int e, double c) {
  switch (x.type) {
    case kAdExchangeValue: return x.values.empty() ? x.constant_value : x.values[e];
    case kAdExchangeAmbient: return c;
    default: return 0.0;
  }
}

// Dispersion coefficient of a face between elements of coefficients a, b:
// min(a + b, 4 a, 4 b) / 2 (so that a = b = D gives D, and the face value is
// at most twice the smaller one).
inline double FaceDispersion(double a, double b) { return 0.5 * std::min(a + b, 4.0 * std::min(a, b)); }

// Longitude difference taken the short way round (radians).
inline double WrapLongitude(double dx) { return std::remainder(dx, 2.0 * std::numbers::pi); }

}  // namespace

// ---- component, flow, dispersion ----------------------------------------------------

void AllocateComponentAD(const HdModule& hd, AdComponent& comp) {
  const HdState& st = hd.state;
  const int nown = st.nelements_owned;
  comp.c.assign(st.nelements, 0.0);
  comp.clamp_correction.assign(nown, 0.0);
  for (Array1<double>* a : {&comp.clamp_total, &comp.drying_total, &comp.surface_total, &comp.decay_total})
    a->assign(nown, 0.0);
  const int nbf = hd.boundary.faces.size();
  comp.boundary_type.assign(nbf, kAdBoundaryNone);
  comp.boundary_c.assign(nbf, 0.0);
  const int ns = static_cast<int>(hd.sources.sources.size());
  comp.source_c.assign(ns, 0.0);
  comp.source_type.assign(ns, kAdSourceConcentration);
}

void AllocateFlowAD(const HdModule& hd, AdFlow& flow) {
  const HdState& st = hd.state;
  const int ne = st.nelements, nown = st.nelements_owned;
  flow.face_volume.assign(st.nfaces, 0.0);
  flow.h_start.assign(ne, 0.0);
  flow.h_end.assign(ne, 0.0);
  flow.wetdry.assign(ne, kDry);
  flow.wetdry_end.assign(ne, kDry);
  flow.precipitation.assign(nown, 0.0);
  flow.evaporation.assign(nown, 0.0);
  flow.cut.assign(nown, 0.0);
  const int ns = static_cast<int>(hd.sources.sources.size());
  for (Array1<int>* a : {&flow.source_giver, &flow.source_taker, &flow.source_partner}) a->assign(ns, 0);
  flow.source_withdrawn.assign(ns, 0.0);
  flow.source_released.assign(ns, 0.0);
  flow.started = false;
}

void BeginFlowAD(const HdModule& hd, AdFlow& flow) {
  const HdState& st = hd.state;
  for (int e = 1; e <= st.nelements_local; ++e) {
    flow.h_end[e] = st.h[e];
    flow.wetdry_end[e] = st.wetdry[e];
  }
  flow.started = true;
}

void GatherFlowAD(const HdModule& hd, const HdSolver& hd_solver, const Mesh& mesh, double dt, AdFlow& flow) {
  if (!flow.started) FatalError("GatherFlowAD: the transport has no start depths (BeginFlowAD was not called)");
  const HdState& st = hd.state;
  const int nown = st.nelements_owned, nlocal = st.nelements_local, nf = st.nfaces;
  flow.dt = dt;
  std::swap(flow.h_start, flow.h_end);
  std::swap(flow.wetdry, flow.wetdry_end);
  const double* q = st.face_flux_len.data();
  double* vol = flow.face_volume.data();
  VHD_OMP_PARALLEL_FOR
  for (int f = 1; f <= nf; ++f) vol[f] = dt * q[f];
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nlocal; ++e) {
    flow.h_end[e] = st.h[e];
    flow.wetdry_end[e] = st.wetdry[e];
  }

  const double* area = ElementAreasHD(hd_solver, mesh);
  const HdPrecipitation& p = hd.precipitation;
  const bool rain = p.Active() && p.gain.size() >= nown;
  const bool cuts = hd.flood_dry.type > 0 && hd.flood_dry.mass_cut.size() >= nown;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    flow.precipitation[e] = rain ? dt * p.gain[e] * area[e] : 0.0;
    flow.evaporation[e] = rain ? dt * p.loss[e] * area[e] : 0.0;
    flow.cut[e] = cuts ? hd.flood_dry.mass_cut[e] : 0.0;
  }

  // Sources: the discharge each moved in the sub-step, from the element
  // giving the water to the one receiving it (as UpdateSourcesHD moved it).
  const std::vector<SourceRecord>& sources = hd.sources.sources;
  for (int k = 1; k <= static_cast<int>(sources.size()); ++k) {
    const SourceRecord& s = sources[static_cast<std::size_t>(k - 1)];
    int giver = 0, taker = 0, partner = 0;
    double withdrawn = 0.0, released = 0.0;
    if (s.include && s.type == kSourceConnected) {
      partner = s.connected_source;
      const int other = sources[static_cast<std::size_t>(partner - 1)].element;
      giver = s.discharge >= 0 ? s.element : other;
      taker = s.discharge >= 0 ? other : s.element;
      withdrawn = released = std::abs(s.discharge) * dt;
    } else if (s.include && s.type != kSourceNoData) {
      if (s.discharge > 0) {
        taker = s.type == kSourceJet ? s.jet.end_element : s.element;
        released = s.discharge * dt;
      } else if (s.discharge < 0) {
        giver = s.element;
        withdrawn = -s.discharge * dt;
      }
    }
    flow.source_giver[k] = giver;
    flow.source_taker[k] = taker;
    flow.source_partner[k] = partner;
    flow.source_withdrawn[k] = withdrawn;
    flow.source_released[k] = released;
  }
}

void ComputeDispersionAD(const AdDispersion& settings, const HdModule& hd, Array1<double>& D) {
  const HdState& st = hd.state;
  const int n = st.nelements_local;
  if (settings.type == kAdDispersionNone) {
    D = Array1<double>();
    return;
  }
  if (settings.type != kAdDispersionScaledEddy && settings.type != kAdDispersionCoefficient)
    FatalError("Dispersion type not implemented yet");
  if (D.size() != st.nelements) D.assign(st.nelements, 0.0);
  const bool map = settings.format != 0 && settings.field.size() >= n;
  const bool eddy = settings.type == kAdDispersionScaledEddy;
  const bool nu_known = st.nu_t.size() >= n;
  const double lo = settings.minimum_dispersion, hi = settings.maximum_dispersion;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) {
    double value;
    if (eddy) {
      const double sigma = map ? settings.field[e] : settings.sigma;
      value = (nu_known ? st.nu_t[e] : 0.0) / sigma;
    } else {
      value = map ? settings.field[e] : settings.constant_value;
    }
    D[e] = std::min(std::max(value, lo), hi);
  }
}

// ---- solver setup ---------------------------------------------------------------------

void AdSolver::Setup(const HdModule& hd, const HdSolver& hd_solver, const Mesh& mesh,
                     const AdSolutionTechnique& technique) {
  CheckCode("scheme_of_time_integration", technique.scheme_of_time_integration, 1, 3);
  CheckCode("scheme_of_space_discretization_horizontal", technique.scheme_of_space_discretization_horizontal, 1,
            3);
  CheckCode("gradient_calculation", technique.gradient_calculation, 1, 3);
  CheckCode("gradient_limiter", technique.gradient_limiter, 0, 3);
  if (!(technique.h_min >= 0.0)) FatalError("SetupAD: h_min must be >= 0 (" + NumberText(technique.h_min) + ")");
  if (hd.subdomain && hd.subdomain->Active() && hd.subdomain->halo_layers < 2)
    FatalError("SetupAD: type_of_halo_layer 1 is too thin for the gradients of the transport; use "
               "type_of_halo_layer 2");

  hd_ = &hd;
  hd_solver_ = &hd_solver;
  mesh_ = &mesh;
  subdomain_ = hd.subdomain;
  technique_ = technique;
  const HdState& st = hd.state;
  nowned_ = st.nelements_owned;
  nlocal_ = st.nelements_local;
  second_ = technique.scheme_of_space_discretization_horizontal >= 2;
  cfl_critical_ = hd.time_step.CFL_critical_AD;
  dt_min_ = hd.time_step.dt_min_AD;
  dt_max_ = hd.time_step.dt_max_AD;
  area_ = ElementAreasHD(hd_solver, mesh);

  // Face geometry in metres: the normal distance of the two centres, the
  // tangential vector of the dispersion term, and the face centre offsets of
  // the reconstruction (mesh units, as the gradients).
  const FaceTable& F = mesh.faces;
  const ElementTable& E = mesh.elements;
  const bool geographic = IsGeographic(mesh.projection);
  const int nf = F.nfaces;
  face_len_.assign(nf, 0.0);
  for (Array1<double>* a : {&face_idn_, &face_tx_, &face_ty_, &face_ox1_, &face_oy1_, &face_ox2_, &face_oy2_})
    a->assign(nf, 0.0);
  for (int f = 1; f <= nf; ++f) {
    const int a = F.element1[f], b = F.element2[f];
    double nx, ny, len;
    FaceMetres(mesh, f, nx, ny, len);
    face_len_[f] = len;
    if (a <= 0 || b <= 0) continue;
    const double R = kMeshEarthRadius;
    const double east = geographic ? R * F.cos_lat[f] : 1.0, north = geographic ? R : 1.0;
    const double dlon = geographic ? WrapLongitude(E.xc[b] - E.xc[a]) : E.xc[b] - E.xc[a];
    const double dx = east * dlon, dy = north * (E.yc[b] - E.yc[a]);
    // A pair whose centres lie nearly along the face (a degenerate element)
    // takes a tenth of their distance.
    const double dn = std::max(dx * nx + dy * ny, 0.1 * std::hypot(dx, dy));
    face_idn_[f] = 1.0 / dn;
    face_tx_[f] = (nx - dx / dn) / east;
    face_ty_[f] = (ny - dy / dn) / north;
    face_ox1_[f] = geographic ? WrapLongitude(F.xf[f] - E.xc[a]) : F.xf[f] - E.xc[a];
    face_oy1_[f] = F.yf[f] - E.yc[a];
    face_ox2_[f] = geographic ? WrapLongitude(F.xf[f] - E.xc[b]) : F.xf[f] - E.xc[b];
    face_oy2_[f] = F.yf[f] - E.yc[b];
  }

  // Per element: the sum over its faces to neighbours of L / (d.n), the
  // dispersive conductance per unit coefficient and depth.
  element_conductance_.assign(st.nelements, 0.0);
  for (int f = 1; f <= nf; ++f) {
    const int a = F.element1[f], b = F.element2[f];
    if (a <= 0 || b <= 0) continue;
    element_conductance_[a] += face_len_[f] * face_idn_[f];
    element_conductance_[b] += face_len_[f] * face_idn_[f];
  }

  SetupGradient(mesh, technique.gradient_calculation, Array1<int>(), Array1<int>(), 2,
                technique.boundary_correction, 0, stencil_);
  if (technique.gradient_limiter != kLimiterNone) SetupLimiterGeometry2D(mesh, limiter_geometry_);

  const int ne = st.nelements;
  for (Array1<double>* a : {&m_base_, &m_, &gx_, &gy_, &gx_raw_, &gy_raw_}) a->assign(ne, 0.0);
  face_flux_.assign(nf, 0.0);
  for (Array1<double>* a : {&h_base_, &h_}) a->assign(ne, 0.0);
  for (Array1<double>* a : {&source_mass_, &source_water_, &water_rate_, &clamp_step_, &decay_step_, &cfl_})
    a->assign(nowned_, 0.0);
  source_ambient_.assign(static_cast<int>(hd.sources.sources.size()), 0.0);
  boundary_mass_.assign(hd.boundary.faces.size(), 0.0);
}

// ---- the step ----------------------------------------------------------------------------

int AdSolver::SubStepCount(const AdFlow& flow, const AdComponent& comp) {
  // Rate r (1/s) of an element wet over the whole sub-step and deeper than
  // h_min: the water leaving it and its dispersive conductance (its own
  // coefficient over the faces to neighbours at its larger depth: exact for
  // a uniform coefficient and depth) over the volume it holds (the smaller
  // of its start and end depths). The transport sub-step is
  // CFL_critical_AD / max r, within dt_min_AD and dt_max_AD; the HD
  // sub-step is split into n equal ones.
  const HdSolver& hs = *hd_solver_;
  const double dt = flow.dt;
  const double* vol = flow.face_volume.data();
  const double* D = comp.dispersion.empty() ? nullptr : comp.dispersion.data();
  const double* h0 = flow.h_start.data();
  const double* h1 = flow.h_end.data();
  const int* code0 = flow.wetdry.data();
  const int* code1 = flow.wetdry_end.data();
  const double* conductance = element_conductance_.data();
  const double h_min = technique_.h_min;
  const int* slots = hs.slot_face_side.data();
  const int planes = hs.face_planes, stride = hs.plane_stride;
  double rmax = 0.0;
  VHD_OMP_PARALLEL_FOR_REDUCTION(max, rmax)
  for (int e = 1; e <= nowned_; ++e) {
    const double h = std::min(h0[e], h1[e]);
    double out = 0.0;
    for (int j = 0; j < planes; ++j) {
      const int m = slots[j * stride + e];
      out += std::max(0.0, (m & 1) ? -vol[m >> 1] : vol[m >> 1]);
    }
    const double dispersive = D ? D[e] * conductance[e] * std::max(h0[e], h1[e]) : 0.0;
    const bool counted = code0[e] == kWet && code1[e] == kWet && h > h_min;
    const double rate = counted ? (out / dt + dispersive) / (area_[e] * h) : 0.0;
    cfl_[e] = rate;
    rmax = std::max(rmax, rate);
  }
  int n = 1;
  if (rmax * dt > cfl_critical_) n = static_cast<int>(std::ceil(rmax * dt / cfl_critical_));
  if (dt > dt_max_) n = std::max(n, static_cast<int>(std::ceil(dt / dt_max_)));
  const int n_most = std::max(1, static_cast<int>(std::floor(dt / dt_min_)));
  n = std::min(n, n_most);
  if (subdomain_ && subdomain_->Active()) n = MaxOverProcesses(n, *subdomain_);
  const double dt_sub = dt / n;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nowned_; ++e) cfl_[e] *= dt_sub;
  return n;
}

void AdSolver::SurfaceAndSources(const AdFlow& flow, AdComponent& comp, double n_inv, double t0) {
  // The mass and depth at the start of the sub-step (time fraction t0 of the
  // HD sub-step); precipitation, evaporation and the water of cut depths
  // (carrying the element's concentration) per element, then the point
  // sources, with the concentrations at the start of the sub-step. The water
  // itself goes into source_water_ by the same operations with the
  // concentration 1.
  const double* c = comp.c.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nowned_; ++e) {
    const double h = flow.h_start[e] + t0 * (flow.h_end[e] - flow.h_start[e]);
    m_base_[e] = m_[e] = c[e] * h;
    h_base_[e] = h_[e] = h;
    const double surface = n_inv * (flow.precipitation[e] * ExchangeValue(comp.precipitation, e, c[e]) -
                                    flow.evaporation[e] * ExchangeValue(comp.evaporation, e, c[e]));
    const double cut = n_inv * flow.cut[e] * c[e];
    comp.surface_total[e] += surface;
    comp.drying_total[e] += cut;
    source_mass_[e] = surface + cut;
    source_water_[e] = n_inv * (flow.precipitation[e] * 1.0 - flow.evaporation[e] * 1.0) + n_inv * flow.cut[e] * 1.0;
  }

  const int ns = flow.source_giver.size();
  if (ns == 0) return;
  auto owned = [this](int e) { return e >= 1 && e <= nowned_; };
  // The concentration of each giving element, from its owner to every
  // process (the mean concentration of the withdrawn water).
  for (int k = 1; k <= ns; ++k) {
    const int g = flow.source_giver[k];
    source_ambient_[k] = owned(g) ? c[g] : 0.0;
  }
  if (subdomain_ && subdomain_->Active()) SumOverProcesses(source_ambient_.data() + 1, ns, *subdomain_);
  for (int k = 1; k <= ns; ++k) {
    const int g = flow.source_giver[k], t = flow.source_taker[k];
    const double withdrawn = n_inv * flow.source_withdrawn[k];
    if (owned(g) && withdrawn > 0.0) {
      const double mass = withdrawn * c[g];
      source_mass_[g] -= mass;
      source_water_[g] -= withdrawn * 1.0;
      comp.source_outflow.Add(mass);
    }
    const double released = n_inv * flow.source_released[k];
    if (owned(t) && released > 0.0) {
      const double cs = comp.source_c.empty() ? 0.0 : comp.source_c[k];
      const bool excess = !comp.source_type.empty() && comp.source_type[k] == kAdSourceExcess;
      // Ambient: the withdrawn water of a connected pair, else the element.
      const double ambient = g > 0 ? source_ambient_[k] : c[t];
      const double mass = released * (excess ? cs + ambient : cs);
      source_mass_[t] += mass;
      source_water_[t] += released * 1.0;
      comp.source_inflow.Add(mass);
    }
  }
}

void AdSolver::Gradients(const AdFlow& flow, const AdComponent& comp) {
  // Limited gradients of c, with the wet/dry codes as the limiter's activity
  // flags. The limiter does not see the values at open boundary faces, so an
  // element that takes water in through one keeps the first order (its
  // reconstruction could otherwise reach past the water entering it).
  const Array1<int>& wetdry = flow.wetdry;
  const int limiter = technique_.gradient_limiter;
  if (limiter == kLimiterENO || limiter == kLimiterWeighted) {
    CALCGRADIENTELEMENT2D(stencil_, comp.c, gx_raw_, gy_raw_);
    if (subdomain_ && subdomain_->Active()) ExchangeHalo(*subdomain_, {&gx_raw_, &gy_raw_});
    CALCLIMITEDGRADIENT2D(limiter, *mesh_, comp.c, wetdry, no_flags_, gx_raw_, gy_raw_, gx_, gy_,
                          kLimiterEpsilon);
  } else {
    CALCGRADIENTELEMENT2D(stencil_, comp.c, gx_, gy_);
    if (limiter == kLimiterBarthJespersen)
      CALCLIMITEDGRADIENTBJ2D(limiter_geometry_, comp.c, wetdry, gx_, gy_, gx_, gy_, kLimiterEpsilon);
  }
  if (limiter != kLimiterNone) LimitAtClosedFaces(comp, wetdry);
  const Array1<BoundaryFaceCondition>& bf = hd_->boundary.faces;
  for (int i = 1; i <= bf.size(); ++i) {
    const int e = bf[i].element;
    if (e <= nowned_ && flow.face_volume[bf[i].face] < 0) gx_[e] = gy_[e] = 0.0;
  }
  if (subdomain_ && subdomain_->Active()) ExchangeHalo(*subdomain_, {&gx_, &gy_});
}

void AdSolver::LimitAtClosedFaces(const AdComponent& comp, const Array1<int>& wetdry) {
  // The mesh limiters bound the reconstruction at faces to wet neighbours
  // only. A wet element with a boundary face or a face to an element that is
  // not wet is scaled (Barth-Jespersen) so that the value reconstructed at
  // those faces too stays within the range of the element and its wet
  // neighbours: otherwise a gradient along the wall could lift every face
  // value to an open neighbour above a local minimum, and the minimum would
  // fall.
  const LimiterGeometry2D& g = limiter_geometry_;
  const int nf = g.faces;
  const double* c = comp.c.data();
  const int* code = wetdry.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nowned_; ++e) {
    if (code[e] != kWet) continue;
    double lo = c[e], hi = c[e];
    bool closed = false;
    for (int j = 0; j < nf; ++j) {
      const int nb = g.neighbour[static_cast<std::size_t>(e) * nf + j];
      if (nb > 0 && code[nb] == kWet) {
        lo = std::min(lo, c[nb]);
        hi = std::max(hi, c[nb]);
      } else {
        closed = true;
      }
    }
    if (!closed) continue;
    double alpha = 1.0;
    for (int j = 0; j < nf; ++j) {
      const std::size_t k = static_cast<std::size_t>(e) * nf + j;
      const int nb = g.neighbour[k];
      if (nb > 0 && code[nb] == kWet) continue;
      const double D = gx_[e] * g.dx[k] + gy_[e] * g.dy[k];
      if (D > kLimiterEpsilon) alpha = std::min(alpha, (hi - c[e]) / D);
      if (D < -kLimiterEpsilon) alpha = std::min(alpha, (lo - c[e]) / D);
    }
    gx_[e] *= alpha;
    gy_[e] *= alpha;
  }
}

void AdSolver::FaceFluxes(const AdFlow& flow, const AdComponent& comp, double frac, double n_inv, double weight) {
  // Mass through every face over the sub-step from the concentrations of the
  // stage, the depths at time fraction frac of the HD sub-step and the
  // sub-step's share n_inv of the face volumes.
  const HdSolver& hs = *hd_solver_;
  const FaceTable& F = mesh_->faces;
  const int* e1 = F.element1.data();
  const int* e2 = F.element2.data();
  const int* code = flow.wetdry.data();
  const double* vol = flow.face_volume.data();
  const double* c = comp.c.data();
  const double* D = comp.dispersion.empty() ? nullptr : comp.dispersion.data();
  const double* hs0 = flow.h_start.data();
  const double* hs1 = flow.h_end.data();
  const double dt_sub = flow.dt * n_inv;
  const bool second = second_, clip = technique_.face_value_limiter > 0;
  const int ni = hs.interior_faces.size();
  const int* faces = hs.interior_faces.data();
  double* flux = face_flux_.data();

  VHD_OMP_PARALLEL {
    VHD_OMP_FOR_NOWAIT
    for (int i = 1; i <= ni; ++i) {
      const int f = faces[i];
      const int a = e1[f], b = e2[f];
      const double v = n_inv * vol[f];
      const double ca = c[a], cb = c[b];
      if (code[a] != kWet || code[b] != kWet) {
        // Advection only, with the element that gave the water.
        flux[f] = v > 0 ? v * ca : (v < 0 ? v * cb : 0.0);
        continue;
      }
      double cf;
      if (!second) {
        cf = v > 0 ? ca : cb;
      } else if (v > 0) {
        cf = ca + gx_[a] * face_ox1_[f] + gy_[a] * face_oy1_[f];
      } else {
        cf = cb + gx_[b] * face_ox2_[f] + gy_[b] * face_oy2_[f];
      }
      if (second && clip) cf = std::min(std::max(cf, std::min(ca, cb)), std::max(ca, cb));
      double F_ab = v * cf;
      if (D) {
        const double ha = hs0[a] + frac * (hs1[a] - hs0[a]), hb = hs0[b] + frac * (hs1[b] - hs0[b]);
        const double dcdn = (cb - ca) * face_idn_[f] +
                            0.5 * ((gx_[a] + gx_[b]) * face_tx_[f] + (gy_[a] + gy_[b]) * face_ty_[f]);
        F_ab -= dt_sub * face_len_[f] * FaceDispersion(D[a], D[b]) * 0.5 * (ha + hb) * dcdn;
      }
      flux[f] = F_ab;
    }

    // Open boundaries: outflow carries the element's concentration, inflow
    // the boundary value, the element's own (no data) or, at a cyclic face,
    // that of the element behind the partner face.
    const Array1<BoundaryFaceCondition>& bf = hd_->boundary.faces;
    const int nb = bf.size();
    VHD_OMP_FOR
    for (int i = 1; i <= nb; ++i) {
      const BoundaryFaceCondition& fc = bf[i];
      const int f = fc.face, e = fc.element;
      if (e > nowned_) continue;
      const double v = n_inv * vol[f];
      double cin = c[e];
      if (fc.type == kBcCyclic) {
        cin = c[static_cast<int>(OldValue(fc, 1))];
      } else if (!comp.boundary_type.empty() && comp.boundary_type[i] == kAdBoundaryValue) {
        cin = comp.boundary_c[i];
      }
      const double m = v > 0 ? v * c[e] : (v < 0 ? v * cin : 0.0);
      flux[f] = m;
      boundary_mass_[i] += weight * m;
    }
  }
}

void AdSolver::UpdateElements(const AdFlow& flow, AdComponent& comp, double alpha, double w, double frac,
                              double n_inv, double weight, bool first, bool sub_end) {
  // The stage advances the mass and, by the same operations, the water
  // depth carried by the face volumes (so that a uniform concentration has
  // exactly its mass); c = m / h of that depth. frac: time of the stage's
  // result as a fraction of the HD sub-step; sub_end: the last stage of a
  // transport sub-step, where the mass goes back to c times the HD depth
  // (the difference, round-off and the elements at or below h_min that kept
  // their concentration, is booked as the drying correction).
  const HdSolver& hs = *hd_solver_;
  const int* slots = hs.slot_face_side.data();
  const int planes = hs.face_planes, stride = hs.plane_stride;
  const double* flux = face_flux_.data();
  const double* vol = flow.face_volume.data();
  const double* h0 = flow.h_start.data();
  const double* h1 = flow.h_end.data();
  const double dt_sub = flow.dt * n_inv;
  const double k_const = comp.decay_constant;
  const double* k_field = comp.decay.empty() ? nullptr : comp.decay.data();
  const double lo = comp.minimum, hi = comp.maximum, h_min = technique_.h_min;
  // A stage of weight 0 (the first of the midpoint scheme) does not enter
  // the budgets.
  const bool book = weight != 0.0, book_decay = book && (k_field || k_const != 0.0);
  double* c = comp.c.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nowned_; ++e) {
    double in = 0.0, water = 0.0;
    for (int j = 0; j < planes; ++j) {
      const int m = slots[j * stride + e];
      in += (m & 1) ? flux[m >> 1] : -flux[m >> 1];
      if (first) {
        const double v = n_inv * vol[m >> 1];
        water += (m & 1) ? v : -v;
      }
    }
    const double A = area_[e];
    // The depth change of the sub-step per area, summed as the mass is (the
    // same for every stage).
    if (first) water_rate_[e] = (water + source_water_[e]) / A;
    const double R = (in + source_mass_[e]) / A;
    const double k = k_field ? k_field[e] : k_const;
    const double pre = alpha * m_base_[e] + (1.0 - alpha) * m_[e] + w * R;
    const double m = pre / (1.0 + w * dt_sub * k);
    const double h = alpha * h_base_[e] + (1.0 - alpha) * h_[e] + w * water_rate_[e];
    // The clamp acts where the element has a concentration (h > h_min).
    const double mc = h > h_min ? std::min(std::max(m, lo * h), hi * h) : m;
    if (book_decay) decay_step_[e] += weight * (pre - m) * A;
    if (book) clamp_step_[e] += weight * (mc - m) * A;
    m_[e] = mc;
    h_[e] = h;
    if (h > h_min) c[e] = mc / h;
    if (sub_end) comp.drying_total[e] += (c[e] * (h0[e] + frac * (h1[e] - h0[e])) - mc) * A;
  }
}

int AdSolver::Step(const AdFlow& flow, AdComponent& comp) {
  const int n = SubStepCount(flow, comp);
  const double n_inv = 1.0 / n;
  const StageRule* rules = kEuler;
  int nstages = 1;
  if (technique_.scheme_of_time_integration == 2) rules = kMidpoint, nstages = 2;
  if (technique_.scheme_of_time_integration == 3) rules = kSsp3, nstages = 3;
  const bool gradients = second_ || !comp.dispersion.empty();
  const bool exchange = subdomain_ && subdomain_->Active();

  std::fill(clamp_step_.begin(), clamp_step_.end(), 0.0);
  std::fill(decay_step_.begin(), decay_step_.end(), 0.0);
  std::fill(boundary_mass_.begin(), boundary_mass_.end(), 0.0);
  if (exchange) ExchangeHalo(*subdomain_, {&comp.c});

  for (int k = 0; k < n; ++k) {
    const double t0 = k * n_inv;  // start of the sub-step, fraction of the HD sub-step
    SurfaceAndSources(flow, comp, n_inv, t0);
    double frac_in = 0.0;
    for (int s = 0; s < nstages; ++s) {
      const StageRule& r = rules[s];
      const double frac_out = k + 1 == n && r.frac == 1.0 ? 1.0 : (k + r.frac) * n_inv;
      if (gradients) Gradients(flow, comp);
      FaceFluxes(flow, comp, (k + frac_in) * n_inv, n_inv, r.weight * r.w);
      UpdateElements(flow, comp, r.alpha, r.w, frac_out, n_inv, r.weight, s == 0, s + 1 == nstages);
      if (exchange) ExchangeHalo(*subdomain_, {&comp.c});
      frac_in = r.frac;
    }
  }

  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nowned_; ++e) {
    comp.clamp_correction[e] = clamp_step_[e];
    comp.clamp_total[e] += clamp_step_[e];
    comp.decay_total[e] += decay_step_[e];
  }
  const Array1<BoundaryFaceCondition>& bf = hd_->boundary.faces;
  for (int i = 1; i <= bf.size(); ++i) {
    const double m = boundary_mass_[i];
    if (m > 0) comp.boundary_outflow.Add(m);
    if (m < 0) comp.boundary_inflow.Add(-m);
  }
  return n;
}

}  // namespace vhd
