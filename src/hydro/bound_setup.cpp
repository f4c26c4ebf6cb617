// Setup of the hydrodynamic boundary conditions: the CODE subsections of
// BOUNDARY_CONDITIONS, the tilting points and the face-condition list with
// its cyclic pairs.

#include <algorithm>
#include <cmath>
#include <new>
#include <string>
#include <vector>

#include "hydro/bound.hpp"
#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

bool LevelType(int type) { return type == kBcLevel || type == kBcLevelWeak || type == kBcFlather; }

bool AcceptedType(int type) {
  switch (type) {
    case kBcLand: case kBcLand2: case kBcVelocity: case kBcFlux: case kBcLevel: case kBcDischarge:
    case kBcTransmissive: case kBcLevelWeak: case kBcVelocityWeak: case kBcFlather: case kBcCyclic:
      return true;
    default:
      return false;
  }
}

std::string CodeSection(int code) {
  return "BOUNDARY_CONDITIONS/CODE_" + std::to_string(code);
}

// The boundary faces of a code in the order of the boundary walk and the
// number of connected stretches among them.
void CodeFaces(const Mesh& mesh, int code, std::vector<int>& faces, int& nsections) {
  faces.clear();
  nsections = 0;
  bool any = false;
  for (int f = 1; f <= mesh.faces.nfaces && !any; ++f) any = mesh.faces.element2[f] == 0 && mesh.faces.code[f] == code;
  if (!any) return;
  MeshSection section;
  SetupMeshSection(mesh, code, section);
  const FaceTable& F = mesh.faces;
  for (int k = 1; k <= section.faces.size(); ++k) {
    const int f = section.faces[k];
    if (k == 1 || FaceNode(F, section.faces[k - 1], 2) != FaceNode(F, f, 1)) ++nsections;
    faces.push_back(f);
  }
}

// Still water depth at a boundary face: minus the mean bed level of its nodes.
double FaceStillWaterDepth(const Mesh& mesh, int f) {
  const int n = FaceNodeCount(mesh.faces, f);
  double z = 0.0;
  for (int j = 1; j <= n; ++j) z += mesh.nodes.z[FaceNode(mesh.faces, f, j)];
  return -z / n;
}

int NumberOfValues(const BoundaryCondition& b) {
  switch (b.type) {
    case kBcVelocity: case kBcFlux: case kBcTransmissive: case kBcVelocityWeak:
      return 4;
    case kBcLevelWeak:
      return 6;
    case kBcFlather:
      return b.type_interpolation_constrain >= 1 ? 8 : 6;
    default:
      return 2;
  }
}

// Reads one data item of n values from the current section; its first value
// is component `first` of the faces.
void ReadItem(BoundaryCondition& b, int n, int first) {
  DataSpec& spec = b.data[b.ndata];
  ReadDataSpec(spec, n);
  b.data_first_component[b.ndata] = first;
  ++b.ndata;
}

void ReadItemInSubsection(BoundaryCondition& b, int item, int n, int first) {
  SktOpenSection("DATA", item);
  ReadItem(b, n, first);
  SktCloseSection();
}

