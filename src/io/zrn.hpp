#pragma once
// Data files (zrn): time series, line series, grids and flexible-mesh files.
//
// Every zrn file is a netCDF-4 file in the classic model that follows the CF
// conventions (and UGRID for meshes), so that other tools can read our results
// and write our inputs. The extension names the kind:
//
//   .zrn0  time series of points   items (time)
//   .zrn1  line series             items (time, x)
//   .zrn2  2D grid                 items (time, y, x)
//   .zrn3  3D grid                 items (time, z, y, x)
//   .zrnu  flexible mesh           items (time, mesh location); file types 2000..2004
//
// One ZrnFile record is kept per open file. Every zrn* call returns 0 on
// success or one of the numbered error codes below. Every call takes an
// optional status as its last argument: when given, the code is stored there
// and the call returns; when absent, a failure ends the run through StopRun
// with "ZRN Error: " and the code's text, naming the file.
//
// Writing order: zrnHeaderCreate (data type, delete value, projection, custom
// block), a time axis, the items with their spatial axes (and, for .zrnu, the
// mesh), zrnFileCreate, static items, then per time step every dynamic item in
// item order (zrnWriteItemTimeStep), zrnFileFlush when asked, zrnFileClose.
//
// Reading order: zrnFileRead, header/time axis/item getters, static items
// (zrnStaticRead + zrnStaticGetData, or zrnStaticSkip), then dynamic items in
// step and item order (zrnReadItemTimeStep, zrnSkipItem, zrnSkipTimeStep), or
// anywhere after zrnFindItemDynamic. A static read after a dynamic read fails.
//
// Data layout of one item record: D0 one value; D1 n values along x; D2 values
// y-major (index j*nx + i); D3 z-major then y then x; D4 one value per mesh
// node, face (element) or volume in the mesh's order. Data pointers point at
// the first value (for an Array1 `a`, pass a.begin()).

#include <array>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "core/array1.hpp"

