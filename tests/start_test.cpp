// Whole starts of the built program, a row each: a name, a device, what the program says, and what
// it changes. device.h tells what an entry is.
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cctype>
#include <cstdio>

#include "starts.h"

namespace {

using namespace at;
using std::string;
using namespace std::string_literals;

// Too long for any matcher that recurses.
constexpr std::size_t very_long = 1U << 20U;

const string cut_name = "%n\n%s" + string(999, 'y');
const entries default_zone = link_to(zone, zoneinfo + "/America/Los_Angeles");

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
report fail_to_point(const string& target) {
  return fail_to_remove(zoneinfo) + say("Unlink of zoneinfo softlink failed") +
         fail_to_link(zoneinfo, target);
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
    {.name = "a system upgraded to the version of the latest update",
     .before = on_first + file(version, "2020b") + update(updates + "2020b.1.0") +
               link_to(latest, updates + "2020b.1.0"),
     .says = given_up,
     .changes =
         links(updates + "2020b.1.0") + file(marker, "") + file(record, "2020b.1.0_2020b.1.0")},
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
     .boot_says = given_up + fail_to_remove(icutz) + say("unlink of ICU softlink failed") +
                  refuse("2020a.10.0", "2020a.10.0") +
                  say("Could not remove ICU link to " + second + "/icutz"),
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
     .before = on_second + link_to(zone, "/usr/share/zoneinfo/Asia/Tokyo"),
     .says = refuse("2020a.10.0", "2020a.10.0") + correct(zoneinfo + "/Asia/Tokyo"),
     .changes = link_to(zone, zoneinfo + "/Asia/Tokyo"),
     .boot_says = correct(zoneinfo + "/Asia/Tokyo") + refuse("2020a.10.0", "2020a.10.0")},
    {.name = "a zone that only the update in use has",
     .before =
         on_second + link_to(zone, "/usr/share/zoneinfo/new") + file(second + "/zoneinfo/new", ""),
     .says = refuse("2020a.10.0", "2020a.10.0") + correct(zoneinfo + "/new"),
     .changes = link_to(zone, zoneinfo + "/new")},

    {.name = "a zone that only the latest update, which is older, lacks",
     .before = on_second + link_to(latest, first) + gone(first + "/zoneinfo/Asia/Tokyo") +
               link_to(zone, "/usr/share/zoneinfo/Asia/Tokyo"),
     .says = refuse("2020a.9.0", "2020a.10.0") + correct(zoneinfo + "/Asia/Tokyo"),
     .changes = link_to(zone, zoneinfo + "/Asia/Tokyo")},
    {.name = "a zone that only the data set which goes out of use lacks",
     .before = on_first + file(version, "none") + gone(first + "/zoneinfo/Asia/Tokyo") +
               link_to(zone, "/usr/share/zoneinfo/Asia/Tokyo"),
     .says = unparsed("none.1.0") + correct(zoneinfo + "/Asia/Tokyo"),
     .changes = links(second) + link_to(zone, zoneinfo + "/Asia/Tokyo") + file(marker, "") +
                file(record, "2020a.9.0_2020a.10.0")},

