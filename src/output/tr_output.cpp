#include "output/tr_output.hpp"

#include <new>

#include "core/omp.hpp"
#include "hydro/time_step.hpp"
#include "io/setup.hpp"
#include "io/units.hpp"
#include "log/log.hpp"
#include "parallel/message_passing.hpp"

namespace vhd {

namespace {

struct ReaderContext {
  const TrModule* tr = nullptr;
};

OutputItem FlowItem(int code, const char* name, int type, int unit) {
  OutputItem it;
  it.code = code;
  it.name = name;
  it.item_type = type;
  it.unit = unit;
  it.wet_only = true;
  return it;
}

void ReadItemsTR(OutputSpec& spec, void* context) {
  const TrModule& tr = *static_cast<ReaderContext*>(context)->tr;
  for (int k = 1; k <= tr.number_of_components; ++k) {
    const TrComponent& c = tr.components[k];
    bool on = false;
    SktReadKeyword(c.name, on, false);
    if (!on) continue;
    OutputItem it;
    it.code = k;
    it.name = c.description;
    it.item_type = c.output_item_type != 999 ? c.output_item_type : c.UVQ_type;
    it.unit = c.output_item_type != 999 ? c.output_unit : c.UVQ_unit;
    it.wet_only = true;
    spec.items.push_back(it);
  }
  static const struct {
    const char* key;
    int code;
    const char* name;
    int type;
    int unit;
  } kFlowItems[] = {
      {"U_VELOCITY", kTrUVelocity, "U-velocity", kUvqIUVelocity, kUvqUmeterPerSec},
      {"V_VELOCITY", kTrVVelocity, "V-velocity", kUvqIVVelocity, kUvqUmeterPerSec},
      {"CFL_NUMBER", kTrCflNumber, "CFL number (AD)", kUvqItemUndefined, kUvqUnonDim},
  };
  for (const auto& f : kFlowItems) {
    bool on = false;
    SktReadKeyword(f.key, on, false);
    if (on) spec.items.push_back(FlowItem(f.code, f.name, f.type, f.unit));
  }
  if (spec.items.empty()) FatalError("No output items specified (section " + SktSectionPath() + ")");
}

int Owned(const Mesh& mesh) {
  return mesh.elements.nelements_int > 0 ? mesh.elements.nelements_int : mesh.elements.nelements;
}

// Amounts c h A of component k (k = 0: the water volume h A) on the owned elements.
void Amounts(TrOutputs& out, const TrModule& tr, const HdState& s, int k, int nown) {
  const double* c = k > 0 ? tr.data[k].ad.c.data() : nullptr;
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) out.amount[e] = (c ? c[e] : 1.0) * s.h[e] * out.area[e];
}

// The accumulated terms of the components of a budget: the solver's totals
// since the start of the transport, over the whole model area
// (SetupOutputsTR refuses polygons for components).
void ComponentTerms(MassBudgetSpec& budget, const TrModule& tr) {
  for (BudgetComponent& b : budget.components) {
    if (b.index == 0) continue;
    const AdComponent& ad = tr.data[b.index].ad;
    b.transport.Clear();
    b.transport.Add(ad.boundary_inflow);
    b.transport.Subtract(ad.boundary_outflow);
    b.source.Clear();
    b.source.Add(ad.source_inflow);
    b.source.Subtract(ad.source_outflow);
    b.process.Clear();
    b.defect.Clear();
    for (int e : budget.elements) {
      b.process += ad.surface_total[e];
      b.process += -ad.decay_total[e];
      b.defect += ad.clamp_total[e];
      b.defect += ad.drying_total[e];
    }
  }
}

}  // namespace

void SetupOutputsTR(TrOutputs& out, const TrModule& tr, const Mesh& mesh, const RunControl& run,
                    const TimeAxis& time) {
  out.run = run;
  ReaderContext context{&tr};
  OutputModuleInfo info;
  info.module = "TR";
  info.read_items = ReadItemsTR;
  info.context = &context;
  info.discharge = false;
  for (int k = 1; k <= tr.number_of_components; ++k) info.budget_components.push_back(tr.components[k].name);
  SktOpenSection("TRANSPORT_MODULE", kNoIndex, nullptr, false);
  SetupOutputs(out.list, info, mesh, run, time);
  SktCloseSection();
  for (const OutputSpec& spec : out.list.outputs) {
    // The solver books what enters through the boundaries and sources over
    // the whole model area, not across the border of a polygon.
    if (spec.type == kOutputMassBudget && !spec.budget.px.empty())
      for (const BudgetComponent& b : spec.budget.components)
        if (b.index > 0)
          FatalError("SpecMassBudget: the budget of component" + b.name +
                     " covers the whole model area; give no polygon in " + spec.section +
                     " (a polygon is possible with FLOW alone)");
  }
}

void OpenOutputFilesTR(TrOutputs& out, const Mesh& mesh) {
  const int ne = mesh.elements.nelements;
  try {
    out.area.assign(ne, 0.0);
    out.values.assign(ne, 0.0);
    out.nodes.assign(mesh.nodes.nnodes, 0.0);
    out.amount.assign(ne, 0.0);
    out.rate.assign(ne, 0.0);
  } catch (const std::bad_alloc&) {
    FatalError("SetupOutputTR: Out of memory");
  }
  for (int e = 1; e <= ne; ++e) out.area[e] = ElementAreaMetres(mesh, e);
  OpenOutputFiles(out.list, mesh);
}