// The keys of the current CODE section.
void ReadCode(const HdModule& hd, BoundaryCondition& b) {
  const std::string where = CodeSection(b.code);
  SktReadKeyword("type", b.type, 1);
  if (!AcceptedType(b.type)) {
    FatalError("Format not supported for data input (type " + std::to_string(b.type) + " in " + where + ")");
  }
  if (b.type == kBcLevel || b.type == kBcDischarge) SktReadKeyword("type_secondary", b.type_secondary, 1);
  if (b.type == kBcDischarge) {
    SktReadKeyword("approach", b.approach, 1);
    if (b.approach < 1 || b.approach > 3) {
      FatalError("Type not supported for approach of a discharge boundary: " + std::to_string(b.approach) +
                 " in " + where + " (1, 2 or 3 expected)");
    }
  }
  if (b.type == kBcFlather) {
    SktReadKeyword("type_interpolation_constrain", b.type_interpolation_constrain, 0);
    SktReadKeyword("type_of_data", b.type_of_data, 2);
  }
  if (b.type == kBcCyclic) {
    SktReadKeyword("code_cyclic", b.code_cyclic, 0);
    if (hd.nprocesses > 1) FatalError("Cyclic boundary conditions only available using OpenMP");
  }
  if (hd.ndim == 3 && (b.type == kBcVelocity || b.type == kBcFlux || b.type == kBcDischarge ||
                       b.type == kBcVelocityWeak || b.type == kBcFlather)) {
    SktReadKeyword("type_of_vertical_profile", b.type_of_vertical_profile, 1);
  }

  // Corrections: their defaults, then what the type allows.
  b.type_of_coriolis_correction = 0;
  b.type_of_wind_correction = 0;
  b.type_of_tilting = 1;
  b.type_of_tilting_point = 1;
  b.point_tilting = 1;
  b.type_of_pressure_correction = 0;
  b.type_of_radiation_stress_correction = 0;
  if (LevelType(b.type)) {
    SktReadKeyword("type_of_coriolis_correction", b.type_of_coriolis_correction, 0);
    SktReadKeyword("type_of_wind_correction", b.type_of_wind_correction, 0);
    if (b.type_of_coriolis_correction != 0 || b.type_of_wind_correction != 0) {
      SktReadKeyword("type_of_tilting", b.type_of_tilting, 1);
      SktReadKeyword("type_of_tilting_point", b.type_of_tilting_point, 1);
      if (b.type_of_tilting_point == 4) SktReadKeyword("point_tilting", b.point_tilting, 1);
    }
    SktReadKeyword("type_of_pressure_correction", b.type_of_pressure_correction, 1);
  }
  if (b.type == kBcLevel || b.type == kBcDischarge || b.type == kBcLevelWeak || b.type == kBcVelocityWeak) {
    SktReadKeyword("type_of_radiation_stress_correction", b.type_of_radiation_stress_correction, 1);
  }
  if (b.type == kBcFlather) {
    SktReadKeyword("type_of_relaxation", b.type_of_relaxation, 0);
    SktReadKeyword("distance", b.distance, 10000.0);
    if (b.type_of_relaxation != 0) {
      FatalError("Type not supported for relaxation of a Flather boundary: type_of_relaxation " +
                 std::to_string(b.type_of_relaxation) + " in " + where + " (only 0 is available)");
    }
  }

  // Data items.
  b.ndata = 0;
  switch (b.type) {
    case kBcVelocity: case kBcFlux: case kBcVelocityWeak:
      ReadItem(b, 2, 1);
      break;
    case kBcLevel: case kBcDischarge: case kBcTransmissive: case kBcLevelWeak:
      ReadItem(b, 1, 1);
      break;
    case kBcFlather: {
      const bool constrain = b.type_interpolation_constrain >= 1;
      if (b.type_of_data == 1) {
        ReadItem(b, constrain ? 4 : 3, 1);
      } else {
        ReadItem(b, 1, 1);
        ReadItemInSubsection(b, 2, 2, 2);
        if (constrain) ReadItemInSubsection(b, 3, 1, 4);
      }
      break;
    }
    default:
      break;
  }
}

// Chooses the tilting point of a level boundary with a Coriolis or wind
// correction, after checking that the boundary is one connected stretch.
void ChooseTiltingPoint(const Mesh& mesh, BoundaryCondition& b, const std::vector<int>& faces) {
  if (!LevelType(b.type) || (b.type_of_coriolis_correction == 0 && b.type_of_wind_correction == 0)) return;
  if (b.nsections != 1) {
    FatalError("SetupBoundCondHD: Only one section allowed when coriolis/wind correction is included (" +
               CodeSection(b.code) + " has " + std::to_string(b.nsections) + " sections)");
  }
  if (b.type_of_tilting != 1) {
    FatalError("Type not supported for level tilting: type_of_tilting " + std::to_string(b.type_of_tilting) +
               " in " + CodeSection(b.code) + " (only 1 is available)");
  }
  const int n = static_cast<int>(faces.size());
  switch (b.type_of_tilting_point) {
    case 1: {
      int best = 1;
      double deepest = FaceStillWaterDepth(mesh, faces[0]);
      for (int j = 2; j <= n; ++j) {
        const double d = FaceStillWaterDepth(mesh, faces[static_cast<std::size_t>(j - 1)]);
        if (d > deepest) deepest = d, best = j;
      }
      b.point_tilting = best;
      break;
    }
    case 2:
      b.point_tilting = 1;
      break;
    case 3:
      b.point_tilting = n;
      break;
    case 4:
      if (b.point_tilting < 1 || b.point_tilting > n) {
        FatalError("SetupBoundCondHD: Illegal value of tilting point (point_tilting " +
                   std::to_string(b.point_tilting) + " in " + CodeSection(b.code) + ", 1 to " + std::to_string(n) +
                   " expected)");
      }
      break;
    default:
      FatalError("SetupBoundCondHD: Illegal value of tilting point (type_of_tilting_point " +
                 std::to_string(b.type_of_tilting_point) + " in " + CodeSection(b.code) + ", 1 to 4 expected)");
  }
}

