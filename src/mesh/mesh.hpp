#pragma once
// The mesh: nodes, elements and faces of an unstructured (flexible) mesh of
// lines, triangles and quadrilaterals (2D) or of their layered 3D forms
// (prisms, hexahedra), with the geometry and neighbour tables that every
// finite-volume module reads.
//
// Numbering. Every table counts from 1 and 0 means "none" (vhd::Array1). Node,
// element and face numbers stored in the tables are positions in the same Mesh;
// identifiers read from files live in the separate `id` arrays. Owned
// (interior) entities come first, halo entities after them: `nnodes_int`,
// `nelements_int`, `nfaces_int` count the owned ones, the plain counts all of
// them (on one process the two are equal).
//
// Compressed rows. A one-to-many table is a start array with one entry more
// than rows (first entry 1) and a list: row r holds list[start[r]] ..
// list[start[r+1]-1].
//
// Units. Coordinates are metres, except for a "LONG/LAT" mesh, whose x and y
// are longitude and latitude in radians. The geometry of such a mesh (areas,
// face lengths, normals) is computed in the (longitude, latitude) plane in
// radians; the solver turns it into metres with the earth radius and the
// cos(latitude) factors stored beside it (`cos_lat`, `tan_lat` per element,
// `cos_lat` per face; 1 and 0 on Cartesian meshes). The element length scale
// is always in metres (it enters the CFL number).
//
// Boundary face codes. Interior faces carry code 0. A boundary face takes the
// larger of its two node codes, and 1 (land) when both node codes are 0 (a
// boundary left unmarked by the mesh maker is a closed wall). Node codes are
// 1 for land and 2 or more for open boundaries, so:
//   - a face between two nodes of one boundary carries that boundary's code;
//   - where an open boundary meets land, the face between the last open node
//     and the first land node belongs to the open boundary: an open boundary
//     spans from land node to land node, so even a single open node gives an
//     open stretch of two faces;
//   - where two open boundaries meet, the face between them takes the higher
//     code.
// A mesh maker therefore gives a node where two boundaries meet the lower of
// the two codes (land where land meets an open boundary); then every face
// carries the code of the boundary stretch it lies on. An open boundary needs
// at least one node of its own code: a single face between two junction
// nodes cannot carry a code of its own. The mesh generator of generate.hpp
// follows this rule at the corners of its rectangle and around its holes.

#include <array>
#include <string>
#include <vector>

#include "core/array1.hpp"

namespace vhd {

// ---- element types and the shape table ----------------------------------------

// Shapes within a dimension: 0 point; 1D: 1 line; 2D: 1 triangle,
// 2 quadrilateral; 3D: 1 tetrahedron, 2 prism, 3 hexahedron.
inline constexpr int kShapePoint = 0;
inline constexpr int kShapeLine = 1;
inline constexpr int kShapeTriangle = 1;
inline constexpr int kShapeQuadrilateral = 2;
inline constexpr int kShapeTetrahedron = 1;
inline constexpr int kShapePrism = 2;
inline constexpr int kShapeHexahedron = 3;

inline constexpr int kMaxShapes = 4;        // distinct shapes of one mesh
inline constexpr int kMaxElementFaces = 6;  // local faces of one element
inline constexpr double kDegToRad = 0.017453292519943295;
inline constexpr double kMeshEarthRadius = 6366707.0;  // m

// Dimension, shape and function type of an element type code (11 .. 43).
// Returns false for an unknown code.
bool ElementTypeInfo(int type, int& dimension, int& shape, int& function_type);

// One reference element: counts, local edge and face node tables, Gauss
// points and shape functions. Local numbers count from 1.
struct RefElement {
  int dimension = 0;
  int shape = 0;
  int function_type = 0;
  int nnodes = 0;
  int nedges = 0;
  int nodes_per_edge = 0;
  int nfaces = 0;
  int nodes_per_face = 0;
  std::vector<int> edge_nodes;  // nedges x nodes_per_edge, row by row
  std::vector<int> face_nodes;  // nfaces x nodes_per_face, 0 pads a shorter face

