#include "check/olm_zone_file.h"

#include <algorithm>
#include <array>
#include <limits>
#include <stdexcept>
#include <string>

namespace {

[[noreturn]] void refuse(const std::string& reason) { throw std::invalid_argument(reason); }

void require(bool is_so, const char* reason) {
  if (!is_so) refuse(reason);
}

// What is lost of a file may itself say that there was more.
void require_length(std::size_t length, std::uint64_t named, bool is_all) {
  if (length == named) return;
  refuse("is " + std::to_string(length) + " bytes long and says that it has " +
         std::to_string(named) + (is_all ? "" : " or more"));
}

// Takes `length` bytes off the front. There must be as many.
std::string_view take(std::string_view& data, std::size_t length) {
  const std::string_view taken = data.substr(0, length);
  data.remove_prefix(length);
  return taken;
}

// A number of `bytes`' length, the high byte first.
std::int64_t get_number(std::string_view bytes) {
  std::uint64_t number = static_cast<signed char>(bytes.front()) < 0 ? ~std::uint64_t{0} : 0;
  for (const char byte : bytes) number = number << 8 | static_cast<unsigned char>(byte);
  return static_cast<std::int64_t>(number);
}

constexpr std::size_t count_size = 4;
constexpr std::size_t kind_size = 6;
constexpr std::size_t header_size = 44;
constexpr char first_long_version = '2';
constexpr char last_version = '4';

// Leap seconds come one at a time. Only a later version of the format may leave out the first ones,
// or end with a record that only says how far the file knows.
void check_leap_seconds(std::string_view data, std::size_t time_size, char version) {
  std::int64_t last_time = -1;
  std::int64_t last_sum = 0;
  const bool may_be_partial = version >= last_version;
  for (bool is_first = true; !data.empty(); is_first = false) {
    const std::int64_t time = get_number(take(data, time_size));
    const std::int64_t sum = get_number(take(data, count_size));
    const bool is_step = sum == last_sum + 1 || sum == last_sum - 1;
    const bool is_end = sum == last_sum && data.empty();
    require(time > last_time && (is_step || (may_be_partial && (is_first || is_end))),
            "has leap seconds out of order");
    last_time = time;
    last_sum = sum;
  }
}

std::string read_name(std::string_view names, std::size_t index) {
  require(index < names.size(), "has a time without a name");
  const std::string_view name = names.substr(index, names.find('\0', index) - index);
  require(std::all_of(name.begin(), name.end(),
                      [](unsigned char byte) { return byte > ' ' && byte < 0x7f; }),
          "has a name that nobody can read");
  return std::string(name);
}

}  // namespace

// What the header of a table says of its parts' lengths.
struct olm_zone_file::numbers {
  std::uint64_t marks_of_ut = 0;
  std::uint64_t marks_of_standard = 0;
  std::uint64_t leap_seconds = 0;
  std::uint64_t changes = 0;
  std::uint64_t times = 0;
  std::uint64_t characters = 0;
  std::uint64_t size_of_time = 0;

  // Of a header that the rest of a file, which has `length` bytes, begins with.
  numbers(std::string_view data, std::size_t length, bool is_long) : size_of_time(is_long ? 8 : 4) {
    if (data.size() < header_size)
      require_length(length, length - data.size() + header_size, false);
    data = data.substr(header_size - 6 * count_size);
    for (std::uint64_t* number :
         {&marks_of_ut, &marks_of_standard, &leap_seconds, &changes, &times, &characters}) {
      constexpr std::uint64_t low_half = std::numeric_limits<std::uint32_t>::max();
      *number = static_cast<std::uint64_t>(get_number(take(data, count_size))) & low_half;
    }
  }

  [[nodiscard]] std::uint64_t count_bytes() const {
    return changes * (size_of_time + 1) + times * kind_size + characters +
           leap_seconds * (size_of_time + count_size) + marks_of_standard + marks_of_ut;
  }
};

