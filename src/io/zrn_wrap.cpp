// Data-file wrappers: opening inputs, the unit check of input items, one-call
// reads, and the "Data File Summary" block written when a file is closed.

#include <cstdio>

#include "io/units.hpp"
#include "io/zrn.hpp"
#include "io/zrn_internal.hpp"
#include "log/log.hpp"

namespace vhd {

int ZrnOpenInput(ZrnFile& f, const std::string& file_name, int* status) {
  int code = kZrnOk;
  zrnFileRead(f, file_name, &code);
  if (status != nullptr) {
    *status = code;
    return code;
  }
  if (code == kZrnOk) return code;
  if (code == kZrnErrOpen) StopRun("ZRN open error on file: " + ZrnLogName(file_name));
  return zrn_detail::Finish(f, code, nullptr);
}

int ZrnCheckItemUnit(const ZrnFile& f, int item, int required_item_type, int* status) {
  std::string name;
  int type = 0, unit = 0, value_type = 0;
  const int code = zrnGetItemInfo(f, item, name, type, unit, value_type, status);
  if (code != kZrnOk) return code;
  const std::string problem = uvqCheckUnitType(required_item_type, type, unit);
  if (problem.empty()) return zrn_detail::Finish(f.name, "", kZrnOk, status);
  if (status != nullptr) {
    *status = kZrnErrItem;
    return kZrnErrItem;
  }
  FatalError(problem + " - item " + std::to_string(item) + " '" + name + "' of file " +
             ZrnLogName(f.name));
}

int ZrnReadItemAtStep(ZrnFile& f, int step, int item, double* data, long n, int* status) {
  int code = zrnFindItemDynamic(f, step, item, status);
  if (code != kZrnOk) return code;
  int read_item = 0;
  double time = 0;
  return zrnReadItemTimeStep(f, read_item, time, data, n, status);
}

namespace {

std::string AxisText(const ZrnFile& f) {
  switch (f.time.type) {
    case kZrnTimeEqCalendar: return "Equidistant Calendar Axis";
    case kZrnTimeNeqCalendar: return "Non Equidistant Calendar Axis";
    case kZrnTimeEqRelative: return "Equidistant Time Axis";
    case kZrnTimeNeqRelative: return "Non Equidistant Time Axis";
    default: return "No Time Axis";
  }
}

std::string ItemLine(const ZrnItemInfo& it) {
  char buf[512];
  const std::string name = it.name.size() > 28 ? it.name.substr(0, 28) : it.name;
  std::string type = uvqGetItemTypeName(it.item_type);
  if (type.size() > 24) type.resize(24);
  if (it.nvalues > 0)
    std::snprintf(buf, sizeof buf, "    %-28s %-24s %14.6g %14.6g  %s", name.c_str(), type.c_str(),
                  it.minimum, it.maximum, uvqGetUnitName(it.unit).c_str());
  else
    std::snprintf(buf, sizeof buf, "    %-28s %-24s %14s %14s  %s", name.c_str(), type.c_str(), "-",
                  "-", uvqGetUnitName(it.unit).c_str());
  return buf;
}

}  // namespace

std::vector<std::string> ZrnSummaryLines(const ZrnFile& f) {
  std::vector<std::string> out;
  out.push_back("");
  out.push_back("Data File Summary");
  out.push_back("  Creator             : " + f.creator);
  out.push_back("  File                : " + ZrnLogName(f.name));
  out.push_back("  Title               : " + f.title);
  out.push_back("  Axis                : " + AxisText(f));
  char head[256];
  std::snprintf(head, sizeof head, "    %-28s %-24s %14s %14s  %s", "Name", "Type", "Minimum",
                "Maximum", "Unit");
  out.push_back("  Static items        : " + std::to_string(f.statics.size()));
  if (!f.statics.empty()) out.push_back(head);
  for (const auto& it : f.statics) out.push_back(ItemLine(it));
  out.push_back("  Dynamic items       : " + std::to_string(f.items.size()));
  if (!f.items.empty()) out.push_back(head);
  for (const auto& it : f.items) out.push_back(ItemLine(it));
  const bool calendar = f.time.type == kZrnTimeEqCalendar || f.time.type == kZrnTimeNeqCalendar;
  if (calendar) out.push_back("  Start date and time : " + zrnDateTimeText(f.time.start));
  else if (f.time.type != kZrnTimeUndefined)
    out.push_back("  Start time          : " + NumberText(f.time.start_offset, 14) + " s");
  double first = 0, last = 0;
  if (f.time.nsteps > 0) {
    zrnGetStepTime(f, 0, first, nullptr);
    zrnGetStepTime(f, f.time.nsteps - 1, last, nullptr);
  }
  char span[128];
  std::snprintf(span, sizeof span, "  Time span           : %.6g s in %d time steps", last - first,
                f.time.nsteps);
  out.push_back(span);
  if (calendar && f.time.nsteps > 0)
    out.push_back("  End date and time   : " + zrnDateTimeText(zrnAddSeconds(f.time.start, last)));
  out.push_back("");
  return out;
}

}  // namespace vhd
