#include "make/release.h"

#include <fstream>
#include <sstream>
#include <stdexcept>

namespace {

using std::string;

// A table has a line for each place: its countries, with commas between them, where it is, and its
// zone. One that names fewer countries knows better.
void read_regions(const string& path, std::map<string, release_zone>& zones) {
  std::ifstream table(path);
  for (string line; std::getline(table, line);) {
    std::istringstream words(line);
    string countries;
    string place;
    string name;
    words >> countries >> place >> name;
    const auto found = zones.find(name);
    if (line.starts_with('#') || found == zones.end() || !found->second.region.empty()) continue;
    found->second.region = countries.substr(0, countries.find(','));
  }
}

}  // namespace

std::map<string, release_zone> read_release(const string& directory) {
  const string path = directory + "/tzdata.zi";
  std::ifstream source(path);
  if (!source) throw std::runtime_error(path + " cannot be read");
  std::map<string, release_zone> zones;
  for (string line; std::getline(source, line);) {
    std::istringstream words(line);
    string kind;
    string first;
    string second;
    words >> kind >> first >> second;
    if (kind == "Z") zones[first] = {};
    if (kind == "L") zones[second].target = first;
  }
  for (auto& [name, zone] : zones) {
    // A link that leads back to itself never ends at a zone.
    for (std::size_t steps = 0; !zone.target.empty(); ++steps) {
      const auto found = zones.find(zone.target);
      if (found == zones.end() || steps > zones.size())
        throw std::invalid_argument("the link " + name + " leads nowhere");
      if (found->second.target.empty()) break;
      zone.target = found->second.target;
    }
  }
  for (const char* const table : {"/zone.tab", "/zone1970.tab"})
    read_regions(directory + table, zones);
  for (auto& [name, zone] : zones)
    if (zone.region.empty() && !zone.target.empty()) zone.region = zones.at(zone.target).region;
  return zones;
}
