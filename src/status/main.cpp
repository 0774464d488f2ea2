// Tells which data sets a device has and what its next start will do about them. Changes nothing.
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <span>
#include <stdexcept>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "dataset/olm_icu.h"
#include "dataset/olm_selection.h"
#include "dataset/olm_zoneinfo.h"
#include "driver/localtime.h"
#include "fs/file_operations.h"

namespace {

namespace files = std::filesystem;
using std::string;

constexpr int cannot_be_told = 2;

// There only if the directory is.
constexpr const char* directory_of_links = "/var/db/timezone/.";

// What is at `path`, not what a link there leads to.
files::file_type look_at(const char* path) {
  std::error_code error;
  return files::symlink_status(path, error).type();
}

// Empty also for what is no link.
string read_target(const char* path) {
  try {
    return fs::read_symlink(path);
  } catch (int) {
    return {};
  }
}

string or_none(string text) {
  if (text.empty()) text = "none";
  return text;
}

const olm_icu& get_icu(const olm_dataset& data) {
  return dynamic_cast<const olm_icu&>(*data.components.back());
}

// What an update that does not fit has for ICU data.
string describe_icu(const olm_dataset& update, const olm_dataset& system) {
  const olm_icu& icu = get_icu(update);
  if (!icu.schema.empty())
    return "schema " + icu.schema + ", the system partition " + or_none(get_icu(system).schema);
  std::error_code error;
  for (const auto& there : files::directory_iterator(icu.directory, error)) {
    const bool is_closed =
        (there.status(error).permissions() & files::perms::others_read) == files::perms::none;
    const string name = there.path().filename();
    const bool has_name = name.starts_with("icutz") && name.ends_with(".dat");
    if (is_closed && has_name) return name + ", which others may not read";
  }
  return "no ICU data";
}

// The path of the current data set; empty also where the zoneinfo link cannot be understood.
string find_current() {
  try {
    return current_dataset_path();
  } catch (int) {
    return {};
  }
}

string locate(const string& path) {
  if (path.empty()) return system_zoneinfo_directory;
  return path;
}

bool has_large_number(const string& path) {
  try {
    const olm_dataset data(path);
    return false;
  } catch (const std::out_of_range&) {
    return true;
  }
}

// Which of the data sets that are weighed with `update` has a number beyond 32 bits.
string find_large_number(const string& update) {
  if (has_large_number("")) return locate("");
  const string current = find_current();
  return has_large_number(current) ? current : update;
}

// What was thrown while `update` was weighed.
string describe_failure(const string& update) {
  try {
    throw;
  } catch (const std::invalid_argument&) {
    return string("the update is not below ") + update_area;
  } catch (const std::out_of_range&) {
    return "a number beyond 32 bits is in the version of " + find_large_number(update);
  } catch (const std::runtime_error& obstacle) {
    return obstacle.what();
  } catch (int) {
    return string(latest_link) + ", or what it names, cannot be read";
  }
}

// The next start, gone through without doing anything. It takes for granted that a link can be made
// and removed where no directory is in the way.
class olm_forecast final : public olm_selection {
 public:
  // `path`, if not empty, stands for what tz_latest names, and the reasons are for what becomes of
  // that. Throws only for want of memory.
  explicit olm_forecast(string path) : judges(!path.empty()), update(std::move(path)) {
    const string before = zoneinfo + '\n' + icutz;
    migrate_icutz();
    try {
      try {
        select();
        if (update.empty()) reasons.emplace_back("there is no latest update");
        if (decision.empty()) decision = "keeps " + olm_dataset(current_dataset_path()).name;
      } catch (...) {
        reasons.push_back(describe_failure(update));
        reset();
      }
    } catch (...) {
      decision = "fails, and leaves the zoneinfo link as it is";
      const string last = describe_failure(update);
      if (reasons.back() != last) reasons.push_back(last);
    }
    changes_links = zoneinfo + '\n' + icutz != before;
  }

  bool judges;
  string update;
  string decision;  // what the start does, such as "keeps 2020a.1.0"
  std::vector<string> reasons;
  string zoneinfo = read_target(zoneinfo_link);  // where the links will lead
  // A file is no link, but goes like one.
  string icutz =
      look_at(icutz_link) == files::file_type::regular ? "a file" : read_target(icutz_link);
  bool changes_links = false;
  bool installs_update = false;

 private:
  [[nodiscard]] string find_latest() override {
    if (update.empty()) update = olm_selection::find_latest();
    return update;
  }

  void reset_bad_link() override {
    reasons.push_back("the zoneinfo link leads to no data set: " + or_none(zoneinfo));
    reset();
  }

  void give_up(const olm_dataset& current, const olm_dataset& system) override {
    const string what = "the current data set " + current.name;
    const string older = what + " is older than the system partition " + system.name;
    explain_schema(what, current, system);
    if (system > current) reasons.push_back(older);
    reset();
  }

  void install(const olm_dataset& latest, const olm_dataset& /*in_use*/,
               const olm_dataset& /*system*/) override {
    if (judges) reasons.clear();
    reasons.push_back("the update " + latest.name + " is fit, and newer than the current data set");
    point_links(latest);
    installs_update = true;
  }

