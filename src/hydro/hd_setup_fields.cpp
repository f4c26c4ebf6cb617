#include "hydro/hd_setup_fields.hpp"

#include <cmath>
#include <string>

#include "core/omp.hpp"
#include "io/setup.hpp"
#include "log/log.hpp"

namespace vhd {

namespace {

std::string FileText(const ZrnFile& file, int item) {
  return "file " + ZrnLogName(file.name) + ", item " + std::to_string(item);
}

// Seconds of the file's step `step` measured from the simulation start.
double StepTime(const ZrnFile& file, int step, double offset) {
  double seconds = 0.0;
  zrnGetStepTime(file, step, seconds);
  return seconds - offset;
}

}  // namespace

bool OpenOptionalSectionHD(std::string_view name) {
  if (!SktSectionExists(name)) return false;
  SktOpenSection(name);
  return true;
}

void ReadElementItemHD(ZrnFile& file, int item, int step, const Array1<int>& file_index, int nelements,
                       Array1<double>& values, Array1<double>& file_values, std::string_view who) {
  // Messages are formed only on failure: this also runs inside the time loop.
  const auto w = [who] { return std::string(who); };
  int nitems = 0;
  zrnGetNoOfItems(file, nitems);
  if (item < 1 || item > nitems) {
    FatalError(w() + ": item_number " + std::to_string(item) + " is not an item of file " +
               ZrnLogName(file.name) + " (it has " + std::to_string(nitems) + " items)");
  }
  ZrnSpatialAxis axis;
  zrnGetItemDim(file, item, axis);
  if (axis.type != kZrnAxisD4 || axis.location != kZrnLocationFace || axis.Count() != nelements) {
    FatalError(w() + ": " + FileText(file, item) + " does not hold one value per element of the mesh (" +
               std::to_string(axis.Count()) + " values, " + std::to_string(nelements) + " elements)");
  }
  if (step >= file.time.nsteps) {
    FatalError(w() + ": " + FileText(file, item) + " has no time step " + std::to_string(step));
  }
  // The file holds the elements in the mesh file's order.
  const bool renumbered = !file_index.empty();
  Array1<double>& read = renumbered ? file_values : values;
  if (read.size() != nelements) read.assign(nelements, 0.0);
  ZrnReadItemAtStep(file, step, item, read.begin(), nelements);
  const double del = file.delete_value;
  for (int k = 1; k <= nelements; ++k) {
    if (!std::isfinite(read[k]) || read[k] == del) {
      FatalError(w() + ": " + FileText(file, item) + " has no value for element " + std::to_string(k));
    }
  }
  if (renumbered) {
    if (values.size() != nelements) values.assign(nelements, 0.0);
    for (int e = 1; e <= nelements; ++e) values[e] = file_values[file_index[e]];
  }
}

void ReadElementFileHD(const std::string& file_name, int item, const Array1<int>& file_index, int nelements,
                       Array1<double>& values, std::string_view who) {
  ZrnFile file;
  ZrnOpenInput(file, file_name);
  Array1<double> file_values;
  ReadElementItemHD(file, item, 0, file_index, nelements, values, file_values, who);
  zrnFileClose(file);
  zrnHeaderDestroy(file);
}

void ReadElementFieldHD(ElementField& field, double def, const Array1<int>& file_index, int nelements,
                        bool time_varying,
                        std::string_view format_message, std::string_view who, const TimeAxis& time) {
  SktReadKeyword("format", field.format, 0);
  const bool known = field.format == 0 || field.format == 2 || (time_varying && field.format == 3);
  if (!known) FatalError(format_message);
  if (field.format == 0) {
    SktReadKeyword("constant_value", field.constant_value, def);
    field.values.assign(nelements, field.constant_value);
    return;
  }
  SktReadFileName("file_name", field.file_name, std::string());
  SktReadKeyword("item_number", field.item_number, 1);
  if (field.file_name.empty()) {
    FatalError(std::string(who) + ": file_name missing in " + SktSectionPath());
  }
  if (field.format == 2) {
    ReadElementFileHD(field.file_name, field.item_number, file_index, nelements, field.values, who);
    return;
  }
  // Format 3: open the file, check that it covers the simulation and read the
  // first two steps.
  ZrnOpenInput(field.file, field.file_name);
  field.nsteps = field.file.time.nsteps;
  field.file_offset = 0.0;
  if (field.file.time.type == kZrnTimeEqCalendar || field.file.time.type == kZrnTimeNeqCalendar) {
    field.file_offset = zrnSecondsBetween(field.file.time.start, zrnDateTime(time.start));
  }
  const double end = time.EndTime();
  if (field.nsteps < 1) {
    FatalError(std::string(who) + ": file " + ZrnLogName(field.file_name) + " holds no time step");
  }
  const double first = StepTime(field.file, 0, field.file_offset);
  const double last = StepTime(field.file, field.nsteps - 1, field.file_offset);
  if (field.nsteps == 1) {
    if (std::fabs(end - first) > 1e-6 || first > 1e-6) {
      FatalError("The data does not cover the entire simulation - only one time step in file");
    }
  } else if (first > 1e-6 || last < end - 1e-6) {
    FatalError("The data does not cover the entire simulation");
  }
  field.file_index = file_index;
  ReadElementItemHD(field.file, field.item_number, 0, field.file_index, nelements, field.values_a, field.file_values,
                    who);
  field.values_b = field.values_a;
  field.time_a = field.time_b = first;
  field.step_b = 0;
  field.values = field.values_a;
  UpdateElementFieldHD(field, 0.0, who);
}

bool UpdateElementFieldHD(ElementField& field, double t, std::string_view who) {
  if (field.format != 3) return false;
  const int n = field.values.size();
  // Move forward until time_a <= t <= time_b (or the file ends).
  while (t > field.time_b && field.step_b + 1 < field.nsteps) {
    std::swap(field.values_a, field.values_b);
    field.time_a = field.time_b;
    ++field.step_b;
    field.time_b = StepTime(field.file, field.step_b, field.file_offset);
    ReadElementItemHD(field.file, field.item_number, field.step_b, field.file_index, n, field.values_b,
                      field.file_values, who);
  }
  const double span = field.time_b - field.time_a;
  const double w = span > 0.0 ? std::fmin(1.0, std::fmax(0.0, (t - field.time_a) / span)) : 1.0;
  const double* a = field.values_a.data();
  const double* b = field.values_b.data();
  double* v = field.values.data();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= n; ++e) v[e] = a[e] * (1.0 - w) + b[e] * w;
  return true;
}

}  // namespace vhd
