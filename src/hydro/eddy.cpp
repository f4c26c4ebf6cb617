// Horizontal eddy viscosity nu_t (m2/s) per element: a given value (constant
// or per element from a mesh data file) or the Smagorinsky model
//   nu_t = 2 Cs^2 Delta^2 |S|,  |S| = sqrt(2 u_x^2 + (u_y + v_x)^2 + 2 v_y^2),
// with Delta^2 the element area and the result kept between the minimum and
// the maximum eddy viscosity. The diffusive momentum fluxes built from nu_t
// are evaluated at the faces by the flux scheme.

#include <algorithm>
#include <cmath>
#include <string>

#include "core/omp.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/hd_setup_fields.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

// Stored code of a read type; -1 for a type that is not supported.
int StoredEddyType(int type) {
  if (type == 0 || type == 1) return type;
  if (type >= 3 && type <= 6) return type - 1;
  return -1;
}

void ReadEddyRecord(HdEddyRecord& r, const HdModule& hd, bool vertical) {
  const int ne = hd.state.nelements;
  int type = 1;
  SktReadKeyword("type", type, 1);
  r.type = StoredEddyType(type);
  if (r.type < 0) FatalError("Type not supported for eddy viscosity");

  if (r.type == kEddyConstant) {
    r.value.constant_value = 0.002;
    r.value.values.assign(ne, 0.002);
    if (OpenOptionalSectionHD("CONSTANT_EDDY_FORMULATION")) {
      ReadElementFieldHD(r.value, 0.002, hd.state.element_file_index, ne, false, "Wrong format for constant formulation.", "SetupEddy",
                         hd.time_axis);
      if (vertical) {
        SktReadKeyword("Ri_damping", r.Ri_damping, 0);
        if (r.Ri_damping != 0) {
          SktReadKeyword("Ri_a", r.Ri_a, 10.0);
          SktReadKeyword("Ri_b", r.Ri_b, 0.5);
        }
      }
      SktCloseSection();
    }
    for (int e = 1; e <= ne; ++e) {
      if (!(r.value.values[e] >= 0.0)) {
        FatalError("SetupEddy: eddy viscosity " + NumberText(r.value.values[e]) + " of element " +
                   std::to_string(FileIndex(hd.state.element_file_index, e)) + " must be 0 or more");
      }
    }
  } else if (r.type == kEddySmagorinsky) {
    r.value.constant_value = 0.28;
    r.value.values.assign(ne, 0.28);
    r.minimum_eddy_viscosity = 0.0;
    r.maximum_eddy_viscosity = 1.0e10;
    if (OpenOptionalSectionHD("SMAGORINSKY_FORMULATION")) {
      ReadElementFieldHD(r.value, 0.28, hd.state.element_file_index, ne, false, "Wrong format for Smagorinsky formulation.", "SetupEddy",
                         hd.time_axis);
      SktReadKeyword("minimum_eddy_viscosity", r.minimum_eddy_viscosity, 0.0);
      SktReadKeyword("maximum_eddy_viscosity", r.maximum_eddy_viscosity, 1.0e10);
      SktCloseSection();
    }
    if (r.minimum_eddy_viscosity < 0.0 || r.maximum_eddy_viscosity < r.minimum_eddy_viscosity) {
      FatalError("SetupEddy: SMAGORINSKY_FORMULATION needs 0 <= minimum_eddy_viscosity <= "
                 "maximum_eddy_viscosity (found " +
                 NumberText(r.minimum_eddy_viscosity) + ", " + NumberText(r.maximum_eddy_viscosity) + ")");
    }
  } else if (r.type == kEddyLogLaw) {
    r.minimum_eddy_viscosity = 1.8e-06;
    r.maximum_eddy_viscosity = 0.4;
    if (OpenOptionalSectionHD("LOG_LAW_FORMULATION")) {
      SktReadKeyword("mixing_length_constants", r.mixing_length_constants, 2, std::vector<double>{0.41, -0.41});
      SktReadKeyword("minimum_eddy_viscosity", r.minimum_eddy_viscosity, 1.8e-06);
      SktReadKeyword("maximum_eddy_viscosity", r.maximum_eddy_viscosity, 0.4);
      SktReadKeyword("Ri_damping", r.Ri_damping, 0);
      SktReadKeyword("Ri_a", r.Ri_a, 10.0);
      SktReadKeyword("Ri_b", r.Ri_b, 0.5);
      SktCloseSection();
    }
  } else if (r.type == kEddyKEpsilon) {
    r.minimum_eddy_viscosity = 1.8e-06;
    r.maximum_eddy_viscosity = 0.4;
    if (OpenOptionalSectionHD("K_EPSILON_FORMULATION")) {
      SktReadKeyword("minimum_eddy_viscosity", r.minimum_eddy_viscosity, 1.8e-06);
      SktReadKeyword("maximum_eddy_viscosity", r.maximum_eddy_viscosity, 0.4);
      SktCloseSection();
    }
  }
  // The log-law, k-epsilon and type-6 models are closures of the layered 3D
  // flow; a 2D run has no vertical structure to feed them.
  if (hd.ndim == 2 && r.type >= kEddyLogLaw) {
    FatalError("SetupEddy: horizontal eddy viscosity type " + std::to_string(type) +
               " needs the 3D turbulence model, which is not available; use type 0, 1 or 3");
  }
}

}  // namespace

