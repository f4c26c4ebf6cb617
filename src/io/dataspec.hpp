#pragma once
// Time-varying input data: one input definition per quantity that may vary in
// time or space (a forcing, a boundary value, a source value, a coefficient).
//
// An input definition is a constant or a data file read item by item:
//   format 0  constant values;
//   format 1  a data file read at every time (point series, line, grid or
//             mesh file; which kind follows from the file and the caller);
//   format 2  a data file read once, at the simulation start, then held;
//   format 3  as format 1;
//   format 4  the soft-start factor itself.
// Every value is brought towards its target from a reference value by the
// soft-start factor f(t) (0 at the start, 1 after the soft time interval):
//   v = r + f (v_data - r),
// except for a component that carries the no-soft-start flag.
//
// Components count from 1 (a vector quantity has n = 2). Times are seconds
// since the simulation start.
//
// This file holds what needs only the setup file and the log: reading a
// input definition, the soft start, interpolation in time, the check that a file
// covers the simulation and the table lookup. Opening the file and carrying
// its values onto a mesh is in mesh/femdata.hpp; the open-file state lives in
// the input definition so that each quantity owns its file.

#include <span>
#include <string>
#include <vector>

#include "core/array1.hpp"
#include "io/zrn.hpp"

namespace vhd {

inline constexpr int kDataConstant = 0;
inline constexpr int kDataFile = 1;
inline constexpr int kDataFileOnce = 2;
inline constexpr int kDataFileMap = 3;
inline constexpr int kDataSoftStartFactor = 4;

inline constexpr int kSoftStartNone = 0;
inline constexpr int kSoftStartLinear = 1;
inline constexpr int kSoftStartSine = 2;

inline constexpr int kTimeInterpolationLinear = 1;
inline constexpr int kTimeInterpolationCircular = 2;  // and above: angles in degrees

// What a caller expects of the file behind an input definition.
enum class FemDataExpect {
  kPoint,  // one value: a point series (.zrn0)
  kLine,   // values along a line or boundary: a point series or a line series (.zrn1)
  kGrid,   // an area on a grid: a point series (uniform) or a grid (.zrn2)
  kMesh,   // an area on the same flexible mesh (.zrnu)
  kArea,   // any area: a point series, a grid or a mesh file
};

// The open data file of an input definition and the two file steps that bracket
// the current time, already carried onto the caller's targets (elements,
// nodes, faces or points). Filled by FemDataOpen; read by FemDataRead.
struct DataFileState {
  bool open = false;
  ZrnFile file;
  FemDataExpect expect = FemDataExpect::kPoint;
  int axis_type = kZrnAxisUndefined;  // spatial axis of the items read
  long record_size = 0;               // values in one item record
  int nsteps = 0;
  double offset = 0.0;        // file time of the simulation start (s)
  std::vector<double> times;  // of every step, simulation seconds
  double first_time = 0.0, last_time = 0.0;

  // Spatial map: target i takes sum_j weight[(i-1)*nweights + j] *
  // record[source[(i-1)*nweights + j]] (sources from 0; weights of one target
  // sum to 1 over the sources that hold data).
  int ntargets = 0;
  int nweights = 1;
  std::vector<long> source;
  std::vector<double> weight;

  // Unit conversion per component: file unit to the unit the engine computes in.
  Array1<int> unit_from, unit_to;

  // Bracketing steps: step1 (from 0; -1 before the first read) at t1 and the
  // next step at t2, simulation seconds. With one step in the file, t1 = t2.
  int step1 = -1;
  double t1 = 0.0, t2 = 0.0;
  // Per component, the target values at t1 (a) and t2 (b), entries 1..ntargets.
  Array1<Array1<double>> a, b;
  std::vector<double> record;  // one item record as read
};

struct DataSpec {
  int format = kDataConstant;
  int n = 1;  // components
  Array1<double> constant_values;
  std::string file_name;
  Array1<int> item_numbers;
  Array1<char> no_soft_start;  // per component; set by an owning module (a direction)
  int type_of_soft_start = kSoftStartSine;
  double soft_time_interval = 0.0;
  Array1<double> reference_values;
  Array1<int> time_interpolation;  // per component: 1 linear, >= 2 circular (degrees)
  int type_of_space_interpolation = 0;
  DataFileState state;
};

// Sets up an input definition of n components with the caller's defaults and
// nothing read: constant values, item numbers 1..n (or the defaults given),
// reference values 0, linear time interpolation.
void InitDataSpec(DataSpec& spec, int n, const std::vector<double>& default_values = {},
                  const std::vector<int>& default_items = {});

// Reads an input definition from the current setup section (the caller has
// opened it). Keywords: format; constant_value(s) (format 0); file_name and
// item_number(s) (formats 1..3); type_of_soft_start, soft_time_interval,
// reference_value(s), type_of_time_interpolation (always);
// type_of_space_interpolation (formats 2, 3). The singular keyword forms are
// read when n = 1. A format outside 0..4 or a missing file name stops the run.
void ReadDataSpec(DataSpec& spec, int n, const std::vector<double>& default_values = {},
                  const std::vector<int>& default_items = {});

// The same, for a quantity that allows only the given formats: any other
// format stops the run with format_message, followed by the format and the
// section. Empty formats: every format of a data input.
void ReadDataSpec(DataSpec& spec, int n, std::span<const int> formats, const std::string& format_message,
                  const std::vector<double>& default_values = {}, const std::vector<int>& default_items = {});

// Soft-start factor at time t for a soft start type and interval T.
double SoftStartFactor(int type, double interval, double t);
inline double SoftStartFactor(const DataSpec& spec, double t) {
  return SoftStartFactor(spec.type_of_soft_start, spec.soft_time_interval, t);
}
// The value v of component k brought from the reference value by the factor
// f, unless k carries the no-soft-start flag.
inline double ApplySoftStart(const DataSpec& spec, int k, double f, double v) {
  if (spec.no_soft_start[k]) return v;
  const double r = spec.reference_values[k];
  return r + f * (v - r);
}

// Value between a (weight 1 - w) and b (weight w). Type 1: linear; type 2 or
// more: angles in degrees, taken the short way round (not folded into 0..360).
double InterpolateInTime(int type, double a, double b, double w);

// Checks that a file with nsteps steps from first to last (simulation
// seconds) covers the simulation from start to end. Failure without status is
// a fatal error naming the file; with status: 0 covered, 1 one step only and
// the simulation longer than an instant, 2 the file starts late or ends early.
int CheckDataCoverage(int nsteps, double first, double last, double start, double end,
                      const std::string& file_name, int* status = nullptr);

// Table lookup in pairs (x[i], y[i]) with x non-decreasing: y[0] below x[0],
// the last y above the last x, else linear in the last pair whose interval
// holds v. A table of one pair gives y[0]; an empty table gives 0.
double TableLookup(std::span<const double> x, std::span<const double> y, double v);
// The inverse lookup: x for a given y (y non-decreasing).
inline double TableLookupInverse(std::span<const double> x, std::span<const double> y, double v) {
  return TableLookup(y, x, v);
}

}  // namespace vhd
