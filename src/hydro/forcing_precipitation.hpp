#pragma once
// Precipitation and evaporation: the section PRECIPITATION_EVAPORATION of the
// HD module with its subsections PRECIPITATION and EVAPORATION, and the
// rates per element that the element update adds to the continuity equation.
//
// Keys: type_of_precipitation 0 none, 1 precipitation (with a separate
// evaporation), 2 net precipitation (negative values evaporate);
// type_of_evaporation 0 none, 1 from EVAPORATION (read only when the
// precipitation is not net). Each rate is a constant (format 0), a time
// series constant in the domain (format 1) or a field varying in time and
// domain (format 3), in mm/day, with a linear soft start over
// soft_time_interval.
//
// Dry elements: rain on a dry element is kept (the element update raises its
// depth; it floods when the water reaches the drying depth). Evaporation
// never takes more water than the element holds at the start of the
// sub-step plus what enters it from sources and rain in that sub-step, so no
// depth is driven below zero by it. The volumes added and taken are booked
// per element (gain, loss) for the volume balance and the mass budgets.

#include "core/array1.hpp"
#include "io/dataspec.hpp"
#include "parallel/exact_sum.hpp"

namespace vhd {

struct HdModule;
struct HdSolver;
struct Mesh;

struct HdPrecipitation {
  int type_of_precipitation = 0;  // 0 none, 1 precipitation, 2 net precipitation
  int type_of_evaporation = 0;    // 0 none, 1 from EVAPORATION
  DataSpec precipitation, evaporation;  // values in mm/day
  // Per element (m/s), fields (format 3) only: the rate read at the current
  // time, after the soft start.
  Array1<double> precipitation_rate, evaporation_rate;
  // Per owned element (m/s): what the last sub-step added (gain >= 0) and took
  // (loss >= 0, after the limit to the water present).
  Array1<double> gain, loss;
  // Per owned element: the volumes added and taken over the run (m3). Each
  // element adds its own terms in step order, so the totals, and their exact
  // sum, do not depend on the threads or processes.
  Array1<double> gain_total, loss_total;

  bool Active() const { return type_of_precipitation > 0 || type_of_evaporation > 0; }
};

// mm/day to m/s.
inline constexpr double kMillimetresPerDay = 1.0 / 86400000.0;

// Reads PRECIPITATION_EVAPORATION (absent: none) inside the HD module section
// and opens the data files on the velocity mesh.
void SetupPrecipitationHD(HdModule& hd, const Mesh& mesh);

// Rates at time t (s since the simulation start, the end of the sub-step of
// length dt), and their depth rates added to solver.src_h of every owned
// element, after the sources (whose inflow the evaporation limit counts).
void UpdatePrecipitationHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t, double dt);

// Volumes of precipitation and evaporation (negative) over the run, the
// exact sums over the owned elements 1 .. nown of this process.
void PrecipitationVolumesHD(const HdPrecipitation& p, int nown, ExactSum& precipitation, ExactSum& evaporation);

void ClosePrecipitationHD(HdPrecipitation& p);

}  // namespace vhd