void SetupEddy(HdModule& hd, const Mesh& mesh) {
  (void)mesh;
  HdEddyViscosity& ev = hd.eddy;
  const int ne = hd.state.nelements;
  hd.state.nu_t.assign(ne, 0.0);
  ev.horizontal = HdEddyRecord{};
  ev.horizontal.value.constant_value = 0.002;
  ev.horizontal.value.values.assign(ne, 0.002);
  if (!OpenOptionalSectionHD("EDDY_VISCOSITY")) return;
  if (OpenOptionalSectionHD("HORIZONTAL_EDDY_VISCOSITY")) {
    ReadEddyRecord(ev.horizontal, hd, false);
    SktCloseSection();
  }
  SktCloseSection();
  if (ev.horizontal.type > 0) AllocateVelocityGradientsHD(hd.state);
}

void CALCEDDYVISCOSITYHD(HdModule& hd, const Mesh& mesh) {
  const HdEddyRecord& r = hd.eddy.horizontal;
  HdState& s = hd.state;
  const int nown = s.nelements_owned;
  if (r.type == kEddyConstant) {
    const double* value = r.value.values.data();
    double* nu = s.nu_t.data();
    VHD_OMP_PARALLEL_FOR
    for (int e = 1; e <= nown; ++e) nu[e] = value[e];
  } else if (r.type == kEddySmagorinsky) {
    CALCSMAGORINSKY2D(hd, mesh);
  }
}

void CALCSMAGORINSKY2D(HdModule& hd, const Mesh& mesh) {
  const HdEddyRecord& r = hd.eddy.horizontal;
  HdState& s = hd.state;
  const int nown = s.nelements_owned;
  const double* area = mesh.elements.area.data();
  const double* cs = r.value.values.data();
  const double* cos_lat = s.cos_lat.data();
  const double r2 = hd.metric_radius * hd.metric_radius;
  const bool geographic = hd.projection == 2;
  const double nu_min = r.minimum_eddy_viscosity;
  const double nu_max = r.maximum_eddy_viscosity;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    if (s.wetdry[e] != kWet) {
      s.nu_t[e] = 0.0;
      continue;
    }
    const double ux = s.ux[e], uy = s.uy[e], vx = s.vx[e], vy = s.vy[e];
    const double shear = uy + vx;
    const double strain = std::sqrt(2.0 * ux * ux + shear * shear + 2.0 * vy * vy);
    const double delta2 = geographic ? area[e] * r2 * cos_lat[e] : area[e];
    const double nu = 2.0 * cs[e] * cs[e] * delta2 * strain;
    s.nu_t[e] = std::min(nu_max, std::max(nu_min, nu));
  }
}

void CORREDDYMUD(HdModule& hd, const Array1<double>& nu_mud) {
  HdState& s = hd.state;
  const int nown = s.nelements_owned;
  const double* mud = nu_mud.data();
  double* nu = s.nu_t.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) nu[e] = std::max(nu[e], mud[e]);
}

}  // namespace vhd
