#pragma once
// Element gradients of the HD state for the second-order reconstruction and
// the eddy viscosity.
//
// Gradients are least-squares fits over the face neighbours of an element
// that take part (wet or flooded, code > 0): with offsets (dx_i, dy_i) of the
// neighbour centroids and weights w_i = 1 / (dx_i^2 + dy_i^2),
//     grad = M^-1 sum w_i (dx_i, dy_i) (phi_i - phi_e),
//     M = sum w_i (dx_i, dy_i)^T (dx_i, dy_i),
// exact for linear fields; an element with fewer than two such neighbours, or
// a singular M, gets a zero gradient. Dry elements are left out so that their
// surface (the bed above the water) does not tilt the water surface of the
// wet elements next to them.
//
// Limiters (gradient_limiter): 0 none; 3 Barth-Jespersen: the gradient is
// scaled so that the values extrapolated to the face centres stay within the
// range of the element and its taking-part neighbours.

#include "hydro/hd_module.hpp"
#include "hydro/sw_fluxes.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

// Limited gradients of eta, P and Q into solver.eta_x .. Q_y.
void UpdateReconstructionHD(HdModule& hd, HdSolver& solver, const Mesh& mesh);

// Velocity gradients state.ux, uy, vx, vy from u = P/h, v = Q/h (wet
// elements; others 0).
void UpdateGradientsHD(HdModule& hd, HdSolver& solver, const Mesh& mesh);

}  // namespace vhd
