// Whole starts of the built program, a row each: a name, a device, what the program says, and what
// it changes. device.h tells what an entry is. Then what tzdata-status says of such devices.
#include <gtest/gtest.h>

#include <cstdio>
#include <filesystem>

#include "starts.h"

namespace {

using namespace at;
using std::string;
using namespace std::string_literals;

// Too long for any matcher that recurses.
constexpr std::size_t very_long = 1U << 20U;

const string first = updates + "2020a.9.0";
const string second = updates + "2020a.10.0";
const string cut_name = "%n\n%s" + string(999, 'y');

// An update goes by the name of its directory, whatever its files say.
entries update(const string& path) {
  return file(path + "/zoneinfo/+VERSION", "1999a\n") + file(path + "/icutz/icutz44l.dat", "");
}

entries links(const string& path) {
  return link_to(zoneinfo, path + "/zoneinfo") + link_to(icutz, path + "/icutz");
}

const entries system_links = link_to(zoneinfo, system_zoneinfo) + gone(icutz);
const entries default_zone = link_to(zone, zoneinfo + "/America/Los_Angeles");

// A system partition of 2019c and two updates, of which the second is the latest.
const entries on_system = file(version, "2019c") + file(schema, "44l") +
                          file(system_zoneinfo + "/Asia/Tokyo", "") + link_to(latest, second) +
                          link_to(zone, zoneinfo + "/Asia/Tokyo") + update(first) + update(second) +
                          system_links;
const entries on_first = on_system + links(first);
const entries on_second = on_system + links(second);

// What it says.
report say(const string& warning) { return {warning}; }
const report invalid = say("Invalid current symlinks; resetting to system partition");
const report given_up = say("Symlink points at data incompatible with installed system");
const report unable = say("Unable to locate data; resetting to system partition");
const report no_zone = say("localtime link invalid; resetting to America/Los_Angeles");
const report not_migrated = say("Could not migrate /var/db/icutz to /var/db/timezone/icutz");
report bad_link(const string& target) { return say("Bad zoneinfo link " + target); }
report correct(const string& target) { return say("Correcting localtime link to " + target); }
report no_schema(const string& path) { return say("No ICU schema found for " + path); }
report fail_to_remove(const string& path) { return say("remove: could not remove " + path); }
report fail_to_link(const string& path, const string& target) {
  return say("create_symlink: from " + path + " to " + target);
}
report refuse(const string& latest_name, const string& current_name) {
  return say("New update not compatible or older version: " + latest_name + " vs. " + current_name);
}
report unparsed(const string& name) {
  const string warning = "Cannot parse version string " + name;
  return {warning + ", results.size() = 0", warning};
}

}  // namespace

