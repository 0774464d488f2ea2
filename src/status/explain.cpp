#include "status/explain.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>

#include "dataset/olm_zoneinfo.h"
#include "driver/localtime.h"

namespace {

using std::string;

constexpr const char* system_localtime = "/etc/localtime";

// Leaves out what has been said.
void append(sentences& lines, const sentences& more) {
  for (const string& line : more) {
    if (std::find(lines.begin(), lines.end(), line) == lines.end()) lines.push_back(line);
  }
}

string or_none(const string& text) { return text.empty() ? "none" : text; }

// --- Data sets ---

bool has_bad_link(const dataset_facts& current) { return !current.data && current.path.empty(); }

// The data set that the latest update is compared with; null where it cannot be used.
const olm_dataset* find_weighed(const device_facts& facts) {
  const dataset_facts& weighed = has_bad_link(facts.current) ? facts.system : facts.current;
  return weighed.data ? &*weighed.data : nullptr;
}

sentences explain_problem(const string& what, const dataset_facts& facts) {
  sentences lines = {what + " cannot be used: " + facts.problem};
  append(lines, facts.obstacles);
  return lines;
}

const olm_zoneinfo& get_zoneinfo(const olm_dataset& data) {
  return dynamic_cast<const olm_zoneinfo&>(*data.components.front());
}

// Why no file counts as the ICU data of an update.
sentences explain_missing_schema(const dataset_facts& update) {
  olm_trial trial;
  if (!update.obstacles.empty()) return update.obstacles;
  const string& directory = get_icu(*update.data).directory;
  if (!trial.find(directory, true).is(S_IFDIR)) return {"there is no directory " + directory};
  sentences lines;
  for (const olm_entry& entry : trial.list(directory)) {
    const string name = entry.place.substr(entry.place.rfind('/') + 1);
    if (read_schema(name.c_str()).empty()) continue;
    const char* const fault = entry.is(S_IFLNK)   ? " is a symbolic link"
                              : entry.is(S_IFREG) ? " is closed to others"
                                                  : " is no file";
    lines.push_back(name + fault);
  }
  return lines;
}

// Why the ICU data of a data set do not fit the system partition's.
sentences explain_schema(const string& what, const dataset_facts& facts,
                         const olm_dataset& system) {
  if (facts.data->compatible_with(system)) return {};
  const string& schema = get_icu(*facts.data).schema;
  const string has = schema.empty() ? " has no ICU data file that counts" : " has schema " + schema;
  sentences lines = {what + has + "; the system partition has schema " +
                     or_none(get_icu(system).schema)};
  if (schema.empty()) append(lines, explain_missing_schema(facts));
  return lines;
}

sentences explain_current(const dataset_facts& current, const olm_dataset& system) {
  const string what = "the current data set " + current.data->name;
  sentences lines = explain_schema(what, current, system);
  if (system > *current.data)
    lines.push_back(what + " is older than the system partition " + system.name);
  return lines;
}

// --- Links ---

// Where the ICU link belongs while the zoneinfo link is like this: nowhere with the system
// partition's zone files.
string get_own_icutz(const olm_entry& zoneinfo) {
  return zoneinfo.target.starts_with(update_area) ? olm_icu(get_parent(zoneinfo.target)).directory
                                                  : "";
}

bool are_apart(const olm_entry& zoneinfo, const olm_entry& icutz) {
  return icutz.target != get_own_icutz(zoneinfo) || (icutz.error == 0 && icutz.target.empty());
}

sentences remark_on_halves(const start_forecast& start) {
  olm_trial trial;
  if (!start.zoneinfo.next.is(S_IFLNK)) return {};
  if (are_apart(start.zoneinfo.next, start.icutz.next)) {
    return {"after the next start, the zone files and the ICU data do not belong together: " +
            describe(start.zoneinfo.next) + " and " + describe(start.icutz.next)};
  }
  if (are_apart(start.zoneinfo.now, start.icutz.now)) {
    return {
        "the zone files and the ICU data do not belong together now; the next start mends that"};
  }
  return {};
}

sentences remark_on_zone(const start_forecast& start) {
  const string before = start.localtime.now.error == 0 ? describe(start.localtime.now) : "missing";
  const string after = describe(start.localtime.next);
  if (start.localtime.next.error != 0) return {"after the next start, there is no local-time link"};
  sentences lines;
  if (!start.localtime.now.equals(start.localtime.next)) {
    lines.push_back("the local-time link is " + before + "; the next start makes it lead to " +
                    after);
  }
  if (!start.localtime.next.target.starts_with(zoneinfo_link + string("/")))
    lines.push_back("the local-time link does not go through the zoneinfo link: " + after);
  if (!start.zone_exists)
    lines.push_back("after the next start, the local-time link leads to no zone file: " + after);
  return lines;
}

sentences remark_on_system_localtime() {
  namespace paths = std::filesystem;
  const olm_entry entry = olm_trial().find(system_localtime);
  const paths::path target = paths::path(system_localtime).parent_path() / entry.target;
  if (target.lexically_normal() == localtime_link) return {};
  return {string(system_localtime) +
          " does not lead through the local-time link: " + describe(entry)};
}

sentences remark_on_system(const olm_dataset& system) {
  sentences lines;
  const string& schema = get_icu(system).schema;
  if (system.version == olm_version()) {
    lines.push_back("the system partition has no version: " + system.name +
                    " is older than any update");
  }
  if (schema.empty()) {
    lines.emplace_back("the system partition has no schema: only an update without ICU data fits");
  } else if (!is_schema(schema)) {
    lines.push_back("the system partition's schema is none, so no update fits: " + schema);
  }
  return lines;
}

}  // namespace