  // Gauss rule on the reference element (triangle (0,0),(1,0),(0,1); square
  // and cube [-1,1]; prism = triangle x [-1,1]; tetrahedron the unit one).
  int ngauss = 0;
  std::vector<double> gauss_xi, gauss_eta, gauss_zeta, gauss_weight;  // ngauss
  // Shape functions and their reference derivatives at the Gauss points:
  // entry (g-1)*nnodes + (j-1) for point g and node j.
  std::vector<double> shape_value, shape_dxi, shape_deta, shape_dzeta;

  int EdgeNode(int edge, int j) const { return edge_nodes[(edge - 1) * nodes_per_edge + (j - 1)]; }
  int FaceNode(int face, int j) const { return face_nodes[(face - 1) * nodes_per_face + (j - 1)]; }
  // Faces of the face table: edges in 1D/2D, faces in 3D.
  int NumberOfMeshFaces() const { return dimension == 3 ? nfaces : nedges; }
  int NodesPerMeshFace() const { return dimension == 3 ? nodes_per_face : nodes_per_edge; }
  int MeshFaceNode(int face, int j) const { return dimension == 3 ? FaceNode(face, j) : EdgeNode(face, j); }
};

// ---- tables ------------------------------------------------------------------------

struct NodeTable {
  int nnodes_max = 0;
  int nnodes = 0;      // stored nodes (owned + halo)
  int nnodes_all = 0;  // kept equal to nnodes by AddNode
  int nnodes_int = 0;  // owned nodes
  Array1<int> id;
  Array1<int> code;  // 0 interior, 1 land, >= 2 open boundary
  Array1<double> x, y, z;  // z: bed level (m)
  Array1<double> value;
  // Position of each node in the mesh file; empty while the table is in file
  // order (mesh/reorder.hpp).
  Array1<int> file_index;

  // Node -> elements (every element that contains the node), ordered by the
  // element centres (x, then y): a sum over a node's elements then does not
  // depend on the numbering.
  Array1<int> element_start, element_list;
  // Node -> neighbouring nodes (joined by an element edge), ascending.
  Array1<int> node_start, node_list;
  // Node control area: the sum over the node's elements of area / nodes.
  Array1<double> area;
};

struct ElementTable {
  int nelements_max = 0;
  int nelements = 0;      // stored elements (owned + halo)
  int nelements_all = 0;  // kept equal to nelements by AddElement
  int nelements_int = 0;  // owned elements
  Array1<int> id;     // 0: a slot that the geometry skips
  Array1<int> type;   // element type code
  Array1<int> shape;  // position in Mesh::shapes
  int nindexes_max = 0;
  Array1<int> node_start;  // nelements_max + 1 entries
  Array1<int> node_list;   // nindexes_max entries
  // Position of each element in the mesh file; empty while the table is in
  // file order (mesh/reorder.hpp).
  Array1<int> file_index;
  // Position of each element in the element order of the whole mesh, before
  // a run on several processes numbered it for one sub-domain; empty when
  // the table is in that order.
  Array1<int> run_order;
  // Element -> faces in the reference element's local face order (0: no face,
  // the bed or surface side of a layered column).
  Array1<int> face_start, face_list;

  // Geometry.
  Array1<double> area;        // area in 2D, volume in 3D, length in 1D
  Array1<double> xc, yc, zc;  // centroid: mean of the node coordinates
  Array1<double> length;      // length scale (m): the shortest edge
  // Triangles: dN_j/dx and dN_j/dy of the three linear shape functions, entry
  // 3*(e-1)+j; zero for other shapes.
  Array1<double> dndx, dndy;
  Array1<double> cos_lat, tan_lat;  // of the centroid latitude; 1, 0 if Cartesian
};

struct FaceTable {
  int nfaces_max = 0;
  int nfaces = 0;      // stored faces (owned + halo)
  int nfaces_int = 0;  // owned faces
  int nboundary_faces = 0;
  Array1<int> id;
  Array1<int> code;      // 0 interior; boundary code (header comment)
  // element1: of the two elements of an interior face, the one that comes
  // first in the run's element order (RunOrder), so that a sub-domain of a
  // run on several processes orients every face as one process does. Faces
  // are listed in the order the elements (in their order) first reach them.
  Array1<int> element1;
  Array1<int> element2;  // the element across; 0 on the boundary
  Array1<int> localface1, localface2;
  int nindexes_max = 0;
  Array1<int> node_start;  // nfaces_max + 1 entries
  Array1<int> node_list;   // in element1's local face-node order

