#pragma once
// A per-element coefficient field of the HD settings (bed resistance, eddy
// viscosity, ice roughness); read and updated in hd_setup_fields.hpp.

#include <string>

#include "core/array1.hpp"
#include "io/zrn.hpp"

namespace vhd {

// One input definition of a per-element coefficient: a constant (format 0),
// values from a mesh data file read once (format 2), or a mesh data file that
// varies in time (format 3).
struct ElementField {
  int format = 0;
  double constant_value = 0.0;
  std::string file_name;
  int item_number = 1;
  Array1<double> values;  // per element, current values

  // Format 3: the open file and the two file steps that bracket the current
  // time (times in seconds since the simulation start).
  ZrnFile file;
  int nsteps = 0;
  int step_b = -1;  // later of the two steps in memory (-1: none read yet)
  double time_a = 0.0, time_b = 0.0;
  double file_offset = 0.0;  // simulation start minus the file's first step (s)
  Array1<double> values_a, values_b;
  // Format 3 on a renumbered mesh: the element order and the file's values.
  Array1<int> file_index;
  Array1<double> file_values;
};

}  // namespace vhd
