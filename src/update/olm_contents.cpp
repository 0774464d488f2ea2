#include "update/olm_contents.h"

#include <algorithm>

#include "fs/file_operations.h"
#include "update/failure.h"
#include "update/steps.h"

namespace {

using std::string;
using kind = update_entry::kind;

constexpr std::size_t most_entries = 20'000;

[[noreturn]] void refuse(const string& name, const string& reason) {
  throw olm_refusal({name + ' ' + reason});
}

bool is_plain(const string& name) {
  const bool is_printable =
      std::all_of(name.begin(), name.end(), [](char byte) { return ' ' < byte && byte <= '~'; });
  // A path that starts at the root and is the same when it is simplified has nothing odd.
  return is_printable && fs::simplify_path('/' + name, false) == '/' + name;
}

// Debian's zone files have this link. What it leads to is no part of them.
bool is_link_of_machine(const string& name, const update_entry& entry) {
  return entry.type == kind::symbolic_link && entry.target == "/etc/localtime" &&
         name.ends_with("/localtime");
}

// Where a link leads. Each name leads through directories alone, so a link that climbs first and
// then gives such a name leads where its text says.
string follow(const string& name, string target) {
  const string up = "../";
  string place = get_directory(name);
  for (; target.starts_with(up) && !place.empty(); target.erase(0, up.size()))
    place = get_directory(place);
  return place.empty() ? target : place + '/' + target;
}

}  // namespace

bool olm_contents::has(const string& name, kind type) const {
  const auto found = entries_.find(name);
  return found != entries_.end() && found->second.type == type;
}

bool olm_contents::leads_within(string name) const {
  constexpr int most_steps = 40;  // where the kernel gives up, too
  for (int step = 0; step <= most_steps; ++step) {
    const auto found = entries_.find(name);
    if (found == entries_.end()) return false;
    if (found->second.type != kind::symbolic_link) return true;
    name = follow(name, found->second.target);
  }
  return false;
}

void olm_contents::add(const string& name, const update_entry& entry) {
  if (!is_plain(name)) refuse(name, "is no name that an update may have");
  if (is_link_of_machine(name, entry)) return;
  const string directory = get_directory(name);
  if (!directory.empty() && !has(directory, kind::directory))
    refuse(name, "stands in no directory of the update");
  if (entry.type == kind::hard_link && !has(entry.target, kind::file))
    refuse(name, "is a link to " + entry.target + ", which is no file before it");
  if (!entries_.emplace(name, entry).second) refuse(name, "is there twice");
  if (entries_.size() > most_entries)
    throw olm_refusal({"it has more than " + std::to_string(most_entries) + " entries"});
}

void olm_contents::require_whole() const {
  if (!has("zoneinfo", kind::directory)) throw olm_refusal({"it has no directory zoneinfo"});
  for (const auto& [name, entry] : entries_) {
    if (entry.type == kind::symbolic_link && !leads_within(name))
      refuse(name, "is a link to " + entry.target + ", which leads to nothing in the update");
  }
}
