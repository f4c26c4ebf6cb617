// Flooding and drying: the FLOOD_AND_DRY settings, the wet/dry code of each
// element after every HD sub-step, and the blow-up check.
//
// Codes: 0 dry (no flux through any face), 1 wet (full participation),
// 2 flooded (carries water and takes part in the mass balance, but has zero
// velocity and receives no element sources and no drag).
//
// Drying is one-sided: a wet element stays wet until it falls below the
// drying depth, while water arriving on a dry element is flooded (mass only)
// until it reaches the mass depth. Water that has been moving keeps moving as
// it thins, so a receding film drains with the water body; were it made
// flooded at the mass depth, it would stop with zero velocity, and a film of
// up to the mass depth would stay behind wherever the water has been
// (flooded elements exchange no water among themselves).

#include <algorithm>
#include <limits>
#include <string>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/hd_setup_fields.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

constexpr double kRadToDeg = 57.29577951308232;

// Element area in m2 (geographic meshes hold it in radians squared).
double AreaM2(const HdModule& hd, const Mesh& mesh, int e) {
  const double a = mesh.elements.area[e];
  if (hd.projection != 2) return a;
  return a * hd.metric_radius * hd.metric_radius * hd.state.cos_lat[e];
}

void WriteBlowUpBlock(const HdModule& hd, const Mesh& mesh, std::string_view header, int e, double t) {
  const HdState& s = hd.state;
  const double scale = hd.projection == 2 ? kRadToDeg : 1.0;
  WriteLogLine("");
  WriteLogLine(header);
  if (hd.subdomain && hd.subdomain->Active()) WriteValueLine("domain                : %", hd.subdomain->owner[e] + 1);
  WriteValueLine("time                  : %", t);
  WriteValueLine("element number        : %", mesh.elements.id[e]);
  WriteValueLine("x-coordinate (center) : %", mesh.elements.xc[e] * scale);
  WriteValueLine("y-coordinate (center) : %", mesh.elements.yc[e] * scale);
  WriteValueLine("total water depth (h) : %", s.h[e]);
  WriteValueLine("surface elevation (s) : %", s.eta[e]);
  WriteValueLine("still water depth (d) : %", s.d[e]);
}

}  // namespace

void SetupFloodDryHD(HdModule& hd) {
  HdFloodDry& fd = hd.flood_dry;
  fd.type = 0;
  fd.drying_depth = fd.flooding_depth = fd.mass_depth = 0.0;
  if (!OpenOptionalSectionHD("FLOOD_AND_DRY")) return;
  SktReadKeyword("type", fd.type, 0);
  if (fd.type < 0) {
    FatalError("SetupFloodDryHD: type = " + std::to_string(fd.type) + " in " + SktSectionPath() +
               " is not supported (0 off, greater than 0 on)");
  }
  if (fd.type > 0) {
    SktReadKeyword("drying_depth", fd.drying_depth, 0.005);
    SktReadKeyword("flooding_depth", fd.flooding_depth, 0.05);
    SktReadKeyword("mass_depth", fd.mass_depth, 0.1);
    SktReadKeyword("maximum_number_of_iterations", fd.maximum_number_of_iterations, 10);
    if (!(fd.drying_depth > 0.0) || fd.mass_depth < fd.drying_depth || fd.flooding_depth < fd.drying_depth) {
      FatalError("SetupFloodDryHD: the depths in " + SktSectionPath() +
                 " must satisfy 0 < drying_depth <= flooding_depth and drying_depth <= mass_depth (found " +
                 NumberText(fd.drying_depth) + ", " + NumberText(fd.flooding_depth) + ", " +
                 NumberText(fd.mass_depth) + ")");
    }
  }
  SktCloseSection();
}

void InitialFloodDryCodesHD(HdModule& hd, const Mesh& mesh) {
  (void)mesh;
  HdState& s = hd.state;
  HdFloodDry& fd = hd.flood_dry;
  const int ne = s.nelements;
  long long nwet = 0;
  for (int e = 1; e <= ne; ++e) {
    int code = kWet;
    if (fd.type > 0) {
      if (s.h[e] < fd.drying_depth) {
        code = kDry;
        if (s.h[e] < 0.0) {
          s.h[e] = 0.0;
          s.eta[e] = -s.d[e];
        }
      } else if (s.h[e] < fd.mass_depth) {
        code = kFlooded;
      }
    }
    s.wetdry[e] = code;
    s.wetdry_old[e] = code;
    // Only wet elements carry momentum.
    if (code != kWet) {
      s.P[e] = 0.0;
      s.Q[e] = 0.0;
    }
    if (e <= s.nelements_owned && code > 0) ++nwet;
  }
  fd.n_wet = nwet;
}

