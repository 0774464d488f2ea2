#include "check/check.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <fstream>
#include <map>
#include <memory>
#include <set>
#include <stdexcept>
#include <utility>
#include <vector>

#include "check/contents.h"
#include "check/halves.h"
#include "check/icu_file.h"
#include "dataset/olm_icu.h"
#include "dataset/olm_zoneinfo.h"

namespace {

using std::string;
using std::filesystem::path;
using names = std::vector<string>;

enum class file_kind { zone, other_zone, table };

// What a file among the zone files is, by its name. Some have no zone, some one that ICU does not
// have, or not by that name.
file_kind get_kind(const string& name) {
  constexpr std::array<const char*, 3> tables = {"tzdata.zi", "leapseconds", "leap-seconds.list"};
  constexpr std::array<const char*, 3> others = {"Factory", "posixrules", "localtime"};
  const auto is_one_of = [&](const auto& known) {
    return std::find(known.begin(), known.end(), name) != known.end();
  };
  if ('/' + name == version_file || is_one_of(tables) || name.ends_with(".tab"))
    return file_kind::table;
  const bool is_other =
      is_one_of(others) || name.starts_with("posix/") || name.starts_with("right/");
  return is_other ? file_kind::other_zone : file_kind::zone;
}

void tell(const listener& add_reason, const string& name, const string& reason) {
  add_reason(name + ' ' + reason);
}

// Those of `all` that are below `directory`, such as "/zoneinfo", by their paths from there.
names find_below(const char* directory, const names& all) {
  const string beginning = string(directory).substr(1) + '/';
  names found;
  for (const string& name : all)
    if (name.starts_with(beginning)) found.push_back(name.substr(beginning.size()));
  return found;
}

// Reads the zone files, each once, whatever number of names it has. Gives those of zones.
auto read_zones(const string& directory, const names& files, const canary_report& report) {
  struct outcome {
    std::shared_ptr<const olm_zone_file> file;
    string damage;
  };
  std::map<string, outcome> outcomes;
  decltype(halves::zones) zones;
  for (const string& name : files) {
    const file_kind kind = get_kind(name);
    if (kind == file_kind::table) continue;
    report.begin_step(name);
    const string place = std::filesystem::canonical(path(directory) / name);
    auto [found, is_new] = outcomes.try_emplace(place);
    auto& [file, damage] = found->second;
    if (is_new) {
      try {
        if (const auto data = read_file(place)) file = std::make_shared<const olm_zone_file>(*data);
      } catch (const std::invalid_argument& why) {
        damage = why.what();
      }
    }
    if (!damage.empty()) tell(report.add_reason, name, damage);
    if (kind == file_kind::zone) zones.emplace(name, file);
  }
  return zones;
}

// The first word of the version file.
string read_version(const string& zoneinfo, const listener& add_reason) {
  string version;
  std::ifstream(zoneinfo + version_file) >> version;
  if (version.empty()) tell(add_reason, string(version_file).substr(1), "is missing, or empty");
  return version;
}

// `replaced` may be a data set, or the directory of its zone files.
void find_missing(const string& replaced, const halves& halves, const listener& add_reason) {
  const auto pass = [](const string& /*reason*/) {};
  const names all = list_contents(replaced, pass);
  const names below = find_below(update_zoneinfo_directory, all);
  bool has_zones = false;
  for (const string& name : below.empty() ? all : below) {
    if (get_kind(name) != file_kind::zone) continue;
    has_zones = true;
    if (!halves.zones.contains(name))
      tell(add_reason, name, "is missing, which " + replaced + " has");
  }
  if (!has_zones) throw std::runtime_error(replaced + " has no zone files");
}

// Whether all four files of ICU's are whole.
bool check_icu_files(const string& directory, const names& files, const listener& add_reason) {
  bool are_whole = true;
  for (const char* const file : icu_files) {
    const string name = string(file) + icu_file_ending;
    string damage = "is missing";
    if (std::find(files.begin(), files.end(), name) != files.end()) {
      try {
        if (const auto data = read_file(path(directory) / name)) check_icu_file(*data);
        damage.clear();
      } catch (const std::invalid_argument& why) {
        damage = why.what();
      }
    }
    if (damage.empty()) continue;
    tell(add_reason, name, damage);
    are_whole = false;
  }
  return are_whole;
}

// The name of one file says what format the data have. A start goes by that of an update.
void check_schema(const names& files, bool is_update, const listener& add_reason) {
  constexpr const char* beginning = "icutz";
  constexpr const char* ending = ".dat";
  int count = 0;
  for (const string& name : files) {
    if (!name.starts_with(beginning) || !name.ends_with(ending)) continue;
    ++count;
    if (read_schema(name.c_str()).empty()) tell(add_reason, name, "has a name that is no schema");
  }
  if (count > 1) add_reason("there is more than one ICU data file");
  if (count == 0 && is_update) add_reason("there is no ICU data file, such as icutz44l.dat");
}

}  // namespace

void check_data_set(const check_request& request, const canary_report& report) {
  const listener& add_reason = report.add_reason;
  const bool is_update = !request.directory.empty();
  names zone_names;
  names icu_names;
  string zoneinfo = request.zoneinfo;
  string icu = request.icu;
  if (is_update) {
    zoneinfo = request.directory + update_zoneinfo_directory;
    icu = request.directory + update_icu_directory;
    const names all = list_contents(request.directory, add_reason);
    zone_names = find_below(update_zoneinfo_directory, all);
    icu_names = find_below(update_icu_directory, all);
  } else {
    zone_names = list_contents(zoneinfo, add_reason);
    icu_names = list_contents(icu, add_reason);
  }
  halves halves;
  halves.since = request.since;
  halves.zones = read_zones(zoneinfo, zone_names, report);
  if (halves.zones.empty()) add_reason("there are no zone files");
  halves.version = read_version(zoneinfo, add_reason);
  if (!request.replaced.empty()) find_missing(request.replaced, halves, add_reason);
  check_schema(icu_names, is_update, add_reason);
  // What ICU would not find here, it would take from elsewhere.
  if (!check_icu_files(icu, icu_names, add_reason) || halves.zones.empty()) return;
  halves.icu_directory = std::filesystem::canonical(icu);
  run_canary([&](const canary_report& inner) { compare_halves(halves, inner); }, report);
}