// Opens the data items of a code on its faces (in walking order).
void OpenItems(HdModule& hd, const Mesh& mesh, BoundaryCondition& b, const std::vector<int>& faces) {
  if (faces.empty()) return;
  FemDataRequest request;
  request.expect = FemDataExpect::kLine;
  request.location = FemDataLocation::kFaces;
  request.mesh = &mesh;
  request.entities = faces;
  for (int i = 0; i < b.ndata; ++i) FemDataOpen(b.data[i], request, hd.time_axis);
}

// Cyclic pairs: every face of a cyclic code stores the element behind its
// partner face; face k of one boundary pairs with face n + 1 - k of the
// other.
void PairCyclic(const Mesh& mesh, HdBoundary& bc) {
  for (int code = 1; code <= bc.ncodes; ++code) {
    BoundaryCondition& b = bc.codes[code];
    if (b.type != kBcCyclic) continue;
    int partner = 0;
    if (b.code_cyclic != 0) {
      const int p = b.code_cyclic;
      if (p >= 1 && p <= bc.ncodes && p != code && bc.codes[p].type == kBcCyclic) partner = p;
    } else {
      for (int p = 1; p <= bc.ncodes && partner == 0; ++p) {
        if (p != code && bc.codes[p].type == kBcCyclic && bc.codes[p].nfaces == b.nfaces) partner = p;
      }
    }
    if (partner == 0) {
      FatalError("SetupBoundCondHD: Cyclic boundary not identified (" + CodeSection(code) + ", code_cyclic " +
                 std::to_string(b.code_cyclic) + ")");
    }
    const BoundaryCondition& o = bc.codes[partner];
    if (o.nfaces != b.nfaces) {
      FatalError("SetupBoundCondHD: The number of faces must be the same (code " + std::to_string(code) + ": " +
                 std::to_string(b.nfaces) + ", code " + std::to_string(partner) + ": " + std::to_string(o.nfaces) +
                 ")");
    }
    const int n = b.nfaces;
    for (int k = 1; k <= n; ++k) {
      BoundaryFaceCondition& fc = bc.faces[b.first_face + k - 1];
      const BoundaryFaceCondition& pc = bc.faces[o.first_face + n - k];
      const double la = FaceLengthMetres(mesh, fc.face), lb = FaceLengthMetres(mesh, pc.face);
      if (std::abs(la - lb) > 1e-6 * la) {
        FatalError("SetupBoundCondHD: Length of faces must be identical (face " + std::to_string(fc.face) +
                   " of code " + std::to_string(code) + ": " + NumberText(la, 12) + " m, face " +
                   std::to_string(pc.face) + " of code " + std::to_string(partner) + ": " + NumberText(lb, 12) +
                   " m)");
      }
      fc.values[0] = fc.values[1] = static_cast<double>(pc.element);
    }
  }
}

}  // namespace

