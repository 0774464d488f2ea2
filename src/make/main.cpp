// Writes ICU's half of an update as the text from which genrb makes it. tzdata-make-update runs it.
#include <err.h>
#include <unicode/uvernum.h>

#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <map>
#include <span>
#include <stdexcept>
#include <string>
#include <vector>

#include "check/contents.h"
#include "check/icu_bundle.h"
#include "check/icu_file.h"
#include "check/icu_names.h"
#include "dataset/olm_zoneinfo.h"
#include "make/icu_text.h"
#include "make/release.h"

namespace {

using std::string;

constexpr const char* nowhere = "001";  // the region of a zone that is none's: the whole world

void write_file(const string& directory, const string& name, const string& text) {
  const string path = directory + '/' + name + ".txt";
  std::ofstream file(path, std::ios::binary);
  file << text << std::flush;
  if (!file) throw std::runtime_error(path + " cannot be written");
}

// ICU believes its files, so they are looked at before.
void take_base_from(const string& directory) {
  for (const char* const name : icu_files) {
    const string path = directory + '/' + name + icu_file_ending;
    try {
      const auto data = read_file(path);
      if (data) check_icu_file(*data);
    } catch (const std::invalid_argument& damage) {
      throw std::runtime_error(path + ' ' + damage.what());
    }
  }
  set_icu_directory(std::filesystem::canonical(directory));
  for (const char* const name : icu_files) {
    if (open_bundle(name) == nullptr || !has_read(string(name) + icu_file_ending))
      throw std::runtime_error(directory + ": ICU cannot read its files");
  }
}

zone_entry make_zone(const string& name, const string& marked, std::vector<icu_rule>& rules) {
  try {
    const auto data = read_file(std::filesystem::path(marked) / name);
    const icu_zone zone = make_icu_zone(olm_zone_file(data.value_or("")));
    if (zone.is_cut)
      std::printf("%s: ICU has no such rule, so its changes end after 400 years\n", name.c_str());
    return {.target = "", .text = print_zone(zone, rules), .region = ""};
  } catch (const std::invalid_argument& damage) {
    throw std::runtime_error(name + ' ' + damage.what());
  }
}

// Adds those of ICU's own zones that the base has, where the release has none of that name.
void add_own_zones(const icu_base& base, std::map<string, zone_entry>& zones) {
  for (const auto& [name, region] : base.regions) {
    if (zones.contains(name)) continue;
    const auto own = base.own_zones.find(name);
    if (own != base.own_zones.end()) {
      zones[name].text = own->second.substr(0, own->second.rfind('}'));
      continue;
    }
    const auto namesake = zones.find(find_namesake(name));
    if (namesake == zones.end()) continue;
    const string& target = namesake->second.target;
    zones[name].target = target.empty() ? namesake->first : target;
  }
}

// Gives each zone the region that the base has for it. Where it has none, or knows the zone only as
// one of nobody, the release may know.
void set_regions(const icu_base& base, const std::map<string, release_zone>& release,
                 std::map<string, zone_entry>& zones) {
  for (auto& [name, zone] : zones) {
    const auto known = base.regions.find(name);
    if (known != base.regions.end()) zone.region = known->second;
    const auto found = release.find(name);
    if ((zone.region.empty() || zone.region == nowhere) && found != release.end())
      zone.region = found->second.region;
    if (zone.region.empty()) zone.region = nowhere;
  }
}

// Tells on the standard output stream what is worth knowing.
void write_half(const string& marked, const string& zoneinfo, const string& output) {
  const icu_base base = read_icu_base();
  std::printf("names and regions come from ICU %s, whose data are of %s\n", U_ICU_VERSION,
              base.release.c_str());
  const auto release = read_release(zoneinfo);
  std::vector<icu_rule> rules;
  std::map<string, zone_entry> zones;
  for (const auto& [name, zone] : release) {
    if (zone.target.empty()) zones[name] = make_zone(name, marked, rules);
    zones[name].target = zone.target;
  }
  add_own_zones(base, zones);
  set_regions(base, release, zones);
  string version;
  std::ifstream(zoneinfo + version_file) >> version;
  write_file(output, icu_files.front(), print_zones(version, zones, rules, base.own_rules));
  for (const char* const name : std::span(icu_files).subspan(1))
    write_file(output, name, print_icu_file(name));
}

}  // namespace

int main(int count, char* arguments[]) {
  if (count < 4 || count > 5)
    errx(EXIT_FAILURE, "usage: tzdata-write-icu MARKED ZONEINFO OUTPUT [BASE]");
  try {
    std::vector<string> paths;
    for (const char* const argument :
         std::span(arguments, static_cast<std::size_t>(count)).subspan(1))
      paths.push_back(std::filesystem::absolute(argument));
    if (paths.size() > 3) take_base_from(paths[3]);
    write_half(paths[0], paths[1], paths[2]);
  } catch (const std::exception& failure) {
    errx(EXIT_FAILURE, "%s", failure.what());
  }
  return std::fflush(stdout) == 0 ? EXIT_SUCCESS : EXIT_FAILURE;
}
