// Transport module in the time loop: the solver setup, the initial step and
// the step of every HD sub-step.

#include <cmath>

#include "hydro/hd_setup_fields.hpp"
#include "log/log.hpp"
#include "mesh/femdata.hpp"
#include "mesh/mesh.hpp"
#include "transport/tr_module.hpp"

namespace vhd {

namespace {

// Values of an exchange (precipitation, evaporation) at time t.
void UpdateExchange(TrWaterConcentration& w, AdExchange& ex, double t) {
  ex.type = w.type;
  if (w.type != kAdExchangeValue) return;
  if (w.data.format == kDataConstant) {
    ex.values.clear();
    ex.constant_value = FemDataValue(w.data, 1, t);
  } else {
    FemDataRead(w.data, 1, t, ex.values);
  }
}

// Everything that varies in time, at t.
void UpdateForcingsTR(TrModule& tr, const HdModule& hd, double t) {
  const HdBoundary& bc = hd.boundary;
  for (int k = 1; k <= tr.number_of_components; ++k) {
    TrComponentData& d = tr.data[k];
    AdComponent& ad = d.ad;
    if (d.dispersion.type == kAdDispersionCoefficient && d.dispersion_map.format == 3 &&
        UpdateElementFieldHD(d.dispersion_map, t, "UpdateForcingsTR"))
      d.dispersion.field = d.dispersion_map.values;
    if (d.decay_type == 1 && d.decay.format == 3) {
      if (UpdateElementFieldHD(d.decay, t, "UpdateForcingsTR")) ad.decay = d.decay.values;
    }
    for (std::size_t i = 0; i < d.sources.size(); ++i) {
      const int s = static_cast<int>(i) + 1;
      ad.source_type[s] = d.sources[i].type;
      ad.source_c[s] = FemDataValue(d.sources[i].data, 1, t);
    }
    UpdateExchange(d.precipitation, ad.precipitation, t);
    UpdateExchange(d.evaporation, ad.evaporation, t);
    for (int code = 1; code <= bc.ncodes; ++code) {
      TrBoundaryCode& b = d.codes[code];
      const BoundaryCondition& hb = bc.codes[code];
      if (hb.nfaces == 0 || (b.type != kTrBoundaryValue && b.type != kTrBoundaryAlong)) continue;
      FemDataRead(b.data, 1, t, d.work);
      for (int j = 1; j <= hb.nfaces; ++j) ad.boundary_c[hb.first_face + j - 1] = d.work[j];
    }
  }
}

}  // namespace

void SetupSolverTR(TrModule& tr, const HdModule& hd, const HdSolver& hd_solver, const Mesh& mesh) {
  tr.solver.Setup(hd, hd_solver, mesh, tr.solution);
  AllocateFlowAD(hd, tr.flow);
  const int nsources = hd.sources.number_of_sources;
  for (int k = 1; k <= tr.number_of_components; ++k) {
    TrComponentData& d = tr.data[k];
    AdComponent& ad = d.ad;
    ad.source_c.assign(nsources, 0.0);
    ad.source_type.assign(nsources, kAdSourceConcentration);
    if (d.decay_type == 1) {
      if (d.decay.format == 0) ad.decay_constant = d.decay.constant_value;
      else ad.decay = d.decay.values;
    }
    // Array sizes of the time-varying inputs are fixed here: the loop does
    // not allocate.
    auto size = [&](const TrWaterConcentration& w, AdExchange& ex) {
      if (w.type == kAdExchangeValue && w.data.format != kDataConstant) ex.values.assign(mesh.elements.nelements, 0.0);
    };
    size(d.precipitation, ad.precipitation);
    size(d.evaporation, ad.evaporation);
  }
}

void InitialStepTR(TrModule& tr, const HdModule& hd) {
  const int ne = hd.state.nelements;
  for (int k = 1; k <= tr.number_of_components; ++k) {
    TrComponentData& d = tr.data[k];
    for (int e = 1; e <= ne; ++e) d.ad.c[e] = d.initial.values[e];
  }
  BeginFlowAD(hd, tr.flow);
  tr.started = true;
}

void StepTR(TrModule& tr, const HdModule& hd, const HdSolver& hd_solver, const Mesh& mesh, double t, double dt) {
  if (!tr.started) {
    // Before the start only the depths are followed.
    BeginFlowAD(hd, tr.flow);
    return;
  }
  StartTiming(tr.timing, kTrTimerTotal);
  StartTiming(tr.timing, kTrTimerForcings);
  GatherFlowAD(hd, hd_solver, mesh, dt, tr.flow);
  UpdateForcingsTR(tr, hd, t - 0.5 * dt);
  StopTiming(tr.timing, kTrTimerForcings);

  StartTiming(tr.timing, kTrTimerSolve);
  for (const std::vector<int>* list : {&tr.type2_2d, &tr.type2_3d}) {
    for (int k : *list) {
      TrComponentData& d = tr.data[k];
      ComputeDispersionAD(d.dispersion, hd, d.ad.dispersion);
      tr.n_substeps += tr.solver.Step(tr.flow, d.ad);
    }
  }
  StopTiming(tr.timing, kTrTimerSolve);
  ++tr.n_steps;
  StopTiming(tr.timing, kTrTimerTotal);
}

void CloseInputsTR(TrModule& tr) {
  for (int k = 1; k <= tr.number_of_components; ++k) {
    TrComponentData& d = tr.data[k];
    for (int code = 1; code <= d.codes.size(); ++code) FemDataClose(d.codes[code].data);
    for (TrSourceConcentration& s : d.sources) FemDataClose(s.data);
    for (TrWaterConcentration* w : {&d.precipitation, &d.evaporation, &d.infiltration}) FemDataClose(w->data);
  }
}

}  // namespace vhd