void SetupBoundCondHD(HdModule& hd, const Mesh& mesh, HdBoundary& bc) {
  const FaceTable& F = mesh.faces;
  int ncodes = 1;
  for (int f = 1; f <= F.nfaces; ++f) {
    if (F.element2[f] != 0) continue;
    if (F.code[f] < 1) {
      FatalError("SetupBoundCondHD: No internal boundaries are allowed (boundary face " + std::to_string(f) +
                 " has code " + std::to_string(F.code[f]) + ")");
    }
    ncodes = std::max(ncodes, F.code[f]);
  }
  try {
    bc.ncodes = ncodes;
    bc.codes.assign(ncodes);
    const int ne = mesh.elements.nelements;
    BoundaryForcingFields& ff = bc.forcing;
    for (Array1<double>* a : {&ff.coriolis, &ff.wind_x, &ff.wind_y, &ff.pressure_x, &ff.pressure_y,
                              &ff.radiation_x, &ff.radiation_y}) {
      a->assign(ne, 0.0);
    }
  } catch (const std::bad_alloc&) {
    FatalError("SetupBoundCondHD: Out of memory");
  }

  int status = 0;
  SktOpenSection("BOUNDARY_CONDITIONS", kNoIndex, &status);
  const bool have_section = status == 0;
  if (have_section) SktReadKeyword("internal_land_boundary_type", bc.internal_land_boundary_type, 1);

  std::vector<int> faces;
  int nmax = 0;
  for (int code = 1; code <= ncodes; ++code) {
    BoundaryCondition& b = bc.codes[code];
    b.code = code;
    CodeFaces(mesh, code, faces, b.nsections);
    b.nfaces = static_cast<int>(faces.size());
    nmax = std::max(nmax, b.nfaces);
    if (have_section && SktSectionExists("CODE", code)) {
      SktOpenSection("CODE", code);
      ReadCode(hd, b);
      OpenItems(hd, mesh, b, faces);
      SktCloseSection();
      if (b.nfaces == 0 && code >= 2) {
        Warning(CodeSection(code) + ": no boundary face of the mesh has code " + std::to_string(code));
      }
    } else if (code >= 2 && b.nfaces > 0) {
      Warning("No section CODE_" + std::to_string(code) +
              " in BOUNDARY_CONDITIONS: the open boundary is closed (land)");
    }
    ChooseTiltingPoint(mesh, b, faces);
    try {
      b.buffer.assign(b.nfaces, 0.0);
    } catch (const std::bad_alloc&) {
      FatalError("SetupBoundCondHD: Out of memory");
    }
  }
  if (have_section) SktCloseSection();
  try {
    bc.work.assign(nmax + 1, 0.0);
  } catch (const std::bad_alloc&) {
    FatalError("SetupBoundCondHD: Out of memory");
  }
  CalcFaceBC(mesh, bc);
  bc.filled = false;
}

void CalcFaceBC(const Mesh& mesh, HdBoundary& bc) {
  std::vector<int> faces;
  int total = 0;
  for (int code = 1; code <= bc.ncodes; ++code) total += bc.codes[code].nfaces;
  try {
    bc.faces.assign(total);
    bc.face_condition.assign(mesh.faces.nfaces, 0);
  } catch (const std::bad_alloc&) {
    FatalError("CalcFaceBC: Out of memory");
  }
  int k = 0;
  for (int code = 1; code <= bc.ncodes; ++code) {
    BoundaryCondition& b = bc.codes[code];
    int nsections = 0;
    CodeFaces(mesh, code, faces, nsections);
    b.nfaces = static_cast<int>(faces.size());
    b.first_face = b.nfaces > 0 ? k + 1 : 0;
    const int nvalues = NumberOfValues(b);
    for (int f : faces) {
      BoundaryFaceCondition& fc = bc.faces[++k];
      fc.face = f;
      fc.element = mesh.faces.element1[f];
      fc.code = code;
      fc.type = b.type;
      fc.type_secondary = b.type_secondary;
      fc.approach = b.approach;
      fc.nvalues = nvalues;
      bc.face_condition[f] = k;
    }
  }
  PairCyclic(mesh, bc);
}

void LinkBoundaryFacesHD(const HdBoundary& bc, HdSolver& solver) {
  for (BoundaryFaceRecord& rec : solver.boundary_faces) {
    const int k = rec.face <= bc.face_condition.size() ? bc.face_condition[rec.face] : 0;
    const int type = k > 0 ? bc.faces[k].type : kBcLand;
    rec.kind = (type == kBcLand || type == kBcLand2) ? kBoundaryLand : type;
  }
}

void CloseBoundaryDataHD(HdBoundary& bc) {
  for (int c = 1; c <= bc.ncodes; ++c) {
    BoundaryCondition& code = bc.codes[c];
    for (int i = 0; i < code.ndata; ++i) FemDataClose(code.data[i]);
  }
}

}  // namespace vhd
