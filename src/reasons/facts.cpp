#include "reasons/facts.h"

#include <algorithm>
#include <cstring>
#include <functional>
#include <stdexcept>

#include "dataset/olm_zoneinfo.h"

namespace {

// The data set at the path that `find_path` gives.
dataset_facts gather_dataset(const suppositions& supposed,
                             const std::function<std::string()>& find_path) {
  olm_trial trial(supposed);
  dataset_facts facts;
  facts.supposed = supposed;
  try {
    facts.path = find_path();
    facts.data.emplace(facts.path);
  } catch (const std::invalid_argument&) {
    facts.problem = facts.path + " is not below " + update_area;
  } catch (const std::out_of_range&) {
    facts.problem = "its version has a number beyond 32 bits";
  } catch (const std::runtime_error&) {
    facts.problem = trial.get_record().endless + " does not end";
  } catch (int error) {
    facts.problem = error == -1 ? "its link leads to no data set" : "its link cannot be read";
  }
  trial.require_told();
  facts.obstacles = trial.get_record().obstacles;
  return facts;
}

// A place in which something is that a start, or a program, looks for.
struct used_place {
  std::string place;
  std::string state;  // of the update that holds it
};

std::vector<update_facts> gather_updates(const device_facts& facts) {
  olm_trial trial(facts.latest.supposed);
  trial.go_by_rights_of_user(true);
  const std::string current_path = get_parent(facts.start.zoneinfo.now.target);
  const bool is_next = get_parent(facts.start.zoneinfo.next.target) == facts.latest.path;
  const std::string next = is_next ? "waiting" : "refused";
  // The first that an update holds counts. Parts of one update may be links into another.
  std::vector<used_place> used = {{current_path, "current"}, {facts.latest.path, next}};
  for (const auto& [path, state] : {used_place{zoneinfo_link, "current"},
                                    {latest_link, next},
                                    {icutz_link, "current"},
                                    {get_parent(facts.start.restored), "current"},
                                    {current_path + update_icu_directory, "current"},
                                    {facts.latest.path + update_icu_directory, next},
                                    {facts.latest.path + update_zoneinfo_directory, next}})
    used.push_back({trial.find(path, true).place, state});

  std::vector<update_facts> updates;
  for (const olm_entry& entry : trial.list(update_area)) {
    const olm_entry directory = trial.find(entry.place, true);
    if (!directory.is(S_IFDIR)) continue;
    const std::string path = update_area + entry.get_name();
    const auto use = std::find_if(used.begin(), used.end(), [&](const used_place& one) {
      return one.place == path || (one.place + '/').starts_with(directory.place + '/');
    });
    updates.push_back({entry.get_name(), use == used.end() ? "unused" : use->state});
  }
  std::sort(updates.begin(), updates.end(), [](const auto& one, const auto& other) {
    return strverscmp(one.name.c_str(), other.name.c_str()) < 0;
  });
  return updates;
}

}  // namespace

const std::string& get_schema(const olm_dataset& data) {
  return dynamic_cast<const olm_icu&>(*data.components.back()).schema;
}

device_facts gather_facts(const suppositions& supposed) {
  device_facts facts;
  facts.start = forecast_start(supposed);
  facts.system = gather_dataset(supposed, [] { return std::string(); });
  facts.current = gather_dataset(supposed, current_dataset_path);
  suppositions restored = supposed;
  if (!facts.start.restored.empty()) restored.push_back({zoneinfo_link, facts.start.restored});
  facts.weighed = gather_dataset(restored, current_dataset_path);
  facts.latest = gather_dataset(supposed, latest_dataset_path);
  if (facts.latest.path.empty()) facts.latest.data.reset();
  facts.updates = gather_updates(facts);
  return facts;
}
