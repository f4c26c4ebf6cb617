#pragma once
// Mesh files: the readers that fill a Mesh from a file, the choice of reader
// by the file's extension, the checks of a read mesh, and the writers of the
// engine's own two mesh formats (used by the conversion tools).
//
// Every reader starts from a cleared Mesh and leaves the coordinates as the
// file gives them (degrees for "LONG/LAT"); ReadMesh then completes the mesh:
// blank projection -> "UTM-32", projection established through the
// cartography layer, "LONG/LAT" coordinates to radians, CheckMesh.
// Bad input ends the run with a message naming the routine, the file and,
// for text files, the line.
//
// Formats (extension, lower case):
//   mesh        ASCII mesh: header (item code, unit code, nnodes, projection |
//               nnodes, projection | nnodes), nnodes lines "id x y z code",
//               "nelements max_nodes_per_element element_type", element rows
//               "id n1 .. n_max" (0 pads a shorter element).
//   zrnu        flexible-mesh data file (netCDF/UGRID) through the data-file layer.
//   zrn1, dt1   line grid -> 1D mesh of 2-node lines through the grid points.
//   zrn2        bathymetry grid -> 2D mesh of quadrilaterals (25) or triangles (21)
//               over the cells that are not land; nodes at the cell corners.
//   zrn3        3D grid -> layered mesh of hexahedra (33) or prisms (32).
//   2dm         SMS 2D mesh: ND, E3T, E4Q, NS cards (node strings become the
//               open-boundary codes 2, 3, ...), with the keyword cards below.
//   14          ADCIRC grid: open boundaries become codes 2, 3, ..., land
//               boundaries code 1; depth (positive down) becomes z = -depth.
//   fem         keyword file: DIMENS (nodes, elements, nodes per element),
//               NODE (element rows), COOR (all x, then all y), ELEV_I
//               ("z node-list", lists with ranges "a-b"), and the keyword
//               cards below.
//   geo         geometry file: "Vertices n" with "x y z code" lines, then
//               "Triangles n" / "Quadrilaterals n" with "n1 n2 n3 [n4] [tag]"
//               lines, an optional "End"; and the keyword cards below.
//   bat         QUODDY: base.nod ("id x y"), base.ele ("id n1 n2 n3"), base.bat
//               ("id depth"), z = -depth.
//   otherwise   node/topology files base.node ("n dim nattr nmarkers", then
//               "id x y [z ...] [marker]") and base.topo or base.ele
//               ("n nodes_per_element nattr", then "id n1 n2 n3 [n4]");
//               boundary markers become node codes; blank projection.
// Keyword cards of 2dm, fem and geo files (one per line, anywhere before the
// data they concern): "coordinate_type <projection>", "UVQ_unit_XY <unit key>",
// "UVQ_unit_Z <unit key>", and for 2dm "element_attribute <material id>"
// (elements of that material are dry: they are left out, and nodes used only
// by them with them). Foreign formats number nodes and elements 1 .. n in file
// order (the stored ids are these positions); boundary nodes without a code
// get the land code 1.

#include <string>

#include "mesh/mesh.hpp"

namespace vhd {

// Grid-to-mesh options (keys of the open setup section for grid files).
struct GridMeshOptions {
  int type_of_element = 0;    // 0: the reader's default (25 for zrn2, 33 for zrn3)
  int type_of_grid = 1;       // zrn2: 1 geometry and bed from file_name; 2 geometry from filename_grid
  std::string filename_grid;  // zrn2, grid type 2
};

// Reads `file_name` from the open setup section, selects the reader by the
// extension, then completes and checks the mesh (header comment). Reads
// `check_mesh` (default 1) and, for grid files, the grid keys.
void ReadMesh(Mesh& mesh);
// The same without the setup file: the reader by extension and the completion.
void ReadMeshFile(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid = {},
                  int check_mesh = 1);
// Only the reader chosen by the extension (coordinates as in the file),
// followed by CheckMeshGeometry; running out of memory while reading is the
// fatal error "ReadMesh: Out of memory (file <name>)".
void ReadMeshBasic(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid = {});
// Refuses, with a fatal error naming the file and the node or element
// numbers, a mesh that the solver cannot work on: a coordinate or bed level
// that is not finite, a node code above 99999, an element that holds a node twice (a quadrilateral
// "1 2 3 3" is read as a triangle before this check), a 2D element of zero
// area (twice its area at most 1e-10 times the square of its longest edge),
// two elements with the same nodes, two nodes at one position (x and y; x, y
// and z in a layered 3D mesh). It runs whatever `check_mesh` says.
void CheckMeshGeometry(const Mesh& mesh, const std::string& file_name);
// Blank projection -> "UTM-32", projection established (fatal "Unable to
// establish projection: " otherwise), "LONG/LAT" coordinates to radians.
void CompleteMeshProjection(Mesh& mesh);

// Node and element ids equal their positions, element nodes within 1 ..
// nnodes, every node in some element. A fault is logged with the mesh file
// (when named) before the fatal error.
void CheckMesh(const Mesh& mesh, const std::string& file_name = "");

void ReadMeshBasicAscii(Mesh& mesh, const std::string& file_name);
void ReadMeshBasicZrnu(Mesh& mesh, const std::string& file_name);
void ReadMeshBasicZrn1(Mesh& mesh, const std::string& file_name);
void ReadMeshBasicZrn2(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid);
void ReadMeshBasicZrn3(Mesh& mesh, const std::string& file_name, const GridMeshOptions& grid);
void ReadMeshBasic2dm(Mesh& mesh, const std::string& file_name);
void ReadMeshBasicADCIRC(Mesh& mesh, const std::string& file_name);
void ReadMeshBasicFem(Mesh& mesh, const std::string& file_name);
void ReadMeshBasicGeo(Mesh& mesh, const std::string& file_name);
void ReadMeshBasicQUODDY(Mesh& mesh, const std::string& file_name);
void ReadMeshBasicNodeTopo(Mesh& mesh, const std::string& file_name);

// gmsh mesh file (.msh, ASCII, versions 2.2 and 4.1): triangles and
// quadrilaterals become elements (anticlockwise), node z is the bed level.
// Boundary lines in a physical group give node codes: the group with tag t
// gives code t (a group named "land" gives 1 whatever its tag), so tag 1 is
// land and tags 2, 3, ... are open boundaries; the inner nodes of a group's
// lines get its code, their end nodes the land code, and every other boundary
// node the land code. gmsh saves only elements of physical groups when any is
// defined: put the surface in one too.
void ReadGmshMesh(Mesh& mesh, const std::string& file_name, const std::string& projection);

// Writers of the engine's formats. Coordinates are written as held: a mesh
// read with ReadMeshBasic* keeps degrees for "LONG/LAT".
void WriteMeshAscii(const Mesh& mesh, const std::string& file_name);
void WriteMeshZrnu(const Mesh& mesh, const std::string& file_name);

}  // namespace vhd
