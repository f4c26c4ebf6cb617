// Rectangle mesh generator.

#include "mesh/generate.hpp"

#include <algorithm>
#include <cmath>
#include <string>

#include "log/log.hpp"

namespace vhd {

namespace {

// SplitMix64: a small, good hash of (seed, stream, index) into 64 bits.
std::uint64_t Mix(std::uint64_t seed, std::uint64_t stream, std::uint64_t index) {
  std::uint64_t z = seed * 0x9E3779B97F4A7C15ULL + stream * 0xD1B54A32D192ED03ULL + index;
  z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9ULL;
  z = (z ^ (z >> 27)) * 0x94D049BB133111EBULL;
  return z ^ (z >> 31);
}

// Uniform number in [0, 1).
double Uniform(std::uint64_t seed, std::uint64_t stream, std::uint64_t index) {
  return static_cast<double>(Mix(seed, stream, index) >> 11) * 0x1.0p-53;
}

// Cell lines of a hole edge: the nearest line index, within 0 .. n.
int SnapLine(double v, double v0, double h, int n) {
  return std::clamp(static_cast<int>(std::lround((v - v0) / h)), 0, n);
}

// Active flags of the cells, row by row (cell (i, j) at i + j * nx).
std::vector<char> ActiveCells(const RectangleMeshSpec& s) {
  std::vector<char> active(static_cast<std::size_t>(s.nx) * s.ny, 1);
  const double hx = (s.x1 - s.x0) / s.nx, hy = (s.y1 - s.y0) / s.ny;
  for (const RectangleHole& h : s.holes) {
    const int i0 = SnapLine(h.x0, s.x0, hx, s.nx), i1 = SnapLine(h.x1, s.x0, hx, s.nx);
    const int j0 = SnapLine(h.y0, s.y0, hy, s.ny), j1 = SnapLine(h.y1, s.y0, hy, s.ny);
    for (int j = j0; j < j1; ++j)
      for (int i = i0; i < i1; ++i) active[static_cast<std::size_t>(i) + static_cast<std::size_t>(j) * s.nx] = 0;
  }
  return active;
}

void CheckSpec(const RectangleMeshSpec& s) {
  if (s.nx < 1) FatalError("GenerateRectangleMesh: nx must be >= 1, found " + std::to_string(s.nx));
  if (s.ny < 1) FatalError("GenerateRectangleMesh: ny must be >= 1, found " + std::to_string(s.ny));
  if (!(s.x1 > s.x0)) FatalError("GenerateRectangleMesh: x1 must be larger than x0");
  if (!(s.y1 > s.y0)) FatalError("GenerateRectangleMesh: y1 must be larger than y0");
  if (static_cast<long long>(s.nx) * s.ny > 200000000LL)
    FatalError("GenerateRectangleMesh: too many cells, nx * ny = " +
               std::to_string(static_cast<long long>(s.nx) * s.ny));
}

}  // namespace

double GeneratedDomainArea(const RectangleMeshSpec& spec) {
  CheckSpec(spec);
  const std::vector<char> active = ActiveCells(spec);
  const long long n = std::count(active.begin(), active.end(), 1);
  const double hx = (spec.x1 - spec.x0) / spec.nx, hy = (spec.y1 - spec.y0) / spec.ny;
  return static_cast<double>(n) * hx * hy;
}

void GenerateRectangleMesh(const RectangleMeshSpec& s, Mesh& mesh) {
  CheckSpec(s);
  ReleaseMesh(mesh);
  mesh.ndim = 2;
  mesh.projection = s.projection;

  const int nx = s.nx, ny = s.ny;
  const double hx = (s.x1 - s.x0) / nx, hy = (s.y1 - s.y0) / ny;
  const std::vector<char> active = ActiveCells(s);
  auto cell = [&](int i, int j) {
    return i >= 0 && i < nx && j >= 0 && j < ny && active[static_cast<std::size_t>(i) + static_cast<std::size_t>(j) * nx];
  };

  // Grid nodes in use, their numbers and codes.
  const std::size_t ngrid = static_cast<std::size_t>(nx + 1) * (ny + 1);
  std::vector<int> number(ngrid, 0);
  int nnodes = 0;
  for (int j = 0; j <= ny; ++j)
    for (int i = 0; i <= nx; ++i)
      if (cell(i - 1, j - 1) || cell(i, j - 1) || cell(i - 1, j) || cell(i, j))
        number[static_cast<std::size_t>(i) + static_cast<std::size_t>(j) * (nx + 1)] = ++nnodes;
  if (nnodes == 0) FatalError("GenerateRectangleMesh: the holes leave no cell");

  AllocateNodes(mesh.nodes, nnodes);
  const double jitter = std::clamp(s.jitter, 0.0, 0.2);
  for (int j = 0; j <= ny; ++j) {
    for (int i = 0; i <= nx; ++i) {
      const std::size_t g = static_cast<std::size_t>(i) + static_cast<std::size_t>(j) * (nx + 1);
      if (number[g] == 0) continue;
      int code = 0;
      auto add_code = [&code](int c) { code = code == 0 ? c : std::min(code, c); };
      if (i == 0) add_code(s.code_west);
      if (i == nx) add_code(s.code_east);
      if (j == 0) add_code(s.code_south);
      if (j == ny) add_code(s.code_north);
      // A hole rim node touches a hole cell (cells outside the rectangle do
      // not count).
      int inside = 0, around = 0;
      for (int dj = -1; dj <= 0; ++dj)
        for (int di = -1; di <= 0; ++di) {
          const int ci = i + di, cj = j + dj;
          if (ci < 0 || ci >= nx || cj < 0 || cj >= ny) continue;
          ++inside;
          around += cell(ci, cj);
        }
      if (around < inside) add_code(s.code_holes);
      double x = s.x0 + i * hx, y = s.y0 + j * hy;
      if (jitter > 0 && code == 0) {
        x += (2 * Uniform(s.seed, 1, g) - 1) * jitter * hx;
        y += (2 * Uniform(s.seed, 2, g) - 1) * jitter * hy;
      }
      const double z = s.bed ? s.bed(x, y) : 0.0;
      AddNode(mesh.nodes, number[g], x, y, z, code);
    }
  }

  // Elements, cell by cell.
  const long long ncells = std::count(active.begin(), active.end(), 1);
  const bool quads = s.layout == CellLayout::kQuadrilaterals;
  const long long nelem_max = quads ? ncells : 2 * ncells;
  AllocateElementsBasic(mesh.elements, static_cast<int>(nelem_max),
                        static_cast<int>(quads ? 4 * ncells : 6 * ncells));
  int ne = 0;
  for (int j = 0; j < ny; ++j) {
    for (int i = 0; i < nx; ++i) {
      if (!cell(i, j)) continue;
      const std::size_t c = static_cast<std::size_t>(i) + static_cast<std::size_t>(j) * nx;
      const std::size_t g = static_cast<std::size_t>(i) + static_cast<std::size_t>(j) * (nx + 1);
      const int a = number[g], b = number[g + 1], cc = number[g + 1 + nx + 1], d = number[g + nx + 1];
      bool quad = quads;
      if (s.layout == CellLayout::kMixed) quad = Uniform(s.seed, 3, c) < s.quad_fraction;
      if (quad) {
        const int q[4] = {a, b, cc, d};
        AddElement(mesh.elements, ++ne, 25, 4, q);
        continue;
      }
      const bool other_diagonal = s.layout != CellLayout::kRightTriangles && Uniform(s.seed, 4, c) < 0.5;
      if (other_diagonal) {
        const int t1[3] = {a, b, d}, t2[3] = {b, cc, d};
        AddElement(mesh.elements, ++ne, 21, 3, t1);
        AddElement(mesh.elements, ++ne, 21, 3, t2);
      } else {
        const int t1[3] = {a, b, cc}, t2[3] = {a, cc, d};
        AddElement(mesh.elements, ++ne, 21, 3, t1);
        AddElement(mesh.elements, ++ne, 21, 3, t2);
      }
    }
  }
}

}  // namespace vhd
