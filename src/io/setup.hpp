#pragma once
// The setup-file layer: a TOML document read once at start-up and kept in
// memory as a tree of targets, sections, keywords and parameters, with one
// current section and typed keyword readers that store the default first and
// log every value read.
//
//   target VantorHD            [VantorHD]
//   section TIME               [VantorHD.TIME]
//   numbered section CODE_2    [VantorHD.....CODE_2]   (index -2 gives CODE_M2)
//   section instance k         element k of an array of tables [[...]]
//   keyword, n parameters      key = value  |  key = [v1, ..., vn]
//
// A relative file name is resolved against the folder of the setup file.
// A value that cannot be read as the type asked for stops the run with a
// message naming section path, keyword, line, wanted type and found value,
// unless the caller passes a flag (then the flag is 1 and the default stays).

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace vhd {

inline constexpr int kNoIndex = 1 << 30;  // "no number appended to the section name"

// Options of a keyword read: keyword instance and parameter number count from
// 1; flag (when given) is set to 0 when the keyword was found and read without
// error, else 1.
struct SktArg {
  int instance = 1;
  int param = 1;
  int* flag = nullptr;
};

// Loads the setup file; when create_log, also creates the log file (named
// from the setup file and the process id). Unreadable file or syntax error:
// the run stops with the system's message.
// With status: an unreadable file gives status -1 (else 0) and no stop, so
// that the caller can report it in its own words.
void SktOpenFile(const std::string& name, bool create_log, int process_id = -1, int* status = nullptr);
void SktClose();
bool SktIsOpen();
const std::string& SktFilePath();
// Folder of the setup file (with trailing "/"), and a name resolved against it.
std::string SktFolder();
std::string SktResolvePath(std::string_view name);

// Opens a top-level target; it becomes the current section (level 0).
// Missing: status -1 when given, else StopRun "SKT target: <name> not found".
void SktOpenTarget(std::string_view name, int* status = nullptr);

// Opens section name (+ "_" + index, or "_M" + |index| for index < 0) inside
// the current section; it becomes current. With log, writes the empty line and
// the "Section: " line. Missing: status -1 when given, else StopRun
// "SKT section: <name> not found". instance counts repeated sections from 1.
void SktOpenSection(std::string_view name, int index = kNoIndex, int* status = nullptr,
                    bool log = true, int instance = 1);
void SktCloseSection();
// Marks the current section and every section below it as deliberately
// skipped: the program opened it only to decide not to read it (an output with
// include = 0, a module switched off). SktReportUnusedKeywords reports none of
// their keywords that no reader asked for. The section stays current: close it
// with SktCloseSection as usual. No effect without a current section.
void SktSkipSection();
// Queries on the current section (no logging, no error).
bool SktSectionExists(std::string_view name, int index = kNoIndex);
int SktNumberOfSectionInstances(std::string_view name);
bool SktHasKeyword(std::string_view key);
int SktNumberOfParams(std::string_view key, int instance = 1);  // 0 when absent
int SktLevel();                  // 0 for a target
std::string SktSectionPath();    // "VantorHD/HYDRODYNAMIC_MODULE/TIME"

// Keyword readers. The default (when given) is stored first; a keyword found
// in the current section has parameter arg.param read into value, and the
// read is logged (" (default)" when the keyword is absent).
//   - An absent keyword without a default leaves the value as the caller set
//     it, sets the flag to 1 and writes no log line; the caller decides
//     whether that is an error.
//   - Integers are read from TOML integers only (never from a float or a
//     boolean); reals from integers or floats; logicals from booleans or
//     integers (non-zero is true); texts and file names from strings. inf and
//     nan are refused, as are values outside the range of the type.
//   - A keyword given as an array of arrays holds instances: instance k is
//     the k-th inner array ("point = [[1.0, 2.0], [3.0, 4.0]]").
//   - A missing parameter or instance of a keyword that is present is a
//     read error like a wrong type; an array reader wants exactly n values.
void SktReadKeyword(std::string_view key, int& value, std::optional<int> def = {}, SktArg arg = {});
void SktReadKeyword(std::string_view key, float& value, std::optional<float> def = {}, SktArg arg = {});
void SktReadKeyword(std::string_view key, double& value, std::optional<double> def = {}, SktArg arg = {});
void SktReadKeyword(std::string_view key, bool& value, std::optional<bool> def = {}, SktArg arg = {});
void SktReadKeyword(std::string_view key, std::string& value, std::optional<std::string> def = {},
                    SktArg arg = {});
// A file name: stored resolved against the setup file's folder; logged whole,
// or without its path when VX7F90_LOG_NOPATH is set.
void SktReadFileName(std::string_view key, std::string& path, std::optional<std::string> def = {},
                     SktArg arg = {});
// Arrays of n values (parameters 1..n); a default array must hold n values.
void SktReadKeyword(std::string_view key, std::vector<int>& values, int n,
                    std::optional<std::vector<int>> def = {}, SktArg arg = {});
void SktReadKeyword(std::string_view key, std::vector<double>& values, int n,
                    std::optional<std::vector<double>> def = {}, SktArg arg = {});

// After all module setups, warnings naming path and line for
//   - every keyword of an opened section that no reader asked for, and the
//     parameters of a keyword that no reader read ("dt = [30, 40]" read as one
//     value);
//   - every section that no reader opened (once, not its keywords nor the
//     sections below it), and every keyword outside the target.
// A name within two edits of one a reader looked for in the same section
// gets "did you mean ...". Sections skipped with SktSkipSection, and all below
// them, are not reported.
void SktReportUnusedKeywords();

}  // namespace vhd
