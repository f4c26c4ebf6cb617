#pragma once
// The particle-tracking (PT) module: Lagrangian particles released from
// sources, carried by the current of the hydrodynamic module and a wind
// drift, spread by random dispersion, settling to the bed, decaying, ageing,
// and written to track files.
//
// Particles live in a pool whose capacity is fixed at setup (every source
// releases a known number per step, so the whole run's releases are known).
// A particle keeps its slot for the whole run and its slot number is its id:
// ids are given in release order (source by source, class by class), so they
// do not depend on threads or processes. Slots are never reused.
//
// Particle states: 1 suspended in the water column (moved each step),
// 4 on the bed (sedimented, not moved; erosion lifts it back to 1),
// -1 dead (aged or decayed away), -2 lost through an open boundary.
//
// Units: positions in the mesh's coordinates (radians on a "LONG/LAT" mesh),
// z the level above datum (m, between the bed -d and the surface eta);
// velocities m/s; age s; the mass (the class's quantity) in its own unit.
//
// One step (StepPT), each per-particle pass a static OpenMP loop in which
// every iteration touches only its own particle:
//   1. node values of the new current (the current of the previous step is
//      kept: the time integration uses both);
//   2. release of the particles of the sources for the step;
//   3. per particle: ageing, erosion, velocity (current with the drift
//      profile, wind drift), dispersion, settling, the target position, the
//      element walk to it, decay.
// The time integration is Heun's method (explicit trapezoidal rule): the
// velocity at the start position from the current at the start of the step,
// a predicted position, the velocity there from the current at the end of the
// step, then the mean of the two. It is second order in time for a current
// that varies in space and time.

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "hydro/hd_module.hpp"
#include "io/dataspec.hpp"
#include "log/log.hpp"
#include "mesh/mesh.hpp"
#include "mesh/search_tree.hpp"

namespace vhd {

inline constexpr int kParticleFree = 0;
inline constexpr int kParticleSuspended = 1;
inline constexpr int kParticleSedimented = 4;
inline constexpr int kParticleDead = -1;
inline constexpr int kParticleLost = -2;

// Result of the element walk of one particle.
inline constexpr int kWalkInside = 0;     // reached its target
inline constexpr int kWalkClosed = 1;     // stopped at a closed boundary (or a dry element)
inline constexpr int kWalkLost = 2;       // left through an open boundary
inline constexpr int kWalkSearched = 3;   // found by the search tree after the walk failed
inline constexpr int kWalkNotFound = 4;   // put back to its old position

struct Particle {
  int state = kParticleFree;
  int move_status = kWalkInside;
  int element = 0;
  int cls = 0;     // class, from 1
  int source = 0;  // source, from 1
  double x = 0.0, y = 0.0, z = 0.0;
  double mass = 0.0;
  double age = 0.0;                   // s
  double u = 0.0, v = 0.0, w = 0.0;   // last velocity (m/s)
};

struct PtClass {
  bool include = true;
  std::string name, description;
  int flood_dry_type = 1;  // 1: particles do not enter dry elements
  int uvq_type = 999, uvq_unit = 999;
  double minimum_particle_mass = 0.0;
  double maximum_particle_mass = 1.0e30;
  double maximum_particle_age = 1.0e30;  // s
  // Processes.
  double decay_rate = 0.0;              // DECAY: first-order rate k (1/s), mass *= exp(-k dt)
  double settling_velocity = 0.0;       // SETTLING: w_s (m/s, positive down)
  double horizontal_dispersion = 0.0;   // DISPERSION: D_h (m2/s)
  double vertical_dispersion = 0.0;     // D_v (m2/s)
  bool erosion = false;                 // EROSION: lifts sedimented particles
  double critical_shear = 0.1;          // N/m2
};

// Kinds of source.
inline constexpr int kSourcePoint = 1;
inline constexpr int kSourceArea = 2;
inline constexpr int kSourceFile = 3;

struct PtSourceClass {
  int number_of_particles_per_timestep = 0;
  double type_value = 1.0;  // amount a source releases per particle
};

struct PtSource {
  bool include = true;
  int type = kSourcePoint;
  int format = 0;
  int first_step = 1, last_step = 1 << 30;  // steps on which it releases (not a file source)
  // Point source: one position; moving (format 1): positions at times
  // (seconds since the start), linear between them, held outside.
  std::vector<double> times, xs, ys, zs;
  // Vertical placement: 0 at the given z (clipped to the water column),
  // 1 at the surface, 2 at the bed, 3 spread evenly over the column.
  int vertical_type = 1;
  bool fail_on_misplaced = false;
  // Area sources: release points (with their element), each step the same
  // set; particles are handed to the points in turn.
  std::vector<double> px, py;
  std::vector<int> pelement;
  // Geometric source with distribute: triangles (three points each) and the
  // cumulative area fractions by which a particle picks its triangle.
  std::vector<double> tri;  // x1 y1 x2 y2 x3 y3 per triangle
  std::vector<double> tri_cumulative;
  // File source: particles read once and released on their step.
  struct FileParticle {
    int step = 0, cls = 1;
    double x = 0, y = 0, z = 0, mass = 0;
  };
  std::vector<FileParticle> file_particles;
  std::vector<PtSourceClass> classes;  // per class
};

// Wind-induced drift and the current profile over the depth.
struct PtDriftProfile {
  int type = 0;  // 0 and 6 none; 1, 3 logarithmic current profile; 2, 4, 5 uniform current
  double wind_drift_factor = 0.0;
  double depth_of_wind_influence = 100.0;  // m
  double offshore_limit = 100.0;
  double wind_weight = 0.0;
  double wind_drift_angle_parameter = 28.0;  // degrees
  double kinematic_viscosity = 1.0e-6;       // m2/s
  double dynamic_viscosity = 0.001;
  double bed_roughness = 0.05;               // Nikuradse ks (m)
};

// One track output.
struct PtOutput {
  bool include = true;
  std::string file_name;
  bool netcdf = false;  // the name ends in ".nc"
  int first_step = 0, last_step = 1 << 30, frequency = 1;
  int first_particle = 1, last_particle = 1 << 30, particle_frequency = 1;
  bool compressed = false, include_xsl = false;
  bool horizontal_direction = false, horizontal_speed = false, vertical_speed = false, age = false;
  bool mass = true;  // STATE_VARIABLE_1: the class's quantity
  std::string xsl_name = "QRVRenderParticelTrack.xsl";
  struct Writer;
  std::shared_ptr<Writer> writer;
};

// Statistics of the run (this process).
struct PtStatistics {
  long long from_sources = 0;
  long long max_active = 0;
  long long lost_boundary = 0;
  long long dead = 0;
  long long moved_other_domain = 0;
  long long walk_searched = 0;
  // Per class (from 1): the amount released.
  std::vector<double> amount_sources;
};

inline constexpr int kPtTimerStep = 1;      // "Particle Track Simulation"
inline constexpr int kPtTimerForcings = 2;  // "Update forcings"
inline constexpr int kPtTimerTracks = 3;    // "Calculate particle tracks"
inline constexpr int kPtTimerTotal = 4;     // "Total"

struct PtModule {
  int mode = 0;
  std::uint64_t seed = 1;
  int type_of_vertical_interpolation = 1;
  int type_of_vertical_transport = 1;
  int mesh_number = 1;
  const Mesh* mesh = nullptr;
  bool geographic = false;
  TimeAxis time;
  double dt = 0.0;

