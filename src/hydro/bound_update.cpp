// Boundary values brought to a new time: data read at every face, value
// pairs shifted, then the corrections of each boundary kind on the old values.

#include <algorithm>
#include <cmath>

#include "core/run.hpp"
#include "hydro/bound.hpp"
#include "hydro/hd_module.hpp"
#include "mesh/femdata.hpp"
#include "mesh/mesh.hpp"
#include "parallel/message_passing.hpp"

namespace vhd {

namespace {

bool LevelType(int type) { return type == kBcLevel || type == kBcLevelWeak || type == kBcFlather; }

RunControl Processes(const HdModule& hd) {
  RunControl run;
  run.process_id = hd.process_id;
  run.nprocesses = hd.nprocesses;
  return run;
}

// Still water depth at a boundary face as the flux sees it.
double StillDepth(const HdState& st, const BoundaryFaceCondition& fc) {
  return fc.face <= st.face_d.size() ? st.face_d[fc.face] : st.d[fc.element];
}

bool Owned(const HdState& st, const BoundaryFaceCondition& fc) { return fc.element <= st.nelements_owned; }

// The total over the processes of a sum over the owned faces.
double Total(ExactSum part, const HdModule& hd) {
  part.SumOverProcesses(Processes(hd));
  return part.Value();
}

// Values per face of a boundary that only the faces' owners can form (they
// read the state of the face's element): every process keeps its owned
// faces' values and takes the others' from their owners.
void ShareFaceValues(const HdModule& hd, const BoundaryCondition& b, Array1<double>& work) {
  if (!hd.subdomain || !hd.subdomain->Active()) return;
  for (int j = 1; j <= b.nfaces; ++j)
    if (!Owned(hd.state, hd.boundary.faces[b.first_face + j - 1])) work[j] = 0.0;
  SumOverProcesses(work.data() + 1, b.nfaces, *hd.subdomain);
}

// Along-boundary integration of the slopes work[1..n] (m/m, one per face):
// the level at the nodes between faces grows by slope x face length, and the
// face value is the mean of its two node values. The face values replace the
// slopes in work, shifted so that face `zero` has the value 0.
void IntegrateAlongBoundary(const Mesh& mesh, const HdBoundary& bc, const BoundaryCondition& b, int zero,
                            Array1<double>& work) {
  double node = 0.0;
  for (int j = 1; j <= b.nfaces; ++j) {
    const double rise = work[j] * FaceLengthMetres(mesh, bc.faces[b.first_face + j - 1].face);
    work[j] = node + 0.5 * rise;
    node += rise;
  }
  const double ref = work[zero];
  for (int j = 1; j <= b.nfaces; ++j) work[j] -= ref;
}

// Adds the integrated corrections in work to the old level of the wet faces.
void AddToLevel(const HdState& st, HdBoundary& bc, const BoundaryCondition& b, const Array1<double>& work) {
  for (int j = 1; j <= b.nfaces; ++j) {
    BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
    if (st.wetdry[fc.element] == kWet && st.h[fc.element] > 0) OldValue(fc, 1) += work[j];
  }
}

// Incoming characteristic of a weakly reflecting level boundary: that of the
// simple wave which runs into the water of outgoing characteristic R0 and
// brings it to the depth h_l that the level gives over the still water depth
// d: R- = R0 - 4 sqrt(g h_l). Water at rest at that depth meets it with
// R0 = 2 sqrt(g h_l), so a lake at rest at the level stays at rest.
double IncomingCharacteristic(double R0, double level, double d, double g) {
  return R0 - 4.0 * std::sqrt(g * std::max(0.0, level + d));
}

// Characteristics u_n -+ 2 sqrt(g h) of the inner element of a face (u_n
// outward; velocity 0 where the element is not wet or below h_min), at the
// depth over the face's still water depth.
void InnerCharacteristics(const HdModule& hd, const Mesh& mesh, const BoundaryFaceCondition& fc, double& Rminus,
                          double& Rplus) {
  const HdState& st = hd.state;
  const int c = fc.element;
  const double h = std::max(0.0, st.eta[c] + StillDepth(st, fc));
  double un = 0.0;
  if (st.wetdry[c] == kWet && st.h[c] >= hd.flood_dry.mass_depth && st.h[c] > 0) {
    un = (st.P[c] * mesh.faces.nx[fc.face] + st.Q[c] * mesh.faces.ny[fc.face]) / st.h[c];
  }
  const double c2 = 2.0 * std::sqrt(kPhysical.g * h);
  Rminus = un - c2;
  Rplus = un + c2;
}

}  // namespace

void UpdateBoundaryValuesHD(HdModule& hd, const Mesh& mesh, double t) {
  HdBoundary& bc = hd.boundary;
  const HdState& st = hd.state;
  const double g = kPhysical.g;
  for (int code = 1; code <= bc.ncodes; ++code) {
    BoundaryCondition& b = bc.codes[code];
    if (b.nfaces == 0 || b.type < 3 || b.type > 12) continue;
    for (int i = 0; i < b.ndata; ++i) {
      DataSpec& spec = b.data[i];
      for (int k = 1; k <= spec.n; ++k) {
        FemDataRead(spec, k, t, b.buffer);
        const int comp = b.data_first_component[i] + k - 1;
        for (int j = 1; j <= b.nfaces; ++j) {
          BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
          OldValue(fc, comp) = bc.filled ? NewValue(fc, comp) : b.buffer[j];
          NewValue(fc, comp) = b.buffer[j];
        }
      }
    }
    DistributeDischargeHD(hd, mesh, b);
    TiltLevelHD(hd, mesh, b);
    ConstrainFlatherHD(hd, mesh, b);
    CorrectRadiationStressHD(hd, mesh, b);
    if ((b.type == kBcTransmissive || b.type == kBcLevelWeak) && !bc.filled) {
      // The water outside is the inner state of the start of the run: its
      // incoming characteristic (transmissive) or its outgoing one, which the
      // waves of the prescribed level run into (weakly reflecting level).
      for (int j = 1; j <= b.nfaces; ++j) {
        BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
        double Rminus, Rplus;
        InnerCharacteristics(hd, mesh, fc, Rminus, Rplus);
        const int k = b.type == kBcTransmissive ? 2 : 3;
        OldValue(fc, k) = NewValue(fc, k) = b.type == kBcTransmissive ? Rminus : Rplus;
      }
    }
    if (b.type == kBcLevelWeak) {
      for (int j = 1; j <= b.nfaces; ++j) {
        BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
        const double d = StillDepth(st, fc), R0 = OldValue(fc, 3);
        OldValue(fc, 2) = IncomingCharacteristic(R0, OldValue(fc, 1), d, g);
        NewValue(fc, 2) = IncomingCharacteristic(R0, NewValue(fc, 1), d, g);
      }
    }
  }
  bc.filled = true;
}

void DistributeDischargeHD(HdModule& hd, const Mesh& mesh, BoundaryCondition& b) {
  if (b.type != kBcDischarge || b.nfaces == 0) return;
  HdBoundary& bc = hd.boundary;
  const HdState& st = hd.state;
  Array1<double>& w = bc.work;

  ExactSum length_sum, wet_sum, level;
  for (int j = 1; j <= b.nfaces; ++j) {
    const BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
    if (!Owned(st, fc)) continue;
    const double len = FaceLengthMetres(mesh, fc.face);
    length_sum += len;
    if (st.wetdry[fc.element] == kWet) {
      wet_sum += len;
      level += len * st.eta[fc.element];
    }
  }
  const double length = Total(length_sum, hd);
  const double wet_length = Total(wet_sum, hd);
  const double level_sum = Total(level, hd);

  // Weights per unit width: (depth under the mean wet level)^(5/3) times the
  // local conveyance 1/sqrt(K) of the bed resistance.
  const bool conveyance = hd.bed.type != kBedNone && hd.bed.K.size() >= st.nelements_owned;
  ExactSum weights;
  for (int j = 1; j <= b.nfaces; ++j) {
    const BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
    w[j] = 0.0;
    if (wet_length <= 0.0) continue;
    const double depth = level_sum / wet_length + StillDepth(st, fc);
    if (depth <= 0.0) continue;
    double factor = 1.0;
    if (conveyance && hd.bed.K[fc.element] > 0.0) factor = 1.0 / std::sqrt(hd.bed.K[fc.element]);
    w[j] = std::pow(depth, 5.0 / 3.0) * factor;
    if (Owned(st, fc)) weights += w[j] * FaceLengthMetres(mesh, fc.face);
  }
  const double weight_sum = Total(weights, hd);

  for (int j = 1; j <= b.nfaces; ++j) {
    BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
    const double Q = OldValue(fc, 1);
    OldValue(fc, 1) = weight_sum > 0.0 ? Q * w[j] / weight_sum : (length > 0.0 ? Q / length : 0.0);
  }
}

void TiltLevelHD(HdModule& hd, const Mesh& mesh, BoundaryCondition& b) {
  if (!LevelType(b.type) || b.nfaces == 0) return;
  const bool coriolis = b.type_of_coriolis_correction != 0;
  const bool wind = b.type_of_wind_correction != 0;
  if (!coriolis && !wind) return;
  const bool pressure = b.type_of_pressure_correction != 0;
  HdBoundary& bc = hd.boundary;
  const HdState& st = hd.state;
  const BoundaryForcingFields& ff = bc.forcing;
  const double g = kPhysical.g, rho = kPhysical.rho0;
  const double hc = hd.flood_dry.mass_depth;
  Array1<double>& w = bc.work;

  // Along-boundary surface slope of the steady momentum balance at each wet
  // face; the boundary direction t = (-ny, nx) keeps the domain on the left.
  for (int j = 1; j <= b.nfaces; ++j) {
    const BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
    const int c = fc.element;
    const double h = st.h[c];
    w[j] = 0.0;
    if (st.wetdry[c] != kWet || h <= 0.0) continue;
    double nx, ny, len;
    FaceMetres(mesh, fc.face, nx, ny, len);
    const double tx = -ny, ty = nx;
    double force = 0.0;  // along-boundary force per unit area / rho (m2/s2)
    if (coriolis) force -= ff.coriolis[c] * (st.P[c] * nx + st.Q[c] * ny);
    if (wind) {
      double scale = 1.0;
      if (hc > 0.0 && h < 2.0 * hc) scale = h * h / (4.0 * hc * hc);
      force += scale * (ff.wind_x[c] * tx + ff.wind_y[c] * ty);
    }
    if (pressure) force -= h * (ff.pressure_x[c] * tx + ff.pressure_y[c] * ty) / rho;
    w[j] = force / (g * h);
  }
  ShareFaceValues(hd, b, w);
  IntegrateAlongBoundary(mesh, bc, b, b.point_tilting, w);
  AddToLevel(st, bc, b, w);
}

void ConstrainFlatherHD(HdModule& hd, const Mesh& mesh, BoundaryCondition& b) {
  if (b.type != kBcFlather || b.type_interpolation_constrain < 1 || b.nfaces == 0) return;
  HdBoundary& bc = hd.boundary;
  const HdState& st = hd.state;
  ExactSum area_sum, discharge_sum;
  for (int j = 1; j <= b.nfaces; ++j) {
    const BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
    if (!Owned(st, fc) || st.wetdry[fc.element] != kWet) continue;
    const double h = OldValue(fc, 1) + StillDepth(st, fc);
    if (h <= 0.0) continue;
    double nx, ny, len;
    FaceMetres(mesh, fc.face, nx, ny, len);
    const double un = OldValue(fc, 2) * nx + OldValue(fc, 3) * ny;
    area_sum += h * len;
    discharge_sum += -un * h * len;
  }
  const double area = Total(area_sum, hd);
  const double discharge = Total(discharge_sum, hd);
  // The prescribed discharge is one value for the whole boundary.
  const double target = OldValue(bc.faces[b.first_face], 4);
  if (b.type_interpolation_constrain == 1) {
    if (std::abs(discharge) <= 1e-6) return;
    const double factor = target / discharge;
    for (int j = 1; j <= b.nfaces; ++j) {
      BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
      OldValue(fc, 2) *= factor;
      OldValue(fc, 3) *= factor;
    }
  } else if (b.type_interpolation_constrain == 2 && area > 0.0) {
    const double shift = -(target - discharge) / area;
    for (int j = 1; j <= b.nfaces; ++j) {
      BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
      double nx, ny, len;
      FaceMetres(mesh, fc.face, nx, ny, len);
      OldValue(fc, 2) += shift * nx;
      OldValue(fc, 3) += shift * ny;
    }
  }
}

void CorrectRadiationStressHD(HdModule& hd, const Mesh& mesh, BoundaryCondition& b) {
  if ((b.type != kBcLevel && b.type != kBcLevelWeak) || b.type_of_radiation_stress_correction < 1 ||
      b.nfaces == 0) {
    return;
  }
  HdBoundary& bc = hd.boundary;
  const HdState& st = hd.state;
  const BoundaryForcingFields& ff = bc.forcing;
  const double g = kPhysical.g;
  Array1<double>& w = bc.work;
  int deepest = 1;
  double deepest_d = -1e300;
  for (int j = 1; j <= b.nfaces; ++j) {
    const BoundaryFaceCondition& fc = bc.faces[b.first_face + j - 1];
    const int c = fc.element;
    const double d = StillDepth(st, fc);
    if (d > deepest_d) deepest_d = d, deepest = j;
    w[j] = 0.0;
    const double h = st.h[c];
    if (st.wetdry[c] != kWet || h <= 0.0) continue;
    double nx, ny, len;
    FaceMetres(mesh, fc.face, nx, ny, len);
    const double tx = -ny, ty = nx;
    w[j] = (ff.radiation_x[c] * tx + ff.radiation_y[c] * ty) / (g * h);
  }
  ShareFaceValues(hd, b, w);
  IntegrateAlongBoundary(mesh, bc, b, deepest, w);
  AddToLevel(st, bc, b, w);
}

}  // namespace vhd