const std::vector<whole_start> starts = {
    // Which data set
    {.name = "a first update",
     .before = on_system,
     .changes = links(second) + file(record, "2019c.1.0_2020a.10.0")},
    {.name = "the next update",
     .before = on_first + file(record, "longer than what replaces it"),
     .changes = links(second) + file(marker, "") + file(record, "2020a.9.0_2020a.10.0")},
    {.name = "nothing new, and the marker of the last start",
     .before = on_second + file(marker, "") + file(record, "a_b"),
     .says = refuse("2020a.10.0", "2020a.10.0"),
     .changes = gone(marker)},
    {.name = "a system upgraded past the update",
     .before = on_second + file(version, "2020b"),
     .says = given_up + refuse("2020a.10.0", "2020a.10.0"),
     .changes = system_links + file(marker, "")},
    {.name = "a system upgraded past both updates; a marker that cannot be looked at",
     .before = on_first + file(version, "2020b"),
     .says = given_up + say("Cannot touch file " + marker),
     .changes = links(second) + file(marker, "") + file(record, "2020b.1.0_2020a.10.0"),
     .tracing = {"-P", marker, "-e", "inject=/stat:error=EIO"}},
    {.name = "a system upgraded to another ICU format; an ICU link that cannot be removed",
     .before = on_second + file(version, "2019e") + file(schema, "45l"),
     .says = given_up + fail_to_remove(icutz) + say("unlink of ICU softlink failed") +
             refuse("2020a.10.0", "2020a.10.0"),
     .changes = link_to(zoneinfo, system_zoneinfo) + file(marker, ""),
     .tracing = {"-P", icutz, "-e", "inject=/^unlink:error=EIO"}},
    {.name = "an incompatible update",
     .before = on_first + gone(second + "/icutz") + file(second + "/icutz/icutz44b.dat", ""),
     .says = refuse("2020a.10.0", "2020a.9.0")},
    {.name = "an update of the system's version, then a newer one; a marker that cannot be closed",
     .before = on_system + update(updates + "2019c.1.0") + links(updates + "2019c.1.0") +
               file(version, "\n \v\f2019c\t2020b") + file(schema, "\n44l\r\n44b"),
     .says = say("Cannot touch file " + marker),
     .changes = links(second) + file(marker, "") + file(record, "2019c.1.0_2020a.10.0"),
     .tracing = {"-P", marker, "-e", "inject=close:error=EIO"}},
    {.name = "an older update; both ICU links; a zone beside the link",
     .before = on_second + link_to(latest, first) + link_to(legacy_icutz, "/usr/share/icu") +
               link_to(zone, zoneinfo + ".old"),
     .says = refuse("2020a.9.0", "2020a.10.0"),
     .changes = gone(legacy_icutz)},
    {.name = "updates that are gone; a legacy link to nowhere; a relative zone",
     .before = on_first + gone(first) + gone(second) + link_to(legacy_icutz, "nowhere") +
               link_to(zone, "../usr/share/zoneinfo/../../.." + zoneinfo),
     .says = no_schema(first) + given_up + no_schema(second) + refuse("2020a.10.0", "2020a.9.0") +
             no_zone,
     .changes = system_links + default_zone + file(marker, "") + gone(legacy_icutz)},
    {.name = "no links",
     .before = on_system + gone(zoneinfo) + gone(zone),
     .says = bad_link("") + invalid + no_zone,
     .changes = links(second) + default_zone + file(record, "2019c.1.0_2020a.10.0")},
    {.name = "a zoneinfo link to neither kind of data set; no update; a zone cut short",
     .before = on_first + gone(latest) + link_to(zoneinfo, "/usr/share/%s%n") +
               link_to(zone, "/var/db/timezone/zoneinf"),
     .says = bad_link("/usr/share/%s%n") + invalid + no_zone,
     .changes = system_links + default_zone},
    {.name = "a latest update elsewhere; a zone by the name of the system's own directory",
     .before = on_first + link_to(latest, "%s%n") + link_to(zone, system_zoneinfo + "/%s%n"),
     .says = say("olm_dataset::create_components: bad path %s%n") + unable +
             correct(zoneinfo + ".default/%s%n") + no_zone,
     .changes = system_links + default_zone},
    {.name = "a latest update that is no link, found before the missing zoneinfo link",
     .before = on_first + gone(zoneinfo) + file(latest, "") + folder(zone),
     .says = say("read_symlink: " + latest) + unable + say("read_symlink: " + zone) + no_zone,
     .changes = system_links + default_zone},

    // What earlier systems left behind, and the zone
    {.name = "an ICU link of earlier systems",
     .before = on_system + gone(latest) + link_to(legacy_icutz, "../../usr/share/icu") +
               folder("/var/db/icu"),
     .changes = gone(legacy_icutz) + gone("/var/db/icu") + link_to(icutz, "../../usr/share/icu")},
    {.name = "a zone among the system's own",
     .before = on_system + gone(latest) + link_to(zone, "/usr/share/zoneinfo/Asia/Tokyo"),
     .says = correct(zoneinfo + "/Asia/Tokyo"),
     .changes = link_to(zone, zoneinfo + "/Asia/Tokyo")},

    // What fails
    {.name = "a directory in the ICU link's place, which keeps the legacy link as it is",
     .before =
         on_first + gone(icutz) + file(icutz + "/kept", "") + link_to(legacy_icutz, "nowhere"),
     .says = fail_to_remove(icutz) + say("unlink of ICU softlink failed") +
             fail_to_link(icutz, second + "/icutz") + unable + fail_to_remove(icutz) +
             say("unlink of ICU softlink failed"),
     .changes = link_to(zoneinfo, system_zoneinfo)},
    {.name = "a directory in the zoneinfo link's place, which keeps the ICU link as it is",
     .before = on_first + gone(zoneinfo) + file(zoneinfo + "/kept", ""),
     .says = say("read_symlink: " + zoneinfo) + invalid + fail_to_remove(zoneinfo) +
             say("Unlink of zoneinfo softlink failed") + fail_to_link(zoneinfo, system_zoneinfo) +
             unable + fail_to_remove(zoneinfo) + say("Unlink of zoneinfo softlink failed") +
             fail_to_link(zoneinfo, system_zoneinfo),
     .ends = "exit 1"},
    {.name = "no directory for the links",
     .before = on_system + gone("/var/db/timezone"),
     .says = bad_link("") + invalid + fail_to_link(zoneinfo, system_zoneinfo) + unable +
             fail_to_link(zoneinfo, system_zoneinfo),
     .ends = "exit 1"},
    {.name = "directories in the places of the old links, the marker and the record",
     .before = on_first + gone(icutz) + folder(legacy_icutz) + file("/var/db/icu/kept", "") +
               file(marker + "/kept", "") + folder(record),
     .says = say("read_symlink: " + legacy_icutz) + not_migrated + fail_to_remove(legacy_icutz) +
             say("Could not remove /var/db/icutz") + fail_to_remove(legacy_icutz) +
             say("unlink of ICU softlink failed") + say("Cannot touch file " + marker),
     .changes = links(second)},
    {.name = "links that can be removed but not made",
     .before = on_system + gone(latest) + link_to(legacy_icutz, "/usr/share/icu") +
               link_to(icutz, "nowhere") + link_to(zone, "/usr/share/zoneinfo/Asia/Tokyo"),
     .says = fail_to_link(icutz, "/usr/share/icu") + not_migrated +
             correct(zoneinfo + "/Asia/Tokyo") + fail_to_link(zone, zoneinfo + "/Asia/Tokyo") +
             no_zone + fail_to_link(zone, zoneinfo + "/America/Los_Angeles"),
     .changes = gone(legacy_icutz) + gone(zone),
     .ends = "exit 1",
     .tracing = {"-e", "inject=/^symlink:error=EROFS"}},
    {.name = "warnings that nobody reads any more",
     .before = on_system + gone(zoneinfo),
     .changes = links(second) + file(record, "2019c.1.0_2020a.10.0"),
     .tracing = {"-P", "/proc/self/fd/2", "-e", "inject=write:error=EPIPE:signal=PIPE"}},

    // Nonsense
    {.name = "a version of 1 MB, and a limit to the size of files",
     .before = on_system + file(version, "2019" + string(very_long, 'z')),
     .changes = links(second) + file(record, ""),
     .tracing = {"-P", record, "-e", "inject=/^write:error=EFBIG:signal=XFSZ"}},
    {.name = "a number of 1 MB",
     .before = on_first + file(version, string(very_long, '1') + "c"),
     .says = unable,
     .ends = "exit 1"},
    {.name = "no ICU data, and a version with bytes that are letters or white space elsewhere",
     .before = on_system + gone("/usr/share/icu") + gone(second + "/icutz") +
               file(version, "%s\xA0\x85\0%n"s),
     .says = unparsed("%s\xA0\x85") + unparsed("%s\xA0\x85") + no_schema(second),
     .changes = links(second) + file(record, "%s\xA0\x85\0%n.1.0_2020a.10.0"s)},
    {.name = "links of 4095 bytes, of which 1024 count, with names that are formats of two lines",
     .before = on_system + link_to(zoneinfo, updates + "%n\n%s" + string(4061, 'x') + "/zoneinfo") +
               link_to(latest, updates + "%n\n%s" + string(4070, 'y')) +
               link_to(zone, "/usr/share/zoneinfo%n\n%s" + string(4071, 'z')),
     .says = bad_link(updates + "%n\n%s" + string(999, 'x')) + invalid + unparsed(cut_name) +
             no_schema(updates + cut_name) + refuse(cut_name, "2019c.1.0") +
             correct(zoneinfo + "%n\n%s" + string(1000, 'z')) + no_zone,
     .changes = system_links + default_zone},
};