    // What a boot mends
    {.name = "a zone and an ICU link that were lost, and what else kills leave",
     .before = on_second + gone(icutz) + gone(zone) + link_to(icutz + ".boot", "x") +
               link_to(zone + ".boot", "/usr/share/zoneinfo/Asia/Tokyo"),
     .says = refuse("2020a.10.0", "2020a.10.0") + no_zone,
     .changes = default_zone,
     .boot_says = say("Restoring link " + zone + " to /usr/share/zoneinfo/Asia/Tokyo") +
                  correct(zoneinfo + "/Asia/Tokyo") + refuse("2020a.10.0", "2020a.10.0") +
                  say("Correcting ICU link to " + second + "/icutz"),
     .mended = links(second) + link_to(zone, zoneinfo + "/Asia/Tokyo") + gone(zone + ".boot") +
               gone(icutz + ".boot")},
    {.name = "an ICU link that leads to an update by way of another link",
     .before = on_system + gone(latest) + link_to(updates + "x", "2020a.9.0") +
               link_to(icutz, "./zoneinfo/../icu") +
               link_to("/usr/share/icu", "/var/db/timezone/tz/x"),
     .boot_says = say("Removing ICU link to ./zoneinfo/../icu"),
     .mended = gone(icutz)},
    {.name = "an ICU link by another path to the update in use; spares that are not needed",
     .before = on_second + link_to(icutz, "tz//2020a.10.0/./x/../icutz/") +
               link_to(icutz + ".boot", "x") + link_to(zone + ".boot", zoneinfo + "/Asia/Tokyo"),
     .says = refuse("2020a.10.0", "2020a.10.0"),
     .mended = gone(zone + ".boot") + gone(icutz + ".boot")},
    {.name = "an ICU link by the name of another update, which leads to the one in use",
     .before = on_second + link_to(first, second) + link_to(icutz, "tz/2020a.9.0/icutz"),
     .says = refuse("2020a.10.0", "2020a.10.0"),
     .boot_says =
         refuse("2020a.10.0", "2020a.10.0") + say("Correcting ICU link to " + second + "/icutz"),
     .mended = links(second)},
    {.name = "a directory in the place of the lost ICU link",
     .before = on_second + gone(icutz) + file(icutz + "/kept", ""),
     .says = refuse("2020a.10.0", "2020a.10.0"),
     .boot_says = refuse("2020a.10.0", "2020a.10.0") +
                  say("Could not correct ICU link to " + second + "/icutz")},

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
     .says = say("read_symlink: " + zoneinfo) + invalid + fail_to_point(system_zoneinfo) + unable +
             fail_to_point(system_zoneinfo),
     .ends = "exit 1"},
    {.name = "no directory for the links, and a legacy one",
     .before = on_system + gone("/var/db/timezone") + link_to(legacy_icutz, "/usr/share/icu"),
     .says = fail_to_link(icutz, "/usr/share/icu") + not_migrated + bad_link("") + invalid +
             fail_to_link(zoneinfo, system_zoneinfo) + unable +
             fail_to_link(zoneinfo, system_zoneinfo),
     .changes = gone(legacy_icutz),
     .ends = "exit 1"},
    {.name = "ICU data one level too deep",
     .before = on_first + gone(second + "/icutz") + file(second + "/icutz/sub/icutz44l.dat", ""),
     .says = no_schema(second) + refuse("2020a.10.0", "2020a.9.0")},
    {.name = "ICU data that can be read but not searched",
     .before = on_first,
     .says = no_schema(second) + refuse("2020a.10.0", "2020a.9.0"),
     .prepare = [] { chmod((second + "/icutz").c_str(), 0444); }},
    {.name = "ICU data that others may not read; a record that is closed",
     .before = on_first + file(record, ""),
     .says = no_schema(second) + refuse("2020a.10.0", "2020a.9.0"),
     .prepare = [] { chmod((second + "/icutz/icutz44l.dat").c_str(), 0640); }},
    {.name = "directories in which nothing can be written",
     .before = on_system + link_to(legacy_icutz, "/usr/share/icu"),
     .says = fail_to_link(icutz, "/usr/share/icu") + not_migrated + fail_to_remove(legacy_icutz) +
             say("Could not remove /var/db/icutz") + fail_to_point(second + "/zoneinfo") + unable +
             fail_to_point(system_zoneinfo),
     .ends = "exit 1",
     .prepare =
         [] {
           chmod("/var/db", 0555);
           chmod("/var/db/timezone", 0555);
         }},
    {.name = "a file system that can only be read",
     .before = on_first + file(marker, ""),
     .says = fail_to_point(second + "/zoneinfo") + unable + fail_to_point(system_zoneinfo),
     .ends = "exit 1",
     .prepare = [] { mount("", "/var/db", "", MS_REMOUNT | MS_RDONLY, nullptr); }},
    {.name = "an ICU link of an update on a file system that can only be read",
     .before = on_system + gone(latest) + link_to(icutz, first + "/icutz") +
               link_to(first + "/icutz", "/usr/share/icu"),
     .boot_says = say("Could not remove ICU link to " + first + "/icutz"),
     .prepare = [] { mount("", "/var/db", "", MS_REMOUNT | MS_RDONLY, nullptr); }},
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
    {.name = "a schema that is none; a link to the system's zone files by another name",
     .before = on_second + file(schema, "44L") + link_to(zoneinfo, "/usr/share/zoneinfo"),
     .says = bad_link("/usr/share/zoneinfo") + invalid + refuse("2020a.10.0", "2019c.1.0"),
     .changes = system_links},
    {.name = "an update below another; ICU data reached by a link; a data file that is a link",
     .before = on_first + link_to(latest, updates + "x/x/x/x/x/x/2020b.1.0") +
               update(updates + "2020b.1.0") + link_to(updates + "x", ".") +
               gone(first + "/icutz") + link_to(first + "/icutz", second + "/icutz") +
               link_to(second + "/icutz/icutz45l.dat", "icutz44l.dat"),
     .says = unparsed("x/x/x/x/x/x/2020b.1.0") + refuse("x/x/x/x/x/x/2020b.1.0", "2020a.9.0")},
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

