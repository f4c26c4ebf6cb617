#pragma once
// Element gradients of the HD state for the second-order reconstruction and
// the eddy viscosity, on the engine's gradient stencils (mesh/gradient.hpp).
//
// The stencil is built once at setup (SetupSolverHD) over the permanent mesh
// layout, with the gradient type `gradient_calculation` and the boundary
// treatment `boundary_correction` of SOLUTION_TECHNIQUE; drying and flooding
// never rebuild it. The wet/dry codes enter as the element activity flags of
// the limiters (1 wet takes part; 0 dry and 2 flooded do not), so that the
// bed of a dry element above the water neither widens the bounds of a wet
// element nor limits it.
//
// Limiters (`gradient_limiter`): 0 none, 1 ENO, 2 weighted, 3 Barth-Jespersen
// (threshold HdSolver::limiter_epsilon).
//
// Fields: the face reconstruction uses eta, P and Q only (the face still
// water depth comes from `face_average_d`, not from a reconstructed d), so
// only those three gradients are formed.

#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

// Builds the gradient stencil of the solver (and the work arrays of the
// limiters that need them). Called by SetupSolverHD when second-order space
// discretisation or eddy viscosity is on.
void SetupReconstructionHD(const HdModule& hd, const Mesh& mesh, HdSolver& solver);

// Limited gradients of eta, P, Q of the current state into solver.eta_x .. Q_y.
void UpdateReconstructionHD(HdModule& hd, HdSolver& solver, const Mesh& mesh);

// Velocity gradients state.ux, uy, vx, vy from the element velocities u, v
// (0 in elements that are not wet), unlimited.
void UpdateGradientsHD(HdModule& hd, HdSolver& solver, const Mesh& mesh);

}  // namespace vhd
