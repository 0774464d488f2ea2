#include "update/update.h"

#include <err.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <optional>

#include "answer/answer.h"
#include "dataset/olm_icu.h"
#include "dataset/olm_zoneinfo.h"
#include "driver/localtime.h"
#include "fs/file_operations.h"
#include "reasons/explain.h"
#include "update/adopt.h"
#include "update/archive.h"
#include "update/command.h"
#include "update/failure.h"
#include "update/olm_state.h"
#include "update/steps.h"

namespace {

using std::string;
namespace filesystem = std::filesystem;

// In an update that was unpacked here, the sum of its archive. Others are never removed.
constexpr const char* mark_name = ".tzdata-update";

constexpr std::size_t sum_length = 64;

std::optional<olm_version> read_version(const string& name) {
  const olm_trial trial;  // takes the warnings
  try {
    const olm_version version(name);
    if (version != olm_version()) return version;
  } catch (const std::out_of_range&) {
  }
  return {};
}

string require_version(const string& name) {
  if (!read_version(name)) throw olm_refusal({name + " is no version such as 2026a.1.0"});
  return update_area + name;
}

olm_descriptor open_file(const string& path) {
  const filesystem::file_status status = filesystem::status(path);
  if (filesystem::exists(status) && !filesystem::is_regular_file(status))
    throw std::runtime_error(path + ": is no file");
  const int opened = open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
  if (opened == -1) fail(path);
  return olm_descriptor(opened);
}

// The sum that a file begins with, as it stands there; it need not be one.
string read_sum(const string& path) {
  std::array<char, sum_length> text{};
  const olm_descriptor file = open_file(path);
  const ssize_t length = read(file.get(), text.data(), text.size());
  if (length < 0) fail(path);
  return {text.data(), static_cast<std::size_t>(length)};
}

// The same of an update's mark; empty where there is none.
string read_mark(const string& update) {
  const string path = update + '/' + mark_name;
  const bool is_there = filesystem::is_directory(filesystem::symlink_status(update)) &&
                        filesystem::is_regular_file(filesystem::symlink_status(path));
  return is_there ? read_sum(path) : "";
}

void write_mark(const olm_directory& directory, const string& sum) {
  olm_descriptor file = open_entry(directory, mark_name, O_WRONLY | O_CREAT | O_EXCL);
  if (write(file.get(), sum.data(), sum.size()) != static_cast<ssize_t>(sum.size()) ||
      file.close() != 0)
    fail(directory.path + '/' + mark_name);
}

string describe_end(const command_result& result) {
  return result.lines.empty() ? "status " + std::to_string(result.status) : result.lines.back();
}

// Gives the archive's sum.
string require_sum(const olm_descriptor& archive, const string& sum_path) {
  string sum = read_sum(sum_path);
  const auto counted = run_command({"sha256sum"}, archive.get());
  if (!counted) throw std::runtime_error("there is no sha256sum");
  if (counted->status != 0) throw std::runtime_error("sha256sum fails: " + describe_end(*counted));
  if (counted->lines.empty() || counted->lines.front().substr(0, sum_length) != sum)
    throw olm_refusal({"the archive is damaged: its sum is not that in " + sum_path});
  return sum;
}

// --- What the next start makes of it ---

// Why tzdata-check, if it is there, takes the update in `directory` for unsound.
sentences list_faults(const string& directory) {
  const olm_descriptor nothing(open("/dev/null", O_RDONLY | O_CLOEXEC));
  const auto answer = run_command({"tzdata-check", directory}, nothing.get());
  if (!answer || answer->status == 0) return {};
  if (answer->status == 1 && !answer->lines.empty()) return answer->lines;
  throw std::runtime_error("tzdata-check cannot tell: " + describe_end(*answer));
}

sentences explain_waiting(const device_facts& facts, const string& update) {
  const auto version = read_version(get_name(update));
  if (!facts.start.installs || !(facts.latest.data->version > *version)) return {};
  return {"a newer update is waiting: " + facts.latest.data->name +
          " (with --older, this one replaces it)"};
}

void warn_of_zone(const start_forecast& start, const string& update) {
  const string target = start.localtime.now.target;
  const string corrected = correct_localtime_target(target);
  const string& kept = corrected.empty() ? target : corrected;
  if (kept.starts_with(zoneinfo_link) &&
      !(start.zone_exists && start.localtime.next.target == kept))
    warnx("%s lacks the device's zone: %s", get_name(update).c_str(), clean(target).c_str());
}

string describe_next(const start_forecast& start) {
  const auto path = find_dataset_path(start.zoneinfo.next.target);
  return "the next start uses " +
         (path && !path->empty() ? get_name(*path) : "the system partition");
}

// --- Taking an update ---

bool is_unused(const device_facts& facts, const string& name) {
  return std::any_of(facts.updates.begin(), facts.updates.end(), [&](const update_facts& update) {
    return update.name == name && update.state == "unused";
  });
}

// Where a link is there, its text must be known: it may name an update.
bool is_known(const olm_entry& link) {
  return link.error == ENOENT || (link.error == 0 && !link.target.empty());
}

// Removes what was not needed after the switch, neither by the forecast nor now.
void remove_unused(const device_facts& forecast) {
  const device_facts facts = gather_facts();
  if (!is_known(facts.start.zoneinfo.now) || !is_known(facts.start.icutz.now)) return;
  for (const update_facts& update : facts.updates) {
    const string path = update_area + update.name;
    const bool is_needed = !is_unused(facts, update.name) || !is_unused(forecast, update.name);
    if (is_needed || !read_version(update.name)) continue;
    try {
      if (!read_mark(path).empty()) remove_update(path);
    } catch (const std::exception& failure) {
      warnx("%s cannot be removed: %s", update.name.c_str(), failure.what());
    }
  }
}

// Has the next start use the update that is to be at `update` and by now is at `place`.
string switch_to(const olm_state& state, const string& update, const string& place,
                 bool allows_older) {
  const device_facts now = gather_facts();
  if (judge_update(now, update).word == "in-use") return get_name(update) + " is in use already";

  suppositions supposed = {{latest_link, update}};
  if (place != update) supposed.push_back({update, place});
  const device_facts facts = gather_facts(supposed);
  const update_verdict verdict = judge_update(facts, update);
  sentences reasons = list_faults(place);
  if (verdict.word == "refused")
    reasons.insert(reasons.end(), verdict.reasons.begin(), verdict.reasons.end());
  // The start after the next one would give it up.
  if (facts.system.data && facts.latest.data && *facts.system.data > *facts.latest.data) {
    reasons.push_back(get_name(update) + " is older than the system partition " +
                      facts.system.data->name);
  }
  if (!allows_older) {
    const sentences waiting = explain_waiting(now, update);
    reasons.insert(reasons.end(), waiting.begin(), waiting.end());
  }
  if (!reasons.empty()) throw olm_refusal(reasons);
  warn_of_zone(facts.start, update);

  sync_all(place);
  if (place != update) put_in_place(update);
  try {
    state.set_link(latest_link, update);
  } catch (...) {
    if (place != update) remove_update(update);
    throw;
  }
  state.sync_links();
  remove_unused(facts);
  return describe_next(facts.start);
}

// --- Going back ---

// The paths of what can be gone back to, the newest first, and last the system partition's, which
// is empty.
std::vector<string> list_before(const device_facts& facts) {
  // What is in use may be damaged, but its name is known.
  const auto weighed = read_version(get_name(facts.weighed.path));
  std::vector<std::pair<olm_version, string>> updates;
  for (const update_facts& update : facts.updates) {
    const auto version = read_version(update.name);
    if (version && weighed && *weighed > *version)
      updates.emplace_back(*version, update_area + update.name);
  }
  std::sort(updates.begin(), updates.end(),
            [](const auto& one, const auto& other) { return one.first > other.first; });
  std::vector<string> paths;
  paths.reserve(updates.size() + 1);
  for (const auto& [version, path] : updates) paths.push_back(path);
  paths.emplace_back();
  return paths;
}

}  // namespace

