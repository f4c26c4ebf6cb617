// Cross sections: faces along a boundary or across a polyline.

#include <algorithm>
#include <map>
#include <new>
#include <string>
#include <vector>

#include "log/log.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

namespace {

void StoreFaces(const std::vector<int>& faces, const std::vector<int>& signs, MeshSection& s, const char* routine) {
  try {
    s.faces.assign(static_cast<int>(faces.size()), 0);
    s.sign.assign(static_cast<int>(faces.size()), 0);
  } catch (const std::bad_alloc&) {
    FatalError(std::string(routine) + ": Out of memory");
  }
  std::copy(faces.begin(), faces.end(), s.faces.begin());
  std::copy(signs.begin(), signs.end(), s.sign.begin());
}

// Orientation of point c against the line a -> b: > 0 left, < 0 right.
double Orient(double ax, double ay, double bx, double by, double cx, double cy) {
  return (bx - ax) * (cy - ay) - (by - ay) * (cx - ax);
}

}  // namespace

void SetupMeshSection(const Mesh& mesh, int code, MeshSection& section) {
  if (code <= 0) FatalError("SetupMeshSection: No boundary specified");
  const FaceTable& f = mesh.faces;
  // Boundary faces run with the domain on their left (the node order of
  // element1); chain them from the face whose first node ends no other face.
  std::map<int, int> by_first;
  std::vector<int> ends;
  std::vector<int> faces, signs;
  try {
    for (int k = 1; k <= f.nfaces; ++k)
      if (f.element2[k] == 0 && f.code[k] == code) {
        by_first.emplace(FaceNode(f, k, 1), k);
        ends.push_back(FaceNode(f, k, 2));
      }
    if (by_first.empty())
      FatalError("SetupMeshSection: No boundary specified (no boundary face has code " + std::to_string(code) + ")");
    std::sort(ends.begin(), ends.end());
    std::vector<char> used(static_cast<std::size_t>(f.nfaces) + 1, 0);
    auto walk = [&](int k) {
      while (k != 0 && !used[k]) {
        used[k] = 1;
        faces.push_back(k);
        signs.push_back(1);
        const auto next = by_first.find(FaceNode(f, k, 2));
        k = next == by_first.end() ? 0 : next->second;
      }
    };
    std::vector<int> starts;
    for (const auto& [node, k] : by_first)
      if (!std::binary_search(ends.begin(), ends.end(), node)) starts.push_back(k);
    std::sort(starts.begin(), starts.end());
    for (int k : starts) walk(k);
    for (const auto& [node, k] : by_first) walk(k);  // closed loops
  } catch (const std::bad_alloc&) {
    FatalError("SetupMeshSection: Out of memory");
  }
  section.code = code;
  section.x.clear();
  section.y.clear();
  StoreFaces(faces, signs, section, "SetupMeshSection");
}

void CalcSection2D(const Mesh& mesh, const std::vector<double>& x, const std::vector<double>& y,
                   MeshSection& section) {
  const FaceTable& f = mesh.faces;
  const ElementTable& el = mesh.elements;
  std::vector<int> faces, signs;
  try {
    section.x = x;
    section.y = y;
    section.code = 0;
    const int nseg = static_cast<int>(std::min(x.size(), y.size())) - 1;
    for (int k = 1; k <= f.nfaces; ++k) {
      const int a = f.element1[k], b = f.element2[k];
      if (b == 0) continue;
      const double ax = el.xc[a], ay = el.yc[a], bx = el.xc[b], by = el.yc[b];
      int crossings = 0;
      for (int s = 0; s < nseg; ++s) {
        const double px = x[s], py = y[s], qx = x[s + 1], qy = y[s + 1];
        const double oa = Orient(px, py, qx, qy, ax, ay), ob = Orient(px, py, qx, qy, bx, by);
        const bool a_left = oa > 0, b_left = ob > 0;
        if (a_left == b_left) continue;
        // Where the link meets the segment's line, as a fraction t along the
        // segment: the start counts, the end only on the last segment, so a
        // link through a polyline vertex crosses once.
        const double op = Orient(ax, ay, bx, by, px, py), oq = Orient(ax, ay, bx, by, qx, qy);
        if (op == oq) continue;
        const double t = op / (op - oq);
        if (t < 0 || t > 1 || (t == 1 && s + 1 < nseg)) continue;
        crossings += a_left ? 1 : -1;
      }
      if (crossings != 0) {
        faces.push_back(k);
        signs.push_back(crossings > 0 ? 1 : -1);
      }
    }
  } catch (const std::bad_alloc&) {
    FatalError("CalcSection2D: Out of memory");
  }
  StoreFaces(faces, signs, section, "CalcSection2D");
}

void SetupSection2D(const Mesh& mesh, const std::vector<double>& x, const std::vector<double>& y,
                    MeshSection& section) {
  CalcSection2D(mesh, x, y, section);
  if (section.faces.size() == 0) FatalError("SetupSection2D: Number of faces is zero in section");
}

void SetupMeshSectionlayer(const Mesh& mesh3d, const MeshSection& section2d, MeshSection& section3d) {
  if (section2d.faces.size() == 0) FatalError("SetupMeshSectionlayer: No boundary specified");
  std::vector<int> faces, signs;
  try {
    for (int k = 1; k <= section2d.faces.size(); ++k) {
      const int f = section2d.faces[k];
      for (int v = mesh3d.column_face_start[f]; v < mesh3d.column_face_start[f + 1]; ++v) {
        faces.push_back(v);
        // The top face of a column always has both sides, so its element1
        // lies in the column of the 2D face's element1; a lower face owned by
        // the other column runs the other way.
        const int top = mesh3d.column_face_start[f + 1] - 1;
        const int owner = mesh3d.element_column[mesh3d.faces.element1[top]];
        const bool same = mesh3d.element_column[mesh3d.faces.element1[v]] == owner;
        signs.push_back(same ? section2d.sign[k] : -section2d.sign[k]);
      }
    }
  } catch (const std::bad_alloc&) {
    FatalError("SetupMeshSectionlayer: Out of memory");
  }
  section3d.x = section2d.x;
  section3d.y = section2d.y;
  section3d.code = section2d.code;
  StoreFaces(faces, signs, section3d, "SetupMeshSectionlayer");
}

}  // namespace vhd
