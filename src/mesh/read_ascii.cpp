// The ASCII mesh format (.mesh): reader and writer.

#include <cstdio>
#include <limits>
#include <memory>
#include <set>
#include <vector>

#include <fmt/format.h>

#include "io/units.hpp"
#include "log/log.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh/read_text.hpp"

namespace vhd {

namespace {

constexpr int kMaxNodesPerElement = 9;

// The header line in its three forms: item code, unit code, nnodes,
// projection | nnodes, projection | nnodes. The projection is the rest of the
// line after the numeric fields (separators and surrounding blanks removed,
// one pair of enclosing quotes dropped); it may hold blanks.
struct AsciiHeader {
  int item_code = kUvqIBathymetry;
  int unit_code = kUvqUmeter;
  int nnodes = 0;
  std::string projection;
};

bool ParseHeader(std::string_view line, AsciiHeader& h) {
  auto sep = [](char c) { return c == ' ' || c == '\t' || c == ',' || c == '\r'; };
  // Leading integer fields with the position where each ends.
  std::vector<int> ints;
  std::size_t pos = 0, after = 0;
  while (ints.size() < 3) {
    std::size_t i = pos;
    while (i < line.size() && sep(line[i])) ++i;
    std::size_t j = i;
    while (j < line.size() && !sep(line[j])) ++j;
    int v = 0;
    if (j == i || !ParseInt(line.substr(i, j - i), v)) break;
    ints.push_back(v);
    pos = j;
    if (ints.size() == 1) after = j;
  }
  if (ints.empty()) return false;
  std::size_t rest_at = after;
  if (ints.size() == 3) {
    h.item_code = ints[0];
    h.unit_code = ints[1];
    h.nnodes = ints[2];
    rest_at = pos;
  } else {
    h.nnodes = ints[0];
  }
  std::size_t i = rest_at;
  while (i < line.size() && sep(line[i])) ++i;
  std::string_view rest = TrimBlanks(line.substr(i));
  if (rest.size() >= 2 && (rest.front() == '"' || rest.front() == '\'') && rest.back() == rest.front())
    rest = TrimBlanks(rest.substr(1, rest.size() - 2));
  h.projection = std::string(rest);
  return true;
}

}  // namespace

void ReadMeshBasicAscii(Mesh& mesh, const std::string& file_name) {
  const char* routine = "ReadMeshBasicAscii";
  TextFile in(routine, file_name);
  ReleaseMesh(mesh);

  in.Require("header line expected");
  AsciiHeader h;
  if (!ParseHeader(in.line(), h)) in.Fail("Header line must begin with the number of nodes");
  if (h.nnodes < 1) in.Fail("Number of nodes must be at least 1, found " + std::to_string(h.nnodes));
  in.CheckCount("nodes", h.nnodes, 5);
  double probe = 1.0;
  if (h.unit_code != kUvqUmeter && uvqConvertUnit(h.unit_code, kUvqUmeter, probe) != 0)
    in.Fail("Unit code " + std::to_string(h.unit_code) + " is not a unit of length");
  mesh.unit_code = h.unit_code;
  mesh.projection = h.projection;

  AllocateNodes(mesh.nodes, h.nnodes);
  for (int n = 1; n <= h.nnodes; ++n) {
    in.Require("node " + std::to_string(n) + " of " + std::to_string(h.nnodes) + " expected");
    int id = 0, code = 0;
    double xyz[3];
    in.Ints("Node line must hold id, x, y, z, code", 0, 1, &id);
    in.Doubles("Node line must hold id, x, y, z, code", 1, 3, xyz);
    in.Ints("Node line must hold id, x, y, z, code", 4, 1, &code);
    double z = xyz[2];
    if (h.unit_code != kUvqUmeter) uvqConvertUnit(h.unit_code, kUvqUmeter, z);
    AddNode(mesh.nodes, id, xyz[0], xyz[1], z, code);
  }

  in.Require("element header (nelements, max_nodes_per_element, element_type) expected");
  int eh[3];
  in.Ints("Element header must hold nelements, max_nodes_per_element, element_type", 0, 3, eh);
  const int nelements = eh[0], max_nodes = eh[1], type = eh[2];
  if (nelements < 1) in.Fail("Number of elements must be at least 1, found " + std::to_string(nelements));
  if (ElementTypeNodeCount(type) == 0) in.Fail("Unknown element type " + std::to_string(type));
  if (max_nodes < ElementTypeNodeCount(type) || max_nodes > kMaxNodesPerElement)
    in.Fail("Element type " + std::to_string(type) + " does not fit " + std::to_string(max_nodes) +
            " nodes per element");
  in.CheckCount("elements", nelements, max_nodes + 1);
  const long long nindexes = static_cast<long long>(nelements) * max_nodes;
  if (nindexes > std::numeric_limits<int>::max()) in.Fail("Too many element nodes");

  AllocateElementsBasic(mesh.elements, nelements, static_cast<int>(nindexes));
  std::vector<int> row(static_cast<std::size_t>(max_nodes) + 1);
  std::vector<int> nodes(static_cast<std::size_t>(max_nodes));
  for (int e = 1; e <= nelements; ++e) {
    in.Require("element " + std::to_string(e) + " of " + std::to_string(nelements) + " expected");
    in.Ints("Element line must hold id and " + std::to_string(max_nodes) + " node numbers", 0, max_nodes + 1,
            row.data());
    int positive = 0;
    for (int j = 1; j <= max_nodes; ++j) {
      if (row[j] < 0 || row[j] > h.nnodes)
        in.Fail("Node number " + std::to_string(row[j]) + " out of range 0 to " + std::to_string(h.nnodes));
      if (row[j] > 0) nodes[static_cast<std::size_t>(positive++)] = row[j];
    }
    int etype = positive == 3 && max_nodes > 3 ? 21 : type;
    if (positive != ElementTypeNodeCount(etype))
      in.Fail("Element with " + std::to_string(positive) + " nodes does not fit element type " +
              std::to_string(etype));
    const int n = CollapseRepeatedLastNode(etype, positive, nodes.data());
    AddElement(mesh.elements, row[0], etype, n, nodes.data());
  }
  mesh.ndim = 2;
}

void WriteMeshAscii(const Mesh& mesh, const std::string& file_name) {
  const char* routine = "WriteMeshAscii";
  const NodeTable& nd = mesh.nodes;
  const ElementTable& el = mesh.elements;
  if (nd.nnodes < 1 || el.nelements < 1) FileError(routine, file_name, "Mesh without nodes or elements");

  // One element type for the file; triangles may stand in a quadrilateral file.
  std::set<int> types;
  int max_nodes = 0;
  for (int e = 1; e <= el.nelements; ++e) {
    types.insert(el.type[e]);
    max_nodes = std::max(max_nodes, ElementTypeNodeCount(el.type[e]));
  }
  int type = *types.rbegin();
  if (types.size() == 2 && types.count(21) && types.count(25)) {
    type = 25;
  } else if (types.size() != 1) {
    FileError(routine, file_name, "Mixed element types cannot be written to an ASCII mesh file");
  }

  std::unique_ptr<std::FILE, int (*)(std::FILE*)> f(std::fopen(file_name.c_str(), "w"), &std::fclose);
  if (!f) FileError(routine, file_name, "Unable to create file");
  fmt::memory_buffer out;
  auto drain = [&](bool always) {
    if (always || out.size() > (1 << 20)) {
      std::fwrite(out.data(), 1, out.size(), f.get());
      out.clear();
    }
  };
  const int item = kUvqIBathymetry;
  fmt::format_to(std::back_inserter(out), "{} {} {} {}\n", item, mesh.unit_code, nd.nnodes, mesh.projection);
  for (int n = 1; n <= nd.nnodes; ++n) {
    double z = nd.z[n];
    if (mesh.unit_code != kUvqUmeter) uvqConvertUnit(kUvqUmeter, mesh.unit_code, z);
    fmt::format_to(std::back_inserter(out), "{} {} {} {} {}\n", nd.id[n], nd.x[n], nd.y[n], z, nd.code[n]);
    drain(false);
  }
  fmt::format_to(std::back_inserter(out), "{} {} {}\n", el.nelements, max_nodes, type);
  for (int e = 1; e <= el.nelements; ++e) {
    fmt::format_to(std::back_inserter(out), "{}", el.id[e]);
    const int n = ElementNodeCount(el, e);
    for (int j = 1; j <= max_nodes; ++j) fmt::format_to(std::back_inserter(out), " {}", j <= n ? ElementNode(el, e, j) : 0);
    out.push_back('\n');
    drain(false);
  }
  drain(true);
  if (std::fflush(f.get()) != 0 || std::ferror(f.get())) FileError(routine, file_name, "Unable to write file");
}

}  // namespace vhd