string take_archive(const string& archive, bool allows_older) {
  const string ending = ".tar";
  if (!archive.ends_with(ending)) throw std::runtime_error(archive + ": is no directory or .tar");
  const string stem = archive.substr(0, archive.size() - ending.size());
  const olm_state state;
  const string update = require_version(get_name(stem));
  const olm_descriptor file = open_file(archive);
  const string sum = require_sum(file, stem + ".sha256");
  const olm_contents contents = read_archive(file.get());
  if (filesystem::exists(filesystem::symlink_status(update))) {
    if (read_mark(update) != sum)
      throw olm_refusal({update + " is there already, and was not made from this archive"});
    return switch_to(state, update, update, allows_older);
  }
  const olm_directory part = make_part();
  unpack(file.get(), contents, part);
  write_mark(part, sum);
  return switch_to(state, update, part_directory, allows_older);
}

string take_directory(const string& directory, bool allows_older) {
  const filesystem::path path = directory;
  const filesystem::path parent = path.parent_path();
  const olm_state state;
  if (!filesystem::equivalent(parent.empty() ? "." : parent, update_area) ||
      filesystem::is_symlink(path))
    throw std::runtime_error(directory + ": is no directory right below " + update_area);
  const string update = require_version(path.filename());
  adopt(update);
  return switch_to(state, update, update, allows_older);
}

string go_back() {
  const olm_state state;
  const device_facts facts = gather_facts();
  const start_forecast& start = facts.start;
  if (start.installs) {
    const start_forecast forecast = forecast_start({{latest_link, facts.weighed.path}});
    state.set_link(latest_link, facts.weighed.path);
    state.sync_links();
    return describe_next(forecast);
  }
  if (!start.zoneinfo.now.equals(start.zoneinfo.next)) return describe_next(start) + " already";
  if (start.zoneinfo.next.target == system_zoneinfo_directory)
    throw olm_refusal({"the system partition is in use, and no update waits"});

  // A boot first points the zoneinfo link back at what its spare names. Without tz_latest, that
  // would be undone; with it alone, nothing changes.
  const string spare = fs::get_spare_path(zoneinfo_link);
  for (const string& path : list_before(facts)) {
    const string target =
        path.empty() ? system_zoneinfo_directory : path + update_zoneinfo_directory;
    const start_forecast forecast = forecast_start({{latest_link, path}, {spare, target}});
    if (forecast.status != EXIT_SUCCESS || forecast.zoneinfo.next.target != target) continue;
    if (!path.empty() && !list_faults(path).empty()) continue;
    state.set_link(latest_link, path);
    state.sync_links();
    state.set_link(spare, target);
    state.sync_links();
    return describe_next(forecast);
  }
  throw std::runtime_error("the next start would not go back; tzdata-status says what is wrong");
}
