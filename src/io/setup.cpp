// The setup-file layer on toml++.

#include "io/setup.hpp"

#include <fmt/core.h>

#include <algorithm>
#include <cctype>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <limits>
#include <map>
#include <memory>
#include <set>
#include <sstream>
#include <toml++/toml.h>

#include "log/log.hpp"

namespace vhd {

namespace {

namespace fs = std::filesystem;

struct Frame {
  const toml::table* table;
  std::string path;  // "VantorHD/HYDRODYNAMIC_MODULE/TIME"
};

struct SetupState {
  std::unique_ptr<toml::table> root;
  std::string path;
  std::string folder;
  std::vector<Frame> stack;                   // empty: the document root
  std::vector<Frame> opened;                  // every section opened, once
  std::set<const toml::node*> used_keys;      // keyword nodes asked for
  std::set<const toml::node*> used_values;    // parameter nodes read
  std::set<const toml::table*> skipped;       // sections skipped on purpose, with all below them
  // Names of sections and keywords that a reader looked for, per table, for
  // the suggestions of the unused report.
  std::map<const toml::table*, std::set<std::string>> asked_sections;
  std::map<const toml::table*, std::set<std::string>> asked_keys;
};

SetupState& State() {
  static SetupState state;
  return state;
}

const toml::table* CurrentTable() {
  const SetupState& s = State();
  return s.stack.empty() ? s.root.get() : s.stack.back().table;
}

// The section `name` of the current section (the document root when none is
// current), remembered as looked for.
const toml::node* LookUpSection(std::string_view name) {
  const toml::table* table = CurrentTable();
  if (!table) return nullptr;
  State().asked_sections[table].emplace(name);
  return table->get(name);
}

bool IsSection(const toml::node& node) { return node.is_table() || node.is_array_of_tables(); }

// An array whose elements are all arrays holds the instances of a keyword.
bool IsInstanceArray(const toml::node& node) {
  const toml::array* a = node.as_array();
  if (!a || a->empty()) return false;
  return std::all_of(a->begin(), a->end(), [](const toml::node& e) { return e.is_array(); });
}

std::string SectionName(std::string_view name, int index) {
  if (index == kNoIndex) return std::string(name);
  if (index < 0) return fmt::format("{}_M{}", name, -static_cast<long long>(index));
  return fmt::format("{}_{}", name, index);
}

// A value as it would be written in the file, for messages.
std::string NodeText(const toml::node& node) {
  if (const auto* v = node.as_string()) return fmt::format("\"{}\"", v->get());
  if (const auto* v = node.as_integer()) return fmt::format("{}", v->get());
  if (const auto* v = node.as_boolean()) return v->get() ? "true" : "false";
  if (const auto* v = node.as_floating_point()) {
    const double x = v->get();
    if (std::isnan(x)) return "nan";
    if (std::isinf(x)) return x > 0 ? "inf" : "-inf";
    std::string text = fmt::format("{}", x);
    if (text.find_first_of(".e") == std::string::npos) text += ".0";
    return text;
  }
  if (const auto* a = node.as_array()) {
    std::string text = "[";
    for (std::size_t i = 0; i < a->size(); ++i) text += (i ? ", " : "") + NodeText(*a->get(i));
    return text + "]";
  }
  if (node.is_table()) return "a table";
  std::ostringstream out;
  node.visit([&out](const auto& v) { out << v; });
  return out.str();
}

int LineOf(const toml::node& node) { return static_cast<int>(node.source().begin.line); }

std::string FileNameForLog(const std::string& name) {
  if (!std::getenv("VX7F90_LOG_NOPATH")) return name;
  const auto cut = name.find_last_of("/\\");
  return cut == std::string::npos ? name : name.substr(cut + 1);
}

std::string FloatText(float value) {
  // The shortest decimal text of the single value, so that 0.1f logs as 0.1.
  char buf[32];
  const auto res = std::to_chars(buf, buf + sizeof buf, value);
  double x = value;
  std::from_chars(buf, res.ptr, x);
  return SubstituteValue("%", x);
}

std::string ValueText(int v) { return SubstituteValue("%", v); }
std::string ValueText(float v) { return FloatText(v); }
std::string ValueText(double v) { return SubstituteValue("%", v); }
std::string ValueText(bool v) { return v ? "True" : "False"; }
std::string ValueText(const std::string& v) { return v; }
template <class T>
std::string ValueText(const std::vector<T>& values) {
  std::string text;
  for (const T& v : values) {
    if (!text.empty()) text += ' ';
    text += ValueText(v);
  }
  return text;
}

void LogRead(std::string_view key, const std::string& value_text, bool is_default) {
  if (!LogIsOpen()) return;
  const int level = std::max(SktLevel(), 0);
  std::string line(2 * (level + 1), ' ');
  line += key;
  line += " : ";
  line += value_text;
  if (is_default) line += " (default)";
  WriteLogLine(line);
}

// Where a keyword read stands: the keyword node (null when absent) and the
// parameter container of the instance asked for.
struct KeywordLookup {
  const toml::node* keyword = nullptr;
  const toml::node* params = nullptr;
};

KeywordLookup FindKeyword(std::string_view key, int instance) {
  KeywordLookup found;
  const toml::table* table = CurrentTable();
  if (!table) return found;
  State().asked_keys[table].emplace(key);
  const toml::node* node = table->get(key);
  if (!node) return found;
  found.keyword = node;
  if (IsInstanceArray(*node)) {
    const toml::array& a = *node->as_array();
    if (instance >= 1 && static_cast<std::size_t>(instance) <= a.size()) found.params = a.get(instance - 1);
  } else if (instance == 1) {
    found.params = node;
  }
  return found;
}

[[noreturn]] void ReadError(std::string_view key, const toml::node& at, std::string_view what) {
  FatalError(fmt::format("SktReadKeyword: keyword {} in section {}, line {} of {}: {}", key, SktSectionPath(),
                         LineOf(at), State().path, what));
}

// Fails with flag = 1 when the caller passed a flag, else stops the run.
bool Fail(const SktArg& arg, std::string_view key, const toml::node& at, std::string_view what) {
  if (arg.flag) {
    *arg.flag = 1;
    return false;
  }
  ReadError(key, at, what);
}

// ---- conversion of one parameter node -----------------------------------

struct Converted {
  bool ok = false;
  std::string wanted;
};

Converted Convert(const toml::node& node, int& out) {
  if (const auto* v = node.as_integer()) {
    const std::int64_t x = v->get();
    if (x >= std::numeric_limits<int>::min() && x <= std::numeric_limits<int>::max()) {
      out = static_cast<int>(x);
      return {true, {}};
    }
    return {false, "integer within the 32-bit range"};
  }
  return {false, "integer"};
}

Converted ConvertReal(const toml::node& node, double& out, double limit, const char* wanted) {
  double x = 0;
  if (const auto* i = node.as_integer()) {
    x = static_cast<double>(i->get());
  } else if (const auto* f = node.as_floating_point()) {
    x = f->get();
  } else {
    return {false, wanted};
  }
  if (!std::isfinite(x) || std::fabs(x) > limit) return {false, fmt::format("finite {}", wanted)};
  out = x;
  return {true, {}};
}

Converted Convert(const toml::node& node, double& out) {
  return ConvertReal(node, out, std::numeric_limits<double>::max(), "number");
}

Converted Convert(const toml::node& node, float& out) {
  double x = 0;
  Converted c = ConvertReal(node, x, std::numeric_limits<float>::max(), "single-precision number");
  if (c.ok) out = static_cast<float>(x);
  return c;
}

Converted Convert(const toml::node& node, bool& out) {
  if (const auto* b = node.as_boolean()) {
    out = b->get();
    return {true, {}};
  }
  if (const auto* i = node.as_integer()) {
    out = i->get() != 0;
    return {true, {}};
  }
  return {false, "logical (true, false or an integer)"};
}

Converted Convert(const toml::node& node, std::string& out) {
  if (const auto* s = node.as_string()) {
    out = s->get();
    return {true, {}};
  }
  return {false, "text"};
}

// Parameter p of a container: an array's element p, or a single value as
// parameter 1.
const toml::node* Param(const toml::node& params, int p) {
  if (const toml::array* a = params.as_array()) {
    return p >= 1 && static_cast<std::size_t>(p) <= a->size() ? a->get(p - 1) : nullptr;
  }
  return p == 1 ? &params : nullptr;
}

int ParamCount(const toml::node& params) {
  if (const toml::array* a = params.as_array()) return static_cast<int>(a->size());
  return 1;
}

// One value: default first, then parameter arg.param of the keyword.
// Returns true when the keyword was found and read.
template <class T>
bool ReadOne(std::string_view key, T& value, const std::optional<T>& def, const SktArg& arg) {
  if (def) value = *def;
  if (arg.flag) *arg.flag = 1;
  const KeywordLookup k = FindKeyword(key, arg.instance);
  if (!k.keyword) return false;
  State().used_keys.insert(k.keyword);
  if (IsSection(*k.keyword)) return Fail(arg, key, *k.keyword, "value wanted, found a section");
  if (!k.params) {
    return Fail(arg, key, *k.keyword, fmt::format("instance {} wanted, found {}", arg.instance, NodeText(*k.keyword)));
  }
  const toml::node* p = Param(*k.params, arg.param);
  if (!p) {
    return Fail(arg, key, *k.params,
                fmt::format("parameter {} wanted, found {} value(s): {}", arg.param, ParamCount(*k.params),
                            NodeText(*k.params)));
  }
  T read{};
  const Converted c = Convert(*p, read);
  if (!c.ok) return Fail(arg, key, *p, fmt::format("{} wanted, found {}", c.wanted, NodeText(*p)));
  State().used_values.insert(p);
  value = read;
  if (arg.flag) *arg.flag = 0;
  return true;
}

template <class T>
void ReadScalar(std::string_view key, T& value, const std::optional<T>& def, const SktArg& arg) {
  const bool found = ReadOne(key, value, def, arg);
  if (found || (def && !FindKeyword(key, arg.instance).keyword)) LogRead(key, ValueText(value), !found);
}

template <class T>
void ReadArray(std::string_view key, std::vector<T>& values, int n, const std::optional<std::vector<T>>& def,
               const SktArg& arg) {
  if (n < 0) n = 0;
  if (def && static_cast<int>(def->size()) != n) {
    FatalError(fmt::format("SktReadKeyword: default of keyword {} in section {} holds {} values, {} wanted", key,
                           SktSectionPath(), def->size(), n));
  }
  if (def) values = *def;
  if (arg.flag) *arg.flag = 1;
  const KeywordLookup k = FindKeyword(key, arg.instance);
  if (!k.keyword) {
    if (def) LogRead(key, ValueText(values), true);
    return;
  }
  State().used_keys.insert(k.keyword);
  if (IsSection(*k.keyword)) {
    Fail(arg, key, *k.keyword, "values wanted, found a section");
    return;
  }
  if (!k.params) {
    Fail(arg, key, *k.keyword, fmt::format("instance {} wanted, found {}", arg.instance, NodeText(*k.keyword)));
    return;
  }
  if (ParamCount(*k.params) != n) {
    Fail(arg, key, *k.params, fmt::format("{} value(s) wanted, found {}", n, NodeText(*k.params)));
    return;
  }
  std::vector<T> read(n);
  for (int i = 1; i <= n; ++i) {
    const toml::node& p = *Param(*k.params, i);
    T x{};
    const Converted c = Convert(p, x);
    if (!c.ok) {
      Fail(arg, key, p, fmt::format("{} wanted as value {}, found {}", c.wanted, i, NodeText(p)));
      return;
    }
    read[i - 1] = x;
  }
  for (int i = 1; i <= n; ++i) State().used_values.insert(Param(*k.params, i));
  values = std::move(read);
  if (arg.flag) *arg.flag = 0;
  LogRead(key, ValueText(values), false);
}

}  // namespace

// ---- file -------------------------------------------------------------------

void SktOpenFile(const std::string& name, bool create_log, int process_id, int* status) {
  SktClose();
  if (status) *status = 0;
  std::error_code ec;
  std::ifstream in;
  if (fs::is_regular_file(name, ec)) in.open(name, std::ios::binary);
  if (!in.is_open()) {
    if (status) {
      *status = -1;
      return;
    }
    FatalError("SktOpenFile : Unable to open " + name);
  }
  std::ostringstream text;
  text << in.rdbuf();
  SetupState& s = State();
  try {
    s.root = std::make_unique<toml::table>(toml::parse(text.str(), name));
  } catch (const toml::parse_error& e) {
    std::string msg(e.description());
    msg = SubstituteValue(msg + " near line %", static_cast<int>(e.source().begin.line));
    msg = SubstituteValue(msg + " and colum %", static_cast<int>(e.source().begin.column));
    msg = SubstituteValue(msg + " in file %", name);
    FatalError(msg);
  }
  s.path = name;
  fs::path folder = fs::absolute(fs::path(name), ec).parent_path().lexically_normal();
  s.folder = folder.string();
  if (s.folder.empty() || s.folder.back() != '/') s.folder += '/';
  if (create_log) OpenLogFile(LogFileName(name, process_id));
}

void SktClose() {
  SetupState& s = State();
  s.root.reset();
  s.path.clear();
  s.folder.clear();
  s.stack.clear();
  s.opened.clear();
  s.used_keys.clear();
  s.used_values.clear();
  s.skipped.clear();
  s.asked_sections.clear();
  s.asked_keys.clear();
}

bool SktIsOpen() { return State().root != nullptr; }

const std::string& SktFilePath() { return State().path; }

std::string SktFolder() { return State().folder; }

std::string SktResolvePath(std::string_view name) {
  if (name.empty()) return {};
  const fs::path p{std::string(name)};
  if (p.is_absolute()) return p.string();
  return (fs::path(State().folder) / p).lexically_normal().string();
}

// ---- sections -----------------------------------------------------------------

void SktOpenTarget(std::string_view name, int* status) {
  SetupState& s = State();
  const toml::node* node = nullptr;
  if (s.root) {
    s.asked_sections[s.root.get()].emplace(name);
    node = s.root->get(name);
  }
  if (!node || !node->is_table()) {
    if (status) {
      *status = -1;
      return;
    }
    StopRun(fmt::format("SKT target: {} not found", name));
  }
  if (status) *status = 0;
  s.stack.clear();
  s.stack.push_back({node->as_table(), std::string(name)});
  if (std::none_of(s.opened.begin(), s.opened.end(), [&](const Frame& f) { return f.table == node->as_table(); })) {
    s.opened.push_back(s.stack.back());
  }
}

void SktOpenSection(std::string_view name, int index, int* status, bool log, int instance) {
  SetupState& s = State();
  const std::string full = SectionName(name, index);
  const toml::node* node = LookUpSection(full);
  const toml::table* table = nullptr;
  if (node && node->is_table() && instance == 1) {
    table = node->as_table();
  } else if (node && node->is_array_of_tables()) {
    const toml::array& a = *node->as_array();
    if (instance >= 1 && static_cast<std::size_t>(instance) <= a.size()) table = a.get(instance - 1)->as_table();
  }
  if (!table) {
    if (status) {
      *status = -1;
      return;
    }
    StopRun(fmt::format("SKT section: {} not found", full));
  }
  if (status) *status = 0;
  std::string path = s.stack.empty() ? full : s.stack.back().path + "/" + full;
  if (instance > 1) path += fmt::format("({})", instance);
  s.stack.push_back({table, path});
  if (std::none_of(s.opened.begin(), s.opened.end(), [&](const Frame& f) { return f.table == table; })) {
    s.opened.push_back(s.stack.back());
  }
  if (log && LogIsOpen()) {
    std::string line(2 * SktLevel(), ' ');
    line += "Section: " + full + " ";
    if (line.size() < 70) line.append(70 - line.size(), '-');
    WriteLogLine("");
    WriteLogLine(line);
  }
}

void SktCloseSection() {
  SetupState& s = State();
  if (!s.stack.empty()) s.stack.pop_back();
}

namespace {

void MarkSkipped(const toml::table& table, std::set<const toml::table*>& skipped) {
  skipped.insert(&table);
  for (const auto& [key, node] : table) {
    if (const toml::table* t = node.as_table()) {
      MarkSkipped(*t, skipped);
    } else if (node.is_array_of_tables()) {
      for (const toml::node& e : *node.as_array()) MarkSkipped(*e.as_table(), skipped);
    }
  }
}

}  // namespace

void SktSkipSection() {
  SetupState& s = State();
  if (!s.stack.empty()) MarkSkipped(*s.stack.back().table, s.skipped);
}

bool SktSectionExists(std::string_view name, int index) { return SktNumberOfSectionInstances(SectionName(name, index)) > 0; }

int SktNumberOfSectionInstances(std::string_view name) {
  const toml::node* node = LookUpSection(name);
  if (!node) return 0;
  if (node->is_table()) return 1;
  if (node->is_array_of_tables()) return static_cast<int>(node->as_array()->size());
  return 0;
}

bool SktHasKeyword(std::string_view key) {
  const toml::table* table = CurrentTable();
  const toml::node* node = table ? table->get(key) : nullptr;
  return node && !IsSection(*node);
}

int SktNumberOfParams(std::string_view key, int instance) {
  const KeywordLookup k = FindKeyword(key, instance);
  if (!k.keyword || IsSection(*k.keyword) || !k.params) return 0;
  return ParamCount(*k.params);
}

int SktLevel() { return static_cast<int>(State().stack.size()) - 1; }

std::string SktSectionPath() {
  const SetupState& s = State();
  return s.stack.empty() ? std::string() : s.stack.back().path;
}

// ---- keyword readers ------------------------------------------------------------

void SktReadKeyword(std::string_view key, int& value, std::optional<int> def, SktArg arg) {
  ReadScalar(key, value, def, arg);
}

void SktReadKeyword(std::string_view key, float& value, std::optional<float> def, SktArg arg) {
  ReadScalar(key, value, def, arg);
}

void SktReadKeyword(std::string_view key, double& value, std::optional<double> def, SktArg arg) {
  ReadScalar(key, value, def, arg);
}

void SktReadKeyword(std::string_view key, bool& value, std::optional<bool> def, SktArg arg) {
  ReadScalar(key, value, def, arg);
}

void SktReadKeyword(std::string_view key, std::string& value, std::optional<std::string> def, SktArg arg) {
  ReadScalar(key, value, def, arg);
}

void SktReadFileName(std::string_view key, std::string& path, std::optional<std::string> def, SktArg arg) {
  const bool found = ReadOne(key, path, def, arg);
  const bool is_default = !found && def && !FindKeyword(key, arg.instance).keyword;
  if (found || is_default) {
    path = SktResolvePath(path);
    LogRead(key, FileNameForLog(path), is_default);
  } else if (def) {
    path = SktResolvePath(path);
  }
}

void SktReadKeyword(std::string_view key, std::vector<int>& values, int n, std::optional<std::vector<int>> def,
                    SktArg arg) {
  ReadArray(key, values, n, def, arg);
}

void SktReadKeyword(std::string_view key, std::vector<double>& values, int n,
                    std::optional<std::vector<double>> def, SktArg arg) {
  ReadArray(key, values, n, def, arg);
}

// ---- unused keywords and sections ----------------------------------------------------

namespace {

struct Unused {
  int line;
  std::string text;
};

// Edit distance of two names with case ignored; swapping two neighbouring
// letters counts as one edit.
int EditDistance(std::string_view a, std::string_view b) {
  const std::size_t n = a.size(), m = b.size();
  std::vector<std::vector<int>> d(n + 1, std::vector<int>(m + 1, 0));
  for (std::size_t i = 0; i <= n; ++i) d[i][0] = static_cast<int>(i);
  for (std::size_t j = 0; j <= m; ++j) d[0][j] = static_cast<int>(j);
  auto up = [](char c) { return static_cast<char>(std::toupper(static_cast<unsigned char>(c))); };
  for (std::size_t i = 1; i <= n; ++i) {
    for (std::size_t j = 1; j <= m; ++j) {
      const int cost = up(a[i - 1]) == up(b[j - 1]) ? 0 : 1;
      d[i][j] = std::min({d[i - 1][j] + 1, d[i][j - 1] + 1, d[i - 1][j - 1] + cost});
      if (i > 1 && j > 1 && up(a[i - 1]) == up(b[j - 2]) && up(a[i - 2]) == up(b[j - 1]))
        d[i][j] = std::min(d[i][j], d[i - 2][j - 2] + 1);
    }
  }
  return d[n][m];
}

// A numbered section's name without its number ("CODE_2", "CODE_M2" -> "CODE").
std::string_view NumberStem(std::string_view name) {
  std::size_t end = name.size();
  while (end > 0 && std::isdigit(static_cast<unsigned char>(name[end - 1]))) --end;
  if (end == name.size()) return name;
  if (end > 1 && name[end - 1] == 'M' && name[end - 2] == '_') return name.substr(0, end - 2);
  if (end > 0 && name[end - 1] == '_') return name.substr(0, end - 1);
  return name;
}

// "; did you mean X?" for the nearest of the names a reader looked for, when
// it lies within two edits (and the edits are less than half of it). A name
// that differs only in its number gets none: CODE_7 is not a typing slip of
// CODE_1.
std::string Suggestion(std::string_view name, const std::map<const toml::table*, std::set<std::string>>& asked,
                       const toml::table* table) {
  const auto it = asked.find(table);
  if (it == asked.end()) return {};
  const std::string* best = nullptr;
  int best_distance = 3;
  for (const std::string& candidate : it->second) {
    if (candidate == name || NumberStem(candidate) == NumberStem(name)) continue;
    const int distance = EditDistance(name, candidate);
    if (distance < best_distance && 2 * distance < static_cast<int>(candidate.size())) {
      best = &candidate;
      best_distance = distance;
    }
  }
  return best ? fmt::format("; did you mean {}?", *best) : std::string();
}

// Sections below `table` that no reader opened, each reported once (not the
// sections below it), and the keywords of the document root.
void CollectUnusedSections(const toml::table& table, const std::string& path,
                           const std::map<const toml::table*, std::string>& opened, std::vector<Unused>& unused) {
  const SetupState& s = State();
  const std::string where = path.empty() ? std::string() : " in section " + path;
  auto visit = [&](const toml::table& section, const std::string& name) {
    if (s.skipped.count(&section)) return;
    const auto found = opened.find(&section);
    if (found != opened.end()) {
      CollectUnusedSections(section, found->second, opened, unused);
      return;
    }
    const int line = LineOf(section);
    unused.push_back({line, fmt::format("Section {}{}, line {}: not used{}", name, where, line,
                                        Suggestion(name, s.asked_sections, &table))});
  };
  for (const auto& [key, node] : table) {
    if (const toml::table* t = node.as_table()) {
      visit(*t, std::string(key.str()));
    } else if (node.is_array_of_tables()) {
      const toml::array& a = *node.as_array();
      for (std::size_t k = 0; k < a.size(); ++k) {
        visit(*a.get(k)->as_table(), k == 0 ? std::string(key.str()) : fmt::format("{}({})", key.str(), k + 1));
      }
    } else if (path.empty()) {
      unused.push_back({LineOf(node), fmt::format("Keyword {} outside the target, line {}: not used", key.str(),
                                                  LineOf(node))});
    }
  }
}

}  // namespace

void SktReportUnusedKeywords() {
  const SetupState& s = State();
  std::vector<Unused> unused;
  std::map<const toml::table*, std::string> opened;
  for (const Frame& f : s.opened) opened.emplace(f.table, f.path);
  if (s.root) CollectUnusedSections(*s.root, std::string(), opened, unused);
  for (const Frame& f : s.opened) {
    if (s.skipped.count(f.table)) continue;
    for (const auto& [key, node] : *f.table) {
      if (IsSection(node)) continue;
      const std::string where = fmt::format("Keyword {} in section {}, line {}", key.str(), f.path, LineOf(node));
      if (!s.used_keys.count(&node)) {
        unused.push_back({LineOf(node), where + ": not used" + Suggestion(key.str(), s.asked_keys, f.table)});
        continue;
      }
      // A keyword read only in part: the parameters no reader asked for.
      const toml::array* a = node.as_array();
      if (!a || IsInstanceArray(node)) continue;
      std::vector<int> missed;
      for (std::size_t i = 0; i < a->size(); ++i) {
        if (!s.used_values.count(a->get(i))) missed.push_back(static_cast<int>(i) + 1);
      }
      if (missed.empty()) continue;
      std::string list;
      for (const int m : missed) list += fmt::format("{}{}", list.empty() ? "" : " ", m);
      unused.push_back({LineOf(node), fmt::format("{}: parameter(s) {} not used", where, list)});
    }
  }
  std::stable_sort(unused.begin(), unused.end(), [](const Unused& a, const Unused& b) { return a.line < b.line; });
  for (const Unused& u : unused) Warning(u.text);
}

}  // namespace vhd
