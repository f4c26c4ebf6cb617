#pragma once
// Per-element coefficient fields of the HD settings (bed resistance, eddy
// viscosity, initial conditions): reading their keys, their values from mesh
// data files (.zrnu, one value per element) and, for fields that vary in
// time, the linear interpolation between the two file steps that bracket the
// current time.

#include <string>
#include <string_view>

#include "core/array1.hpp"
#include "hydro/hd_module.hpp"

namespace vhd {

// Opens name (a section inside the current one) when it exists; returns false
// and leaves the current section unchanged when it does not, so that its keys
// keep their defaults.
bool OpenOptionalSectionHD(std::string_view name);

// Reads item `item` (from 1) of step `step` (from 0) of an opened mesh data
// file into values[1 .. nelements]. A file whose item is not one value per
// element of a mesh of nelements elements, or that has no such step, stops
// the run with a message naming `who`, the file and the item. The file holds
// the elements in the mesh file's order; on a renumbered mesh (file_index not
// empty, mesh/reorder.hpp) they are read into file_values and element e
// takes the value of its place file_index[e]. Sized arrays are not
// reallocated (this also runs in the time loop).
void ReadElementItemHD(ZrnFile& file, int item, int step, const Array1<int>& file_index, int nelements,
                       Array1<double>& values, Array1<double>& file_values, std::string_view who);
// Opens the file, reads item `item` of its first step and closes it.
void ReadElementFileHD(const std::string& file_name, int item, const Array1<int>& file_index, int nelements,
                       Array1<double>& values, std::string_view who);

// Reads the keys format, constant_value, file_name, item_number of the
// current section into field (default constant def) and fills field.values for
// nelements elements. Allowed formats: 0, 2 and, when time_varying, 3; any
// other format stops the run with format_message. A format-3 field is opened
// and checked to cover [0, end_time] of the simulation (start: date-time).
void ReadElementFieldHD(ElementField& field, double def, const Array1<int>& file_index, int nelements,
                        bool time_varying,
                        std::string_view format_message, std::string_view who, const TimeAxis& time);

// Brings a format-3 field to time t (s since the simulation start): values =
// linear interpolation between the bracketing file steps. Reads forward only.
// Returns true when the values changed.
bool UpdateElementFieldHD(ElementField& field, double t, std::string_view who);

}  // namespace vhd