void CHECKFLOODDRYHD(HdModule& hd, const Mesh& mesh) {
  HdFloodDry& fd = hd.flood_dry;
  if (fd.type <= 0) return;
  HdState& s = hd.state;
  const int nown = s.nelements_owned;
  const double h_dry = fd.drying_depth;
  const double h_mass = fd.mass_depth;
  const double h_flood = fd.flooding_depth;
  double* h = s.h.data();
  double* eta = s.eta.data();
  const double* d = s.d.data();
  int* code = s.wetdry.data();
  int* old = s.wetdry_old.data();
  double* cut = fd.mass_cut.data();

  // 1. New codes from the depths; drying elements with a negative depth are
  //    filled up to 0 and the volume is noted per element.
  int ncut = 0;
  VHD_OMP_PARALLEL_FOR_REDUCTION(+, ncut)
  for (int e = 1; e <= nown; ++e) {
    const int prev = code[e];
    old[e] = prev;
    cut[e] = 0.0;
    int next;
    if (prev == kDry) {
      next = h[e] > h_mass ? kWet : (h[e] > h_dry ? kFlooded : kDry);
    } else if (prev == kWet) {
      next = h[e] < h_dry ? kDry : kWet;
    } else {
      next = h[e] < h_dry ? kDry : (h[e] < h_mass ? kFlooded : kWet);
    }
    if (next == kDry && h[e] < 0.0) {
      cut[e] = -h[e] * AreaM2(hd, mesh, e);
      h[e] = 0.0;
      eta[e] = -d[e];
      ++ncut;
    }
    code[e] = next;
  }
  if (ncut > 0)
    for (int e = 1; e <= nown; ++e)
      if (cut[e] != 0.0) fd.mass_correction.Add(cut[e]);
  // The halo's new codes and depths: a wet halo element floods an owned one.
  if (hd.subdomain) ExchangeHalo(*hd.subdomain, {&s.h, &s.eta}, {&s.wetdry});

  // 2. A wet or flooded element deeper than h_flood floods a dry neighbour
  //    whose bed lies below its water surface. Serial: it writes across faces.
  const FaceTable& faces = mesh.faces;
  const int nf = faces.nfaces_int;  // the faces of owned elements
  for (int f = 1; f <= nf; ++f) {
    const int e1 = faces.element1[f];
    const int e2 = faces.element2[f];
    if (e1 <= 0 || e2 <= 0) continue;
    int wet_side = 0, dry_side = 0;
    if (code[e1] > 0 && code[e2] == kDry) {
      wet_side = e1;
      dry_side = e2;
    } else if (code[e2] > 0 && code[e1] == kDry) {
      wet_side = e2;
      dry_side = e1;
    } else {
      continue;
    }
    if (dry_side > nown) continue;
    if (h[wet_side] > h_flood && h[wet_side] - d[wet_side] + d[dry_side] > 0.0) code[dry_side] = kFlooded;
  }

  // 3. Momentum reset: every change of code loses the momentum, except
  //    flooded to wet, which keeps what the element gathered through its faces.
  double* P = s.P.data();
  double* Q = s.Q.data();
  long long nwet = 0;
  VHD_OMP_PARALLEL_FOR_REDUCTION(+, nwet)
  for (int e = 1; e <= nown; ++e) {
    const int before = old[e];
    const int after = code[e];
    if (before != after && !(before == kFlooded && after == kWet)) {
      P[e] = 0.0;
      Q[e] = 0.0;
    }
    if (after > 0) ++nwet;
  }
  // 4. Statistics.
  fd.n_wet = nwet;
}

bool CheckBlowUpHD(HdModule& hd, const Mesh& mesh, double t, int* status) {
  HdState& s = hd.state;
  // Every process takes part: the element reported is the first in the
  // file's order over all of them, and its owner sends its values.
  auto first_over_processes = [&](int v) { return hd.subdomain ? MinOverProcesses(v, *hd.subdomain) : v; };
  const int nown = s.nelements_owned;
  const double limit = hd.flood_dry.elevation_limit;
  const double* eta = s.eta.data();
  const double* h = s.h.data();

  // The element reported is the first in the mesh file's order.
  const Array1<int>& place = mesh.elements.file_index;
  const int none = std::numeric_limits<int>::max();
  int first = none;
  VHD_OMP_PARALLEL_FOR_REDUCTION(min, first)
  for (int e = 1; e <= nown; ++e) {
    if (!(eta[e] <= limit)) first = std::min(first, FileIndex(place, e));
  }
  first = first_over_processes(first);
  std::string_view header;
  if (first != none) {
    header = "BLOW-UP - Elevation too large";
  } else if (hd.flood_dry.type <= 0) {
    VHD_OMP_PARALLEL_FOR_REDUCTION(min, first)
    for (int e = 1; e <= nown; ++e) {
      if (!(h[e] > 0.0)) first = std::min(first, FileIndex(place, e));
    }
    first = first_over_processes(first);
    if (first != none) header = "BLOW-UP - Total depth too small";
  }
  if (first == none) return true;
  if (!place.empty()) first = static_cast<int>(std::find(place.begin(), place.end(), first) - place.begin()) + 1;
  if (hd.subdomain) BroadcastElement(*hd.subdomain, first, {&s.h, &s.eta, &s.d});

  WriteBlowUpBlock(hd, mesh, header, first, t);
  if (status == nullptr) FatalError(header);
  *status = -1;
  return false;
}

}  // namespace vhd
