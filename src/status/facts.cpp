#include "status/facts.h"

#include <algorithm>
#include <cstring>
#include <functional>
#include <stdexcept>

#include "dataset/olm_zoneinfo.h"

namespace {

// The data set at the path that `find_path` gives.
dataset_facts gather_dataset(const std::function<std::string()>& find_path) {
  olm_trial trial;
  dataset_facts facts;
  try {
    facts.path = find_path();
    facts.data.emplace(facts.path);
  } catch (const std::invalid_argument&) {
    facts.problem = facts.path + " is not below " + update_area;
  } catch (const std::out_of_range&) {
    facts.problem = "its version has a number beyond 32 bits";
  } catch (const std::runtime_error&) {
    facts.problem = trial.endless + " does not end";
  } catch (int) {
    facts.problem = "its link leads to no data set";
  }
  trial.require_told();
  facts.obstacles = trial.obstacles;
  return facts;
}

std::vector<update_facts> gather_updates(const std::string& latest, bool installs) {
  olm_trial trial;
  if (!latest.empty()) trial.put_link(latest_link, latest);
  const std::string current_place = trial.find(zoneinfo_link, true).place;
  const std::string latest_place = trial.find(latest_link, true).place;
  std::vector<update_facts> updates;
  for (const olm_entry& entry : trial.list(update_area)) {
    const olm_entry directory = trial.find(entry.place, true);
    if (!directory.is(S_IFDIR)) continue;
    update_facts update{.name = entry.place.substr(entry.place.rfind('/') + 1), .state = "unused"};
    if (current_place.starts_with(directory.place + '/')) {
      update.state = "current";
    } else if (directory.place == latest_place) {
      update.state = installs ? "waiting" : "refused";
    }
    updates.push_back(update);
  }
  std::sort(updates.begin(), updates.end(), [](const auto& one, const auto& other) {
    return strverscmp(one.name.c_str(), other.name.c_str()) < 0;
  });
  return updates;
}

}  // namespace

const olm_icu& get_icu(const olm_dataset& data) {
  return dynamic_cast<const olm_icu&>(*data.components.back());
}

device_facts gather_facts(const std::string& latest) {
  device_facts facts;
  facts.start = forecast_start(latest);
  facts.system = gather_dataset([] { return std::string(); });
  facts.current = gather_dataset(current_dataset_path);
  facts.latest = gather_dataset([&] { return latest.empty() ? latest_dataset_path() : latest; });
  if (facts.latest.path.empty()) facts.latest.data.reset();
  facts.updates = gather_updates(latest, facts.start.installs);
  return facts;
}
