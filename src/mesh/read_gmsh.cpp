// gmsh mesh files (.msh, ASCII, versions 2.2 and 4.1) read into a Mesh.

#include <map>
#include <vector>

#include "log/log.hpp"
#include "mesh/read_mesh.hpp"
#include "mesh/read_text.hpp"

namespace vhd {

namespace {

constexpr const char* kRoutine = "ReadGmshMesh";

// Number of nodes of the gmsh element types we take or pass over; 0 unknown.
int GmshNodeCount(int type) {
  switch (type) {
    case 1: return 2;   // line
    case 2: return 3;   // triangle
    case 3: return 4;   // quadrilateral
    case 15: return 1;  // point
    default: return 0;
  }
}

struct GmshReader {
  TextFile in;
  MeshBuilder b;
  std::map<int, int> code_of_group;  // physical tag of a line group -> code
  std::map<int, std::vector<int>> curve_groups;  // 4.1: curve entity -> physical tags

  GmshReader(const std::string& file) : in(kRoutine, file), b(kRoutine, file) {}

  int CodeOfGroup(int tag) const {
    auto it = code_of_group.find(tag);
    return it != code_of_group.end() ? it->second : tag;
  }

  // One element of a gmsh type with its physical group (0: none).
  void Element(int type, const int* nodes, int physical) {
    if (type == 1) {
      if (physical > 0) b.AddBoundarySegment(nodes[0], nodes[1], CodeOfGroup(physical), in.number());
    } else if (type == 2) {
      b.AddElement(21, nodes, 3, in.number());
    } else if (type == 3) {
      b.AddElement(25, nodes, 4, in.number());
    } else if (type != 15) {
      in.Fail("Element type " + std::to_string(type) + " not supported (lines, triangles, quadrilaterals)");
    }
  }

  void PhysicalNames() {
    in.Require("number of physical names expected");
    int n = 0;
    in.Ints("Number of physical names expected", 0, 1, &n);
    for (int k = 0; k < n; ++k) {
      in.Require("physical name expected");
      int dim_tag[2];
      in.Ints("Physical name line must hold dimension, tag, name", 0, 2, dim_tag);
      const std::string& line = in.line();
      const std::size_t q1 = line.find('"'), q2 = line.rfind('"');
      const std::string name = q1 != std::string::npos && q2 > q1 ? line.substr(q1 + 1, q2 - q1 - 1) : "";
      if (dim_tag[0] == 1 && LowerCase(name) == "land") code_of_group[dim_tag[1]] = 1;
    }
  }

  void Entities() {
    in.Require("entity counts expected");
    int counts[4];
    in.Ints("Entity counts expected", 0, 4, counts);
    for (int dim = 0; dim < 4; ++dim) {
      for (int k = 0; k < counts[dim]; ++k) {
        in.Require("entity line expected");
        int tag = 0, nphys = 0;
        const int at = dim == 0 ? 4 : 7;  // points: tag x y z; others: tag and a bounding box
        in.Ints("Entity line expected", 0, 1, &tag);
        in.Ints("Entity line must hold its physical tags", at, 1, &nphys);
        in.CheckCount("physical tags", nphys, 1);
        std::vector<int> phys(static_cast<std::size_t>(std::max(nphys, 0)));
        if (nphys > 0) in.Ints("Entity line must hold its physical tags", at + 1, nphys, phys.data());
        if (dim == 1) curve_groups[tag] = phys;
      }
    }
  }

