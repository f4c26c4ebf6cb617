#pragma once
// Advection-dispersion (AD) solver of dissolved substances on the 2D flow of
// the hydrodynamic (HD) module: one scalar per call, cell-centred finite
// volumes on the HD mesh and faces.
//
// The conserved quantity is the mass per unit area m = c h (c the
// concentration, h the total depth). Over one transport step of length dt
//     A dm/dt = - sum_faces F + S_sources + S_surface - A k m,
// with the face fluxes F (advection with the volumes the HD module moved
// through the face, dispersion), the point sources S_sources, precipitation
// and evaporation S_surface and the linear decay k (treated implicitly per
// stage: the division by 1 + dt k).
//
// Consistency with the flow. A transport step covers exactly one HD sub-step
// (the driver calls the transport after the hydrodynamics on every HD
// sub-step). GatherFlowAD takes from the HD state what the HD element update
// applied over that sub-step: per face the volume through it (dt times the
// face mass flux of the last stage, the only stage whose fluxes enter the
// result of the one-stage and the midpoint scheme alike, after the outflow
// limiter), per element the depth at the start and the end, the volumes of
// the sources, precipitation and evaporation and the water added where a
// negative depth was cut (flooding and drying). These satisfy, element by
// element, A (h_end - h_start) = sum of those volumes, so a uniform
// concentration with sources and boundaries of the same concentration stays
// uniform. The stages advance the water depth with the same volumes and the
// same operations as the mass (m for c = 1), and c = m / h of that depth, so
// c = 1 stays 1 to the last bit; at the end of a sub-step the mass is c
// times the HD depth again (what that moves, round-off and the elements that
// kept their concentration, is the drying correction). When the transport's
// own stability rule (CFL_critical_AD, dt_min_AD, dt_max_AD; the rate of an
// element is the water leaving it plus its dispersive conductance, its own
// coefficient over its faces to neighbours, over the water it holds) asks
// for a shorter step, the HD sub-step is split into n equal transport
// sub-steps that take 1/n of every volume and the depths interpolated
// linearly between start and end; n is the largest over the processes.
//
// Time integration (AdSolutionTechnique::scheme_of_time_integration), each
// stage m = (base + w dt R) / (1 + w dt k):
//   1 forward Euler;
//   2 midpoint: half a step to c*, then the full step with R(c*);
//   3 three-stage strong-stability-preserving Runge-Kutta.
// After every stage, where h > h_min, the mass is clamped to [minimum h,
// maximum h] (the clamp correction records what that adds) and c = m / h; a
// shallower element keeps its previous concentration (the mass that this
// adds or removes is the drying correction).
//
// Space: first order takes the upwind element's concentration at the face;
// second order reconstructs it to the face centre with the upwind element's
// limited gradient (the mesh gradient stencils and limiters; an element with
// a boundary face or a face to an element that is not wet is limited at
// those faces too, and one that takes water in through an open boundary
// stays first order, so that no new extremum forms). A face with a
// side that is not wet carries only advection, first order, with the
// concentration of the upwind element (which held the water). Dispersion at
// a face between two wet elements: F_d = -L D_f h_f dc/dn with
// D_f = min(D_L + D_R, 4 D_L, 4 D_R) / 2 (so D for D_L = D_R = D, at most
// twice the smaller), h_f the mean depth of the two sides and dc/dn the
// two-point difference over the normal distance of the centres plus the
// tangential correction from the mean of the two element gradients.
//
// Boundary faces (the HD face list HdBoundary::faces): water leaving carries
// the element's concentration; water entering carries the component's
// boundary value (kAdBoundaryValue) or the element's own concentration
// (kAdBoundaryNone, no data); at a face of a cyclic pair of the HD module it
// carries the concentration of the element behind the partner face.
//
// Threads and processes: the face loop writes each face's flux into a face
// array, the elements gather their faces in local face order (static OpenMP
// loops, no atomics), so results have the same bits for any thread count.
// Loops run over the owned elements and the faces with an owned side; the
// halo concentrations are exchanged before every stage; the source sums
// are added over the processes. Step allocates nothing.

#include <string>

#include "core/array1.hpp"
#include "mesh/gradient.hpp"
#include "mesh/gradient_limiter.hpp"
#include "parallel/exact_sum.hpp"

