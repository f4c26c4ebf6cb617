#pragma once
// Helpers of the data-file tests.

#include <string>
#include <vector>

#include "io/units.hpp"

#include "io/zrn.hpp"

namespace vhd::test {

// A mesh from node coordinates (shifted by x0, y0) and 1-based element node
// lists (three nodes: triangle, four: quadrilateral); bed levels, ids and
// codes differ from node to node so that a mix-up shows.
inline ZrnMeshData MakeZrnMesh(const std::vector<double>& xs, const std::vector<double>& ys, double x0, double y0,
                               const std::vector<std::vector<int>>& elements) {
  ZrnMeshData m;
  const int nnodes = static_cast<int>(xs.size()), nelements = static_cast<int>(elements.size());
  m.x.assign(nnodes);
  m.y.assign(nnodes);
  m.z.assign(nnodes);
  m.node_id.assign(nnodes);
  m.node_code.assign(nnodes);
  for (int i = 1; i <= nnodes; ++i) {
    m.x[i] = x0 + xs[static_cast<std::size_t>(i - 1)];
    m.y[i] = y0 + ys[static_cast<std::size_t>(i - 1)];
    m.z[i] = -1.0 - 0.5 * i;
    m.node_id[i] = 10 + i;
    m.node_code[i] = i % 2;
  }
  m.element_id.assign(nelements);
  m.element_type.assign(nelements);
  m.node_start.assign(nelements + 1);
  m.node_start[1] = 1;
  std::vector<int> list;
  for (int e = 1; e <= nelements; ++e) {
    const auto& nodes = elements[static_cast<std::size_t>(e - 1)];
    m.element_id[e] = 100 + e;
    m.element_type[e] = nodes.size() == 3 ? 21 : 25;
    m.node_start[e + 1] = m.node_start[e] + static_cast<int>(nodes.size());
    list.insert(list.end(), nodes.begin(), nodes.end());
  }
  m.node_list.assign(static_cast<int>(list.size()));
  for (int j = 1; j <= m.node_list.size(); ++j) m.node_list[j] = list[static_cast<std::size_t>(j - 1)];
  return m;
}

// A created .zrn0 of `nitems` point items on a one-minute calendar axis,
// flushed after every step.
inline ZrnFile StartSeries(const std::string& name, int nitems, int precision = kZrnFloat) {
  ZrnFile w;
  zrnHeaderCreate(w, name, kZrnFileData, "series");
  zrnSetEqCalendarAxis(w, ZrnDateTime{2004, 1, 1, 0, 0, 0}, 60.0);
  for (int k = 1; k <= nitems; ++k) {
    zrnSetItemInfo(w, k, std::string("Item ").append(std::to_string(k)), kUvqIWaterLevel, kUvqUmeter, precision);
    zrnSetItemAxisEqD0(w, k);
  }
  zrnFileCreate(w, true);
  return w;
}

}  // namespace vhd::test
