#pragma once
// Point sources and sinks: the section SOURCES of the HD module, the location
// of each source in the mesh, its values at every sub-step, the element
// source terms they give and the source result file.
//
// Source types and their values (each a time-varying input of the SOURCE_n
// subsection):
//   1 simple     discharge Q (m3/s, positive into the domain); water
//                released with no momentum of its own;
//   2 standard   Q and the x and y velocity (m/s, mesh axes) of the water
//                released;
//   3 connected  Q and the release velocity: Q >= 0 withdraws Q at this
//                source and releases it at its partner (connected_source),
//                Q < 0 the other way round;
//   4 jet        refused: the near-field jet model is not in this build;
//   5            no data of its own: the partner of a connected source.
// Withdrawn water leaves with the velocity of its element, so withdrawal
// does not change the element's velocity. Momentum acts on wet elements only
// (as every element source); the water of a source enters every element,
// dry or not, and so is never lost: a dry element holding it floods at the
// drying depth.
//
// A withdrawal never takes more water than its element holds at the start of
// the sub-step plus what the sources before it in number order gave it; a
// connected source releases exactly what it withdrew, so a pair changes no
// volume.
//
// Several processes: every process holds the whole mesh, reads every
// source's data and locates every source (so knows its element and the
// owner); the owner of a withdrawing element limits the withdrawal and the
// withdrawn discharges are summed over the processes (one owner per source,
// the others add 0), so every process knows what every source moved. Each
// process adds the terms of its owned elements and books their volumes.

#include <string>
#include <vector>

#include "core/array1.hpp"
#include "io/dataspec.hpp"
#include "io/zrn.hpp"
#include "mesh/search_tree.hpp"
#include "parallel/exact_sum.hpp"

namespace vhd {

struct HdModule;
struct HdSolver;
struct Mesh;

inline constexpr int kSourceSimple = 1;
inline constexpr int kSourceStandard = 2;
inline constexpr int kSourceConnected = 3;
inline constexpr int kSourceJet = 4;
inline constexpr int kSourceNoData = 5;

struct SourceRecord {
  int number = 0;  // the SOURCE_n subsection
  bool include = true;
  int type = kSourceSimple;
  int format_coordinates = 0;  // 0 fixed, 1 moving (position from a file)
  std::string name;            // the subsection's name, for messages
  double x = 0.0, y = 0.0;     // position in the mesh's coordinates
  int element = 0;             // element holding the position (0: not located)
  int connected_source = 0;    // partner of a connected source
  DataSpec data;               // Q (and the release velocity), none for type 5
  DataSpec position;           // moving: x and y from a data file
  // Values (Q, u, v) at the old and new time of the sub-step.
  double values_old[3] = {0, 0, 0}, values_new[3] = {0, 0, 0};
  // Discharge moved in the last sub-step (m3/s): into the domain at this
  // source (negative: withdrawn); for a connected source the discharge
  // taken from its giving side to the other.
  double discharge = 0.0;
};

struct HdSources {
  int number_of_sources = 0;
  int output_type = 0;  // 0 none, else the source result file
  std::string output_file_name;
  int output_frequency = 1;  // in overall time steps
  int merge_data = 0;
  std::vector<SourceRecord> sources;  // all, numbered from 1 at index 0
  SearchTree2D tree;                  // for moving sources

  // Per source (index 0 ..): the discharge withdrawn in the sub-step, summed
  // over the processes.
  std::vector<double> withdrawn;
  // Per element: discharge of the sources in it (m3/s, owned elements).
  Array1<double> element_rate;
  // Volumes in and out over the run (m3, this process's owned elements).
  ExactSum inflow, outflow;

  ZrnFile file;
  bool file_open = false;

  bool Active() const { return number_of_sources > 0; }
};

// Reads SOURCES (absent: none) inside the HD module section, checks the
// connected pairs, locates the sources on the velocity mesh and opens their
// data.
void SetupSourcesHD(HdModule& hd, const Mesh& mesh);

// Values at time t (the end of the sub-step of length dt), new positions of
// moving sources, and the source terms of the owned elements added to
// solver.src_h, src_P, src_Q.
void UpdateSourcesHD(HdModule& hd, HdSolver& solver, const Mesh& mesh, double t, double dt);

// The source result file (process 0): one item per included source, the
// discharge of the last sub-step (at step 0 the discharge of the data at the
// start), every output_frequency overall steps.
void OpenSourceOutputHD(HdModule& hd);
void WriteSourceOutputHD(HdModule& hd, int n, double t);
void CloseSourcesHD(HdModule& hd);

}  // namespace vhd