namespace vhd {

struct HdModule;
struct HdSolver;
struct Mesh;
struct Subdomain;

// The SOLUTION_TECHNIQUE settings of the calling module.
struct AdSolutionTechnique {
  int scheme_of_time_integration = 1;                 // 1, 2 or 3
  int scheme_of_space_discretization_horizontal = 1;  // 1 first order, 2 or 3 second order
  int scheme_of_space_discretization_vertical = 1;    // layered meshes only (kept, unused in 2D)
  int gradient_calculation = 2;                       // gradient type of the stencil (1, 2, 3)
  int gradient_limiter = 3;                           // 0 none, 1 ENO, 2 weighted, 3 Barth-Jespersen
  int face_value_limiter = 1;                         // > 0: face value clipped to the two centre values
  int boundary_correction = 2;                        // boundary treatment of the stencil
  double h_min = 1e-4;                                // m: shallower elements keep their concentration
  int maximum_number_of_iterations = 10;              // read with scheme 2 (the midpoint is not iterated)
};

// Dispersion settings of one component (section DISPERSION,
// HORIZONTAL_DISPERSION).
inline constexpr int kAdDispersionNone = 0;
inline constexpr int kAdDispersionScaledEddy = 1;   // D = nu_t / sigma
inline constexpr int kAdDispersionCoefficient = 2;  // D given

struct AdDispersion {
  int type = kAdDispersionScaledEddy;
  int format = 0;                 // 0 constant; otherwise `field` holds the map
  double sigma = 1.0;             // type 1, constant
  double constant_value = 0.01;   // type 2, constant (m2/s)
  // Per element (owned and halo), when format != 0: sigma (type 1) or the
  // coefficient (type 2). The module reads the map into it.
  Array1<double> field;
  double minimum_dispersion = 0.0;
  double maximum_dispersion = 1.0e10;
};

// Concentration carried by precipitation or evaporation water.
inline constexpr int kAdExchangeNothing = 0;  // carries no substance
inline constexpr int kAdExchangeValue = 1;    // the given concentration
inline constexpr int kAdExchangeAmbient = 2;  // the element's concentration

struct AdExchange {
  int type = kAdExchangeNothing;
  double constant_value = 0.0;
  Array1<double> values;  // per element; empty: constant_value
};

// Kind of a boundary face for the component.
inline constexpr int kAdBoundaryNone = 0;    // inflow carries the element's concentration
inline constexpr int kAdBoundaryValue = 1;   // inflow carries boundary_c
// (A face that the HD module pairs as cyclic always takes the concentration
// of the element behind its partner face, whatever its type here.)

// Concentration type of a source's released water.
inline constexpr int kAdSourceConcentration = 1;  // c_s
inline constexpr int kAdSourceExcess = 2;         // c_s + ambient

// One transported component: the state the calling module owns and the
// solver advances. Units: c in the component's unit; masses are c times m3.
struct AdComponent {
  std::string name;
  Array1<double> c;              // per element (owned and halo)
  double minimum = -1.0e10, maximum = 1.0e10;
  double decay_constant = 0.0;   // 1/s
  Array1<double> decay;          // per element (1/s); empty: decay_constant
  Array1<double> dispersion;     // D per element (m2/s, ComputeDispersionAD); empty: no dispersion

  // Per boundary face condition of the HD list (1 .. number of faces).
  Array1<int> boundary_type;     // kAdBoundary...; empty: every face kAdBoundaryNone
  Array1<double> boundary_c;

  // Per HD source (1 .. number_of_sources, in the order of HdSources::sources).
  Array1<double> source_c;
  Array1<int> source_type;       // kAdSourceConcentration or kAdSourceExcess

  AdExchange precipitation, evaporation;

  // Per owned element, the last step: mass added by the clamp (negative:
  // removed).
  Array1<double> clamp_correction;
  // Per owned element, totals over the run: mass added by the clamp, by
  // flooding and drying (cut depths, elements at or below h_min), by
  // precipitation minus evaporation, and removed by decay (positive).
  Array1<double> clamp_total, drying_total, surface_total, decay_total;
  // Over the run, this process's owned elements: mass entering and leaving
  // through open boundaries and sources (both positive).
  ExactSum boundary_inflow, boundary_outflow, source_inflow, source_outflow;
};

// Allocates the component's per-element and per-face arrays (c = 0; the
// module sets the initial values) for the HD module's mesh.
void AllocateComponentAD(const HdModule& hd, AdComponent& component);

// The water movement of one HD sub-step, gathered after StepHD.
struct AdFlow {
  double dt = 0.0;                 // s
  Array1<double> face_volume;      // per face, m3, positive from element1 to element2 (boundary: outward)
  Array1<double> h_start, h_end;   // per element (owned and halo), m
  Array1<int> wetdry;              // per element, HD codes at the start of the sub-step (the fluxes saw them)
  Array1<int> wetdry_end;          // per element, HD codes at the end of the sub-step
  Array1<double> precipitation;    // per owned element, volume added (m3)
  Array1<double> evaporation;      // per owned element, volume taken (m3, >= 0)
  Array1<double> cut;              // per owned element, volume added where a negative depth was cut (m3)
  // Per HD source (1 .. number_of_sources): the element giving water and the
  // volume it gives (m3), the element receiving and the volume released
  // (0: none), the partner source of a connected pair (0: none).
  Array1<int> source_giver, source_taker, source_partner;
  Array1<double> source_withdrawn, source_released;
  bool started = false;            // h_end holds the depths of the last gather
};

// Allocates the flow record for the HD module's mesh.
void AllocateFlowAD(const HdModule& hd, AdFlow& flow);
// The current HD depths become the depths at the start of the next step.
// Called when the transport starts (its initial step, or each HD sub-step
// before its start step) and after anything other than StepHD changed h.
void BeginFlowAD(const HdModule& hd, AdFlow& flow);
// Gathers the HD sub-step of length dt that StepHD has just taken. The start
// depths are the end depths of the previous gather (or of BeginFlowAD).
void GatherFlowAD(const HdModule& hd, const HdSolver& hd_solver, const Mesh& mesh, double dt, AdFlow& flow);

// D per element (owned and halo) from the settings: the eddy viscosity of
// the HD state over sigma, or the coefficient, clamped to [minimum, maximum];
// type 0 empties D. Another type stops the run with "Dispersion type not
// implemented yet".
void ComputeDispersionAD(const AdDispersion& settings, const HdModule& hd, Array1<double>& D);

// The solver: setup-time tables and the work arrays of the schemes, shared by
// all components.
class AdSolver {
 public:
  // Checks the technique, builds the gradient stencil and limiter tables
  // (second order or dispersion) and allocates every work array. Codes out of
  // range stop the run ("Type not supported for ..." naming the key).
  void Setup(const HdModule& hd, const HdSolver& hd_solver, const Mesh& mesh, const AdSolutionTechnique& technique);