TEST(start, each_case) {
  for (const auto& row : starts) {
    SCOPED_TRACE(row.name);
    lay_out(row.before);
    const report heard = row.says + report{row.ends};
    EXPECT_EQ(start(row.tracing), heard);
    EXPECT_EQ(look(), change(change({}, row.before), row.changes));
  }
}

namespace {

// What tzdata-status prints, line by line and without `margin`, and its exit status.
report ask(const string& arguments = "", const string& margin = "none", const string& tracer = "") {
  report answer = {""};
  // NOLINTNEXTLINE(cert-env33-c): the command is this file's own
  FILE* const output = popen((tracer + STATUS " " + arguments).c_str(), "r");
  for (int byte = 0; (byte = getc(output)) != EOF;) {
    if (byte == '\n') {
      answer.emplace_back();
    } else {
      answer.back() += static_cast<char>(byte);
      if (answer.back() == margin) answer.back().clear();
    }
  }
  answer.back() = "exit " + std::to_string(WEXITSTATUS(pclose(output)));
  return answer;
}

// What a link holds, or "none".
string follow(const string& path) {
  const auto there = look();
  const auto found = there.find(path);
  return found != there.end() && found->second.starts_with("-> ") ? found->second.substr(3)
                                                                  : "none";
}

}  // namespace

TEST(status, forecasts_each_start) {
  for (const auto& row : starts) {
    SCOPED_TRACE(row.name);
    lay_out(row.before);
    const device before = look();
    const string links = follow(zoneinfo) + follow(icutz);
    const report answer = ask();
    EXPECT_EQ(look(), before);
    start();
    EXPECT_EQ(answer.back(), follow(zoneinfo) + follow(icutz) == links ? "exit 0" : "exit 1");
    EXPECT_TRUE(answer[4].starts_with("next start ") &&
                answer[4].ends_with(": " + follow(zoneinfo)))
        << answer[4];
  }
}