  // Geometry. The normal points from element1 to element2 (out of element1).
  Array1<double> length;      // length in 2D, area in 3D
  Array1<double> nx, ny, nz;  // unit normal
  Array1<double> xf, yf, zf;  // face centre: mean of the node coordinates
  Array1<double> dist1;       // face centre to the centroid of element1
  Array1<double> dist2;       // face centre to the centroid of element2 (0 on the boundary)
  // Centroid of element1 to centroid of element2; on the boundary twice the
  // distance from element1's centroid to the face line (its mirror image).
  Array1<double> dist12;
  Array1<double> cos_lat;  // of the face-centre latitude; 1 if Cartesian
};

// Compressed-row sparse pattern with sorted columns and the diagonal included.
struct SparsePattern {
  int nrows = 0;
  Array1<int> row_start;  // nrows + 1 entries
  Array1<int> column;
  Array1<int> diagonal;   // position of (r, r) in column
};

// ---- vertical discretisation -------------------------------------------------------

// Keys of the vertical mesh (domain setup) and the levels derived from them.
struct VerticalMesh {
  int vertical_mesh_type_overall = 1;  // 1 sigma, 2 combined sigma/z
  int number_of_layers = 10;           // sigma layers
  double z_sigma = 0.0;                // sigma/z interface level (type 2)
  int vertical_mesh_type = 1;          // 1 equidistant, 2 list, 3 transformed
  std::vector<double> layer_thickness; // fractions, bottom to top
  double sigma_c = 0.0;
  double b = 0.0;
  double theta = 2.0;
  int number_of_layers_zlevel = 10;
  int vertical_mesh_type_zlevel = 1;   // 1 constant, 2 variable thickness
  double constant_layer_thickness_zlevel = 0.0;
  std::vector<double> variable_layer_thickness_zlevel;  // bottom to top
  int type_of_bathymetry_adjustment = 1;
  double minimum_layer_thickness_zlevel = 0.0;
  double area_factor_cutcell = 0.1;

  // Sigma level fractions of the water depth, bottom (0) to surface (1):
  // number_of_layers + 1 entries, sigma_levels[0] = 0.
  std::vector<double> sigma_levels;
  // z-layer interfaces (m), bottom to top, ending at z_sigma:
  // number_of_layers_zlevel + 1 entries (type 2 only).
  std::vector<double> z_levels;
};

// ---- the mesh ----------------------------------------------------------------------

struct Mesh {
  int number = 0;  // position in the domain's list of meshes
  int unit_code = 1000;
  std::string projection;
  int ndim = 2;
  int nlayers = 0;
  int vertical_type = 1;  // 1 sigma only, 2 combined sigma/z
  int nlayers_sigma = 0;
  int nlayers_z = 0;
  ElementTable elements;
  NodeTable nodes;
  FaceTable faces;
  std::vector<RefElement> shapes;  // the shape table, at most kMaxShapes
  VerticalMesh vertical;           // levels of a layered 3D mesh