string describe(const olm_entry& entry) {
  if (entry.is(S_IFLNK)) return entry.target;
  if (entry.is(S_IFDIR)) return "a directory";
  return entry.error == 0 ? "a file" : "none";
}

string describe_start(const device_facts& facts) {
  const start_forecast& start = facts.start;
  const olm_dataset* const current = find_weighed(facts);
  if (!start.status) return "never ends";
  if (*start.status != EXIT_SUCCESS) return "fails";
  if (start.installs) return "installs " + (facts.latest.data ? facts.latest.data->name : "");
  if (start.zoneinfo.next.is_new) return "falls back to the system partition";
  return "keeps " + (current != nullptr ? current->name : "");
}

sentences explain_latest(const device_facts& facts) {
  if (!facts.system.data) return explain_problem("the system partition", facts.system);
  if (facts.latest.path.empty() && facts.latest.problem.empty())
    return {"there is no latest update"};
  if (!facts.latest.data) return explain_problem("the latest update", facts.latest);
  const olm_dataset* const current = find_weighed(facts);
  if (current == nullptr) return explain_problem("the current data set", facts.current);

  const olm_dataset& latest = *facts.latest.data;
  const string what = "the update " + latest.name;
  sentences lines;
  if (takes_over(latest, *current, *facts.system.data)) {
    lines = {what + " is fit, and newer than the current data set " + current->name};
    const string file = get_zoneinfo(latest).directory + version_file;
    if (olm_trial().find(file, true).error == ENOENT)
      lines.push_back("it has no " + file + ", which a start does not ask for");
    return lines;
  }
  const int error = olm_trial().find(latest.path, true).error;
  if (error == ENOENT || error == ENOTDIR) return {"there is no directory " + latest.path};
  if (latest.same_path(*current) && may_stay(*current, *facts.system.data))
    return {what + " is the current data set"};
  if (latest.same_path(*current)) return explain_current(facts.latest, *facts.system.data);
  if (latest.name.ends_with('/')) {
    lines.push_back(string(latest_link) + " ends in a slash, which makes its name no version");
  } else if (latest.version == olm_version()) {
    lines.push_back(what + " has a name that is no version");
  }
  append(lines, explain_schema(what, facts.latest, *facts.system.data));
  if (!(latest > *current)) {
    lines.push_back(what + (*current > latest ? " is older than" : " is not newer than") +
                    " the current data set " + current->name);
  }
  return lines;
}

sentences explain_start(const device_facts& facts) {
  const start_forecast& start = facts.start;
  if (!start.status) return {start.record.endless + " makes a start wait, or run out of memory"};
  sentences lines;
  const bool stops_at_latest = facts.latest.path.empty() && !facts.latest.problem.empty();
  if (facts.system.data && !stops_at_latest) {
    if (has_bad_link(facts.current)) {
      lines.push_back("the zoneinfo link leads to no data set: " + describe(start.zoneinfo.now));
    } else if (facts.current.data && !may_stay(*facts.current.data, *facts.system.data)) {
      lines = explain_current(facts.current, *facts.system.data);
    }
  }
  append(lines, explain_latest(facts));
  return lines;
}

sentences list_remarks(const device_facts& facts) {
  sentences lines = facts.start.record.obstacles;
  if (facts.system.data) append(lines, remark_on_system(*facts.system.data));
  append(lines, remark_on_halves(facts.start));
  append(lines, remark_on_zone(facts.start));
  append(lines, remark_on_system_localtime());
  return lines;
}
