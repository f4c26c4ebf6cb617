#pragma once
// A moving bed handed to the flow state (morphology).
//
// The bed of element e rises by dz[e] (m): the still water depth d falls by
// dz. In an element holding water (code > 0) the surface elevation stays and
// the depth follows, h = eta + d; where the bed rises through the surface
// the element falls dry (h = 0, the surface on the bed, fluxes 0, code 0,
// so that no neighbour reconstructs a surface from it); in a dry element (code 0) the depth stays
// and the surface moves with the bed. The fluxes P, Q stay, the velocities
// are formed again from them. So a lake at rest stays at rest over any
// change of its bed, and the water volume changes by the bed volume raised
// under water. The face still water depths of the bed-slope term are formed
// again as at setup (face_average_d 2: from the node bed levels, which move
// by the mean change of their elements; else the mean of the two elements'
// d), and the next time step forms the CFL rates again.
//
// With several processes dz is read on the owned elements and taken by the
// halo from the owners (ExchangeHalo); every process then updates its owned
// and halo elements alike, so that no flow field needs an exchange.

#include "core/array1.hpp"
#include "hydro/hd_module.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

void ApplyBedChangeHD(HdModule& hd, const Mesh& mesh, Array1<double>& dz);

}  // namespace vhd