  void Nodes(bool v4) {
    in.Require("node counts expected");
    if (!v4) {
      int n = 0;
      in.Ints("Number of nodes expected", 0, 1, &n);
      for (int k = 0; k < n; ++k) {
        in.Require("node line expected");
        int id = 0;
        double xyz[3];
        in.Ints("Node line must hold id, x, y, z", 0, 1, &id);
        in.Doubles("Node line must hold id, x, y, z", 1, 3, xyz);
        b.AddNode(id, xyz[0], xyz[1], xyz[2]);
      }
      return;
    }
    int head[4];
    in.Ints("Node header must hold blocks, nodes, min tag, max tag", 0, 4, head);
    for (int blk = 0; blk < head[0]; ++blk) {
      in.Require("node block header expected");
      int bh[4];
      in.Ints("Node block header must hold dimension, entity, parametric, count", 0, 4, bh);
      in.CheckCount("nodes", bh[3], 4);
      std::vector<int> tags(static_cast<std::size_t>(std::max(bh[3], 0)));
      for (int k = 0; k < bh[3]; ++k) {
        in.Require("node tag expected");
        in.Ints("Node tag expected", 0, 1, &tags[static_cast<std::size_t>(k)]);
      }
      for (int k = 0; k < bh[3]; ++k) {
        in.Require("node coordinates expected");
        double xyz[3];
        in.Doubles("Node coordinates expected", 0, 3, xyz);
        b.AddNode(tags[static_cast<std::size_t>(k)], xyz[0], xyz[1], xyz[2]);
      }
    }
  }

  void Elements(bool v4) {
    in.Require("element counts expected");
    int nodes[4];
    if (!v4) {
      int n = 0;
      in.Ints("Number of elements expected", 0, 1, &n);
      for (int k = 0; k < n; ++k) {
        in.Require("element line expected");
        int h[3];
        in.Ints("Element line must hold id, type, number of tags", 0, 3, h);
        const int nn = GmshNodeCount(h[1]);
        if (nn == 0) in.Fail("Element type " + std::to_string(h[1]) + " not supported");
        int physical = 0;
        if (h[2] > 0) in.Ints("Element tags expected", 3, 1, &physical);
        in.Ints("Element nodes expected", 3 + h[2], nn, nodes);
        Element(h[1], nodes, physical);
      }
      return;
    }
    int head[4];
    in.Ints("Element header must hold blocks, elements, min tag, max tag", 0, 4, head);
    for (int blk = 0; blk < head[0]; ++blk) {
      in.Require("element block header expected");
      int bh[4];
      in.Ints("Element block header must hold dimension, entity, type, count", 0, 4, bh);
      const int nn = GmshNodeCount(bh[2]);
      if (nn == 0) in.Fail("Element type " + std::to_string(bh[2]) + " not supported");
      int physical = 0;
      if (bh[0] == 1) {
        auto it = curve_groups.find(bh[1]);
        if (it != curve_groups.end() && !it->second.empty()) physical = it->second.front();
      }
      for (int k = 0; k < bh[3]; ++k) {
        in.Require("element line expected");
        in.Ints("Element line must hold its tag and nodes", 1, nn, nodes);
        Element(bh[2], nodes, physical);
      }
    }
  }

  void SkipSection(const std::string& name) {
    const std::string end = "$End" + name.substr(1);
    while (in.Next())
      if (TrimBlanks(in.line()) == end) return;
    in.Fail("Section " + name + " without its end");
  }
};

}  // namespace

void ReadGmshMesh(Mesh& mesh, const std::string& file_name, const std::string& projection) {
  GmshReader r(file_name);
  bool v4 = false, format = false;
  while (r.in.NextNonBlank()) {
    const std::string section(TrimBlanks(r.in.line()));
    if (section == "$MeshFormat") {
      r.in.Require("format line expected");
      const auto f = r.in.Fields();
      int binary = 0;
      r.in.Ints("Format line must hold version, file type, data size", 1, 1, &binary);
      if (f[0] != "2.2" && f[0] != "4.1") r.in.Fail("Version " + std::string(f[0]) + " not supported (2.2 or 4.1)");
      if (binary != 0) r.in.Fail("Binary files not supported (save as ASCII)");
      v4 = f[0] == "4.1";
      format = true;
      r.SkipSection(section);
    } else if (!format) {
      r.in.Fail("File does not begin with $MeshFormat");
    } else if (section == "$PhysicalNames") {
      r.PhysicalNames();
      r.SkipSection(section);
    } else if (section == "$Entities") {
      r.Entities();
      r.SkipSection(section);
    } else if (section == "$Nodes") {
      r.Nodes(v4);
      r.SkipSection(section);
    } else if (section == "$Elements") {
      r.Elements(v4);
      r.SkipSection(section);
    } else if (!section.empty() && section[0] == '$') {
      r.SkipSection(section);
    }
  }
  r.b.Build(mesh, projection);
}

}  // namespace vhd
