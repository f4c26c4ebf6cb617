#pragma once
// The volume balance of the whole model area at the end of a run: the block
// "Volume balance" of the log and the small HTML report "VolumeBalance"
// beside the log.
//
//   Continuity balance = final volume - initial volume - volume from sources
//                        - volume from processes - volume from boundaries
//                        - volume defect
// which is zero to round-off when the scheme conserves mass: every volume
// that entered or left the model area is booked in one of the terms.

#include <cstdio>
#include <string>

namespace vhd {

struct VolumeBalance {
  double initial = 0.0;     // m3 in the model area at the start
  double final_wet = 0.0;   // m3 in wet and flooded elements at the end
  double final_dry = 0.0;   // m3 in dry elements at the end
  double source_inflow = 0.0, source_outflow = 0.0;  // outflow negative
  double precipitation = 0.0, evaporation = 0.0, infiltration = 0.0;  // losses negative
  double boundaries = 0.0;  // net inflow through open boundaries
  double defect = 0.0;      // volume the scheme added (negative depths cut to zero)
  bool show_sources = false;  // the source lines (flow computed)
  bool show_defect = false;   // the module counts a volume defect

  double Final() const { return final_wet + final_dry; }
  double TotalSource() const { return source_inflow + source_outflow; }
  double TotalProcess() const { return precipitation + evaporation + infiltration; }
  double Continuity() const { return Final() - initial - TotalSource() - TotalProcess() - boundaries - defect; }
};

// The "Volume balance" block of the log (values already summed over processes).
void PrintVolumeBalance(const VolumeBalance& balance);

// The volume-report library: a small HTML page of labelled volumes.
struct Volrep {
  std::FILE* file = nullptr;
  std::string path;
};
// Creates the page; false (and a warning) when it cannot be created.
bool CCreateHtmlVolumeBalanceFile(Volrep& report, const std::string& path, const std::string& title);
void CPlaceVolumeValueInHTML(Volrep& report, const std::string& label, double value);
void CCloseHtmlVolumeBalance(Volrep& report);

// The report "VolumeBalance" of a balance, written beside the log file
// (its name with "_VolumeBalance.html" in place of ".log"). Returns its path,
// empty when there is no log.
std::string WriteVolumeBalanceReport(const VolumeBalance& balance);

}  // namespace vhd
