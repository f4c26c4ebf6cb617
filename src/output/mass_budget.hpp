#pragma once
// Mass budgets: for a polygon of the domain, the amount of water and of each
// selected component of the owning module, and the terms that changed it
// since the start of the run.
//
// Items per selected component (flow first), in this order, each selected by
// its keyword of section MASSBUDGET:
//   "Total area,"     amount in every element inside the polygon
//   "Wet area,"       amount in wet and flooded elements (code 1 or 2)
//   "Real wet area,"  amount in wet elements (code 1)
//   "Dry area,"       amount in dry elements (code 0)
//   "Transport,"      accumulated amount carried into the polygon across its
//                     border (faces between an element inside and one
//                     outside, and the model boundary of elements inside)
//   "Source,"         accumulated amount from sources inside the polygon
//   "Proces,"         accumulated amount from processes inside the polygon
//   "Defect,"         accumulated amount added by the scheme itself (volume
//                     added where negative depths were cut to zero)
//   "Error,"          Total - initial Total - Transport - Source - Proces -
//                     Defect: the budget's continuity error
// followed by the component's name (" Flow" for the water volume, so the
// flow's total is "Total area, Flow"). Amounts are instantaneous, the terms
// accumulated from the first step of the run.
//
// A module plugs its components in by naming them (they become keywords of
// MASSBUDGET) and, per sub-step, handing its face fluxes and element rates to
// the Accumulate* routines; amounts come from a per-element amount array
// (volume h A for the flow, c h A for a concentration). Everything counts
// owned elements only, so that the sums of all processes give the whole.

#include <array>
#include <string>
#include <vector>

#include "core/array1.hpp"
#include "core/run.hpp"
#include "parallel/exact_sum.hpp"
#include "mesh/mesh.hpp"

namespace vhd {

inline constexpr int kBudgetItems = 9;
inline constexpr int kBudgetTotal = 1;
inline constexpr int kBudgetWet = 2;
inline constexpr int kBudgetRealWet = 3;
inline constexpr int kBudgetDry = 4;
inline constexpr int kBudgetTransport = 5;
inline constexpr int kBudgetSource = 6;
inline constexpr int kBudgetProcess = 7;
inline constexpr int kBudgetDefect = 8;
inline constexpr int kBudgetError = 9;

// Keyword and item label of budget item k (1 .. 9).
const char* BudgetItemKeyword(int k);
const char* BudgetItemLabel(int k);

// Running terms of one selected component.
struct BudgetComponent {
  std::string name;   // " Flow" for the water volume, else " " + component name
  int index = 0;      // 0 the flow, k >= 1 the module's component k
  // This process's part (its owned elements and the border faces of its
  // owned elements), as exact sums: every term is added on its own, so that
  // the total over the processes does not depend on how the mesh is split.
  ExactSum initial;  // total amount at the start
  ExactSum transport, source, process, defect;
};

struct MassBudgetSpec {
  int flow = 1;
  std::vector<int> component_flags;  // one per component of the module
  std::array<int, kBudgetItems> item_flags{1, 1, 1, 1, 1, 1, 1, 1, 1};
  std::vector<double> px, py;        // polygon, mesh coordinates (empty: the whole model area)
  int write_section = 0;
  std::string file_name_section;

  std::vector<BudgetComponent> components;  // the selected ones, flow first
  Array1<char> inside;        // per element: 1 inside the polygon (owned elements only)
  Array1<int> elements;       // owned elements inside
  Array1<int> border_faces;   // faces across the border, and boundary faces of elements inside
  Array1<int> border_sign;    // +1 when element1 lies inside (its positive flux leaves)
};

// Reads section MASSBUDGET (inside the current output section) with the
// module's component names, finds the elements inside the polygon and the
// border faces. output_file names the budget file (default of
// file_name_section: its name with the extension ".xyz").
void SpecMassBudget(MassBudgetSpec& budget, const std::vector<std::string>& component_names, const Mesh& mesh,
                    const std::string& output_file);

// Amounts in the polygon from a per-element amount array: total, wet (code
// 1 or 2), real wet (code 1), dry (code 0).
struct BudgetAmounts {
  double total = 0.0, wet = 0.0, real_wet = 0.0, dry = 0.0;
};
// Summed over all processes (collective).
BudgetAmounts BudgetAmountsOf(const MassBudgetSpec& budget, const Array1<double>& amount, const Array1<int>& code,
                              const RunControl& run);

// Sets the initial amount of component c (position in budget.components).
void StartBudget(MassBudgetSpec& budget, int c, const Array1<double>& amount);

// Per sub-step of length dt: face fluxes (amount/s, positive from element1
// to element2) into Transport; element rates (amount/s) into Source or
// Proces; amounts added per element (amount) into Defect.
void AccumulateBudgetTransport(MassBudgetSpec& budget, int c, const Array1<double>& face_flux, double dt);
void AccumulateBudgetSource(MassBudgetSpec& budget, int c, const Array1<double>& rate, double dt);
void AccumulateBudgetProcess(MassBudgetSpec& budget, int c, const Array1<double>& rate, double dt);
void AccumulateBudgetDefect(MassBudgetSpec& budget, int c, const Array1<double>& added);

// Value of item k (1 .. 9) of component c from the current amounts; an
// unknown item is the fatal error "SpecMassBudget: Item not supported".
// The accumulated terms are summed over all processes (collective).
double BudgetItemValue(const MassBudgetSpec& budget, int c, int k, const BudgetAmounts& now, const RunControl& run);

// Writes the polygon to file_name_section (x y per line, closed).
void WriteBudgetSection(const MassBudgetSpec& budget, const Mesh& mesh);

}  // namespace vhd