  std::vector<PtClass> classes;  // from 0 (class k is classes[k-1])
  std::vector<PtSource> sources;
  PtDriftProfile drift;
  bool wind = false;
  DataSpec wind_spec;  // x and y wind velocity (m/s), uniform over the mesh
  std::vector<PtOutput> outputs;

  // Pool: capacity fixed at setup; slots 1 .. nparticles in use.
  Array1<Particle> particles;
  int nparticles = 0;
  int capacity = 0;

  SearchTree2D tree;
  // Node values of the current at the start and the end of the step, and of
  // the surface elevation and the bed.
  Array1<double> u0, v0, u1, v1;
  Array1<double> eta_node, bed_node;
  bool have_start_current = false;
  double wind_x = 0.0, wind_y = 0.0;  // wind of the step (m/s)
  double t_state = 0.0;               // time of the particle positions (s since the start)

  PtStatistics stats;
  TimingSet timing;
};

// ---- setup (pt_setup.cpp) -----------------------------------------------------------

// Reads PARTICLE_TRACKING_MODULE (the caller has opened nothing) for the
// mode selected in MODULE_SELECTION, builds the search tree and sizes the pool.
// The particles move on the velocity mesh SPACE.number_of_2D_mesh_velocity.
void SetupPT(PtModule& pt, int selected_mode, const RunControl& run, const TimeAxis& time,
             const std::vector<const Mesh*>& meshes);

// ---- the step (pt_step.cpp) ---------------------------------------------------------

// The flow the particles move in: the velocity-mesh state of the HD module.
// Before the first step (t = 0): takes the current as the start current.
void UpdateInitStepPT(PtModule& pt, const HdState& hd);
// Advances the particles over step n (from (n-1) dt to n dt).
void StepPT(PtModule& pt, const HdState& hd, int n);
// Element walk from (x0, y0) in element e towards (x1, y1): returns a kWalk
// code and leaves in e, x1, y1 where the particle ends (on the face where it
// stopped at a closed boundary or left through an open one). avoid_dry: a
// dry element (code 0) is a closed wall.
int WalkPT(const PtModule& pt, const Array1<int>& wetdry, bool avoid_dry, int& e, double x0, double y0, double& x1,
           double& y1);
// Wind drift velocity (m/s) at depth s below the surface for wind (wx, wy):
// the drift factor times the wind, turned clockwise by the deflection angle,
// fading linearly to zero at the depth of wind influence.
void WindDriftPT(const PtDriftProfile& drift, double wx, double wy, double s, double& ud, double& vd);
// Deflection angle of the wind drift (degrees) at wind speed w (m/s).
double WindDriftAnglePT(const PtDriftProfile& drift, double w);
// The particles in the water or on the bed.
long long ActiveParticlesPT(const PtModule& pt);
void PrintStatisticsPT(const PtModule& pt);

// ---- track files (pt_track.cpp) -----------------------------------------------------

void OpenOutputsPT(PtModule& pt);
// Writes step n to every output for which n is due (n = -1: the current state).
void WriteOutputsPT(PtModule& pt, int n);
void CloseOutputsPT(PtModule& pt);
// Encoding name for a code page ("utf-8" for an unknown one, with a warning).
std::string XmlEncodingPT(int code_page);

}  // namespace vhd
