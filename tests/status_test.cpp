// What tzdata-status says beside its forecast: why, and what is not as it should be.
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <array>
#include <filesystem>

#include "starts.h"

namespace {

using namespace at;
using std::string;

struct question {
  entries before;
  report answer;  // the reasons and remarks; for an update, the verdict and its reasons
  string ends = "exit 1";
  string update{};
  std::function<void()> prepare = [] {};
};

// On a device that uses the first update, the update at `path` is refused.
question refuse(
    const string& path, const entries& changes, const report& reasons,
    const std::function<void()>& prepare = [] {}) {
  return {on_first + changes, report{"Verdict: refused"} + reasons, "exit 1", path, prepare};
}

report because(const string& reason) { return {"Because: " + reason}; }
report reason(const string& reason) { return {"Reason: " + reason}; }
report remark(const string& text) { return {"Remark: " + text}; }
report apart(const string& zoneinfo_target, const string& icutz_target) {
  return remark("after the next start, the zone files and the ICU data do not belong together: " +
                zoneinfo_target + " and " + icutz_target);
}
report reset(const string& zone_target) {
  return remark("the local-time link is " + zone_target + "; the next start makes it lead to " +
                zoneinfo + "/America/Los_Angeles");
}
report no_zone(const string& name) {
  return remark("after the next start, the local-time link leads to no zone file: " + zoneinfo +
                name);
}
report no_icu(const string& name, report (*as)(const string&) = reason) {
  return as("the update " + name +
            " has no ICU data file that counts; the system partition has schema 44l");
}
report waits(const string& path) {
  return because(path + " makes a start wait, or run out of memory");
}

const string newer = "the update 2020a.10.0 is fit, and newer than the current data set ";
const report waiting = because(newer + "2020a.9.0");
const report in_use = because("the update 2020a.10.0 is the current data set");
const report mended =
    remark("the zone files and the ICU data do not belong together now; the next start mends that");
const string large = "cannot be used: its version has a number beyond 32 bits";
const string third = updates + "2020b.1.0";

const std::vector<question> questions = {
    {on_first, {"Verdict: used", "Reason: " + newer + "2020a.9.0"}, "exit 0", second},
    {on_first + gone(second + "/zoneinfo"),
     {"Verdict: used", "Reason: " + newer + "2020a.9.0",
      "Reason: it has no " + second + "/zoneinfo/+VERSION, which a start does not ask for"},
     "exit 0",
     second},
    {on_first,
     {"Verdict: in-use", "Reason: it is in use already, and stays so",
      "Reason: the target of tz_latest must not end in a slash, as this path did"},
     "exit 0",
     first + "/"},

    {on_second + link_to(zoneinfo + ".boot", first + "/zoneinfo"),
     {"Verdict: used", "Reason: a boot goes back to it"},
     "exit 0",
     first},

    // Halves that do not belong together
    {on_second + file(icutz, ""), in_use + mended},
    {on_second + folder(icutz), in_use + apart(second + "/zoneinfo", "a directory"), "exit 0"},
    {on_system + gone(latest) + link_to(icutz, "/usr/share/icu"),
     because("there is no latest update") + apart(system_zoneinfo, "/usr/share/icu"), "exit 0"},
    {on_first + gone(icutz), waiting + mended},

    // Zones
    {on_second + link_to(zone, "/usr/share/zoneinfo/Europe/Berlin"),
     in_use + reset("/usr/share/zoneinfo/Europe/Berlin") + no_zone("/America/Los_Angeles")},
    {on_second + gone(zone), in_use + reset("missing") + no_zone("/America/Los_Angeles")},
    {on_second + link_to(zone, zoneinfo + "/Asia/Tokio"), in_use + no_zone("/Asia/Tokio"),
     "exit 0"},
    {on_second + link_to(zone, zoneinfo + ".old/Asia/Tokyo"),
     in_use +
         remark("the local-time link does not go through the zoneinfo link: " + zoneinfo +
                ".old/Asia/Tokyo") +
         no_zone(".old/Asia/Tokyo"),
     "exit 0"},

    // System partitions
    {on_system + gone(version) + gone(schema),
     because("the update 2020a.10.0 has schema 44l; the system partition has schema none") +
         remark("the system partition has no version that can be read: .1.0 counts as older than "
                "every update") +
         remark("the system partition has no schema: only an update without ICU data fits"),
     "exit 0"},
    {on_system + file(schema, "44L"),
     because("the update 2020a.10.0 has schema 44l; the system partition has schema 44L") +
         remark("44L is no schema, so no update fits the system partition"),
     "exit 0"},
    {on_system + file(version, "9999999999a"), because("the system partition " + large)},
    {on_second + file(schema, "45l"),
     because(
         "the current data set 2020a.10.0 has schema 44l; the system partition has schema 45l")},
    {on_second + file(version, "2020b"),
     because("the current data set 2020a.10.0 is older than the system partition 2020b.1.0")},

    // Links
    {on_first + link_to(latest, "tz/2020a.10.0"),
     because("the latest update cannot be used: tz/2020a.10.0 is not below " + updates)},
    {on_system + file(latest, ""),
     because("the latest update cannot be used: its link cannot be read"), "exit 0"},
    {on_first + link_to(latest, second + "/"),
     because(latest + " ends in a slash, which makes its name no version") +
         because("the update 2020a.10.0/ is older than the current data set 2020a.9.0"),
     "exit 0"},
    {on_first + link_to(zoneinfo, "tz/2020a.9.0/zoneinfo"),
     because("the zoneinfo link leads to no data set: tz/2020a.9.0/zoneinfo") +
         because(newer + "2019c.1.0") + mended},
    {on_first + link_to(zoneinfo, updates + "2147483648a/zoneinfo"),
     because("the current data set " + large) + mended},
    {on_first + folder(zoneinfo),
     because("a directory is in the place of " + zoneinfo) +
         because("the zoneinfo link leads to no data set: a directory") +
         because(newer + "2019c.1.0") + no_zone("/Asia/Tokyo")},
    {on_system + gone("/var/db/timezone"),
     because("there is no directory for " + zoneinfo) + because("there is no zoneinfo link") +
         because("there is no latest update") +
         remark("after the next start, the local-time link is missing")},
    {on_second + gone(zone) + file(zone + "/kept", ""),
     because("a directory is in the place of " + zone) + in_use +
         remark("after the next start, the local-time link is a directory")},
    {on_second + folder(second + "/zoneinfo/Asia/Tokio") + link_to(zone, zoneinfo + "/Asia/Tokio"),
     in_use + no_zone("/Asia/Tokio"), "exit 0"},
    {on_first + folder("/var/db/icu") + folder(marker),
     because(icutz + " cannot be removed") + waiting + apart(system_zoneinfo, "a file"), "exit 1",
     "",
     [] {
       std::filesystem::remove(icutz);
       mkfifo(icutz.c_str(), 0644);
       mount(icutz.c_str(), icutz.c_str(), "", MS_BIND, nullptr);
     }},

    {on_system + gone("/var/db/timezone") + folder("/usr/share/elsewhere") +
         link_to("/var/db/timezone", "/usr/share/elsewhere"),
     because("there is no zoneinfo link") + because("there is no latest update") +
         reset("missing") + no_zone("/America/Los_Angeles")},

    // What lies elsewhere
    {on_first + gone(second) + link_to(second, "/var/tmp"),
     no_icu("2020a.10.0", because) + because("/var/tmp/icutz lies where a boot may not read"),
     "exit 0", "", [] { std::filesystem::create_directory("/var/tmp/icutz"); }},
    {on_first + link_to(record, "/usr/share/record"),
     waiting + remark("/usr/share lies where a boot may not write")},

    // What makes a start wait
    {on_first + gone(second + "/zoneinfo"), waits(second + "/zoneinfo/+VERSION"), "exit 1", "",
     [] {
       std::filesystem::create_directory(second + "/zoneinfo");
       mkfifo((second + "/zoneinfo/+VERSION").c_str(), 0644);
     }},
    {on_first, waits(record), "exit 1", "", [] { mkfifo(record.c_str(), 0644); }},
    {on_first, waits(version), "exit 1", "",
     [] { std::filesystem::resize_file(version, 1U << 30U); }},
    {on_first + link_to(first + "/zoneinfo/+VERSION", "/dev/null"),
     waiting + remark("/dev/null lies where a boot may not read")},

    // Why an update is refused
    refuse(first + ".0", update(first + ".0"),
           reason("the update 2020a.9.0.0 has a name that is no version") +
               reason("the update 2020a.9.0.0 is older than the current data set 2020a.9.0")),
    refuse(updates + "2018b.1.0", file(updates + "2018b.1.0/icutz/icutz45l.dat", ""),
           reason("the update 2018b.1.0 has schema 45l; the system partition has schema 44l") +
               reason("the update 2018b.1.0 is older than the current data set 2020a.9.0")),
    refuse(updates + "02020a.9.0", update(updates + "02020a.9.0"),
           reason("the update 02020a.9.0 is not newer than the current data set 2020a.9.0")),
    refuse(first, file(version, "2020b"),
           reason("the current data set 2020a.9.0 is older than the system partition 2020b.1.0")),
    refuse(updates + "missing", {}, reason("there is no directory " + updates + "missing")),
    refuse(third, folder(third),
           no_icu("2020b.1.0") + reason("there is no directory " + third + "/icutz")),
    refuse(third,
           link_to(third + "/icutz/icutz44l.dat", "x") + folder(third + "/icutz/icutz45l.dat"),
           no_icu("2020b.1.0") + reason("icutz45l.dat is no file") +
               reason("icutz44l.dat is a symbolic link")),
    refuse(third, update(third), no_icu("2020b.1.0") + reason("icutz44l.dat is closed to others"),
           [] { chmod((third + "/icutz/icutz44l.dat").c_str(), 0640); }),
    refuse(third, update(third),
           no_icu("2020b.1.0") + reason(third + " is closed to a start (owner: user 0, mode 0)"),
           [] { chmod(third.c_str(), 0); }),
    refuse(updates + "2147483648a", update(updates + "2147483648a"),
           reason("the latest update " + large)),
    refuse("/usr/share/icu", {},
           reason("the latest update cannot be used: /usr/share/icu is not below " + updates)),
    refuse("/usr/share", system_links,
           reason("the latest update cannot be used: /usr/share is not below " + updates)),
    refuse(second, {}, reason(record + " makes a start wait, or run out of memory"),
           [] { mkfifo(record.c_str(), 0644); }),
    refuse(second + string(1024, '0'), {}, reason("a start cannot read that path from tz_latest")),
    refuse(first, gone("/var/db/timezone"),
           reason("there is no directory for " + zoneinfo) +
               reason("a start cannot read that path from tz_latest")),
};

// Where programs look for the local time. It goes with the private root.
void link_system_localtime(const string& target) {
  ASSERT_EQ(mount("tmpfs", "/etc", "tmpfs", 0, nullptr), 0);
  std::filesystem::create_symlink(target, "/etc/localtime");
}

TEST(status, says_why) {
  link_system_localtime(zone);
  for (const auto& row : questions) {
    SCOPED_TRACE(row.answer.back());
    lay_out(row.before);
    row.prepare();
    const bool is_judged = !row.update.empty();
    report lines;
    for (const string& line : ask(is_judged ? report{"--query", row.update} : report{"--query"})) {
      const string key = line.substr(0, line.find(':'));
      if (is_judged ? key == "Verdict" || key == "Reason" : key == "Because" || key == "Remark")
        lines.push_back(line);
      if (line.starts_with("exit ")) lines.push_back(line);
    }
    EXPECT_EQ(lines, row.answer + report{row.ends});
  }
}

TEST(status, reports_to_people) {
  const string refused = updates + "2020c.1.0";
  lay_out(on_second + link_to(latest, refused) + folder(refused) + file(version, "2020b\x1b") +
          link_to(updates + "part", "nowhere") + link_to("/usr/share/localtime", zone));
  link_system_localtime("../usr/share/localtime");
  EXPECT_EQ(
      ask({}),
      (report{"system      2020b?.1.0, schema 44l",
              "current     2020a.10.0, schema 44l",
              "latest      2020c.1.0, schema none",
              "zoneinfo    " + second + "/zoneinfo",
              "icutz       " + second + "/icutz",
              "localtime   " + zoneinfo + "/Asia/Tokyo",
              "next start  keeps 2020a.10.0: " + second + "/zoneinfo",
              "because     the update 2020c.1.0 has no ICU data file that counts; the system",
              "            partition has schema 44l",
              "            there is no directory /var/db/timezone/tz/2020c.1.0/icutz",
              "will warn   Cannot parse version string 2020b?.1.0, results.size() = 0",
              "            Cannot parse version string 2020b?.1.0",
              "            No ICU schema found for /var/db/timezone/tz/2020c.1.0",
              "            New update not compatible or older version: 2020c.1.0 vs. 2020a.10.0",
              "remarks     the system partition has no version that can be read: 2020b?.1.0",
              "            counts as older than every update",
              "updates     2020a.9.0 unused",
              "            2020a.10.0 current",
              "            2020c.1.0 refused: the update 2020c.1.0 has no ICU data file that",
              "            counts; the system partition has schema 44l",
              "exit 0"}));
  EXPECT_EQ(ask({refused}).front(), "refused     " + refused);
  EXPECT_EQ(ask({"--root=" + first}).at(6), "next start  fails: none");
  lay_out(on_first + gone(latest) + file(version, "2020b"));
  EXPECT_EQ(ask({}).at(6), "next start  falls back to the system partition: " + system_zoneinfo);
  lay_out(on_second + gone(latest) + link_to(zoneinfo + ".boot", first + "/zoneinfo"));
  EXPECT_EQ(ask({}).at(6), "next start  goes back to 2020a.9.0: " + first + "/zoneinfo");
  EXPECT_EQ(ask({}).at(7), "because     the zoneinfo link is first pointed back at");
  // Wherever a name of one word ends.
  lay_out(on_first + link_to(latest, updates + string(100, 'x')));
  EXPECT_EQ(ask({}).at(9), "            " + updates + string(100, 'x'));
}

TEST(status, answers_scripts) {
  lay_out(on_second + gone(latest) + gone(second + "/icutz") + gone(icutz) +
          link_to(second + "/icutz", first + "/icutz") + link_to(legacy_icutz, "/usr/share/icu") +
          link_to(updates + "2018a", "2020a.10.0") + update(updates + "2020a.1"));
  link_system_localtime("/x");
  const report misled = remark("/etc/localtime does not lead through the local-time link: /x");
  EXPECT_EQ(ask({"--query"}), (report{"Zoneinfo: " + second + "/zoneinfo",
                                      "Icutz: ",
                                      "Localtime: " + zoneinfo + "/Asia/Tokyo",
                                      "System-Version: 2019c.1.0",
                                      "System-Schema: 44l",
                                      "Current-Version: 2020a.10.0",
                                      "Current-Schema: 44l",
                                      "Latest-Version: ",
                                      "Latest-Schema: ",
                                      "Next-Zoneinfo: " + second + "/zoneinfo",
                                      "Next-Icutz: " + second + "/icutz",
                                      "Next-Localtime: " + zoneinfo + "/Asia/Tokyo",
                                      "Next-Status: 0",
                                      "Next-Warning: Correcting ICU link to " + second + "/icutz",
                                      "Because: there is no latest update",
                                      mended.front(),
                                      misled.front(),
                                      "Update: 2018a current",
                                      "Update: 2020a.1 unused",
                                      "Update: 2020a.9.0 current",
                                      "Update: 2020a.10.0 current",
                                      "exit 1"}));
}

TEST(status, is_asked_wrongly_or_cannot_tell) {
  lay_out(on_first);
  const string usage = "usage: tzdata-status [--query] [--root=DIRECTORY] [UPDATE]";
  EXPECT_EQ(ask({"--help"}).front(), usage);
  EXPECT_EQ(ask({"--help"}).back(), "exit 0");
  EXPECT_EQ(ask({"--version"}).back(), "exit 0");
  for (const report& wrong : {report{"one", "two"}, report{""}, report{"/"}})
    EXPECT_EQ(ask(wrong), (report{usage, "exit 2"}));
  for (const report& wrong : {report{"--root=" + second + "/x"}, report{"-x"}})
    EXPECT_EQ(ask(wrong).back(), "exit 2");
  // What an ordinary user may not look at, or read, although the unit may.
  const std::array<string, 3> rows[] = {
      {"look at", "statx", "/usr/share/icu"},     {"look at", "statx", zone + ".boot"},
      {"look at", "statx", second + "/zoneinfo"}, {"read", "openat", version},
      {"read", "openat", first + "/icutz"},       {"read", "openat", "/var/db/icu"},
  };
  // Another has a lease on it.
  EXPECT_EQ(ask({}, {"-P", version, "-e", "inject=openat:error=EAGAIN"}).at(6),
            "next start  never ends: " + first + "/zoneinfo");
  for (const auto& [what, call, path] : rows) {
    lay_out(on_first + folder("/var/db/icu"));
    EXPECT_EQ(
        ask({}, {"-P", path, "-e", "inject=" + call + ":error=EACCES"}),
        (report{"tzdata-status: cannot be told: you may not " + what + " " + path, "exit 2"}));
  }
}

}  // namespace
