#pragma once
// Result outputs of a module: the numbered OUTPUT sections of its OUTPUTS
// section, each one zrn data file that covers a part of the domain and holds
// the items the module offers, written at chosen steps.
//
//   type 1  field output on the 2D mesh (items of PARAMETERS_2D)
//        3  mass budget of a polygon (MASSBUDGET, mass_budget.hpp)
//        4  discharge through a line (DISCHARGE)
//   format, by the dimension of the output's mesh:
//        dim 1: 0 points, 1 area;  dim 2: 0 points, 1 line, 2 area;
//        dim 3: 0 points, 1 line, 2 vertical plane, 3 volume.
//
// Kinds of file (by extension): points .zrn0 (one item per point and
// parameter), line .zrn1 (values at points spaced evenly along the line),
// area .zrnu (UGRID: the elements of the mesh, all or those in a polygon or
// box) or .zrn2 (a regular grid sampled from the mesh), mass budgets and
// discharges .zrn0. Every file has a non-equidistant calendar time axis from
// the simulation start: a record holds the time of the state written, so that
// the emergency record after a failure carries its true time.
//
// Values on points, lines and grids (interpolation_type 1) come from node
// values (pseudo-Laplacian average of the element values) interpolated
// linearly inside the element that holds the point; interpolation_type 2
// takes the value of that element. Codes (the wet/dry code) are never
// interpolated. flood_and_dry: 0 writes every element's value; 1 writes the
// delete value for the flow items of dry elements (code 0); 2 also for
// flooded elements (code 2). Grid points outside the mesh take land_value.
//
// Coordinates in the setup file are those of the mesh's files: degrees on a
// "LONG/LAT" mesh (held in radians inside), projected metres otherwise.
//
// With several processes every process sets up every output on the whole
// mesh, and process 0 alone writes the files: the others send it their
// owned elements' values (GatherOwned) and their parts of every sum, so a
// file holds the same values as after a run on one process. There are no
// per-process files; merge_data and ordering are read and have nothing left
// to do.
//
// Everything here runs on the main thread; writing allocates nothing.

#include <string>
#include <string_view>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "io/zrn.hpp"
#include "mesh/mesh.hpp"
#include "mesh/search_tree.hpp"
#include "output/mass_budget.hpp"

namespace vhd {

inline constexpr int kOutputField2D = 1;
inline constexpr int kOutputField3D = 2;
inline constexpr int kOutputMassBudget = 3;
inline constexpr int kOutputDischarge = 4;

enum class OutputDomain { kNone, kPoints, kLine, kArea, kPlane, kVolume };

// One item of an output as the module defines it.
struct OutputItem {
  int code = 0;       // the module's item code
  std::string name;   // item name, also the netCDF variable name
  int item_type = 999;
  int unit = 0;
  int mode = 1;       // 1 scalar, 2 direction in degrees (averaged across 0/360)
  bool discrete = false;  // a code: never interpolated
  bool wet_only = false;  // masked by flood_and_dry
  int value_type = kZrnInstantaneous;
};

// A point of a point, line or grid output, in mesh coordinates.
struct OutputPoint {
  std::string name;
  double x = 0.0, y = 0.0;
  int element = 0;  // owned element that holds it, 0 outside (or on another process)
};

// Discharge output items.
inline constexpr int kDischarge = 1;
inline constexpr int kDischargeAccumulated = 2;
inline constexpr int kDischargePositive = 3;
inline constexpr int kDischargeNegative = 4;

struct DischargeSpec {
  MeshSection section;       // faces crossed by the line, with their signs
  double accumulated = 0.0;  // m3 since the start, positive to the right of the line
  double positive = 0.0;     // m3 carried to the right
  double negative = 0.0;     // m3 carried to the left (negative)
};

struct OutputSpec {
  int number = 0;         // i of OUTPUT_i
  std::string section;    // setup path of the section, for messages
  int include = 1;
  std::string file_name;  // as read (full path)
  std::string title;
  int type = kOutputField2D;
  int format = 2;
  double delete_value = 1e-35;
  double land_value = 10.0;
  int flood_and_dry = 1;
  int ordering = 1;
  bool write = true;  // this process writes the file (process 0 or a single process)
  int precision = 2;  // 1 single, 2 double
  int first_time_step = 0;
  int last_time_step = 0;
  int time_step_frequency = 1;
  int number_of_variables = 0;
  std::vector<int> type_of_variables;
  int interpolation_type = 1;
  int interpolation_subtype = 1;
  int merge = 0;

  // Domain.
  OutputDomain domain = OutputDomain::kNone;
  int file_kind = -1;        // zrnFileKind of the file name
  std::string path;          // the file this process writes
  std::vector<OutputPoint> points;  // points; line samples; grid points (row by row from the south)
  double line_length = 0.0;         // line: length of the line (mesh units)
  int nx = 0, ny = 0;               // grid
  double x0 = 0.0, y0 = 0.0, dx = 0.0, dy = 0.0, orientation = 0.0;
  int compress = 1;                 // area on the mesh: 1 only the selected elements
  Array1<int> elements;             // area on the mesh: the elements written (owned)
  Array1<char> selected;            // area on the mesh without compression: 1 inside

