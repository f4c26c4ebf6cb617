#pragma once
// Pieces shared by the mesh readers: a text file read line by line with
// free-format fields, strict number parsing, and a builder that collects nodes
// and elements named by file identifiers and turns them into a Mesh.

#include <cstdint>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

#include "mesh/mesh.hpp"

namespace vhd {

// Fields of a line separated by blanks, tabs and commas.
std::vector<std::string_view> SplitFields(std::string_view line);
// Whole-field conversions (no trailing characters; "1.5D3" is read as 1.5e3).
bool ParseInt(std::string_view field, int& value);
bool ParseDouble(std::string_view field, double& value);
std::string_view TrimBlanks(std::string_view s);
std::string LowerCase(std::string_view s);
// Extension of a file name in lower case, without the dot ("" when none).
std::string FileExtension(const std::string& file_name);
// File name without its extension.
std::string FileBaseName(const std::string& file_name);

// Nodes of an element of the given type code; 0 for an unknown code.
int ElementTypeNodeCount(int type);
// A quadrilateral (type 25) written with its last node repeated ("1 2 3 3")
// is a triangle: sets the type to 21 and returns 3. Otherwise returns n.
int CollapseRepeatedLastNode(int& type, int n, const int* nodes);

// A text file read line by line. Every failure ends the run with
// "<routine>: <what> (file <name>, line <n>)".
class TextFile {
public:
  TextFile(std::string routine, const std::string& path);

  // Next line; false at the end of the file.
  bool Next();
  // Next line that holds something other than blanks; false at the end.
  bool NextNonBlank();
  // Next non-blank line, or the fatal error "Unexpected end of file, <what>".
  void Require(std::string_view what);
  const std::string& line() const { return line_; }
  int number() const { return number_; }
  const std::string& path() const { return path_; }
  std::vector<std::string_view> Fields() const { return SplitFields(line_); }

  // Reads n integers / doubles from the fields of the current line starting at
  // field `first`; a missing or unreadable field is the fatal error naming `what`.
  void Ints(std::string_view what, int first, int n, int* values) const;
  void Doubles(std::string_view what, int first, int n, double* values) const;

  [[noreturn]] void Fail(std::string_view what) const;
  // Refuses a count from a header that the file cannot hold, each of the
  // `count` records taking at least `fields` fields of two characters (a
  // digit and a separator): "Header gives <count> <what>, more than the file
  // can hold". Header counts size the tables before any data is read.
  void CheckCount(std::string_view what, long long count, int fields) const;

private:
  std::string routine_;
  std::string path_;
  std::uintmax_t size_ = 0;
  std::ifstream in_;
  std::string line_;
  int number_ = 0;
};

// Fatal error "<routine>: <what> (file <name>)".
[[noreturn]] void FileError(std::string_view routine, const std::string& path, std::string_view what);

// Collects a mesh whose nodes are named by identifiers of the file. Build()
// numbers nodes and elements 1 .. n in file order (the stored ids are these
// positions), turns the nodes of 2D elements anticlockwise, and gives every
// node on the boundary that still has code 0 the land code 1.
//
// Boundary segments (two nodes of one boundary stretch with its code) become
// node codes so that every face of the stretch takes that code (a boundary
// face takes the larger code of its two nodes): the inner nodes of a stretch
// get its code, its two end nodes the land code 1, where land or another
// stretch begins. A stretch of one single segment gives both nodes its code.
class MeshBuilder {
public:
  MeshBuilder(std::string routine, std::string path) : routine_(std::move(routine)), path_(std::move(path)) {}

  void Reserve(int nnodes, int nelements, int nodes_per_element);
  void AddNode(int file_id, double x, double y, double z, int code = 0);
  // Node identifiers of the file; `line` names the source line in messages.
  void AddElement(int type, const int* file_ids, int n, int line = 0);
  // Sets the code of the node with a file identifier (unknown ids are fatal).
  void SetCode(int file_id, int code, int line = 0);
  void SetZ(int file_id, double z, int line = 0);
  void AddBoundarySegment(int file_id_a, int file_id_b, int code, int line = 0);
  // Leaves out nodes that no element uses (after dropping elements).
  void DropUnusedNodes() { drop_unused_ = true; }
  int NodeCount() const { return static_cast<int>(x_.size()); }
  int ElementCount() const { return static_cast<int>(type_.size()); }
  void Build(Mesh& mesh, const std::string& projection);

private:
  int Position(int file_id, int line) const;  // 0-based
  [[noreturn]] void Fail(std::string_view what, int line) const;

  std::string routine_, path_;
  std::vector<int> file_id_;
  std::vector<double> x_, y_, z_;
  std::vector<int> code_;
  std::vector<int> type_, start_{0}, nodes_;  // nodes_: file ids, element by element
  std::vector<int> element_line_;
  struct Segment {
    int a, b, code, line;
  };
  std::vector<Segment> segments_;
  bool drop_unused_ = false;
  mutable std::vector<int> index_;  // file id - min id -> position + 1
  mutable int min_id_ = 0;
  mutable bool indexed_ = false;
};

}  // namespace vhd