const local_time& olm_zone_file::table::find(instant when) const {
  const auto next = std::upper_bound(changes.begin(), changes.end(), when);
  if (next == changes.begin()) return times.front();
  return times[kinds[static_cast<std::size_t>(next - changes.begin()) - 1]];
}

olm_zone_file::table olm_zone_file::read_table(std::string_view data, const numbers& counts,
                                               char version) {
  const auto is_none_or = [](std::uint64_t number, std::uint64_t other) {
    return number == 0 || number == other;
  };
  // A change tells the time that follows by a byte, and a time the place of its name.
  constexpr std::uint64_t most_times = 256;
  constexpr std::uint64_t most_characters = 1024;
  require(counts.times > 0 && counts.times <= most_times && counts.characters > 0 &&
              counts.characters <= most_characters &&
              is_none_or(counts.marks_of_ut, counts.times) &&
              is_none_or(counts.marks_of_standard, counts.times),
          "has numbers in its header that do not fit");
  table read;
  for (std::uint64_t left = counts.changes; left > 0; --left)
    read.changes.push_back(get_number(take(data, counts.size_of_time)));
  require(std::is_sorted(read.changes.begin(), read.changes.end(), std::less_equal<>()),
          "has changes out of order");
  constexpr instant latest = 800'000'000'000;  // after the year 27000, still within std::chrono's
  require(read.changes.empty() || read.changes.back() < latest, "has changes in a far future");
  for (const char kind : take(data, counts.changes)) {
    read.kinds.push_back(static_cast<std::uint8_t>(kind));
    require(read.kinds.back() < counts.times, "has a change to a time that it does not have");
  }
  std::string_view kinds = take(data, counts.times * kind_size);
  const std::string_view names = take(data, counts.characters);
  require(names.ends_with('\0'), "has a name without an end");
  while (!kinds.empty()) {
    local_time time;
    const std::int64_t offset = get_number(take(kinds, count_size));
    constexpr std::int64_t most = 93600;
    require(offset > -most && offset < most, "has a time more than a day from UTC");
    time.offset = static_cast<std::int32_t>(offset);
    const char is_dst = take(kinds, 1).front();
    require(is_dst == 0 || is_dst == 1, "has a time that may or may not be daylight saving time");
    time.is_dst = is_dst != 0;
    time.name = read_name(names, static_cast<unsigned char>(take(kinds, 1).front()));
    read.times.push_back(time);
  }
  check_leap_seconds(take(data, counts.leap_seconds * (counts.size_of_time + count_size)),
                     counts.size_of_time, version);
  if (counts.leap_seconds > 0) has_leap_seconds_ = true;
  const std::string_view standard = take(data, counts.marks_of_standard);
  const std::string_view ut = take(data, counts.marks_of_ut);
  for (std::size_t i = 0; i < counts.times; ++i) {
    const int is_standard = standard.empty() ? 0 : standard[i];
    const int is_ut = ut.empty() ? 0 : ut[i];
    require((is_standard == 0 || is_standard == 1) && (is_ut == 0 || is_ut == is_standard),
            "has marks of how its changes were written that do not fit");
  }
  return read;
}

olm_zone_file::olm_zone_file(std::string_view data) {
  require(data.starts_with("TZif"), "is no zone file");
  const std::size_t length = data.size();
  const numbers counts(data, length, false);
  const char version = data[4];
  require(version == 0 || (version >= first_long_version && version <= last_version),
          "is of a version of the format that is not known");
  const std::uint64_t end = header_size + counts.count_bytes();
  if (version == 0 || length < end) require_length(length, end, version == 0);
  table_ = read_table(data.substr(header_size), counts, 0);
  if (version == 0) return;

  const std::string_view rest = data.substr(end);
  const numbers long_counts(rest, length, true);
  require(rest.starts_with("TZif") && rest[4] == version, "has no table with 64 bits");
  const std::uint64_t rule_begins = header_size + long_counts.count_bytes();
  // A line follows that holds no less than nothing.
  if (rest.size() < rule_begins + 2) require_length(length, end + rule_begins + 2, false);
  const table short_table = table_;
  table_ = read_table(rest.substr(header_size), long_counts, version);
  read_rule(rest.substr(rule_begins));
  // A short table for nobody has no changes, and no name.
  if (counts.changes > 0 || counts.characters > 1) compare_tables(short_table);
}