  std::vector<OutputItem> items;
  MassBudgetSpec budget;     // type 3
  DischargeSpec discharge;   // type 4

  // The open file.
  ZrnFile file;
  bool open = false;
  int records = 0;
  double last_time = 0.0;    // time of the last record (s since the start)
  std::vector<double> buffer;  // one record
};

// The outputs of one module.
struct OutputList {
  std::string module;  // suffix of the routine names: "HD", "TR", ...
  int number_of_outputs = 0;
  int merge_data = 2;
  std::vector<OutputSpec> outputs;  // included outputs, in section order
  SearchTree2D tree;   // element search of point, line and grid outputs
  bool have_tree = false;
  int process_id = -1;
  int nprocesses = 1;
  TimeAxis time;
};

// Reads the module's item selection of one output (PARAMETERS_2D) into
// spec.items; the output section is current.
using OutputItemReader = void (*)(OutputSpec& spec, void* context);

// What a module hands the reader of its OUTPUTS section.
struct OutputModuleInfo {
  std::string module;                         // "HD"
  OutputItemReader read_items = nullptr;      // type 1
  void* context = nullptr;
  std::vector<std::string> budget_components; // components of mass budgets, in module order
  bool discharge = true;                      // offers discharge outputs (type 4)
};

// Reads the OUTPUTS section inside the current section (the module's own):
// number_of_outputs, merge_data, then each OUTPUT_i; only included outputs
// are kept. Sets up every output's domain on the mesh.
void SetupOutputs(OutputList& list, const OutputModuleInfo& info, const Mesh& mesh, const RunControl& run,
                  const TimeAxis& time);

// Kind of domain of a format on a mesh of dimension dim; any other
// combination: "SpecOutputDomain: Output format not supported".
OutputDomain SpecOutputDomain(const OutputSpec& spec, int dim);

// Domain setups (the output section is current).
void SetupPointDomain(OutputSpec& spec, const Mesh& mesh, OutputList& list);
void SetupLineDomain(OutputSpec& spec, const Mesh& mesh, OutputList& list);
void SetupAreaDomain(OutputSpec& spec, const Mesh& mesh, OutputList& list);

// True when step n is one of the output's steps (n = -1: always).
bool OutputStepDue(const OutputSpec& spec, int n);

// Creates the files of every included output (header, time axis, items,
// mesh). projection: the mesh's projection string.
void OpenOutputFiles(OutputList& list, const Mesh& mesh);

// Writing one record of step n at time t (seconds since the start):
// BeginOutputRecord is false when n is not one of the output's steps, when
// its file is not open, or when the state of time t is written already (the
// emergency record right after the record of the same state). Then every item
// in item order, then EndOutputRecord. The file is flushed after the last
// item of the record.
bool BeginOutputRecord(const OutputSpec& spec, int n, double t);
// A field item from element values (the delete value where masked) onto the
// output's domain; node_values is a work array over the mesh's nodes. On a
// point output this writes the item's records of every point.
void WriteFieldItem(OutputSpec& spec, const Mesh& mesh, const OutputItem& item, const Array1<double>& element_values,
                    Array1<double>& node_values, double t);
// A one-value item (mass budgets, discharges).
void WriteValueItem(OutputSpec& spec, double value, double t);
void EndOutputRecord(OutputSpec& spec, double t);

// Closes every file (each logs its "Data File Summary").
void CloseOutputFiles(OutputList& list);

// Point-in-polygon test (even-odd rule; a point on an edge may fall on either side).
bool PointInPolygon(double x, double y, const std::vector<double>& px, const std::vector<double>& py);

// Mesh coordinate of a coordinate given in the setup file, and back.
double ToMeshCoordinate(const Mesh& mesh, double value);
double FromMeshCoordinate(const Mesh& mesh, double value);

// Reads the point input of the current section: input_format 1 (default):
// number_of_points and the sections POINT_j (name, x, y); input_format 2:
// input_file_name (a point file, below). Coordinates come back in mesh
// coordinates. routine names the caller in messages.
void ReadPointInput(const std::string& routine, const Mesh& mesh, std::vector<double>& x, std::vector<double>& y,
                    std::vector<std::string>* names = nullptr);

// Reads a point list from a text file: one point per line, "x y [name]";
// blank lines and lines starting with '#' are skipped. A line that cannot be
// read is a fatal error naming the file and the line.
void ReadPointFile(const std::string& routine, const std::string& file, std::vector<double>& x,
                   std::vector<double>& y, std::vector<std::string>* names = nullptr);

}  // namespace vhd