// Whether a start would use an update, on a device that uses the first one; each answer without
// what all its lines begin with.
TEST(status, judges_an_update) {
  const string closed = updates + "2020b.1.0";
  lay_out(on_first + update(closed) + update(updates + "02020a.9.0") + folder(first + ".0") +
          file(updates + "2018b.1.0/zoneinfo/+VERSION", "") +
          file(updates + "2018b.1.0/icutz/icutz45l.dat", ""));
  std::filesystem::permissions(closed + "/icutz/icutz44l.dat", std::filesystem::perms(0640));
  const string current = " the current data set 2020a.9.0";
  const string no_version_file = "it has no zoneinfo/+VERSION, which a start does not ask for";
  const std::pair<string, report> rows[] = {
      {second, {"the update 2020a.10.0 is fit, and newer than the current data set", "exit 0"}},
      {first, {"the update 2020a.9.0 is" + current, "exit 1"}},
      {first + ".0",
       {"the update 2020a.9.0.0 has a name that is no version",
        "the update 2020a.9.0.0 has no ICU data", "the update 2020a.9.0.0 is older than" + current,
        no_version_file, "exit 1"}},
      {closed, {"the update 2020b.1.0 has icutz44l.dat, which others may not read", "exit 1"}},
      {updates + "02020a.9.0", {"the update 02020a.9.0 is not newer than" + current, "exit 1"}},
      {updates + "2018b.1.0",
       {"the update 2018b.1.0 has schema 45l, the system partition 44l",
        "the update 2018b.1.0 is older than" + current, "exit 1"}},
      {updates + "2147483648a",
       {"a number beyond 32 bits is in the version of " + updates + "2147483648a", no_version_file,
        "exit 1"}},
      {"tz", {"the update is not below " + updates, no_version_file, "exit 1"}},
  };
  for (const auto& [path, reasons] : rows) {
    const string used = reasons.back() == "exit 0" ? "would be used     " : "would be refused  ";
    EXPECT_EQ(ask(path, string(18, ' ')), report{used + path} + reasons);
  }
  for (const string bad : {"one two", "-h", "''"})
    EXPECT_EQ(ask(bad + " 2>&1"), (report{"usage: tzdata-status [UPDATE]", "exit 2"}));
  EXPECT_EQ(ask(">/dev/full"), report{"exit 2"});
  // What an ordinary user may not read, each alone.
  const string tracer =
      "ASAN_OPTIONS=detect_leaks=0 strace -o /dev/null -e inject=/access:error=EACCES -P ";
  for (const string& path : {version, schema, legacy_icutz, first + "/icutz", second + "/icutz"}) {
    EXPECT_EQ(ask(second, "", tracer + path + " "),
              (report{"cannot be told    you may not read " + path, "exit 2"}));
  }
}

TEST(status, tells_of_a_device) {
  const string older =
      "the current data set 2020a.10.0 is older than the system partition 2020b.1.0";
  lay_out(on_second + file(version, "2020b\n") + link_to(latest, updates + "2147483648a"));
  EXPECT_EQ(
      ask(),
      (report{"system partition  2020b.1.0    schema 44l   /usr/share/zoneinfo.default",
              "current           2020a.10.0   schema 44l   " + second,
              "latest update     cannot be used: " + updates + "2147483648a",
              "local zone        Asia/Tokyo",
              "next start        falls back to the system partition, 2020b.1.0: " + system_zoneinfo,
              "because           " + older,
              "                  a number beyond 32 bits is in the version of " + updates +
                  "2147483648a",
              "provided that     links can be made and removed: nothing here tries to write",
              "exit 1"}));
  // Nothing can be weighed.
  lay_out(on_system + file(icutz, "") + file(latest, "") + link_to(zone, "/\x1b") +
          file(version, "9999999999a"));
  EXPECT_EQ(
      ask(),
      (report{"system partition  cannot be used: /usr/share/zoneinfo.default",
              "current           cannot be used: /usr/share/zoneinfo.default",
              "latest update     none", "local zone        /?",
              "next start        fails, and leaves the zoneinfo link as it is: " + system_zoneinfo,
              "because           a number beyond 32 bits is in the version of " + system_zoneinfo,
              "exit 0"}));
  // What stands in the ICU link's place is all that goes.
  lay_out(on_system + file(icutz, "") + file(latest, "") + gone(zone));
  EXPECT_EQ(
      ask(),
      (report{"system partition  2019c.1.0    schema 44l   /usr/share/zoneinfo.default",
              "current           2019c.1.0    schema 44l   /usr/share/zoneinfo.default",
              "latest update     none", "local zone        none",
              "next start        falls back to the system partition, 2019c.1.0: " + system_zoneinfo,
              "because           " + latest + ", or what it names, cannot be read",
              "provided that     links can be made and removed: nothing here tries to write",
              "exit 1"}));
}
