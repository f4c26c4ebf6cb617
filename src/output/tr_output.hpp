#pragma once
// Outputs of the transport module: the items of PARAMETERS_2D, and mass
// budgets of its components (and of the water volume).
//
// Items (logical keys of PARAMETERS_2D), element values:
//   <component name>   the component's concentration, titled with its
//                      description, item type and unit from its record
//   U_VELOCITY "U-velocity", V_VELOCITY "V-velocity" (m/s)
//   CFL_NUMBER "CFL number (AD)": the solver's CFL number of its last
//                      sub-step (advection out of the element and dispersion)
// Concentrations of dry elements keep their last value (the delete value
// with flood_and_dry, as the flow items).
//
// Mass budgets: per selected component the amount c h A in the polygon, and
// accumulated from the start of the transport: Transport (advective and
// dispersive fluxes across the polygon's border and the model boundary),
// Source (sources), Proces (decay, precipitation and evaporation), Defect
// (the clamp corrections of the solver). FLOW books the water volume as the
// hydrodynamic budgets do.
//
// Called by the driver's adapter as the HD outputs are: SetupOutputsTR at
// the end of the transport setup, OpenOutputFilesTR after the initial
// state, UpdateOutputsTR after every transport step, WriteOutputTR with
// each step n, CloseOutputFilesTR and OutputStatisticsTR at the end.

#include "core/array1.hpp"
#include "core/run.hpp"
#include "hydro/hd_module.hpp"
#include "mesh/mesh.hpp"
#include "output/output_spec.hpp"
#include "transport/tr_module.hpp"

namespace vhd {

// Item codes: 1 .. number_of_components are the components, then these.
inline constexpr int kTrUVelocity = -1;
inline constexpr int kTrVVelocity = -2;
inline constexpr int kTrCflNumber = -3;

struct TrOutputs {
  OutputList list;
  RunControl run;
  bool started = false;  // the budgets were started (the transport runs)

  // Work arrays, sized when the files are opened.
  Array1<double> area;    // element area (m2)
  Array1<double> values;  // element values of one item
  Array1<double> nodes;   // node values of one item
  Array1<double> amount;  // element amounts of one component or the water volume
  Array1<double> rate;    // water: precipitation less evaporation per element (m3/s)
};

void SetupOutputsTR(TrOutputs& out, const TrModule& tr, const Mesh& mesh, const RunControl& run,
                    const TimeAxis& time);
void OpenOutputFilesTR(TrOutputs& out, const Mesh& mesh);
// The initial amounts of the budgets, when the transport starts.
void StartBudgetsTR(TrOutputs& out, const TrModule& tr, const HdModule& hd, const Mesh& mesh);
// After a transport step of length dt: the accumulated budget terms.
void UpdateOutputsTR(TrOutputs& out, const HdModule& hd, const Mesh& mesh, double dt);
void WriteOutputTR(TrOutputs& out, const TrModule& tr, const HdModule& hd, const Mesh& mesh, int n, double t);
void CloseOutputFilesTR(TrOutputs& out);
void OutputStatisticsTR(const TrOutputs& out, const RunControl& run);

// Element values of item code on the owned elements.
void TrItemValues(const TrModule& tr, const HdModule& hd, const Mesh& mesh, int code, int flood_and_dry,
                  double delete_value, Array1<double>& values);

}  // namespace vhd
