#include "output/mass_budget.hpp"

#include <cstdio>
#include <filesystem>

#include "io/setup.hpp"
#include "log/log.hpp"
#include "output/output_spec.hpp"

namespace vhd {

namespace {

constexpr const char* kItemKeywords[kBudgetItems] = {"MASS_TOTAL",  "MASS_WET",    "MASS_REAL_WET",
                                                     "MASS_DRY",    "MASS_TRANSPORT", "MASS_SOURCE",
                                                     "MASS_PROCES", "MASS_DEFECT", "MASS_ERROR"};
constexpr const char* kItemLabels[kBudgetItems] = {"Total area,", "Wet area,", "Real wet area,",
                                                   "Dry area,",   "Transport,", "Source,",
                                                   "Proces,",     "Defect,",    "Error,"};

std::string SectionFileDefault(const std::string& output_file) {
  std::filesystem::path p(output_file);
  p.replace_extension(".xyz");
  return p.string();
}

}  // namespace

const char* BudgetItemKeyword(int k) { return kItemKeywords[k - 1]; }
const char* BudgetItemLabel(int k) { return kItemLabels[k - 1]; }

void SpecMassBudget(MassBudgetSpec& budget, const std::vector<std::string>& component_names, const Mesh& mesh,
                    const std::string& output_file) {
  SktOpenSection("MASSBUDGET");
  SktReadKeyword("FLOW", budget.flow, 1);
  budget.component_flags.assign(component_names.size(), 1);
  for (std::size_t k = 0; k < component_names.size(); ++k)
    SktReadKeyword(component_names[k], budget.component_flags[k], 1);
  for (int k = 1; k <= kBudgetItems; ++k) SktReadKeyword(kItemKeywords[k - 1], budget.item_flags[k - 1], 1);

  budget.components.clear();
  auto add = [&](std::string name, int index) {
    budget.components.emplace_back();
    budget.components.back().name = std::move(name);
    budget.components.back().index = index;
  };
  if (budget.flow == 1) add(" Flow", 0);
  for (std::size_t k = 0; k < component_names.size(); ++k)
    if (budget.component_flags[k] == 1)
      add(" " + component_names[k], static_cast<int>(k) + 1);
  if (budget.components.empty()) FatalError("SpecMassBudget: No components selected");
  bool any_item = false;
  for (int f : budget.item_flags) any_item = any_item || f == 1;
  if (!any_item) FatalError("SpecMassBudget: No items selected");

  ReadPointInput("SpecMassBudget", mesh, budget.px, budget.py);
  if (!budget.px.empty() && budget.px.size() < 3)
    FatalError("SpecMassBudget: a polygon needs at least 3 points, section " + SktSectionPath() + " gives " +
               std::to_string(budget.px.size()));
  SktReadKeyword("write_section", budget.write_section, 0);
  SktReadFileName("file_name_section", budget.file_name_section, SectionFileDefault(output_file));
  SktCloseSection();

  // Elements inside: every element (halo too) by its centroid, so that border
  // faces to halo elements are recognised; only owned ones are counted.
  const ElementTable& el = mesh.elements;
  const int ne = el.nelements;
  const int nown = el.nelements_int > 0 ? el.nelements_int : ne;
  budget.inside.assign(ne, 0);
  int count = 0;
  for (int e = 1; e <= ne; ++e) {
    const bool in = budget.px.empty() || PointInPolygon(el.xc[e], el.yc[e], budget.px, budget.py);
    budget.inside[e] = in ? 1 : 0;
    if (in && e <= nown) ++count;
  }
  budget.elements.assign(count);
  count = 0;
  for (int e = 1; e <= nown; ++e)
    if (budget.inside[e]) budget.elements[++count] = e;
  if (count == 0) Warning("SpecMassBudget: No element(s) inside polygon");

  const FaceTable& fc = mesh.faces;
  std::vector<int> faces, signs;
  for (int f = 1; f <= fc.nfaces; ++f) {
    const int e1 = fc.element1[f], e2 = fc.element2[f];
    const bool in1 = e1 > 0 && budget.inside[e1];
    const bool in2 = e2 > 0 && budget.inside[e2];
    if (in1 == in2) continue;
    const int inner = in1 ? e1 : e2;
    if (inner > nown) continue;  // counted by the process that owns it
    faces.push_back(f);
    signs.push_back(in1 ? 1 : -1);
  }
  budget.border_faces.assign(static_cast<int>(faces.size()));
  budget.border_sign.assign(static_cast<int>(faces.size()));
  for (std::size_t k = 0; k < faces.size(); ++k) {
    budget.border_faces[static_cast<int>(k) + 1] = faces[k];
    budget.border_sign[static_cast<int>(k) + 1] = signs[k];
  }
  if (budget.write_section == 1) WriteBudgetSection(budget, mesh);
}

BudgetAmounts BudgetAmountsOf(const MassBudgetSpec& budget, const Array1<double>& amount, const Array1<int>& code,
                              const RunControl& run) {
  ExactSum total, wet, real_wet, dry;
  for (int e : budget.elements) {
    const double m = amount[e];
    total += m;
    if (code[e] > 0) wet += m;
    if (code[e] == 1) real_wet += m;
    if (code[e] == 0) dry += m;
  }
  for (ExactSum* s : {&total, &wet, &real_wet, &dry}) s->SumOverProcesses(run);
  return BudgetAmounts{total.Value(), wet.Value(), real_wet.Value(), dry.Value()};
}

void StartBudget(MassBudgetSpec& budget, int c, const Array1<double>& amount) {
  BudgetComponent& bc = budget.components[static_cast<std::size_t>(c)];
  for (ExactSum* s : {&bc.initial, &bc.transport, &bc.source, &bc.process, &bc.defect}) s->Clear();
  for (int e : budget.elements) bc.initial += amount[e];
}

void AccumulateBudgetTransport(MassBudgetSpec& budget, int c, const Array1<double>& face_flux, double dt) {
  ExactSum& in = budget.components[static_cast<std::size_t>(c)].transport;
  const int n = budget.border_faces.size();
  for (int k = 1; k <= n; ++k) in += -budget.border_sign[k] * face_flux[budget.border_faces[k]] * dt;
}

void AccumulateBudgetSource(MassBudgetSpec& budget, int c, const Array1<double>& rate, double dt) {
  ExactSum& s = budget.components[static_cast<std::size_t>(c)].source;
  for (int e : budget.elements) s += rate[e] * dt;
}

void AccumulateBudgetProcess(MassBudgetSpec& budget, int c, const Array1<double>& rate, double dt) {
  ExactSum& s = budget.components[static_cast<std::size_t>(c)].process;
  for (int e : budget.elements) s += rate[e] * dt;
}

void AccumulateBudgetDefect(MassBudgetSpec& budget, int c, const Array1<double>& added) {
  ExactSum& s = budget.components[static_cast<std::size_t>(c)].defect;
  for (int e : budget.elements)
    if (added[e] != 0.0) s += added[e];
}

double BudgetItemValue(const MassBudgetSpec& budget, int c, int k, const BudgetAmounts& now, const RunControl& run) {
  const BudgetComponent& bc = budget.components[static_cast<std::size_t>(c)];
  auto total = [&](const ExactSum& part) {
    ExactSum s = part;
    s.SumOverProcesses(run);
    return s.Value();
  };
  switch (k) {
    case kBudgetTotal: return now.total;
    case kBudgetWet: return now.wet;
    case kBudgetRealWet: return now.real_wet;
    case kBudgetDry: return now.dry;
    case kBudgetTransport: return total(bc.transport);
    case kBudgetSource: return total(bc.source);
    case kBudgetProcess: return total(bc.process);
    case kBudgetDefect: return total(bc.defect);
    case kBudgetError: {
      ExactSum booked;  // every booked term, in one exact sum
      for (const ExactSum* s : {&bc.initial, &bc.transport, &bc.source, &bc.process, &bc.defect}) booked.Add(*s);
      return now.total - total(booked);
    }
    default: FatalError("SpecMassBudget: Item not supported");
  }
}

void WriteBudgetSection(const MassBudgetSpec& budget, const Mesh& mesh) {
  std::FILE* f = std::fopen(budget.file_name_section.c_str(), "w");
  if (!f) FatalError("SpecMassBudget: Unable to create the section file " + budget.file_name_section);
  const std::size_t n = budget.px.size();
  for (std::size_t k = 0; k <= n && n > 0; ++k) {
    const std::size_t i = k % n;
    std::fprintf(f, "%.10g %.10g\n", FromMeshCoordinate(mesh, budget.px[i]), FromMeshCoordinate(mesh, budget.py[i]));
  }
  if (std::fclose(f) != 0)
    FatalError("SpecMassBudget: Unable to write the section file " + budget.file_name_section);
}

}  // namespace vhd
