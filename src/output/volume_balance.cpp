#include "output/volume_balance.hpp"

#include <filesystem>
#include <vector>

#include "log/log.hpp"

namespace vhd {

namespace {

struct Line {
  const char* label;
  double value;
};

// The lines of the balance in log order.
std::vector<Line> BalanceLines(const VolumeBalance& b) {
  std::vector<Line> lines = {
      {"Initial volume in model area (m**3)                : %", b.initial},
      {"   Final volume in wet area (m**3)                 : %", b.final_wet},
      {"   Final volume in dry area (m**3)                 : %", b.final_dry},
      {"Final volume in model area (m**3)                  : %", b.Final()},
  };
  if (b.show_sources) {
    lines.push_back({"   Source inflow (m**3)                            : %", b.source_inflow});
    lines.push_back({"   Source outflow (m**3)                           : %", b.source_outflow});
  }
  lines.push_back({"Total volume from source (m**3)                    : %", b.TotalSource()});
  lines.push_back({"   Precipitation (m**3)                            : %", b.precipitation});
  lines.push_back({"   Evaporation (m**3)                              : %", b.evaporation});
  lines.push_back({"   Infiltration (m**3)                             : %", b.infiltration});
  lines.push_back({"Total volume from process (m**3)                   : %", b.TotalProcess()});
  lines.push_back({"Total volume from boundaries (m**3)                : %", b.boundaries});
  if (b.show_defect) lines.push_back({"Volume defect (m**3)                               : %", b.defect});
  lines.push_back({"Continuity balance (m**3)                          : %", b.Continuity()});
  return lines;
}

// The label of a line without its padding and value slot.
std::string Label(const char* templ) {
  std::string s(templ);
  s = s.substr(0, s.find(':'));
  const auto first = s.find_first_not_of(' ');
  const auto last = s.find_last_not_of(' ');
  return first == std::string::npos ? std::string() : s.substr(first, last - first + 1);
}

std::string Html(const std::string& text) {
  std::string out;
  for (char c : text) {
    if (c == '<') out += "&lt;";
    else if (c == '>') out += "&gt;";
    else if (c == '&') out += "&amp;";
    else out += c;
  }
  return out;
}

}  // namespace

void PrintVolumeBalance(const VolumeBalance& balance) {
  WriteBanner("Volume balance");
  for (const Line& line : BalanceLines(balance)) WriteValueLine(line.label, line.value);
  WriteBanner("");
}

bool CCreateHtmlVolumeBalanceFile(Volrep& report, const std::string& path, const std::string& title) {
  report.path = path;
  report.file = std::fopen(path.c_str(), "w");
  if (!report.file) {
    Warning("CCreateHtmlVolumeBalanceFile: Unable to create " + path);
    return false;
  }
  std::fprintf(report.file,
               "<!DOCTYPE html>\n<html>\n<head>\n<meta charset=\"utf-8\">\n<title>%s</title>\n"
               "<style>body{font-family:sans-serif} td{padding:2px 12px} td.v{text-align:right;"
               "font-family:monospace}</style>\n</head>\n<body>\n<h1>%s</h1>\n<table>\n",
               Html(title).c_str(), Html(title).c_str());
  return true;
}

void CPlaceVolumeValueInHTML(Volrep& report, const std::string& label, double value) {
  if (!report.file) return;
  const bool indented = !label.empty() && label.front() == ' ';
  const std::size_t first = label.find_first_not_of(' ');
  const std::string text = first == std::string::npos ? std::string() : label.substr(first);
  std::fprintf(report.file, "<tr><td>%s%s</td><td class=\"v\">%.10g</td></tr>\n", indented ? "&emsp;" : "",
               Html(text).c_str(), value);
}

void CCloseHtmlVolumeBalance(Volrep& report) {
  if (!report.file) return;
  std::fprintf(report.file, "</table>\n</body>\n</html>\n");
  if (std::fclose(report.file) != 0) Warning("CCloseHtmlVolumeBalance: Unable to write " + report.path);
  report.file = nullptr;
}

std::string WriteVolumeBalanceReport(const VolumeBalance& balance) {
  if (!LogIsOpen()) return {};
  std::filesystem::path p(LogFilePath());
  const std::string stem = p.stem().string();
  const std::string path = (p.parent_path() / (stem + "_VolumeBalance.html")).string();
  Volrep report;
  if (!CCreateHtmlVolumeBalanceFile(report, path, "VolumeBalance")) return {};
  for (const Line& line : BalanceLines(balance)) {
    // An indented line of the log stays indented in the report.
    std::string text = Label(line.label);
    if (line.label[0] == ' ') text.insert(text.begin(), ' ');
    CPlaceVolumeValueInHTML(report, text, line.value);
  }
  CCloseHtmlVolumeBalance(report);
  return path;
}

}  // namespace vhd
