#include "control/st_driver_module.hpp"

#include <cmath>
#include <string>
#include <vector>

#include "control/hd_driver_module.hpp"
#include "io/setup.hpp"
#include "io/units.hpp"
#include "log/log.hpp"
#include "parallel/subdomain.hpp"

namespace vhd {

namespace {

struct StItemDefinition {
  const char* key;
  OutputItem item;
};

OutputItem Item(int code, const char* name, int type, int unit) {
  OutputItem it;
  it.code = code;
  it.name = name;
  it.item_type = type;
  it.unit = unit;
  it.wet_only = false;  // no bed load is a value in a dry element
  return it;
}

const std::vector<StItemDefinition>& StOutputItems() {
  static const std::vector<StItemDefinition> kItems = {
      {"BED_LOAD_X", Item(kStBedLoadX, "Bed load x", kUvqIBedLoad, kUvqUm2PerSec)},
      {"BED_LOAD_Y", Item(kStBedLoadY, "Bed load y", kUvqIBedLoad, kUvqUm2PerSec)},
      {"BED_LOAD_MAGNITUDE", Item(kStBedLoadMagnitude, "Bed load magnitude", kUvqIBedLoad, kUvqUm2PerSec)},
      {"BED_LEVEL", Item(kStBedLevel, "Bed level", kUvqIBathymetry, kUvqUmeter)},
      {"BED_LEVEL_CHANGE", Item(kStBedLevelChange, "Bed level change", kUvqIBathymetry, kUvqUmeter)},
  };
  return kItems;
}

void ReadItemsST(OutputSpec& spec, void* /*context*/) {
  for (const StItemDefinition& def : StOutputItems()) {
    bool on = false;
    SktReadKeyword(def.key, on, false);
    if (on) spec.items.push_back(def.item);
  }
}

void ItemValues(const StModule& st, const HdState& s, int code, int nown, int ne, double delete_value,
                Array1<double>& values) {
  for (int e = 1; e <= nown; ++e) {
    double v = 0.0;
    switch (code) {
      case kStBedLoadX: v = st.qx[e]; break;
      case kStBedLoadY: v = st.qy[e]; break;
      case kStBedLoadMagnitude: v = std::sqrt(st.qx[e] * st.qx[e] + st.qy[e] * st.qy[e]); break;
      case kStBedLevel: v = -s.d[e]; break;
      case kStBedLevelChange: v = st.bed_change[e]; break;
      default: break;
    }
    values[e] = v;
  }
  for (int e = nown + 1; e <= ne; ++e) values[e] = delete_value;
}

}  // namespace

void StDriverModule::Setup(const ModuleContext& context) {
  Module* hd_slot = context.modules ? context.modules->Get(ModuleKind::HD) : nullptr;
  auto* hd = dynamic_cast<HdDriverModule*>(hd_slot);
  if (!hd)
    FatalError("SetupST: the sand transport module moves sand with the computed flow: "
               "mode_of_hydrodynamic_module in MODULE_SELECTION must select the hydrodynamic module");
  hd_ = &hd->mutable_hd();
  mesh_ = &hd->mesh();
  run_ = &context.run;
  dt_overall_ = context.time.dt;
  SktOpenSection(ModuleSectionName(ModuleKind::ST));
  SetupST(st_, *hd_, *mesh_);
  OutputModuleInfo info;
  info.module = "ST";
  info.read_items = ReadItemsST;
  SetupOutputs(outputs_, info, *mesh_, context.run, context.time);
  for (const OutputSpec& spec : outputs_.outputs)
    if (spec.type != kOutputField2D)
      FatalError("SetupOutputsST: Output type not supported - type " + std::to_string(spec.type) + " in " +
                 spec.section + "; the sand transport outputs are field outputs (type 1)");
  SktCloseSection();
}

void StDriverModule::InitialStep(double t, int& /*run_status*/) {
  // The bed load of the initial flow, for the first output.
  CalcBedLoadInputsST(st_, *hd_);
  CalcBedLoadST(st_, *hd_);
  t_state_ = t;
}

void StDriverModule::OpenOutputs() {
  values_.assign(mesh_->elements.nelements, 0.0);
  nodes_.assign(mesh_->nodes.nnodes, 0.0);
  OpenOutputFiles(outputs_, *mesh_);
}

void StDriverModule::WriteOutput(int n) {
  const double t = n >= 0 ? n * dt_overall_ : t_state_;
  for (OutputSpec& spec : outputs_.outputs) {
    if (!BeginOutputRecord(spec, n, t)) continue;
    for (const OutputItem& item : spec.items) {
      ItemValues(st_, hd_->state, item.code, st_.nowned, mesh_->elements.nelements, spec.delete_value, values_);
      if (hd_->subdomain) GatherOwned(*hd_->subdomain, values_);
      WriteFieldItem(spec, *mesh_, item, values_, nodes_, t);
    }
    EndOutputRecord(spec, t);
  }
}

void StDriverModule::Step(const StepTimes& times, int& /*run_status*/) {
  StepST(st_, *hd_, *mesh_, times.t, times.dt);
  t_state_ = times.t;
}

void StDriverModule::CloseOutputs() { CloseOutputFiles(outputs_); }

void StDriverModule::PrintStatistics() { PrintStatisticsST(st_, *run_); }

void StDriverModule::PrintTimings() { vhd::PrintTimings(st_.timing); }

}  // namespace vhd