namespace {

// What a link holds, or nothing.
string follow(const string& path) {
  const auto there = look();
  const auto found = there.find(path);
  return found != there.end() && found->second.starts_with("-> ") ? found->second.substr(3) : "";
}

// What tzdata-status --query says of a start: its lines from Next-Zoneinfo to the last
// Next-Warning.
report forecast() {
  report lines;
  for (const string& line : ask({"--query"}))
    if (line.starts_with("Next-")) lines.push_back(line);
  return lines;
}

// How the line for people on the next start ends.
string forecast_target() {
  for (const string& line : ask({}))
    if (line.starts_with("next start  ")) return line.substr(line.rfind(": ") + 2);
  return "no such line";
}

// The same of a start that has been made.
report describe(const report& heard) {
  report lines = {"Next-Zoneinfo: " + follow(zoneinfo), "Next-Icutz: " + follow(icutz),
                  "Next-Localtime: " + follow(zone),
                  "Next-Status: " + heard.back().substr(heard.back().rfind(' ') + 1)};
  for (const string& warning : report(heard.begin(), heard.end() - 1))
    lines.push_back("Next-Warning: " + warning);
  for (string& line : lines) {
    for (char& byte : line) byte = std::iscntrl(static_cast<unsigned char>(byte)) != 0 ? '?' : byte;
  }
  return lines;
}

}  // namespace

// What tzdata-boot makes of it, and tzdata-status forecasts where no call fails that nothing on the
// device makes fail.
TEST(start, each_case) {
  for (const auto& row : starts) {
    SCOPED_TRACE(row.name);
    lay_out(row.before);
    row.prepare();
    EXPECT_EQ(start(row.tracing), row.says + report{row.ends});
    const device changed = change(change({}, row.before), row.changes);
    EXPECT_EQ(look(), changed);

    lay_out(row.before);
    row.prepare();
    const report forecasted = forecast();
    const string forecasted_target = forecast_target();
    EXPECT_EQ(look(), change({}, row.before));
    const report heard = boot(row.tracing);
    EXPECT_EQ(heard, row.boot_says.value_or(row.says) + report{row.ends});
    EXPECT_EQ(look(), change(changed, row.mended));
    if (row.tracing.empty()) {
      EXPECT_EQ(forecasted, describe(heard));
      EXPECT_EQ(forecasted.front(),
                "Next-Zoneinfo: " + (forecasted_target == "none" ? "" : forecasted_target));
    }
  }
}

// Where parts of a device are another user's, the start has only the rights of the unit.
TEST(start, on_parts_of_another_user) {
  constexpr uid_t another = 1000;
  const std::array<std::pair<string, mode_t>, 10> closed = {{{second, 0700},
                                                             {second, 0705},
                                                             {second + "/icutz", 0744},
                                                             {second + "/icutz", 0711},
                                                             {second + "/zoneinfo/+VERSION", 0600},
                                                             {version, 0640},
                                                             {"/var/db/timezone", 0700},
                                                             {"/var/db/timezone", 0755},
                                                             {"/var/db/timezone", 0777},
                                                             {"/var/db/timezone", 01777}}};
  for (const auto& [path, mode] : closed) {
    for (const gid_t group : {0U, another}) {
      SCOPED_TRACE(path + " " + std::to_string(mode) + " " + std::to_string(group));
      lay_out(on_first + link_to(zone, "/usr/share/zoneinfo/Asia/Tokyo"));
      ASSERT_EQ(chmod(path.c_str(), mode), 0);
      // In a user namespace there may be no other users; that tests less, but holds as well.
      if (chown(path.c_str(), another, group) != 0 || lchown(zoneinfo.c_str(), another, group) != 0)
        std::puts("there are no other users here");
      const report forecasted = forecast();
      EXPECT_EQ(forecasted, describe(boot()));
    }
  }
}