void StartBudgetsTR(TrOutputs& out, const TrModule& tr, const HdModule& hd, const Mesh& mesh) {
  const int nown = Owned(mesh);
  for (OutputSpec& spec : out.list.outputs) {
    if (spec.type != kOutputMassBudget) continue;
    for (std::size_t c = 0; c < spec.budget.components.size(); ++c) {
      Amounts(out, tr, hd.state, spec.budget.components[c].index, nown);
      StartBudget(spec.budget, static_cast<int>(c), out.amount);
    }
  }
  out.started = true;
}

void UpdateOutputsTR(TrOutputs& out, const HdModule& hd, const Mesh& mesh, double dt) {
  const int nown = Owned(mesh);
  const bool process = hd.precipitation.Active();
  bool rate_done = false;
  for (OutputSpec& spec : out.list.outputs) {
    if (spec.type != kOutputMassBudget) continue;
    for (std::size_t c = 0; c < spec.budget.components.size(); ++c) {
      const int k = static_cast<int>(c);
      const int index = spec.budget.components[c].index;
      if (index == 0) {
        // The water volume, as the hydrodynamic budgets book it; the
        // components' terms are taken from the solver when written.
        AccumulateBudgetTransport(spec.budget, k, hd.state.face_flux_len, dt);
        if (hd.sources.Active()) AccumulateBudgetSource(spec.budget, k, hd.sources.element_rate, dt);
        if (process) {
          if (!rate_done) {
            const HdPrecipitation& p = hd.precipitation;
            for (int e = 1; e <= nown; ++e) out.rate[e] = (p.gain[e] - p.loss[e]) * out.area[e];
            rate_done = true;
          }
          AccumulateBudgetProcess(spec.budget, k, out.rate, dt);
        }
        if (hd.flood_dry.type > 0 && hd.flood_dry.mass_cut.size() >= nown)
          AccumulateBudgetDefect(spec.budget, k, hd.flood_dry.mass_cut);
        continue;
      }
    }
  }
}

void TrItemValues(const TrModule& tr, const HdModule& hd, const Mesh& mesh, int code, int flood_and_dry,
                  double delete_value, Array1<double>& values) {
  const HdState& s = hd.state;
  const int ne = mesh.elements.nelements;
  const int nown = Owned(mesh);
  const double* c = code > 0 ? tr.data[code].ad.c.data() : nullptr;
  const Array1<double>& cfl = tr.solver.Cfl();
  VHD_OMP_PARALLEL_FOR
  for (int e = 1; e <= nown; ++e) {
    if (flood_and_dry > 0 && (s.wetdry[e] == kDry || (flood_and_dry == 2 && s.wetdry[e] != kWet))) {
      values[e] = delete_value;
      continue;
    }
    double v = 0.0;
    if (c) {
      v = c[e];
    } else if (code == kTrUVelocity) {
      v = s.u[e];
    } else if (code == kTrVVelocity) {
      v = s.v[e];
    } else if (code == kTrCflNumber) {
      v = e <= cfl.size() ? cfl[e] : 0.0;
    }
    values[e] = v;
  }
  for (int e = nown + 1; e <= ne; ++e) values[e] = delete_value;
}

void WriteOutputTR(TrOutputs& out, const TrModule& tr, const HdModule& hd, const Mesh& mesh, int n, double t) {
  for (OutputSpec& spec : out.list.outputs) {
    if (!BeginOutputRecord(spec, n, t)) continue;
    switch (spec.type) {
      case kOutputField2D:
        for (const OutputItem& item : spec.items) {
          TrItemValues(tr, hd, mesh, item.code, spec.flood_and_dry, spec.delete_value, out.values);
          if (hd.subdomain) GatherOwned(*hd.subdomain, out.values);
          WriteFieldItem(spec, mesh, item, out.values, out.nodes, t);
        }
        break;
      case kOutputMassBudget: {
        if (out.started) ComponentTerms(spec.budget, tr);
        std::size_t current = spec.budget.components.size();
        BudgetAmounts now;
        for (const OutputItem& item : spec.items) {
          const std::size_t c = static_cast<std::size_t>(item.code / 100);
          if (c != current) {
            Amounts(out, tr, hd.state, spec.budget.components[c].index, Owned(mesh));
            now = BudgetAmountsOf(spec.budget, out.amount, hd.state.wetdry, out.run);
            current = c;
          }
          // Before the transport starts its budget terms are all zero.
          const double v = out.started || item.code % 100 < kBudgetTransport
                               ? BudgetItemValue(spec.budget, static_cast<int>(c), item.code % 100, now, out.run)
                               : 0.0;
          WriteValueItem(spec, v, t);
        }
        break;
      }
      default:
        FatalError("WriteOutputTR: Output type not supported - type " + std::to_string(spec.type) + " (section " +
                   spec.section + ")");
    }
    EndOutputRecord(spec, t);
  }
}

void CloseOutputFilesTR(TrOutputs& out) { CloseOutputFiles(out.list); }

void OutputStatisticsTR(const TrOutputs& out, const RunControl& run) {
  if (run.nprocesses <= 1) return;
  WriteBanner("Output Statistics " + out.list.module);
  for (const OutputSpec& spec : out.list.outputs) {
    WriteLogLine("  Output " + std::to_string(spec.number) + " : " + ZrnLogName(spec.path) +
                 (spec.write ? "" : " (written by process 0)"));
    WriteValueLine("    Records written : %", spec.records);
  }
  WriteBanner("");
}

}  // namespace vhd
