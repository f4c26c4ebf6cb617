// Readers of public text mesh formats: SMS 2DM, ADCIRC grid (.14), the fem
// keyword file, the geo geometry file, QUODDY (.nod/.ele/.bat) and
// node/topology files (.node with .topo or .ele). Layouts: read_mesh.hpp.

#include <cctype>
#include <filesystem>
#include <vector>

#include "io/units.hpp"
#include "log/log.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh/read_text.hpp"

namespace vhd {

namespace {

// Keyword cards shared by the 2dm, fem and geo readers.
struct KeywordCards {
  std::string projection;
  int unit_xy = kUvqUmeter;
  int unit_z = kUvqUmeter;
  int element_attribute = -1;  // 2dm: material id of dry elements (-1 none)

  // True when the current line is a card (it is then stored).
  bool Take(const TextFile& in) {
    const auto f = in.Fields();
    if (f.empty()) return false;
    const std::string key = LowerCase(f[0]);
    if (key == "coordinate_type") {
      std::string_view line = in.line();
      projection = std::string(TrimBlanks(line.substr(line.find(f[0]) + f[0].size())));
      return true;
    }
    int* target = key == "uvq_unit_xy" ? &unit_xy
                  : key == "uvq_unit_z" ? &unit_z
                  : key == "element_attribute" ? &element_attribute
                                               : nullptr;
    if (!target) return false;
    in.Ints("Keyword " + std::string(f[0]) + " needs an integer", 1, 1, target);
    if (target != &element_attribute) {
      double probe = 1.0;
      const bool length = *target == kUvqUmeter || uvqConvertUnit(*target, kUvqUmeter, probe) == 0;
      if (!length && !(target == &unit_xy && *target == kUvqUdegree))
        in.Fail("Unit " + std::to_string(*target) + " is not a unit of length");
    }
    return true;
  }
  void ToMetres(double& x, double& y, double& z) const {
    if (unit_xy != kUvqUmeter && unit_xy != kUvqUdegree) {
      uvqConvertUnit(unit_xy, kUvqUmeter, x);
      uvqConvertUnit(unit_xy, kUvqUmeter, y);
    }
    if (unit_z != kUvqUmeter) uvqConvertUnit(unit_z, kUvqUmeter, z);
  }
};

int TriangleOrQuad(int n) { return n == 3 ? 21 : 25; }

}  // namespace

// ---- SMS 2DM ------------------------------------------------------------------------------

void ReadMeshBasic2dm(Mesh& mesh, const std::string& file_name) {
  const char* routine = "ReadMeshBasic2dm";
  TextFile in(routine, file_name);
  MeshBuilder b(routine, file_name);
  KeywordCards cards;
  struct Element {
    int n, material, line;
    int nodes[4];
  };
  std::vector<Element> elements;
  std::vector<int> string_nodes;
  std::vector<int> string_lines;
  int nstrings = 0;
  bool header = false;
  auto end_string = [&]() {
    ++nstrings;
    for (std::size_t k = 0; k + 1 < string_nodes.size(); ++k)
      b.AddBoundarySegment(string_nodes[k], string_nodes[k + 1], nstrings + 1, string_lines[k]);
    string_nodes.clear();
    string_lines.clear();
  };
  while (in.NextNonBlank()) {
    const auto f = in.Fields();
    const std::string card(f[0]);
    if (card == "MESH2D") {
      header = true;
    } else if (card == "ND") {
      int id = 0;
      double xyz[3];
      in.Ints("ND card must hold id, x, y, z", 1, 1, &id);
      in.Doubles("ND card must hold id, x, y, z", 2, 3, xyz);
      cards.ToMetres(xyz[0], xyz[1], xyz[2]);
      b.AddNode(id, xyz[0], xyz[1], xyz[2]);
    } else if (card == "E3T" || card == "E4Q") {
      Element e{card == "E3T" ? 3 : 4, 0, in.number(), {0, 0, 0, 0}};
      int id = 0;
      in.Ints(card + " card must hold id and node numbers", 1, 1, &id);
      in.Ints(card + " card must hold id and node numbers", 2, e.n, e.nodes);
      if (f.size() > static_cast<std::size_t>(2 + e.n)) in.Ints(card + " material id", 2 + e.n, 1, &e.material);
      elements.push_back(e);
    } else if (card == "NS") {
      for (std::size_t k = 1; k < f.size(); ++k) {
        int id = 0;
        if (!ParseInt(f[k], id)) break;  // a trailing node string name
        string_nodes.push_back(std::abs(id));
        string_lines.push_back(in.number());
        if (id < 0) {
          end_string();
          break;
        }
      }
    } else if (card.size() > 2 && card[0] == 'E' && std::isdigit(static_cast<unsigned char>(card[1]))) {
      in.Fail("Element card " + card + " not supported (only E3T and E4Q)");
    } else {
      cards.Take(in);  // MESHNAME, BEGPARAMDEF and other cards carry nothing for the mesh
    }
  }
  if (!header) FileError(routine, file_name, "No MESH2D card: not a 2DM mesh");
  if (!string_nodes.empty()) end_string();
  int dry = 0;
  for (const Element& e : elements) {
    if (cards.element_attribute >= 0 && e.material == cards.element_attribute) {
      ++dry;
      continue;
    }
    b.AddElement(TriangleOrQuad(e.n), e.nodes, e.n, e.line);
  }
  if (dry > 0) b.DropUnusedNodes();
  WriteValueLine("Number of dry elements     : %", dry);
  b.Build(mesh, cards.projection);
}

// ---- ADCIRC ------------------------------------------------------------------------------

void ReadMeshBasicADCIRC(Mesh& mesh, const std::string& file_name) {
  const char* routine = "ReadMeshBasicADCIRC";
  TextFile in(routine, file_name);
  MeshBuilder b(routine, file_name);
  in.Require("title line expected");
  in.Require("NE NP line expected");
  int count[2];
  in.Ints("Second line must hold the numbers of elements and nodes", 0, 2, count);
  const int ne = count[0], np = count[1];
  if (ne < 1 || np < 1) in.Fail("Numbers of elements and nodes must be at least 1");
  in.CheckCount("nodes", np, 4);
  in.CheckCount("elements", ne, 5);
  b.Reserve(np, ne, 3);
  for (int n = 0; n < np; ++n) {
    in.Require("node line expected");
    int id = 0;
    double xyd[3];
    in.Ints("Node line must hold id, x, y, depth", 0, 1, &id);
    in.Doubles("Node line must hold id, x, y, depth", 1, 3, xyd);
    b.AddNode(id, xyd[0], xyd[1], -xyd[2]);
  }
  for (int e = 0; e < ne; ++e) {
    in.Require("element line expected");
    int head[2], nodes[3];
    in.Ints("Element line must hold id, number of nodes and the nodes", 0, 2, head);
    if (head[1] != 3) FatalError("ReadMeshBasicADCIRC: Element type not supported");
    in.Ints("Element line must hold id, 3 and three nodes", 2, 3, nodes);
    b.AddElement(21, nodes, 3, in.number());
  }
  // Boundary tables (optional): open boundaries get codes 2, 3, ...; land 1.
  auto read_segments = [&](bool open) {
    if (!in.NextNonBlank()) return;
    int nseg = 0, total = 0;
    in.Ints("Number of boundary segments expected", 0, 1, &nseg);
    in.Require("total number of boundary nodes expected");
    in.Ints("Total number of boundary nodes expected", 0, 1, &total);
    for (int s = 0; s < nseg; ++s) {
      in.Require("boundary segment header expected");
      int n = 0;
      in.Ints("Boundary segment header must hold its number of nodes", 0, 1, &n);
      int previous = 0;
      for (int k = 0; k < n; ++k) {
        in.Require("boundary node expected");
        int node = 0;
        in.Ints("Boundary node expected", 0, 1, &node);
        if (k > 0) b.AddBoundarySegment(previous, node, open ? s + 2 : 1, in.number());
        previous = node;
      }
    }
  };
  read_segments(true);
  read_segments(false);
  b.Build(mesh, "");
}

// ---- fem keyword file -------------------------------------------------------------------------

void ReadMeshBasicFem(Mesh& mesh, const std::string& file_name) {
  const char* routine = "ReadMeshBasicFem";
  TextFile in(routine, file_name);
  KeywordCards cards;
  int nn = 0, ne = 0, nbn = 0;
  std::vector<int> elements;
  std::vector<double> coords;
  std::vector<double> z;
  std::vector<int> element_lines;
  bool more = in.NextNonBlank();
  while (more) {
    const std::string block = std::string(TrimBlanks(in.line()));
    if (block == "DIMENS") {
      in.Require("DIMENS values expected");
      int d[3];
      in.Ints("DIMENS must hold nodes, elements, nodes per element", 0, 3, d);
      nn = d[0];
      ne = d[1];
      nbn = d[2];
      if (nn < 1 || ne < 1 || (nbn != 3 && nbn != 4)) in.Fail("DIMENS values not supported");
      in.CheckCount("nodes", nn, 2);
      in.CheckCount("elements", ne, nbn);
      z.assign(static_cast<std::size_t>(nn), 0.0);
      more = in.NextNonBlank();
    } else if (block == "NODE") {
      if (nbn == 0) in.Fail("NODE block before DIMENS");
      for (int e = 0; e < ne; ++e) {
        in.Require("element row expected");
        std::vector<int> row(static_cast<std::size_t>(nbn));
        in.Ints("Element row must hold " + std::to_string(nbn) + " node numbers", 0, nbn, row.data());
        elements.insert(elements.end(), row.begin(), row.end());
        element_lines.push_back(in.number());
      }
      more = in.NextNonBlank();
    } else if (block == "COOR") {
      if (nn == 0) in.Fail("COOR block before DIMENS");
      while (coords.size() < 2u * nn) {
        in.Require("coordinates expected");
        for (auto f : in.Fields()) {
          double v = 0;
          if (!ParseDouble(f, v)) in.Fail("Coordinate expected, found " + std::string(f));
          coords.push_back(v);
        }
      }
      if (coords.size() != 2u * nn) in.Fail("COOR block holds more values than 2 x nodes");
      more = in.NextNonBlank();
    } else if (block == "ELEV_I") {
      if (nn == 0) in.Fail("ELEV_I block before DIMENS");
      // Lines "value node-list"; a list item is a node or a range "a-b".
      while ((more = in.NextNonBlank())) {
        const auto f = in.Fields();
        double v = 0;
        if (!ParseDouble(f[0], v) || f.size() < 2) break;
        for (std::size_t k = 1; k < f.size(); ++k) {
          int a = 0, c = 0;
          const std::size_t dash = f[k].find('-', 1);
          const bool range = dash != std::string_view::npos;
          if (!ParseInt(range ? f[k].substr(0, dash) : f[k], a) || (range && !ParseInt(f[k].substr(dash + 1), c)))
            in.Fail("Node list expected, found " + std::string(f[k]));
          if (!range) c = a;
          if (a < 1 || c > nn || a > c) in.Fail("Node range " + std::string(f[k]) + " outside 1 to " + std::to_string(nn));
          for (int n = a; n <= c; ++n) z[static_cast<std::size_t>(n - 1)] = v;
        }
      }
    } else {
      cards.Take(in);  // other blocks and cards carry nothing for the mesh
      more = in.NextNonBlank();
    }
  }
  if (nn == 0 || elements.empty() || coords.size() != 2u * nn)
    FileError(routine, file_name, "DIMENS, NODE and COOR blocks are all needed");
  MeshBuilder b(routine, file_name);
  b.Reserve(nn, ne, nbn);
  for (int n = 0; n < nn; ++n) {
    double x = coords[n], y = coords[nn + n], zz = z[n];
    cards.ToMetres(x, y, zz);
    b.AddNode(n + 1, x, y, zz);
  }
  for (int e = 0; e < ne; ++e) {
    const int* row = elements.data() + static_cast<std::size_t>(e) * nbn;
    const int n = nbn == 4 && row[3] == 0 ? 3 : nbn;
    b.AddElement(TriangleOrQuad(n), row, n, element_lines[e]);
  }
  b.Build(mesh, cards.projection);
}

// ---- geo geometry file -------------------------------------------------------------------------

void ReadMeshBasicGeo(Mesh& mesh, const std::string& file_name) {
  const char* routine = "ReadMeshBasicGeo";
  TextFile in(routine, file_name);
  MeshBuilder b(routine, file_name);
  KeywordCards cards;
  int nvertices = 0;
  while (in.NextNonBlank()) {
    const auto f = in.Fields();
    // The fields view the current line: the keyword is copied before the
    // next line is read.
    const std::string word(f[0]);
    const std::string key = LowerCase(word);
    if (key == "end") break;
    if (key == "vertices" || key == "triangles" || key == "quadrilaterals") {
      int n = 0;
      if (f.size() > 1) {
        in.Ints(word + " needs a count", 1, 1, &n);
      } else {
        in.Require(word + " count expected");
        in.Ints(word + " needs a count", 0, 1, &n);
      }
      if (n < 0) in.Fail("Negative count");
      for (int k = 0; k < n; ++k) {
        in.Require(word + " line expected");
        if (key == "vertices") {
          double xyz[3];
          int code = 0;
          in.Doubles("Vertex line must hold x, y, z, code", 0, 3, xyz);
          in.Ints("Vertex line must hold x, y, z, code", 3, 1, &code);
          cards.ToMetres(xyz[0], xyz[1], xyz[2]);
          b.AddNode(++nvertices, xyz[0], xyz[1], xyz[2], code);
        } else {
          const int nv = key == "triangles" ? 3 : 4;
          int nodes[4];
          in.Ints("Element line must hold " + std::to_string(nv) + " vertex numbers", 0, nv, nodes);
          b.AddElement(TriangleOrQuad(nv), nodes, nv, in.number());
        }
      }
    } else if (!cards.Take(in)) {
      in.Fail("Unknown keyword " + word);
    }
  }
  b.Build(mesh, cards.projection);
}

// ---- QUODDY -------------------------------------------------------------------------------------

void ReadMeshBasicQUODDY(Mesh& mesh, const std::string& file_name) {
  const char* routine = "ReadMeshBasicQUODDY";
  const std::string base = FileBaseName(file_name);
  for (const char* ext : {".nod", ".ele", ".bat"}) {
    if (!std::filesystem::exists(base + ext)) {
      WriteLogLine("  Missing file: " + base + ext);
      FatalError("ReadMeshBasicQUODDY: Error reading mesh information");
    }
  }
  MeshBuilder b(routine, file_name);
  {
    TextFile in(routine, base + ".nod");
    while (in.NextNonBlank()) {
      int id = 0;
      double xy[2];
      in.Ints("Node line must hold id, x, y", 0, 1, &id);
      in.Doubles("Node line must hold id, x, y", 1, 2, xy);
      b.AddNode(id, xy[0], xy[1], 0.0);
    }
  }
  {
    TextFile in(routine, base + ".ele");
    while (in.NextNonBlank()) {
      int row[4];
      in.Ints("Element line must hold id and three nodes", 0, 4, row);
      b.AddElement(21, row + 1, 3, in.number());
    }
  }
  {
    TextFile in(routine, base + ".bat");
    while (in.NextNonBlank()) {
      int id = 0;
      double depth = 0;
      in.Ints("Depth line must hold id, depth", 0, 1, &id);
      in.Doubles("Depth line must hold id, depth", 1, 1, &depth);
      b.SetZ(id, -depth, in.number());
    }
  }
  b.Build(mesh, "");
}

// ---- node/topology files --------------------------------------------------------------------------

void ReadMeshBasicNodeTopo(Mesh& mesh, const std::string& file_name) {
  const char* routine = "ReadMeshBasicNodeTopo";
  const std::string base = FileBaseName(file_name);
  const std::string topo = std::filesystem::exists(base + ".topo") ? base + ".topo" : base + ".ele";
  MeshBuilder b(routine, file_name);
  {
    TextFile in(routine, base + ".node");
    in.Require("header (nodes, dimension, attributes, markers) expected");
    int h[4];
    in.Ints("Header must hold nodes, dimension, attributes, markers", 0, 4, h);
    if (h[0] < 1 || h[1] != 2 || h[2] < 0 || h[3] < 0 || h[3] > 1) in.Fail("Header values not supported");
    for (int n = 0; n < h[0]; ++n) {
      in.Require("node line expected");
      int id = 0, marker = 0;
      double xy[2], z = 0.0;
      in.Ints("Node line must hold id, x, y, attributes, marker", 0, 1, &id);
      in.Doubles("Node line must hold id, x, y, attributes, marker", 1, 2, xy);
      if (h[2] > 0) in.Doubles("Node line must hold id, x, y, attributes, marker", 3, 1, &z);
      if (h[3] > 0) in.Ints("Node line must hold id, x, y, attributes, marker", 3 + h[2], 1, &marker);
      b.AddNode(id, xy[0], xy[1], z, marker);
    }
  }
  {
    TextFile in(routine, topo);
    in.Require("header (elements, nodes per element, attributes) expected");
    int h[2];
    in.Ints("Header must hold elements and nodes per element", 0, 2, h);
    if (h[0] < 1 || (h[1] != 3 && h[1] != 4)) in.Fail("Header values not supported");
    for (int e = 0; e < h[0]; ++e) {
      in.Require("element line expected");
      int row[5];
      in.Ints("Element line must hold id and " + std::to_string(h[1]) + " nodes", 0, 1 + h[1], row);
      b.AddElement(TriangleOrQuad(h[1]), row + 1, h[1], in.number());
    }
  }
  b.Build(mesh, "");
}

}  // namespace vhd