namespace vhd {

// ---- error codes --------------------------------------------------------------

inline constexpr int kZrnOk = 0;
inline constexpr int kZrnErrOpen = 101;               // "Unable to open ZRN file"
inline constexpr int kZrnErrFileType = 102;           // "Invalid type of ZRN file"
inline constexpr int kZrnErrItemNumber = 103;         // "Invalid item number"
inline constexpr int kZrnErrStaticCount = 104;        // "Unable to detect number of static items"
inline constexpr int kZrnErrItem = 105;               // "Invalid item"
inline constexpr int kZrnErrSpatialAxis = 106;        // "Invalid spatial axis"
inline constexpr int kZrnErrTimeAxis = 107;           // "Invalid time axis"
inline constexpr int kZrnErrAddBlock = 108;           // "Unable to add custom block"
inline constexpr int kZrnErrGetBlock = 109;           // "Unable to get custom block value"
inline constexpr int kZrnErrSetBlock = 110;           // "Unable to set custom block value"
inline constexpr int kZrnErrMemory = 111;             // "Unable to allocate memory"
inline constexpr int kZrnErrReadStatic = 201;         // "Unable to read static item"
inline constexpr int kZrnErrReadDynamic = 202;        // "Unable to read dynamic item"
inline constexpr int kZrnErrStaticAfterDynamic = 203; // "Static read call after dynamic"
inline constexpr int kZrnErrSkip = 204;               // "Unable to skip data"
inline constexpr int kZrnErrFlush = 205;              // "Unable to flush file"
inline constexpr int kZrnErrCreateHeader = 301;       // "Unable to create header"
inline constexpr int kZrnErrCreateFile = 302;         // "Unable to create file"
inline constexpr int kZrnErrWriteStatic = 401;        // "Unable to write static item"
inline constexpr int kZrnErrWriteDynamic = 402;       // "Unable to write dynamic item"
inline constexpr int kZrnErrStaticWriteAfterDynamic = 403;  // "Static write call after dynamic"
inline constexpr int kZrnErrStaticBlock = 501;        // "Unable to locate static block"
inline constexpr int kZrnErrDynamicBlock = 502;       // "Unable to locate dynamic block"

// Text of a code ("Unknown error: " and the number for any other code).
std::string zrnErrorText(int code);

// ---- codes and small records ------------------------------------------------------

// File type codes. Mesh-based files (.zrnu) use 2000..2004.
inline constexpr int kZrnFileData = 1;            // .zrn0 .. .zrn3
inline constexpr int kZrnFileMesh2D = 2000;       // 2D horizontal mesh
inline constexpr int kZrnFileMeshColumn = 2001;   // 1D vertical column
inline constexpr int kZrnFileMeshProfile = 2002;  // vertical profile
inline constexpr int kZrnFileMesh3DSigma = 2003;  // layered 3D mesh, sigma layers
inline constexpr int kZrnFileMesh3DSigmaZ = 2004; // layered 3D mesh, sigma/z layers
inline bool zrnIsMeshFileType(int t) { return t >= 2000 && t <= 2004; }

// Kind of file from the extension of a file name: 0..3 for .zrn0 .. .zrn3,
// 4 for .zrnu, -1 for anything else.
int zrnFileKind(std::string_view file_name);

// Time axis types.
inline constexpr int kZrnTimeUndefined = 0;
inline constexpr int kZrnTimeEqRelative = 1;   // equidistant, seconds from an offset
inline constexpr int kZrnTimeNeqRelative = 2;  // non-equidistant, seconds
inline constexpr int kZrnTimeEqCalendar = 3;   // equidistant from a start date-time
inline constexpr int kZrnTimeNeqCalendar = 4;  // non-equidistant from a start date-time

// Spatial axis types of an item.
inline constexpr int kZrnAxisUndefined = -1;
inline constexpr int kZrnAxisD0 = 0;  // one point
inline constexpr int kZrnAxisD1 = 1;  // equidistant line along x
inline constexpr int kZrnAxisD2 = 2;  // equidistant grid (y, x)
inline constexpr int kZrnAxisD3 = 3;  // equidistant grid (z, y, x)
inline constexpr int kZrnAxisD4 = 4;  // flexible mesh location

// Mesh locations of a D4 item.
inline constexpr int kZrnLocationFace = 1;    // one value per (2D) element
inline constexpr int kZrnLocationNode = 2;    // one value per node
inline constexpr int kZrnLocationVolume = 3;  // one value per 3D (layered) element

// Value types of an item.
inline constexpr int kZrnInstantaneous = 0;
inline constexpr int kZrnAccumulated = 1;
inline constexpr int kZrnStepAccumulated = 2;
inline constexpr int kZrnMeanStepBackward = 3;
inline constexpr int kZrnMeanStepForward = 4;

// Storage precision of an item.
inline constexpr int kZrnFloat = 1;
inline constexpr int kZrnDouble = 2;

inline constexpr double kZrnDefaultDeleteValue = 1e-35;

// A calendar date-time (proleptic Gregorian), whole seconds.
struct ZrnDateTime {
  int year = 1990, month = 1, day = 1, hour = 0, minute = 0, second = 0;
};
ZrnDateTime zrnDateTime(const std::array<int, 6>& ymdhms);
// Seconds from a to b.
double zrnSecondsBetween(const ZrnDateTime& a, const ZrnDateTime& b);
// t plus s seconds (s rounded to whole seconds).
ZrnDateTime zrnAddSeconds(const ZrnDateTime& t, double s);
// "YYYY-MM-DD hh:mm:ss".
std::string zrnDateTimeText(const ZrnDateTime& t);
// Parses "YYYY-MM-DD hh:mm:ss" (also "T" as separator, missing time parts are 0).
bool zrnParseDateTime(std::string_view text, ZrnDateTime& t);

struct ZrnTimeAxis {
  int type = kZrnTimeUndefined;
  ZrnDateTime start;         // calendar axes
  double start_offset = 0;   // relative axes: time of step 0 in seconds
  double dt = 0;             // equidistant axes
  int nsteps = 0;            // steps in the file (written or readable)
};

struct ZrnSpatialAxis {
  int type = kZrnAxisUndefined;
  std::array<int, 3> n{1, 1, 1};          // nx, ny, nz (D1..D3); n[0] = count for D4
  std::array<double, 3> x0{0, 0, 0};      // origin of x, y, z
  std::array<double, 3> dx{1, 1, 1};      // spacing of x, y, z
  int location = 0;                       // D4 only
  long Count() const;                     // values in one record
};

struct ZrnItemInfo {
  std::string name;
  int item_type = 999;   // unit-library item type key (999 undefined)
  int unit = 0;          // unit-library unit key (0 undefined)
  int precision = kZrnFloat;
  int value_type = kZrnInstantaneous;
  ZrnSpatialAxis axis;
  int compression = 0;   // deflate level 0..9
  // Filled by the layer:
  std::string var_name;  // netCDF variable name
  double minimum = 0, maximum = 0;  // of the values written or read so far
  long long nvalues = 0;            // values counted in minimum/maximum
};

struct ZrnCustomBlock {
  std::string name;
  bool integer = true;          // stored as NC_INT (else NC_DOUBLE)
  std::vector<double> values;
};

// A flexible mesh as written to and read from a .zrnu file. Node and element
// numbers count from 1 in memory; element e has the nodes
// node_list[node_start[e]] .. node_list[node_start[e+1]-1].
struct ZrnMeshData {
  int ndim = 2;
  int nlayers = 0;
  int nlayers_sigma = 0;
  Array1<int> node_id;
  Array1<double> x, y, z;
  Array1<int> node_code;
  Array1<int> element_id;
  Array1<int> element_type;     // engine element type codes (21 triangle, 25 quad, ...)
  Array1<int> node_start;       // nelements + 1 entries, node_start[1] = 1
  Array1<int> node_list;
  Array1<double> face_x, face_y;  // element centres; filled from the nodes when empty
  int nnodes() const { return x.size(); }
  int nelements() const { return element_id.size(); }
};

// ---- the open-file record ------------------------------------------------------------

struct ZrnFile {
  std::string name;
  int file_type = kZrnFileData;
  std::string title;
  std::string creator = "VantorHD";
  int data_type = 0;
  double delete_value = kZrnDefaultDeleteValue;
  std::string projection;       // "LONG/LAT", "UTM-32", a PROJ string or WKT
  std::string crs_wkt;          // WKT of the projection when known (written as `crs`)
  int epsg = 0;                 // EPSG code when known (0 none)
  double origin_x = 0, origin_y = 0, orientation = 0;
  std::vector<ZrnCustomBlock> blocks;
  ZrnTimeAxis time;
  std::vector<ZrnItemInfo> items;         // dynamic items, items[k-1] is item k
  std::vector<ZrnItemInfo> statics;       // static items in file order
  std::vector<double> step_times;         // time of every step as zrnGetStepTime gives it (opened files)
  double first_time = 0, last_time = 0;   // times of the first and last step written
  ZrnMeshData mesh;                       // .zrnu: the mesh to write (cleared after create)

