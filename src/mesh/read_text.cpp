#include "mesh/read_text.hpp"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <cstdlib>
#include <filesystem>
#include <limits>

#include "io/zrn.hpp"
#include "log/log.hpp"

namespace vhd {

std::vector<std::string_view> SplitFields(std::string_view line) {
  std::vector<std::string_view> fields;
  std::size_t i = 0;
  auto sep = [](char c) { return c == ' ' || c == '\t' || c == ',' || c == '\r'; };
  while (i < line.size()) {
    while (i < line.size() && sep(line[i])) ++i;
    std::size_t j = i;
    while (j < line.size() && !sep(line[j])) ++j;
    if (j > i) fields.push_back(line.substr(i, j - i));
    i = j;
  }
  return fields;
}

bool ParseInt(std::string_view field, int& value) {
  if (!field.empty() && field.front() == '+') field.remove_prefix(1);
  if (field.empty()) return false;
  auto [p, ec] = std::from_chars(field.data(), field.data() + field.size(), value);
  return ec == std::errc() && p == field.data() + field.size();
}

bool ParseDouble(std::string_view field, double& value) {
  if (!field.empty() && field.front() == '+') field.remove_prefix(1);
  if (field.empty()) return false;
  std::string text(field);
  for (char& c : text)
    if (c == 'd' || c == 'D') c = 'e';
  auto [p, ec] = std::from_chars(text.data(), text.data() + text.size(), value);
  return ec == std::errc() && p == text.data() + text.size() && std::abs(value) <= std::numeric_limits<double>::max();
}

std::string_view TrimBlanks(std::string_view s) {
  while (!s.empty() && std::isspace(static_cast<unsigned char>(s.front()))) s.remove_prefix(1);
  while (!s.empty() && std::isspace(static_cast<unsigned char>(s.back()))) s.remove_suffix(1);
  return s;
}

std::string LowerCase(std::string_view s) {
  std::string r(s);
  for (char& c : r) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return r;
}

std::string FileExtension(const std::string& file_name) {
  const std::size_t slash = file_name.find_last_of("/\\");
  const std::size_t dot = file_name.find_last_of('.');
  if (dot == std::string::npos || (slash != std::string::npos && dot < slash)) return {};
  return LowerCase(std::string_view(file_name).substr(dot + 1));
}

std::string FileBaseName(const std::string& file_name) {
  const std::size_t slash = file_name.find_last_of("/\\");
  const std::size_t dot = file_name.find_last_of('.');
  if (dot == std::string::npos || (slash != std::string::npos && dot < slash)) return file_name;
  return file_name.substr(0, dot);
}

int ElementTypeNodeCount(int type) {
  switch (type) {
    case 11: return 2;
    case 12: return 3;
    case 21: return 3;
    case 22: return 4;
    case 23: return 6;
    case 24: return 7;
    case 25: return 4;
    case 26: return 5;
    case 27: return 8;
    case 28: return 9;
    case 31: return 4;
    case 32: return 6;
    case 33: return 8;
    case 41:
    case 42:
    case 43: return 1;
    default: return 0;
  }
}

int CollapseRepeatedLastNode(int& type, int n, const int* nodes) {
  if (type != 25 || n != 4 || nodes[3] != nodes[2]) return n;
  type = 21;
  return 3;
}

// ---- TextFile --------------------------------------------------------------------------

void FileError(std::string_view routine, const std::string& path, std::string_view what) {
  FatalError(std::string(routine) + ": " + std::string(what) + " (file " + ZrnLogName(path) + ")");
}

TextFile::TextFile(std::string routine, const std::string& path)
    : routine_(std::move(routine)), path_(path), in_(path) {
  if (!in_) FileError(routine_, path_, "Unable to open file");
  std::error_code ec;
  size_ = std::filesystem::file_size(path, ec);
  if (ec) size_ = 0;
}

void TextFile::CheckCount(std::string_view what, long long count, int fields) const {
  if (count > 0 && static_cast<std::uintmax_t>(count) * 2u * static_cast<std::uintmax_t>(fields) > size_ + 1)
    Fail("Header gives " + std::to_string(count) + " " + std::string(what) + ", more than the file can hold");
}

bool TextFile::Next() {
  if (!std::getline(in_, line_)) return false;
  ++number_;
  if (!line_.empty() && line_.back() == '\r') line_.pop_back();
  return true;
}

bool TextFile::NextNonBlank() {
  while (Next())
    if (!TrimBlanks(line_).empty()) return true;
  return false;
}

void TextFile::Require(std::string_view what) {
  if (!NextNonBlank()) {
    FatalError(routine_ + ": Unexpected end of file, " + std::string(what) + " (file " + ZrnLogName(path_) +
               ", after line " + std::to_string(number_) + ")");
  }
}

void TextFile::Ints(std::string_view what, int first, int n, int* values) const {
  const auto fields = Fields();
  for (int k = 0; k < n; ++k) {
    const std::size_t i = static_cast<std::size_t>(first + k);
    if (i >= fields.size() || !ParseInt(fields[i], values[k])) Fail(what);
  }
}

void TextFile::Doubles(std::string_view what, int first, int n, double* values) const {
  const auto fields = Fields();
  for (int k = 0; k < n; ++k) {
    const std::size_t i = static_cast<std::size_t>(first + k);
    if (i >= fields.size() || !ParseDouble(fields[i], values[k])) Fail(what);
  }
}

void TextFile::Fail(std::string_view what) const {
  FatalError(routine_ + ": " + std::string(what) + " (file " + ZrnLogName(path_) + ", line " +
             std::to_string(number_) + ")");
}

// ---- MeshBuilder ------------------------------------------------------------------------

void MeshBuilder::Reserve(int nnodes, int nelements, int nodes_per_element) {
  if (nnodes < 0 || nelements < 0) return;
  file_id_.reserve(nnodes);
  x_.reserve(nnodes);
  y_.reserve(nnodes);
  z_.reserve(nnodes);
  code_.reserve(nnodes);
  type_.reserve(nelements);
  start_.reserve(static_cast<std::size_t>(nelements) + 1);
  nodes_.reserve(static_cast<std::size_t>(nelements) * nodes_per_element);
  element_line_.reserve(nelements);
}

void MeshBuilder::AddNode(int file_id, double x, double y, double z, int code) {
  file_id_.push_back(file_id);
  x_.push_back(x);
  y_.push_back(y);
  z_.push_back(z);
  code_.push_back(code);
  indexed_ = false;
}

void MeshBuilder::AddElement(int type, const int* file_ids, int n, int line) {
  n = CollapseRepeatedLastNode(type, n, file_ids);
  type_.push_back(type);
  nodes_.insert(nodes_.end(), file_ids, file_ids + n);
  start_.push_back(static_cast<int>(nodes_.size()));
  element_line_.push_back(line);
}

void MeshBuilder::Fail(std::string_view what, int line) const {
  std::string where = " (file " + ZrnLogName(path_);
  if (line > 0) where += ", line " + std::to_string(line);
  FatalError(routine_ + ": " + std::string(what) + where + ")");
}

int MeshBuilder::Position(int file_id, int line) const {
  if (!indexed_) {
    if (file_id_.empty()) Fail("No nodes in file", line);
    const auto [lo, hi] = std::minmax_element(file_id_.begin(), file_id_.end());
    const long long range = static_cast<long long>(*hi) - *lo + 1;
    if (range > 4LL * static_cast<long long>(file_id_.size()) + 1024)
      Fail("Node identifiers are too sparse (" + std::to_string(*lo) + " to " + std::to_string(*hi) + ")", 0);
    min_id_ = *lo;
    index_.assign(static_cast<std::size_t>(range), 0);
    for (std::size_t i = 0; i < file_id_.size(); ++i) {
      int& slot = index_[static_cast<std::size_t>(file_id_[i] - min_id_)];
      if (slot != 0) Fail("Node identifier " + std::to_string(file_id_[i]) + " is given twice", 0);
      slot = static_cast<int>(i) + 1;
    }
    indexed_ = true;
  }
  const long long k = static_cast<long long>(file_id) - min_id_;
  if (k < 0 || k >= static_cast<long long>(index_.size()) || index_[static_cast<std::size_t>(k)] == 0)
    Fail("Unknown node " + std::to_string(file_id), line);
  return index_[static_cast<std::size_t>(k)] - 1;
}

void MeshBuilder::SetCode(int file_id, int code, int line) { code_[Position(file_id, line)] = code; }

void MeshBuilder::SetZ(int file_id, double z, int line) { z_[Position(file_id, line)] = z; }

void MeshBuilder::AddBoundarySegment(int file_id_a, int file_id_b, int code, int line) {
  segments_.push_back({file_id_a, file_id_b, code, line});
}

void MeshBuilder::Build(Mesh& mesh, const std::string& projection) {
  if (NodeCount() < 1) Fail("No nodes in file", 0);
  const int ne = ElementCount();
  if (ne < 1) Fail("No elements in file", 0);

  // Element nodes as positions (from 1).
  std::vector<int> local(nodes_.size());
  for (int e = 0; e < ne; ++e)
    for (int k = start_[e]; k < start_[e + 1]; ++k) local[k] = Position(nodes_[k], element_line_[e]) + 1;

  // Boundary stretches: per code, nodes met by two segments are inner nodes.
  std::sort(segments_.begin(), segments_.end(), [](const Segment& p, const Segment& q) { return p.code < q.code; });
  std::vector<int> degree(x_.size(), 0);
  std::vector<int> ends;
  for (std::size_t i = 0; i < segments_.size();) {
    std::size_t j = i;
    while (j < segments_.size() && segments_[j].code == segments_[i].code) ++j;
    std::vector<int> touched;
    for (std::size_t k = i; k < j; ++k) {
      for (int id : {segments_[k].a, segments_[k].b}) {
        const int p = Position(id, segments_[k].line);
        if (degree[p]++ == 0) touched.push_back(p);
      }
    }
    for (int p : touched) {
      if (degree[p] >= 2 || j - i == 1) {
        code_[p] = std::max(code_[p], segments_[i].code);
      } else {
        ends.push_back(p);
      }
      degree[p] = 0;
    }
    i = j;
  }
  for (int p : ends)
    if (code_[p] == 0) code_[p] = 1;

  if (drop_unused_) {
    std::vector<int> renumber(x_.size(), 0);
    for (int p : local) renumber[p - 1] = 1;
    int kept = 0;
    for (std::size_t p = 0; p < x_.size(); ++p) {
      if (!renumber[p]) continue;
      renumber[p] = ++kept;
      x_[kept - 1] = x_[p];
      y_[kept - 1] = y_[p];
      z_[kept - 1] = z_[p];
      code_[kept - 1] = code_[p];
    }
    x_.resize(kept);
    y_.resize(kept);
    z_.resize(kept);
    code_.resize(kept);
    for (int& p : local) p = renumber[p - 1];
  }
  const int nn = static_cast<int>(x_.size());

  // Boundary edges (of 2D elements) belong to one element only; their nodes
  // get the land code where the file gave none.
  std::vector<long long> edges;
  for (int e = 0; e < ne; ++e) {
    const int n = start_[e + 1] - start_[e];
    int dim = 0, shape = 0, ftype = 0;
    if (!ElementTypeInfo(type_[e], dim, shape, ftype) || dim != 2 || ftype != 1) continue;
    for (int j = 0; j < n; ++j) {
      int a = local[start_[e] + j], b = local[start_[e] + (j + 1) % n];
      if (a > b) std::swap(a, b);
      edges.push_back(static_cast<long long>(a) * (nn + 1) + b);
    }
  }
  std::sort(edges.begin(), edges.end());
  for (std::size_t i = 0; i < edges.size();) {
    std::size_t j = i;
    while (j < edges.size() && edges[j] == edges[i]) ++j;
    if (j - i == 1) {
      const int a = static_cast<int>(edges[i] / (nn + 1)), b = static_cast<int>(edges[i] % (nn + 1));
      if (code_[a - 1] == 0) code_[a - 1] = 1;
      if (code_[b - 1] == 0) code_[b - 1] = 1;
    }
    i = j;
  }

  // Nodes of 2D elements anticlockwise (positive area), whatever the file's habit.
  for (int e = 0; e < ne; ++e) {
    int dim = 0, shape = 0, ftype = 0;
    if (!ElementTypeInfo(type_[e], dim, shape, ftype) || dim != 2 || ftype != 1) continue;
    int* v = local.data() + start_[e];
    const int n = start_[e + 1] - start_[e];
    double twice_area = 0.0;
    for (int j = 0; j < n; ++j) {
      const int a = v[j] - 1, c = v[(j + 1) % n] - 1;
      twice_area += x_[a] * y_[c] - x_[c] * y_[a];
    }
    if (twice_area < 0.0) std::reverse(v + 1, v + n);
  }

  ReleaseMesh(mesh);
  mesh.projection = projection;
  mesh.ndim = 2;
  AllocateNodes(mesh.nodes, nn);
  for (int i = 0; i < nn; ++i) vhd::AddNode(mesh.nodes, i + 1, x_[i], y_[i], z_[i], code_[i]);
  AllocateElementsBasic(mesh.elements, ne, std::max<int>(1, static_cast<int>(local.size())));
  for (int e = 0; e < ne; ++e)
    vhd::AddElement(mesh.elements, e + 1, type_[e], start_[e + 1] - start_[e], local.data() + start_[e]);
}

}  // namespace vhd
