// Element, node and face order of a mesh for memory locality.

#include "mesh/reorder.hpp"

#include <algorithm>
#include <limits>
#include <new>
#include <numeric>

#include "log/log.hpp"

namespace vhd {

namespace {

struct Centre {
  double x = 0, y = 0;
};

// Mean of the node coordinates of every element (no faces needed).
std::vector<Centre> ElementCentres(const Mesh& mesh) {
  const ElementTable& el = mesh.elements;
  const NodeTable& nd = mesh.nodes;
  std::vector<Centre> c(static_cast<std::size_t>(el.nelements) + 1);
  for (int e = 1; e <= el.nelements; ++e) {
    const int n = ElementNodeCount(el, e);
    double sx = 0, sy = 0;
    for (int j = 1; j <= n; ++j) {
      sx += nd.x[ElementNode(el, e, j)];
      sy += nd.y[ElementNode(el, e, j)];
    }
    if (n > 0) c[static_cast<std::size_t>(e)] = {sx / n, sy / n};
  }
  return c;
}

// Strict order of two elements by their centres, the tie-break of both orders.
struct ByCentre {
  const std::vector<Centre>* c;
  bool operator()(int a, int b) const {
    const Centre& p = (*c)[static_cast<std::size_t>(a)];
    const Centre& q = (*c)[static_cast<std::size_t>(b)];
    if (p.x != q.x) return p.x < q.x;
    if (p.y != q.y) return p.y < q.y;
    return a < b;  // coinciding centres: only in a broken mesh
  }
};

std::vector<int> HilbertOrder(const Mesh& mesh, int first, int last) {
  const std::vector<Centre> c = ElementCentres(mesh);
  double x0 = std::numeric_limits<double>::max(), y0 = x0;
  double x1 = std::numeric_limits<double>::lowest(), y1 = x1;
  for (int e = first; e <= last; ++e) {
    const Centre& p = c[static_cast<std::size_t>(e)];
    x0 = std::min(x0, p.x);
    x1 = std::max(x1, p.x);
    y0 = std::min(y0, p.y);
    y1 = std::max(y1, p.y);
  }
  // One scale for both axes keeps the curve's cells square.
  const double span = std::max(x1 - x0, y1 - y0);
  const double scale = span > 0 ? 65535.0 / span : 0.0;
  struct Keyed {
    unsigned key;
    int e;
  };
  std::vector<Keyed> k;
  k.reserve(static_cast<std::size_t>(last - first + 1));
  for (int e = first; e <= last; ++e) {
    const Centre& p = c[static_cast<std::size_t>(e)];
    const auto ix = static_cast<unsigned>((p.x - x0) * scale);
    const auto iy = static_cast<unsigned>((p.y - y0) * scale);
    k.push_back({HilbertIndex(ix, iy), e});
  }
  const ByCentre by_centre{&c};
  std::sort(k.begin(), k.end(), [&](const Keyed& a, const Keyed& b) {
    return a.key != b.key ? a.key < b.key : by_centre(a.e, b.e);
  });
  std::vector<int> order(k.size());
  for (std::size_t i = 0; i < k.size(); ++i) order[i] = k[i].e;
  return order;
}

// Neighbours through an edge (two consecutive corner nodes) among the
// elements first .. last, in compressed rows over those elements.
void EdgeGraph(const Mesh& mesh, int first, int last, std::vector<int>& start, std::vector<int>& list) {
  const ElementTable& el = mesh.elements;
  Array1<int> nstart, nlist;
  NodeElementTable_CRS(el, mesh.nodes.nnodes, nstart, nlist);
  const int count = last - first + 1;
  start.assign(static_cast<std::size_t>(count) + 1, 0);
  list.clear();
  list.reserve(static_cast<std::size_t>(count) * 4);
  for (int e = first; e <= last; ++e) {
    const int n = ElementNodeCount(el, e);
    for (int j = 1; j <= n; ++j) {
      const int a = ElementNode(el, e, j), b = ElementNode(el, e, j % n + 1);
      for (int q = nstart[a]; q < nstart[a + 1]; ++q) {
        const int c = nlist[q];
        if (c == e || c < first || c > last) continue;
        bool has_b = false;
        for (int i = 1; i <= ElementNodeCount(el, c) && !has_b; ++i) has_b = ElementNode(el, c, i) == b;
        if (has_b && std::find(list.begin() + start[static_cast<std::size_t>(e - first)], list.end(), c) == list.end())
          list.push_back(c);
      }
    }
    start[static_cast<std::size_t>(e - first) + 1] = static_cast<int>(list.size());
  }
}

std::vector<int> CuthillMcKeeOrder(const Mesh& mesh, int first, int last) {
  const std::vector<Centre> c = ElementCentres(mesh);
  const ByCentre by_centre{&c};
  std::vector<int> start, list;
  EdgeGraph(mesh, first, last, start, list);
  auto at = [&](int e) { return static_cast<std::size_t>(e - first); };
  auto degree = [&](int e) { return start[at(e) + 1] - start[at(e)]; };
  auto lower = [&](int a, int b) { return degree(a) != degree(b) ? degree(a) < degree(b) : by_centre(a, b); };

  const int count = last - first + 1;
  std::vector<int> order;
  order.reserve(static_cast<std::size_t>(count));
  std::vector<int> level(static_cast<std::size_t>(count), -1);
  std::vector<int> seeds(static_cast<std::size_t>(count));
  std::iota(seeds.begin(), seeds.end(), first);
  std::sort(seeds.begin(), seeds.end(), by_centre);
  std::vector<int> queue, nb;
  queue.reserve(static_cast<std::size_t>(count));
  // Breadth-first levels from e over its component; returns the last level's
  // element of lowest degree.
  auto sweep = [&](int e, std::vector<int>& visited) {
    visited.clear();
    visited.push_back(e);
    level[at(e)] = 0;
    int deepest = e;
    for (std::size_t i = 0; i < visited.size(); ++i) {
      const int u = visited[i];
      nb.assign(list.begin() + start[at(u)], list.begin() + start[at(u) + 1]);
      std::sort(nb.begin(), nb.end(), lower);
      for (int v : nb) {
        if (level[at(v)] >= 0) continue;
        level[at(v)] = level[at(u)] + 1;
        visited.push_back(v);
        if (level[at(v)] > level[at(deepest)] || (level[at(v)] == level[at(deepest)] && lower(v, deepest)))
          deepest = v;
      }
    }
    return deepest;
  };
  for (int seed : seeds) {
    if (level[at(seed)] >= 0) continue;
    // A pseudo-peripheral start: two sweeps from the component's seed.
    int s = seed;
    for (int pass = 0; pass < 2; ++pass) {
      s = sweep(s, queue);
      for (int u : queue) level[at(u)] = -1;
    }
    // Each component in reversed breadth-first order, the components in the
    // order of their seeds.
    sweep(s, queue);
    order.insert(order.end(), queue.rbegin(), queue.rend());
  }
  return order;
}

}  // namespace

unsigned HilbertIndex(unsigned x, unsigned y) {
  unsigned d = 0;
  for (unsigned s = 1u << 15; s > 0; s >>= 1) {
    const unsigned rx = (x & s) ? 1u : 0u;
    const unsigned ry = (y & s) ? 1u : 0u;
    d += s * s * ((3u * rx) ^ ry);
    if (ry == 0) {  // rotate the quadrant
      if (rx == 1) {
        x = s - 1 - (x & (s - 1));
        y = s - 1 - (y & (s - 1));
      }
      std::swap(x, y);
    }
    x &= s - 1;
    y &= s - 1;
  }
  return d;
}

std::vector<int> ElementOrder(const Mesh& mesh, int type_of_reordering, int first, int last) {
  if (type_of_reordering != kReorderNone && type_of_reordering != kReorderHilbert &&
      type_of_reordering != kReorderCuthillMcKee)
    FatalError("Illegal type of reordering: type_of_reordering " + std::to_string(type_of_reordering) +
               " (0 none, 1 Hilbert curve, 2 reverse Cuthill-McKee)");
  try {
    if (last < first) return {};
    if (type_of_reordering == kReorderHilbert) return HilbertOrder(mesh, first, last);
    if (type_of_reordering == kReorderCuthillMcKee) return CuthillMcKeeOrder(mesh, first, last);
    std::vector<int> order(static_cast<std::size_t>(last - first + 1));
    std::iota(order.begin(), order.end(), first);
    return order;
  } catch (const std::bad_alloc&) {
    FatalError("ReorderElementList: Out of memory");
  }
  return {};
}

void ReorderMesh(Mesh& mesh, const std::vector<int>& order) {
  ElementTable& el = mesh.elements;
  NodeTable& nd = mesh.nodes;
  const int ne = el.nelements, nn = nd.nnodes;
  if (static_cast<int>(order.size()) != ne) FatalError("ReorderMesh: the order does not list every element");
  try {
    // Nodes in the order of first use.
    Array1<int> new_node(nn, 0);
    std::vector<int> old_node;
    old_node.reserve(static_cast<std::size_t>(nn));
    for (int e : order)
      for (int j = 1; j <= ElementNodeCount(el, e); ++j) {
        const int n = ElementNode(el, e, j);
        if (new_node[n] == 0) {
          old_node.push_back(n);
          new_node[n] = static_cast<int>(old_node.size());
        }
      }
    for (int n = 1; n <= nn; ++n)
      if (new_node[n] == 0) {
        old_node.push_back(n);
        new_node[n] = static_cast<int>(old_node.size());
      }

    NodeTable nodes = nd;
    for (int k = 1; k <= nn; ++k) {
      const int n = old_node[static_cast<std::size_t>(k - 1)];
      nodes.id[k] = nd.id[n];
      nodes.code[k] = nd.code[n];
      nodes.x[k] = nd.x[n];
      nodes.y[k] = nd.y[n];
      nodes.z[k] = nd.z[n];
      nodes.value[k] = nd.value[n];
    }
    nodes.file_index.assign(nn);
    for (int k = 1; k <= nn; ++k) nodes.file_index[k] = FileIndex(nd.file_index, old_node[static_cast<std::size_t>(k - 1)]);
    nd = std::move(nodes);

    ElementTable elements = el;
    elements.file_index.assign(ne);
    if (!el.run_order.empty()) elements.run_order.assign(ne);
    int pos = 1;
    for (int k = 1; k <= ne; ++k) {
      const int e = order[static_cast<std::size_t>(k - 1)];
      elements.id[k] = el.id[e];
      elements.type[k] = el.type[e];
      elements.shape[k] = el.shape[e];
      elements.file_index[k] = FileIndex(el.file_index, e);
      if (!el.run_order.empty()) elements.run_order[k] = el.run_order[e];
      elements.node_start[k] = pos;
      for (int j = 1; j <= ElementNodeCount(el, e); ++j) elements.node_list[pos++] = new_node[ElementNode(el, e, j)];
    }
    elements.node_start[ne + 1] = pos;
    el = std::move(elements);
  } catch (const std::bad_alloc&) {
    FatalError("ReorderMesh: Out of memory");
  }
}

Array1<int> FileOrder(const Array1<int>& file_index, int count) {
  Array1<int> position(count, 0);
  for (int i = 1; i <= count; ++i) position[FileIndex(file_index, i)] = i;
  return position;
}

}  // namespace vhd