  // State of the open file.
  int ncid = -1;
  bool writing = false;     // dynamic records may be written (created or appended file)
  bool can_write = false;   // static items and custom blocks may be written
  bool flush_each_step = false;
  bool header_ready = false;
  int next_item = 1;        // next dynamic item to write or read (1..nitems, then 1 again)
  int current_step = 0;     // step of the next dynamic record
  bool dynamic_started = false;
  int next_static = 0;      // static items read or skipped so far
  std::string detail;       // the library's own message for the last failure
  std::vector<int> item_varid, static_varid;
  std::vector<double> fill, missing, scale, offset;  // per dynamic item (reading)
  // One dynamic record as stored, for either type of values (writing; sized when opened).
  std::vector<double> record;
  std::vector<float> record_float;
  int time_varid = -1;
};

// ---- header ------------------------------------------------------------------------

// Clears the record and starts a new header for a file to be created.
int zrnHeaderCreate(ZrnFile& f, const std::string& file_name, int file_type,
                    const std::string& title, int* status = nullptr);
// Releases everything held by the record (closes the file without summary when open).
int zrnHeaderDestroy(ZrnFile& f, int* status = nullptr);

int zrnSetDataType(ZrnFile& f, int data_type, int* status = nullptr);
int zrnGetDataType(const ZrnFile& f, int& data_type, int* status = nullptr);
int zrnSetDeleteValFloat(ZrnFile& f, double delete_value, int* status = nullptr);
int zrnGetDeleteValFloat(const ZrnFile& f, double& delete_value, int* status = nullptr);
// Projection string, origin, orientation (degrees), and the WKT of the
// projection when the caller knows it (written as the grid mapping `crs`).
int zrnSetGeoInfoUTMProj(ZrnFile& f, const std::string& projection, double x0, double y0,
                         double orientation, const std::string& crs_wkt = "", int epsg = 0,
                         int* status = nullptr);
int zrnGetGeoInfoUTMProj(const ZrnFile& f, std::string& projection, double& x0, double& y0,
                         double& orientation, int* status = nullptr);

// Custom blocks: a named list of numbers (the mesh header "TANO_KX": number of
// nodes, number of elements, ndim, nlayers, nlayers_sigma; "VX7_Misc" for others).
int zrnAddCustomBlock(ZrnFile& f, const std::string& name, const std::vector<int>& values,
                      int* status = nullptr);
int zrnAddCustomBlock(ZrnFile& f, const std::string& name, const std::vector<double>& values,
                      int* status = nullptr);
// Value k (from 1) of a block; 109 when the block or the value is missing.
int zrnGetCustomBlockValue(const ZrnFile& f, const std::string& name, int k, double& value,
                           int* status = nullptr);
int zrnSetCustomBlockValue(ZrnFile& f, const std::string& name, int k, double value,
                           int* status = nullptr);
// Name of the custom block for a file type ("TANO_KX" or "VX7_Misc").
std::string zrnCustomBlockName(int file_type);

// ---- time axis ---------------------------------------------------------------------

int zrnSetEqCalendarAxis(ZrnFile& f, const ZrnDateTime& start, double dt, int* status = nullptr);
int zrnSetNeqCalendarAxis(ZrnFile& f, const ZrnDateTime& start, int* status = nullptr);
int zrnSetEqTimeAxis(ZrnFile& f, double start_offset, double dt, int* status = nullptr);
int zrnSetNeqTimeAxis(ZrnFile& f, double start_offset, int* status = nullptr);
int zrnGetTimeAxisType(const ZrnFile& f, int& type, int* status = nullptr);
int zrnGetEqCalendarAxis(const ZrnFile& f, ZrnDateTime& start, double& dt, int& nsteps,
                         int* status = nullptr);
// span: seconds from the first to the last step.
int zrnGetNeqCalendarAxis(const ZrnFile& f, ZrnDateTime& start, double& span, int& nsteps,
                          int* status = nullptr);
int zrnGetEqTimeAxis(const ZrnFile& f, double& start_offset, double& dt, int& nsteps,
                     int* status = nullptr);
int zrnGetNeqTimeAxis(const ZrnFile& f, double& start_offset, double& span, int& nsteps,
                      int* status = nullptr);
// Time of step (from 0) in seconds: since the start date-time on calendar
// axes, on the axis itself (step 0 at the start offset) on relative axes. A
// non-equidistant file being written keeps the times of its first and last
// steps only (writing allocates nothing per step).
int zrnGetStepTime(const ZrnFile& f, int step, double& seconds, int* status = nullptr);

// ---- items -------------------------------------------------------------------------

// Defines dynamic item k (1..n; items are numbered without gaps). precision:
// kZrnFloat or kZrnDouble.
int zrnSetItemInfo(ZrnFile& f, int item, const std::string& name, int item_type, int unit,
                   int precision = kZrnFloat, int* status = nullptr);
int zrnSetItemValueType(ZrnFile& f, int item, int value_type, int* status = nullptr);
int zrnSetItemAxisEqD0(ZrnFile& f, int item, int* status = nullptr);
int zrnSetItemAxisEqD1(ZrnFile& f, int item, int nx, double x0, double dx, int* status = nullptr);
int zrnSetItemAxisEqD2(ZrnFile& f, int item, int nx, int ny, double x0, double y0, double dx,
                       double dy, int* status = nullptr);
int zrnSetItemAxisEqD3(ZrnFile& f, int item, int nx, int ny, int nz, double x0, double y0,
                       double z0, double dx, double dy, double dz, int* status = nullptr);
// location: kZrnLocationFace, kZrnLocationNode or kZrnLocationVolume; n values.
int zrnSetItemAxisEqD4(ZrnFile& f, int item, int location, int n, int* status = nullptr);
int zrnItemEnableCompression(ZrnFile& f, int item, int level = 4, int* status = nullptr);
int zrnGetNoOfItems(const ZrnFile& f, int& nitems, int* status = nullptr);
int zrnGetItemInfo(const ZrnFile& f, int item, std::string& name, int& item_type, int& unit,
                   int& value_type, int* status = nullptr);
int zrnGetItemAxisType(const ZrnFile& f, int item, int& axis_type, int* status = nullptr);
// The whole spatial axis of an item (sizes, origin, spacing, location).
int zrnGetItemDim(const ZrnFile& f, int item, ZrnSpatialAxis& axis, int* status = nullptr);

// The mesh of a .zrnu file: set before zrnFileCreate (it also sets the
// "TANO_KX" block), read after zrnFileRead.
int zrnSetMesh(ZrnFile& f, const ZrnMeshData& mesh, int* status = nullptr);
int zrnReadMesh(ZrnFile& f, ZrnMeshData& mesh, int* status = nullptr);

// ---- files ---------------------------------------------------------------------------

// Creates the file from the header (replacing an existing file). With
// flush_each_step, the file is flushed after the last item of every step.
int zrnFileCreate(ZrnFile& f, bool flush_each_step = true, int* status = nullptr);
// Opens a file for reading and reads its header, time axis and items. A plain
// CF time series (time coordinate with units, one variable per series) reads
// as a .zrn0 with defaults for missing zrn_* attributes.
int zrnFileRead(ZrnFile& f, const std::string& file_name, int* status = nullptr);
// Opens an existing zrn file to change static items or custom block values.
int zrnFileEdit(ZrnFile& f, const std::string& file_name, int* status = nullptr);
// Opens an existing zrn file to add time steps after its last one.
int zrnFileAppend(ZrnFile& f, const std::string& file_name, bool flush_each_step = true,
                  int* status = nullptr);
int zrnFileFlush(ZrnFile& f, int* status = nullptr);
// Closes the file and writes the "Data File Summary" block to the log.
int zrnFileClose(ZrnFile& f, int* status = nullptr);
int zrnFileDelete(const std::string& file_name, int* status = nullptr);

// ---- static items ----------------------------------------------------------------------

// Writing: zrnStaticCreate defines a static item (after zrnFileCreate, before
// the first dynamic write) and returns its number; zrnStaticWrite writes its data.
int zrnStaticCreate(ZrnFile& f, const ZrnItemInfo& info, int& static_no, int* status = nullptr);
int zrnStaticWrite(ZrnFile& f, int static_no, const double* data, long n, int* status = nullptr);
int zrnStaticWrite(ZrnFile& f, int static_no, const float* data, long n, int* status = nullptr);
// Reading in file order: zrnStaticRead gives the next static item's info,
// zrnStaticGetData its values (n must be the item's count); zrnStaticSkip passes one.
int zrnStaticRead(ZrnFile& f, ZrnItemInfo& info, int* status = nullptr);
int zrnStaticGetData(ZrnFile& f, double* data, long n, int* status = nullptr);
int zrnStaticSkip(ZrnFile& f, int* status = nullptr);
int zrnGetNoOfStatics(const ZrnFile& f, int& nstatics, int* status = nullptr);

// ---- dynamic items ----------------------------------------------------------------------

// Writes the next dynamic item of the current step (n values). time: the
// step's time as zrnGetStepTime gives it, for non-equidistant axes (taken from
// the first item of the step; steps must follow in increasing time), ignored
// for equidistant axes. A failed write leaves the record position unchanged.
int zrnWriteItemTimeStep(ZrnFile& f, double time, const double* data, long n,
                         int* status = nullptr);
int zrnWriteItemTimeStep(ZrnFile& f, double time, const float* data, long n,
                         int* status = nullptr);
// Reads the next dynamic record: returns its item number, its time (as
// zrnGetStepTime) and n values (the delete value where the file has no data).
int zrnReadItemTimeStep(ZrnFile& f, int& item, double& time, double* data, long n,
                        int* status = nullptr);
int zrnSkipItem(ZrnFile& f, int* status = nullptr);
// Skips the rest of the current step.
int zrnSkipTimeStep(ZrnFile& f, int* status = nullptr);
// Positions reading at item `item` of step `step` (from 0).
int zrnFindItemDynamic(ZrnFile& f, int step, int item, int* status = nullptr);
// Step of the next dynamic record and number of steps in the file.
int zrnGetDynamicPosition(const ZrnFile& f, int& step, int& item, int* status = nullptr);

// ---- wrappers ------------------------------------------------------------------------------

// Opens an input file for reading; a failure without status ends the run with
// "ZRN open error on file: " and the name.
int ZrnOpenInput(ZrnFile& f, const std::string& file_name, int* status = nullptr);
// Checks that an input item's unit fits the item type the caller requires;
// the failure text is "The Item type: ... does not have the required unit type: ...".
int ZrnCheckItemUnit(const ZrnFile& f, int item, int required_item_type, int* status = nullptr);
// Reads item `item` of step `step` in one call (find + read).
int ZrnReadItemAtStep(ZrnFile& f, int step, int item, double* data, long n, int* status = nullptr);
// Name as shown in messages and the log (without path when VX7F90_LOG_NOPATH is set).
std::string ZrnLogName(const std::string& file_name);
// The log lines of the "Data File Summary" block of an open file.
std::vector<std::string> ZrnSummaryLines(const ZrnFile& f);

}  // namespace vhd