  void refuse(const olm_dataset& latest, const olm_dataset& current,
              const olm_dataset& system) override {
    const string what = "the update " + latest.name;
    if (judges) reasons.clear();
    if (latest.version == olm_version()) reasons.push_back(what + " has a name that is no version");
    explain_schema(what, latest, system);
    if (latest > current) return;
    const char* const than = current > latest            ? " is older than "
                             : latest.same_path(current) ? " is "
                                                         : " is not newer than ";
    reasons.push_back(what + than + "the current data set " + current.name);
  }

  void explain_schema(const string& what, const olm_dataset& data, const olm_dataset& system) {
    if (!data.compatible_with(system))
      reasons.push_back(what + " has " + describe_icu(data, system));
  }

  // As migrate_icutz_link does it.
  void migrate_icutz() {
    const string target = read_target(legacy_icutz_link);
    if (!fs::exists(legacy_icutz_link)) return;
    if (!fs::exists(directory_of_links)) return;
    if (target.empty() || look_at(icutz_link) != files::file_type::not_found) return;
    icutz = target;
    reasons.emplace_back("the ICU link of earlier systems moves to its new place");
  }

  void reset() { point_links(olm_dataset()); }

  // As install_links does it.
  void point_links(const olm_dataset& data) {
    const bool is_update = !data.path.empty();
    decision = (is_update ? "installs " : "falls back to the system partition, ") + data.name;
    if (!fs::exists(directory_of_links)) throw std::runtime_error("no directory for the links");
    if (look_at(zoneinfo_link) == files::file_type::directory)
      throw std::runtime_error("a directory is in the place of the zoneinfo link");
    zoneinfo = olm_zoneinfo(data.path).directory;
    if (look_at(icutz_link) != files::file_type::directory) {
      icutz.clear();
      if (is_update) icutz = get_icu(data).directory;
    } else if (is_update) {
      throw std::runtime_error("a directory is in the place of the ICU link");
    }
  }
};

// Names come from outside: a control byte shows as a question mark, so that a line stays one.
void print_row(const char* label, string text) {
  for (char& byte : text) {
    if (std::iscntrl(static_cast<unsigned char>(byte)) != 0) byte = '?';
  }
  std::printf("%-17s %s\n", label, text.c_str());
}

void print_reasons(const char* label, const olm_forecast& forecast) {
  for (const auto& reason : forecast.reasons) print_row(std::exchange(label, ""), reason);
}

string pad(string text, std::size_t width) {
  text.resize(std::max(text.size(), width), ' ');
  return text;
}

string describe(const string& path) {
  try {
    const olm_dataset data(path);
    return pad(data.name, 12) + " schema " + pad(or_none(get_icu(data).schema), 5) + " " +
           locate(path);
  } catch (...) {
    return "cannot be used: " + locate(path);
  }
}

string describe_current() {
  try {
    return describe(current_dataset_path());
  } catch (int) {
    return "none";
  }
}

string describe_latest() {
  const string path = read_target(latest_link);
  if (path.empty()) return "none";
  return describe(path);
}

// Prints that the forecast cannot be told, and throws errno, if this user may not look at `path`.
void demand(const string& path, int mode) {
  if (access(path.c_str(), mode) == 0 || errno != EACCES) return;
  print_row("cannot be told", "you may not read " + path);
  throw errno;
}

// Gives the exit status, as does judge.
int tell() {
  const olm_forecast forecast("");
  string zone = read_target(localtime_link);
  const string prefix = string(zoneinfo_link) + "/";
  if (zone.starts_with(prefix)) zone.erase(0, prefix.size());
  print_row("system partition", describe(""));
  print_row("current", describe_current());
  print_row("latest update", describe_latest());
  print_row("local zone", or_none(zone));
  print_row("next start", forecast.decision + ": " + or_none(forecast.zoneinfo));
  print_reasons("because", forecast);
  if (!forecast.changes_links) return 0;
  print_row("provided that", "links can be made and removed: nothing here tries to write");
  return 1;
}

// Whether the next start would install the update at `path`.
int judge(const string& path) {
  const olm_forecast forecast(path);
  print_row(forecast.installs_update ? "would be used" : "would be refused", path);
  print_reasons("", forecast);
  const bool has_version = fs::exists(olm_zoneinfo(path).directory + version_file);
  if (!has_version && errno == ENOENT)
    print_row("", string("it has no zoneinfo") + version_file + ", which a start does not ask for");
  return forecast.installs_update ? 0 : 1;
}

}  // namespace

int main(int count, char* arguments[]) {
  const string update = count == 2 ? std::span(arguments, 2)[1] : "";
  if (count > 2 || update.starts_with('-') || (count == 2 && update.empty())) {
    static_cast<void>(std::fputs("usage: tzdata-status [UPDATE]\n", stderr));
    return cannot_be_told;
  }
  // What a start would warn of is told in other words: a directory takes nothing.
  if (std::freopen("/", "r", stderr) == nullptr) return cannot_be_told;
  int status = cannot_be_told;
  try {
    // Of all that a start reads, what an ordinary user may be barred from.
    demand(string(system_zoneinfo_directory) + version_file, R_OK);
    demand(string(system_icu_directory) + schema_file, R_OK);
    demand(legacy_icutz_link, F_OK);
    demand(find_current() + "/icutz", R_OK | X_OK);
    demand((update.empty() ? string(latest_link) : update) + "/icutz", R_OK | X_OK);
    status = update.empty() ? tell() : judge(update);
  } catch (...) {
    // It has been told, or memory ran out.
  }
  return std::fflush(stdout) == 0 ? status : cannot_be_told;
}