  // Advances the component over the step of the flow record. Returns the
  // number of transport sub-steps taken (>= 1, the same on every process).
  int Step(const AdFlow& flow, AdComponent& component);

  // Per owned element: the CFL number (AD) of the last sub-step of the last
  // Step (advection out of the element and dispersion, 0 where not wet).
  const Array1<double>& Cfl() const { return cfl_; }
  const AdSolutionTechnique& Technique() const { return technique_; }

 private:
  int SubStepCount(const AdFlow& flow, const AdComponent& comp);
  void SurfaceAndSources(const AdFlow& flow, AdComponent& comp, double n_inv, double t0);
  void Gradients(const AdFlow& flow, const AdComponent& comp);
  void LimitAtClosedFaces(const AdComponent& comp, const Array1<int>& wetdry);
  void FaceFluxes(const AdFlow& flow, const AdComponent& comp, double frac, double n_inv, double weight);
  void UpdateElements(const AdFlow& flow, AdComponent& comp, double alpha, double w, double frac, double n_inv,
                      double weight, bool first, bool sub_end);

  const HdModule* hd_ = nullptr;
  const HdSolver* hd_solver_ = nullptr;  // its interior faces and element face slots
  const Mesh* mesh_ = nullptr;
  Subdomain* subdomain_ = nullptr;
  AdSolutionTechnique technique_;
  int nowned_ = 0, nlocal_ = 0;
  bool second_ = false;
  double cfl_critical_ = 1.0, dt_min_ = 0.01, dt_max_ = 30.0;

  // Geometry (metres; on geographic meshes on the sphere).
  const double* area_ = nullptr;       // per element (m2)
  Array1<double> face_len_;            // per face (m)
  // Per face: inverse of the centre distance along the normal (1/m); the
  // tangential vector n - d / (d.n) in gradient units (per mesh unit); the
  // face centre minus each centroid (mesh units).
  Array1<double> face_idn_, face_tx_, face_ty_;
  Array1<double> face_ox1_, face_oy1_, face_ox2_, face_oy2_;

  Array1<double> element_conductance_;  // per element: sum of L / (d.n) over its faces to neighbours (1)

  GradientStencil stencil_;
  LimiterGeometry2D limiter_geometry_;
  Array1<int> no_flags_;  // empty: every face open

  // Work arrays.
  Array1<double> m_base_, m_;                    // per element: mass per area at the sub-step start, of the stage
  Array1<double> h_base_, h_;                    // per element: water depth carried alike
  Array1<double> gx_, gy_, gx_raw_, gy_raw_;     // per element
  Array1<double> face_flux_;                     // per face: mass through it over the sub-step
  Array1<double> source_mass_;                   // per owned element: mass of sources and surface over the sub-step
  Array1<double> source_water_, water_rate_;     // per owned element: their water; depth change per area
  Array1<double> clamp_step_;                    // per owned element: clamp correction of the step (weighted)
  Array1<double> decay_step_;                    // per owned element: decay of the step (weighted)
  Array1<double> source_ambient_;                // per source: c of the giving element (process sums)
  Array1<double> boundary_mass_;                 // per boundary face condition: mass through it over the step
  Array1<double> cfl_;
};

}  // namespace vhd
