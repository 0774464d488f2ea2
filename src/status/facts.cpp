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
    facts.problem = trial.get_record().endless + " does not end";
  } catch (int) {
    facts.problem = "its link leads to no data set";
  }
  trial.require_told();
  facts.obstacles = trial.get_record().obstacles;
  return facts;
}

// A data set that a link names: by the path that a start reads from it, or by where it really
// leads.
struct named_dataset {
  std::string path;
  std::string place;

  [[nodiscard]] bool is(const std::string& other_path, const olm_entry& directory) const {
    return path == other_path || (place + '/').starts_with(directory.place + '/');
  }
};

std::vector<update_facts> gather_updates(const device_facts& facts, const std::string& latest) {
  olm_trial trial;
  trial.go_by_rights_of_user(true);
  if (!latest.empty()) trial.put_link(latest_link, latest);
  const named_dataset current{get_parent(facts.start.zoneinfo.now.target),
                              trial.find(zoneinfo_link, true).place};
  const named_dataset next{facts.latest.path, trial.find(latest_link, true).place};
  std::vector<update_facts> updates;
  for (const olm_entry& entry : trial.list(update_area)) {
    const olm_entry directory = trial.find(entry.place, true);
    if (!directory.is(S_IFDIR)) continue;
    const std::string name = entry.place.substr(entry.place.rfind('/') + 1);
    const std::string path = update_area + name;
    updates.push_back({name, current.is(path, directory) ? "current"
                             : !next.is(path, directory) ? "unused"
                             : facts.start.installs      ? "waiting"
                                                         : "refused"});
  }
  std::sort(updates.begin(), updates.end(), [](const auto& one, const auto& other) {
    return strverscmp(one.name.c_str(), other.name.c_str()) < 0;
  });
  return updates;
}

}  // namespace

std::string get_parent(const std::string& path) { return path.substr(0, path.rfind('/')); }

const olm_icu& get_icu(const olm_dataset& data) {
  return dynamic_cast<const olm_icu&>(*data.components.back());
}

device_facts gather_facts(const std::string& latest) {
  device_facts facts;
  facts.start = forecast_start(latest);
  facts.system = gather_dataset([] { return std::string(); });
  facts.current = gather_dataset(current_dataset_path);
  facts.latest = gather_dataset([&] {
    if (!latest.empty()) olm_trial::get().put_link(latest_link, latest);
    return latest_dataset_path();
  });
  if (facts.latest.path.empty()) facts.latest.data.reset();
  facts.updates = gather_updates(facts, latest);
  return facts;
}
