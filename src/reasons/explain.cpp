#include "reasons/explain.h"

#include <algorithm>
#include <cstdlib>
#include <filesystem>

#include "dataset/olm_zoneinfo.h"
#include "driver/localtime.h"

namespace {

using std::string;

constexpr const char* system_localtime = "/etc/localtime";
constexpr int longest_chain = 40;  // of links

// Leaves out what has been said.
void add_lines(sentences& lines, const sentences& more) {
  for (const string& line : more) {
    if (std::find(lines.begin(), lines.end(), line) == lines.end()) lines.push_back(line);
  }
}

string or_none(const string& text) { return text.empty() ? "none" : text; }

// --- Data sets ---

bool has_bad_link(const device_facts& facts) {
  return !facts.weighed.data && facts.weighed.path.empty();
}

// The data set that the latest update is compared with; null where it cannot be used.
const olm_dataset* find_weighed(const device_facts& facts) {
  const dataset_facts& weighed = has_bad_link(facts) ? facts.system : facts.weighed;
  return weighed.data ? &*weighed.data : nullptr;
}

sentences explain_problem(const string& what, const dataset_facts& facts) {
  sentences lines = {what + " cannot be used: " + facts.problem};
  add_lines(lines, facts.obstacles);
  return lines;
}

// Why no file counts as the ICU data of an update.
sentences explain_missing_schema(const dataset_facts& update) {
  olm_trial trial(update.supposed);
  if (!update.obstacles.empty()) return update.obstacles;
  const string directory = update.path + update_icu_directory;
  for (const string& needed : {update.path, directory}) {
    if (!trial.find(needed, true).is(S_IFDIR)) return {"there is no directory " + needed};
  }
  sentences lines;
  for (const olm_entry& entry : trial.list(directory)) {
    const string name = entry.get_name();
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
  const string& schema = get_schema(*facts.data);
  const string has = schema.empty() ? " has no ICU data file that counts" : " has schema " + schema;
  sentences lines = {what + has + "; the system partition has schema " +
                     or_none(get_schema(system))};
  if (schema.empty()) add_lines(lines, explain_missing_schema(facts));
  return lines;
}

sentences explain_current(const dataset_facts& current, const olm_dataset& system) {
  const string what = "the current data set " + current.data->name;
  sentences lines = explain_schema(what, current, system);
  if (system > *current.data)
    lines.push_back(what + " is older than the system partition " + system.name);
  return lines;
}

// Why the latest update does not take over from `current`.
sentences explain_refusal(const device_facts& facts, const olm_dataset& current) {
  const olm_dataset& latest = *facts.latest.data;
  const olm_dataset& system = *facts.system.data;
  const string what = "the update " + latest.name;
  const int error = olm_trial(facts.latest.supposed).find(latest.path, true).error;
  if (error == ENOENT || error == ENOTDIR) return {"there is no directory " + latest.path};
  if (latest.same_path(current)) {
    if (may_stay(current, system)) return {what + " is the current data set"};
    return explain_current(facts.latest, system);
  }
  sentences lines;
  if (latest.name.ends_with('/')) {
    lines.push_back(string(latest_link) + " ends in a slash, which makes its name no version");
  } else if (latest.version == olm_version()) {
    lines.push_back(what + " has a name that is no version");
  }
  add_lines(lines, explain_schema(what, facts.latest, system));
  if (!(latest > current)) {
    lines.push_back(what + (current > latest ? " is older than" : " is not newer than") +
                    " the current data set " + current.name);
  }
  return lines;
}

// --- Links ---

// Beside the system partition's zone files, any ICU link is one too many.
bool are_apart(bool fit, const olm_entry& zoneinfo, const olm_entry& icutz) {
  return !fit || (icutz.error == 0 && !zoneinfo.target.starts_with(update_area));
}

sentences remark_on_halves(const start_forecast& start) {
  if (!start.zoneinfo.next.is(S_IFLNK)) return {};
  if (are_apart(start.fit_next, start.zoneinfo.next, start.icutz.next)) {
    return {"after the next start, the zone files and the ICU data do not belong together: " +
            describe(start.zoneinfo.next) + " and " + describe(start.icutz.next)};
  }
  if (are_apart(start.fit_now, start.zoneinfo.now, start.icutz.now)) {
    return {
        "the zone files and the ICU data do not belong together now; the next start mends that"};
  }
  return {};
}

sentences remark_on_zone(const start_forecast& start) {
  const string before = start.localtime.now.error == 0 ? describe(start.localtime.now) : "missing";
  const string after = describe(start.localtime.next);
  if (!start.localtime.next.is(S_IFLNK)) {
    const bool is_missing = start.localtime.next.error != 0;
    return {"after the next start, the local-time link is " + (is_missing ? "missing" : after)};
  }
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
  olm_trial trial;
  std::filesystem::path path = system_localtime;
  olm_entry entry = trial.find(path);
  const olm_entry first = entry;
  for (int links = 0; links < longest_chain && entry.is(S_IFLNK); ++links) {
    path = (path.parent_path() / entry.target).lexically_normal();
    if (path == localtime_link) return {};
    entry = trial.find(path);
  }
  return {string(system_localtime) +
          " does not lead through the local-time link: " + describe(first)};
}

sentences remark_on_system(const olm_dataset& system) {
  sentences lines;
  const string& schema = get_schema(system);
  if (system.version == olm_version()) {
    lines.push_back("the system partition has no version that can be read: " + system.name +
                    " counts as older than every update");
  }
  if (schema.empty()) {
    lines.emplace_back("the system partition has no schema: only an update without ICU data fits");
  } else if (!is_schema(schema)) {
    lines.push_back(schema + " is no schema, so no update fits the system partition");
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
  if (current != nullptr && start.zoneinfo.next.target == start.restored)
    return "goes back to " + current->name;
  if (start.zoneinfo.next.is_new) return "falls back to the system partition";
  return "keeps " + (current != nullptr ? current->name : "");
}

sentences explain_latest(const device_facts& facts) {
  const start_forecast& start = facts.start;
  const olm_dataset* const current = find_weighed(facts);
  if (!start.status) return {start.record.endless + " makes a start wait, or run out of memory"};
  if (!facts.system.data) return explain_problem("the system partition", facts.system);
  if (facts.latest.path.empty() && facts.latest.problem.empty())
    return {"there is no latest update"};
  if (!facts.latest.data) return explain_problem("the latest update", facts.latest);
  if (current == nullptr) return explain_problem("the current data set", facts.weighed);
  const olm_dataset& latest = *facts.latest.data;
  if (!takes_over(latest, *current, *facts.system.data)) return explain_refusal(facts, *current);

  // If it does not, what it met tells why.
  sentences lines;
  if (!start.installs) lines = start.record.obstacles;
  lines.push_back("the update " + latest.name + " is fit, and newer than the current data set " +
                  current->name);
  const string file = latest.path + update_zoneinfo_directory + version_file;
  if (olm_trial(facts.latest.supposed).find(file, true).error == ENOENT)
    lines.push_back("it has no " + file + ", which a start does not ask for");
  return lines;
}

update_verdict judge_update(const device_facts& facts, const string& update) {
  const start_forecast& start = facts.start;
  const bool is_next = start.status && update.starts_with(update_area) &&
                       get_parent(start.zoneinfo.next.target) == update;
  if (is_next && start.installs) return {"used", explain_latest(facts)};
  if (is_next && get_parent(start.zoneinfo.now.target) == update)
    return {"in-use", {"it is in use already, and stays so"}};
  if (is_next) return {"used", {"a boot goes back to it"}};
  if (facts.latest.path == update) return {"refused", explain_latest(facts)};
  // Of a longer path, a start reads only the first bytes.
  sentences reasons = start.record.obstacles;
  reasons.emplace_back("a start cannot read that path from tz_latest");
  return {"refused", reasons};
}

sentences explain_start(const device_facts& facts) {
  const start_forecast& start = facts.start;
  sentences lines;
  if (start.status == EXIT_FAILURE) lines = start.record.obstacles;
  const bool stops_at_latest = facts.latest.path.empty() && !facts.latest.problem.empty();
  if (start.status && facts.system.data && !stops_at_latest) {
    if (!start.restored.empty()) {
      lines.push_back("the zoneinfo link is first pointed back at " + start.restored);
    } else if (start.zoneinfo.now.error == ENOENT) {
      lines.emplace_back("there is no zoneinfo link");
    } else if (has_bad_link(facts)) {
      lines.push_back("the zoneinfo link leads to no data set: " + describe(start.zoneinfo.now));
    }
    if (facts.weighed.data && !may_stay(*facts.weighed.data, *facts.system.data))
      add_lines(lines, explain_current(facts.weighed, *facts.system.data));
  }
  add_lines(lines, explain_latest(facts));
  return lines;
}

sentences list_remarks(const device_facts& facts) {
  sentences lines;
  const sentences said = explain_start(facts);
  for (const string& obstacle : facts.start.record.obstacles) {
    if (std::find(said.begin(), said.end(), obstacle) == said.end()) lines.push_back(obstacle);
  }
  if (facts.system.data) add_lines(lines, remark_on_system(*facts.system.data));
  add_lines(lines, remark_on_halves(facts.start));
  add_lines(lines, remark_on_zone(facts.start));
  add_lines(lines, remark_on_system_localtime());
  return lines;
}
