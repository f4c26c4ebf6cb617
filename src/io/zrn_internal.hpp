#pragma once
// Helpers shared by the data-file layer's sources (not part of its interface).

#include <string>

#include "io/zrn.hpp"

namespace vhd::zrn_detail {

// Ends a call: stores the code in status when given, otherwise stops the run
// on failure with "ZRN Error: " and the code's text, naming the file.
int Finish(const std::string& file_name, const std::string& detail, int code, int* status);
inline int Finish(const ZrnFile& f, int code, int* status) {
  return Finish(f.name, f.detail, code, status);
}
// Records the library's message for a failure and returns the code.
int Fail(ZrnFile& f, int code, const std::string& detail);
// The time axis name written to and read from `zrn_time_axis`.
const char* TimeAxisText(int type);
int TimeAxisFromText(const std::string& text);
// What is wrong with a spatial axis ("" when nothing): sizes below 1, an
// origin or spacing that is not finite, a zero spacing (a negative spacing is
// a descending axis), an unknown mesh location.
std::string AxisProblem(const ZrnSpatialAxis& a);

}  // namespace vhd::zrn_detail