void olm_zone_file::read_rule(std::string_view text) {
  const std::size_t end = text.find('\n', 1);
  require(text.front() == '\n' && end != std::string_view::npos, "has no line at its end");
  require(end + 1 == text.size(), "goes on after the line at its end");
  if (end == 1) return;
  try {
    rule_.emplace(text.substr(1, end - 1));
  } catch (const std::invalid_argument&) {
    refuse("has no rule in the line at its end");
  }
  compare_rule();
}

// Programs go by one or the other, and so must find the same.
void olm_zone_file::compare_tables(const table& short_table) const {
  constexpr instant least = std::numeric_limits<std::int32_t>::min();
  constexpr instant most = std::numeric_limits<std::int32_t>::max();
  const auto& changes = short_table.changes;
  // Before its first change, the short table may lack what came before 32 bits, but nothing else.
  const bool has_all = table_.changes.empty() || table_.changes.front() > least;
  std::vector<instant> instants = changes;
  if (has_all || changes.empty()) instants.push_back(least);
  list_changes(least, most, instants);
  for (const instant when : instants)
    require(find(when) == short_table.find(when), "has two tables that differ");
}

void olm_zone_file::compare_rule() const {
  const std::array<local_time, 2> yearly = {rule_->get_standard(), rule_->get_daylight()};
  const local_time& last =
      table_.kinds.empty() ? table_.times.front() : table_.times[table_.kinds.back()];
  const bool fits = table_.changes.empty() ? last == yearly.front() || last == yearly.back()
                                           : last == rule_->find(table_.changes.back());
  require(fits, "has a rule at its end that does not go on from the last change");
  // Where the table has such a time, but never by this name, one of both is wrong.
  for (const local_time& time : yearly) {
    const auto is_alike = [&](const local_time& other) {
      return other.offset == time.offset && other.is_dst == time.is_dst;
    };
    const auto& times = table_.times;
    require(std::none_of(times.begin(), times.end(), is_alike) ||
                std::find(times.begin(), times.end(), time) != times.end(),
            "has a name in the rule at its end that is not in its table");
  }
}

local_time olm_zone_file::find(instant when) const {
  const bool is_after = table_.changes.empty() || when >= table_.changes.back();
  return is_after && rule_ ? rule_->find(when) : table_.find(when);
}

void olm_zone_file::list_changes(instant from, instant to, std::vector<instant>& changes) const {
  const auto first = std::upper_bound(table_.changes.begin(), table_.changes.end(), from);
  const auto last = std::lower_bound(table_.changes.begin(), table_.changes.end(), to);
  if (first < last) changes.insert(changes.end(), first, last);
  if (!table_.changes.empty()) from = std::max(from, table_.changes.back());
  if (rule_ && from < to) rule_->list_changes(from, to, changes);
}

bool olm_zone_file::has_negative_dst(instant since) const {
  const auto is_set_back = [](const local_time& one, const local_time& other) {
    return one.is_dst && !other.is_dst && one.offset < other.offset;
  };
  const auto& [changes, kinds, times] = table_;
  for (std::size_t i = 1; i < kinds.size(); ++i) {
    const local_time& before = times[kinds[i - 1]];
    const local_time& after = times[kinds[i]];
    if (changes[i] > since && (is_set_back(before, after) || is_set_back(after, before)))
      return true;
  }
  return rule_ && is_set_back(rule_->get_daylight(), rule_->get_standard());
}
