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
//   4 jet        Q released through the near-field jet model (below), at
//                the element where the jet ends, with the jet's momentum;
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
// Jets: a top-hat round jet in the ambient current taken distance_upstream
// upstream of the source (jet.cpp; docs/decisions.md): Morton entrainment dQ/ds = 2 pi b alpha
// |w - u_a| (alpha = entrainment, b = sqrt(Q / (pi |w|))), the ambient
// momentum of the entrained water added, the path followed for at most
// maximum_distance. In still water the dilution is 1 + 4 alpha s / D, the
// classical 0.28 s / D of a round jet for alpha = 0.07. The results at the
// ends of number_of_sections equal sections go to the log.
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

// Near-field model of a jet source (type 4) and its results at the ends of
// its sections.
struct JetPoint {
  double x = 0, y = 0, z = 0;  // end of the section (mesh coordinates; z above datum)
  double discharge = 0;        // jet discharge there, entrained water included (m3/s)
  double width = 0;            // characteristic width, twice the top-hat radius (m)
  double dilution = 0;         // discharge over the source's discharge
  double distance = 0;         // along the jet from the source (m)
  int stop = 0;                // stop code of the jet (kJetStop...)
};

inline constexpr int kJetStopDistance = 0;  // reached maximum_distance
inline constexpr int kJetStopVelocity = 1;  // excess velocity below gamma (m/s)
inline constexpr int kJetStopAmbient = 2;   // excess velocity below epsilon times the ambient speed
inline constexpr int kJetStopSurface = 3;   // reached the surface or the bed
inline constexpr int kJetStopLand = 4;      // reached a dry element or the edge of the mesh

struct JetModel {
  int vertical_position = 2;  // interpolation_type (2 to 4)
  double diameter = 0.2, sigma = 0.0, theta = 0.0, maximum_distance = 500.0;
  double gamma = 0.01, epsilon = 0.1, delta = 5.0, entrainment = 0.07;
  int position = 2, distribution = 2, upstream = 1;
  double distance_upstream = 10.0;
  int number_of_sections_radius = 3, number_of_sections_circle = 12, number_of_sections = 5;
  double north = 0.0;  // true north at the source, degrees clockwise from the mesh's y axis
  std::vector<JetPoint> points;     // one per section
  double x_upstream = 0, y_upstream = 0, distance_to_upstream = 0;
  int upstream_element = 0;  // element of the upstream ambient point (0: outside)
  int end_element = 0;       // element that receives the discharge
  // Where the last report found the jet: its end element, -1 on land, -2
  // outside the mesh, times 4 plus 0, 1, 2 for the upstream point in water,
  // on land, outside (a new report only when this changes).
  int report_key = -1000000;
  // The water column and current at the source (m, m/s).
  double z_bed = 0, z_surface = 0, u_source = 0, v_source = 0;
  double release_u = 0, release_v = 0;  // velocity of the water released (m/s)
};

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
  JetModel jet;                // type 4
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
  // Per source, the values of elements that the jets read (summed over the
  // processes: each from the owner of its element).
  std::vector<double> jet_values;
  std::vector<int> jet_keys;  // per source, work of the jet update
  bool has_jets = false;
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

// The near-field model of jet s (discharge values_new[0] > 0) from the
// ambient current (u_a, v_a, m/s in the mesh's axes) and the water column
// (bed z_bed, surface z_surface) at the source: fills s.jet.points and the
// release velocity. metres_x, metres_y: metres per unit of the mesh's x and
// y at the source (1 on projected meshes). Reads no element.
void RunJetModel(SourceRecord& s, double u_a, double v_a, double z_bed, double z_surface, double metres_x,
                 double metres_y);
void WriteSourceOutputHD(HdModule& hd, int n, double t);
void CloseSourcesHD(HdModule& hd);

}  // namespace vhd