  // Layered 3D mesh: columns over the 2D mesh it was built from. Elements of
  // 2D element c are column_element_start[c] .. column_element_start[c+1]-1,
  // bottom to top; likewise the nodes of 2D node n and the vertical faces of
  // 2D face f. Horizontal faces (between layers) follow the vertical faces,
  // from face nfaces_vertical+1 on. Empty on a 2D mesh.
  Array1<int> column_element_start, column_node_start, column_face_start;
  Array1<int> element_column, element_layer;  // 2D element and layer (1 = bottom)
  Array1<int> node_column, node_level;        // 2D node and level (1 = bottom)
  Array1<int> face_column;                    // 2D face of a vertical face, 0 for horizontal
  int nfaces_vertical = 0;
  int nlevels = 0;  // level interfaces of the deepest column (nlayers + 1)
};

bool IsGeographic(const std::string& projection);  // "LONG/LAT"

// ---- tables: allocation and filling --------------------------------------------------

void AllocateNodes(NodeTable& nodes, int nnodes_max);
void AddNode(NodeTable& nodes, int id, double x, double y, double z, int code);
void AllocateElementsBasic(ElementTable& elements, int nelements_max, int nindexes_max);
// Appends one element; 0 entries of the node list are dropped. Exceeding a
// capacity is the fatal error "AddElement: nelements_max is to small" (or
// "AddElement: nindexes_max is to small").
void AddElement(ElementTable& elements, int id, int type, int nnodes, const int* node_numbers);
void AllocateFacesBasic(FaceTable& faces, int nfaces_max, int nindexes_max);
// Sets the counts, ndim and nlayers to 0 and frees every array.
void ReleaseMesh(Mesh& mesh);

// ---- accessors -----------------------------------------------------------------------

inline int ElementNodeCount(const ElementTable& el, int e) { return el.node_start[e + 1] - el.node_start[e]; }
inline int ElementNode(const ElementTable& el, int e, int j) { return el.node_list[el.node_start[e] + j - 1]; }
inline int ElementFaceCount(const ElementTable& el, int e) { return el.face_start[e + 1] - el.face_start[e]; }
inline int ElementFace(const ElementTable& el, int e, int j) { return el.face_list[el.face_start[e] + j - 1]; }
inline int FaceNodeCount(const FaceTable& f, int k) { return f.node_start[k + 1] - f.node_start[k]; }
inline int FaceNode(const FaceTable& f, int k, int j) { return f.node_list[f.node_start[k] + j - 1]; }
inline int NodeElementCount(const NodeTable& n, int i) { return n.element_start[i + 1] - n.element_start[i]; }
inline int NodeElement(const NodeTable& n, int i, int j) { return n.element_list[n.element_start[i] + j - 1]; }
inline int NodeNeighbourCount(const NodeTable& n, int i) { return n.node_start[i + 1] - n.node_start[i]; }
inline int NodeNeighbour(const NodeTable& n, int i, int j) { return n.node_list[n.node_start[i] + j - 1]; }
// Place in the mesh file of node or element i (file_index of its table).
inline int FileIndex(const Array1<int>& file_index, int i) { return file_index.empty() ? i : file_index[i]; }
inline int RunOrder(const ElementTable& el, int e) { return el.run_order.empty() ? e : el.run_order[e]; }
inline const RefElement& ElementShape(const Mesh& m, int e) { return m.shapes[m.elements.shape[e] - 1]; }

// ---- shape table -----------------------------------------------------------------------

void SetupShapeData(Mesh& mesh);
void SetRefElement(int dimension, int shape, int function_type, RefElement& ref);
int GetMeshDimension(const Mesh& mesh);
void PrintShapeData(const RefElement& ref);
void PrintShapeData(const Mesh& mesh);  // every record of the shape table

// ---- faces, geometry, connectivity ----------------------------------------------------

// Builds the face table (needs SetupShapeData) and the node-element table.
void CalcFaces(Mesh& mesh, int& nfaces, int& nboundary_faces);
// Local face of element e holding exactly the given nodes (any order), or the
// fatal error "FindFaceInElement:  Failed finding a neighbour element".
int FindFaceInElement(const Mesh& mesh, int e, const int* face_nodes, int n);
// Code of a boundary face from its two end node codes (header comment).
int BoundaryFaceCode(int code_a, int code_b);

void CalcElementValues(ElementTable& elements, const NodeTable& nodes, const std::string& projection);
void CalcFaceValues(FaceTable& faces, const ElementTable& elements, const NodeTable& nodes,
                    const std::string& projection);
// Orders every node's element list by the element centres (needs
// CalcElementValues).
void OrderNodeElements(Mesh& mesh);
void CalcNodeValues(Mesh& mesh);

// Geometry of a 2D face and element in metres, as the flow sees it: on a
// "LONG/LAT" mesh the (longitude, latitude) plane in radians mapped onto the
// sphere of kMeshEarthRadius at the stored cos(latitude) (R cos(lat) dlon
// east, R dlat north); on any other mesh the stored values themselves.
// Unit normal (east and north components) and length of face f:
void FaceMetres(const Mesh& mesh, int f, double& nx, double& ny, double& length);
double FaceLengthMetres(const Mesh& mesh, int f);
// Area of element e (m2).
double ElementAreaMetres(const Mesh& mesh, int e);

void CreateNodeElementConnectivity(Mesh& mesh);
void CreateNodeNodeConnectivity(Mesh& mesh);
void CreateElementFaceConnectivity(Mesh& mesh);

// Node -> element and node -> node tables of an element table over nnodes nodes.
void NodeElementTable_CRS(const ElementTable& elements, int nnodes, Array1<int>& start, Array1<int>& list);
void CompNodeNodeTable_CRS(const ElementTable& elements, int nnodes, Array1<int>& start, Array1<int>& list);
// Element-element pattern (each element with its face neighbours).
void CreateSpStructureMeshCRS(const Mesh& mesh, SparsePattern& element_pattern);
// Node-node and element-element patterns for the implicit solvers.
void CompSpIndexMesh(const Mesh& mesh, SparsePattern& node_pattern, SparsePattern& element_pattern);

// The whole setup of a read mesh: shape table, faces, element-face and
// node-node tables, element, face and node geometry. Counts of owned entities
// are set to the full counts when they are 0.
void SetupMeshGeometry(Mesh& mesh);

// ---- cross sections --------------------------------------------------------------------

// Faces along a line or a boundary. sign[k] is +1 when a positive flux of
// face faces[k] (element1 -> element2) crosses the section from its left to
// its right side (walking the polyline), -1 otherwise.
struct MeshSection {
  std::vector<double> x, y;  // polyline (empty for a boundary section)
  int code = 0;              // boundary code (boundary section)
  Array1<int> faces;
  Array1<int> sign;
};

// Boundary faces of one code, in the order of the boundary walk (the domain
// on the left). code <= 0: "SetupMeshSection: No boundary specified".
void SetupMeshSection(const Mesh& mesh, int code, MeshSection& section);
// Faces crossed by a polyline: the faces between an element whose centroid
// lies left of the line and one whose centroid lies right of it, where the
// link between the two centroids crosses the polyline.
void CalcSection2D(const Mesh& mesh, const std::vector<double>& x, const std::vector<double>& y,
                   MeshSection& section);
// CalcSection2D that refuses an empty section
// ("SetupSection2D: Number of faces is zero in section").
void SetupSection2D(const Mesh& mesh, const std::vector<double>& x, const std::vector<double>& y,
                    MeshSection& section);
// The vertical faces of a layered mesh above the faces of a 2D section, column
// by column, bottom to top.
void SetupMeshSectionlayer(const Mesh& mesh3d, const MeshSection& section2d, MeshSection& section3d);

// ---- vertical mesh and the layered 3D mesh -------------------------------------------

// Transformed sigma level at s in [-1, 0]: fraction of the water depth above
// the bed (0 at the bed, 1 at the surface).
double TransformedSigmaLevel(double s, double sigma_c, double b, double theta);
// Reads the vertical mesh keys from the open setup section (the domain);
// minimum_depth is the default of z_sigma (half of it) and mesh2d gives the
// deepest bed for the default z-layer thickness. Fills the levels.
void SetupVerticalMesh(const Mesh& mesh2d, double minimum_depth, VerticalMesh& vertical);
// Levels from the keys: sigma_levels and z_levels (warnings on layer
// thickness sums).
void CalcVerticalLevels(VerticalMesh& vertical, double deepest_bed);
// Stacks the 2D mesh into a layered 3D mesh of prisms and hexahedra with the
// levels of a surface at datum (eta = 0), and sets up its faces and geometry.
void BuildLayeredMesh(const Mesh& mesh2d, const VerticalMesh& vertical, Mesh& mesh3d);

}  // namespace vhd
