// What tzdata-check says of a small data set, and of what damages do to it.
#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>

#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <new>
#include <sstream>
#include <stdexcept>

#include "check/canary.h"
#include "check/icu_file.h"
#include "check/olm_zone_file.h"
#include "device.h"

namespace {

namespace files = std::filesystem;
using std::string;

const string sound = "/var/tmp/sound";
const string damaged = "/var/tmp/damaged";
const string summer = "/zoneinfo/Test/Summer";
const string darwin = "/zoneinfo/Australia/Darwin";

string read(const string& path) {
  return (std::ostringstream() << std::ifstream(path, std::ios::binary).rdbuf()).str();
}

void run(const string& command) {
  const report said = hear({"sh", "-c", command});
  EXPECT_EQ(said.back(), "exit 0") << command << said.front();
}

report check(const report& arguments) { return hear(report{PROGRAMS "/tzdata-check"} + arguments); }

// The command that makes ICU's zones anew, edited by sed, in the working directory.
string make_icu(const string& edit) {
  return "sed '" + edit +
         "' " DATA_SET "/zoneinfo64.txt >zoneinfo64.txt; genrb -q -d icutz zoneinfo64.txt";
}

class check_test : public testing::Test {
 protected:
  void SetUp() override {
    const string source = DATA_SET;
    run("umask 022; mkdir -p " + sound + "/icutz && cd " + sound +
        " && PATH=$PATH:/usr/sbin zic -b fat -d zoneinfo " + source +
        "/zones && genrb -q -d icutz " + source +
        "/*.txt && echo 2098a >zoneinfo/+VERSION && touch icutz/icutz44l.dat && "
        "rm zoneinfo/Test/Same && ln -s ../Australia/Darwin zoneinfo/Test/Same");
  }
};

// Damages to the data set in the working directory, by a shell's command, and what is said of them.
struct damage {
  string command;
  report reasons;
  report arguments = {damaged};
};

TEST_F(check_test, tells_damage) {
  const string early =
      "sed '2s/.*/Rule S 1980 1985 - Mar lastSun 2:00u 1:00 S\\n"
      "Rule S 1986 max - Mar lastSun 1:00u 1:00 S/' " DATA_SET "/zones";
  const string compile = " | (cd zoneinfo && PATH=$PATH:/usr/sbin zic -b ";
  const std::vector<damage> rows = {
      {"true", {}},
      {"true", {}, {damaged + "/zoneinfo", damaged + "/icutz"}},
      {"true", {}, {"--replaces=" + sound, "--since=1800", damaged}},
      {"true", {}, {"--replaces=" + sound + "/zoneinfo", damaged}},
      // What may be there, too.
      {"cd zoneinfo; mkdir posix; cp Test/Summer posixrules; ln posixrules Factory; "
       "ln -s /etc/localtime localtime; echo x >zone.tab; ln -s .. Test/up; ln -s ../Test "
       "posix/Test",
       {}},
      {"cd zoneinfo; mkdir right; echo 'Leap 2016 Dec 31 23:59:60 + S' >../leaps; "
       "PATH=$PATH:/usr/sbin zic -b fat -L ../leaps -d right " DATA_SET "/zones",
       {}},
      {"cat " DATA_SET "/zones" + compile + "slim -d x - && mv x/Test/Summer Test && rm -r x)", {}},
      // Damaged zone files.
      {"truncate -s 300 zoneinfo/Test/Summer; echo x >zoneinfo/Test/Same",
       {"Australia/Darwin is no zone file", "Test/Same is no zone file",
        "Test/Summer is 300 bytes long and says that it has 662 or more"}},
      {"truncate -s 20M zoneinfo/Test/Summer",
       {"Test/Summer is 20971520 bytes long, which is too much"}},
      {": >zoneinfo/+VERSION; rm zoneinfo/Test/Same",
       {"+VERSION is missing, or empty", "Test/Same: ICU has such a zone, the zone files do not"}},
      {"rm -r zoneinfo", {"there are no zone files", "+VERSION is missing, or empty"}},
      {"mkfifo pipe; cp zoneinfo/Test/Same zoneinfo/Test/Old",
       {"Test/Old is missing, which " + damaged + " has"},
       {"--replaces", damaged, sound}},
      {"cd zoneinfo; cp Test/Same Test/New; rm Test/Winter",
       {"Test/Winter is missing, which " + sound + " has",
        "Test/New: the zone files have such a zone, ICU does not",
        "Test/Winter: ICU has such a zone, the zone files do not"},
       {"--replaces", sound, damaged}},
      // Both halves are whole, and differ.
      {"cp zoneinfo/Australia/Darwin zoneinfo/Test/Summer",
       {"Test/Summer: from 1970-01-01 the zone files have +09:00, ICU's +01:00"}},
      {"cp zoneinfo/Test/Summer zoneinfo/Australia/Darwin",
       {"ACT: from 1970-01-01 the zone files of Australia/Darwin have +01:00, ICU's +09:00",
        "Australia/Darwin: from 1970-01-01 the zone files have +01:00, ICU's +09:00",
        "Test/Same: from 1970-01-01 the zone files have +01:00, ICU's +09:00"}},
      {early + compile + "fat -d . -)",
       {"Test/Summer: from 1980-03-30 the zone files have +01:00, ICU's +02:00"}},
      {early + compile + "fat -d . -)", {}, {"--since=1986", damaged}},
      {"sed 's/ 9:30 - TWO/ 9:30 0 TWO 2100\\n 9:30:20 - TWO/' " DATA_SET "/zones" + compile +
           "fat -d . -)",
       {"ACT: from 2100-01-01 the zone files of Australia/Darwin have +09:30:20, ICU's +09:30",
        "Australia/Darwin: from 2100-01-01 the zone files have +09:30:20, ICU's +09:30",
        "Test/Same: from 2100-01-01 the zone files have +09:30:20, ICU's +09:30"}},
      {"sed 's/ 9:00 - ONE/ 8:00 1:00 ONE/' " DATA_SET "/zones" + compile + "fat -d . -)",
       {"ACT: from 1970-01-01 the zone files of Australia/Darwin have daylight saving time, ICU's "
        "do not",
        "Australia/Darwin: from 1970-01-01 the zone files have daylight saving time, ICU's do not",
        "Test/Same: from 1970-01-01 the zone files have daylight saving time, ICU's do not"}},
      {"echo 'Leap 2016 Dec 31 23:59:60 + S' >leaps; grep -A3 Winter " DATA_SET
       "/zones; cat " DATA_SET "/zones" +
           compile + "fat -L ../leaps -d x - && mv x/Test/Summer Test; rm -r x)",
       {"Test/Summer: the zone files count leap seconds, which ICU does not"}},
      {"echo 2097b >zoneinfo/+VERSION",
       {"the zone files say that they are 2097b, ICU's that they are 2098a"}},
      {make_icu("s/-18000, 3600/-18000, 1800/"),
       {"SystemV/EST5EDT: from 1970-04-26 its rules have -04:00, ICU's -04:30"}},
      {make_icu("s/126687600/126687601/"),
       {"SystemV/EST5EDT: from 1974-01-06 its rules have -04:00, ICU's -05:00"}},
      {make_icu(R"(s/\(Regions { "\)AU/\1A1/)"), {"ACT: ICU has no region for it"}},
      {make_icu("s/links:intvector { 0, 1, 4/links:intvector { 0, 1, 5/"),
       {"ACT: ICU takes it for an equal of Test/Summer",
        "Australia/Darwin: ICU takes it for an equal of Test/Summer",
        "Test/Same: ICU takes it for an equal of Test/Summer"}},
      // ICU's files, damaged.
      {"rm icutz/metaZones.res; echo >icutz/windowsZones.res; : >icutz/zoneinfo64.res",
       {"zoneinfo64.res is no file of ICU's resources",
        "windowsZones.res is no file of ICU's resources", "metaZones.res is missing"}},
      {"truncate -s 1000 icutz/zoneinfo64.res",
       {"zoneinfo64.res is 1000 bytes long and says that it has 1016"}},
      {make_icu("s/Names/Namen/"), {"ICU: no list of zones: U_MISSING_RESOURCE_ERROR"}},
      {"mv icutz/icutz44l.dat icutz/icutz44.dat", {"icutz44.dat has a name that is no schema"}},
      {"rm icutz/icutz44l.dat", {"there is no ICU data file, such as icutz44l.dat"}},
      {"rm icutz/icutz44l.dat", {}, {damaged + "/zoneinfo", damaged + "/icutz"}},
      {"touch icutz/icutz45l.dat", {"there is more than one ICU data file"}},
      // What is there, and who may read it.
      {"chmod o-r icutz/icutz44l.dat zoneinfo/Test/Summer; chmod o-x icutz",
       {"icutz may not be listed by everybody", "zoneinfo/Test/Summer may not be read by everybody",
        "icutz/icutz44l.dat may not be read by everybody"}},
      {"mkfifo pipe; ln -s nowhere zoneinfo/Test/link; ln -s /etc other; ln -s pipe twice",
       {"other is a link that leads elsewhere", "pipe is no file, directory or link",
        "zoneinfo/Test/link is a link that leads nowhere"}},
      {"mkdir -p a b; for i in 1 2 3 4 5 6 7 8 9; do mkdir $i; for j in 0 1 2 3; do "
       "ln -s ../$((i + 1)) $i/$j; done; done; mkdir 10; ln -s 1 a/up",
       {"a/up is a link that leads nowhere", "there are too many files"}},
      {"mkdir 'a\nb:c'; cp -R icutz zoneinfo 'a\nb:c'", {}, {damaged + "/a\nb:c"}},
      {"mkdir store; mv icutz/zoneinfo64.res store; ln -s ../store/zoneinfo64.res icutz; mkdir a "
       "b; "
       "ln -s ../b a; ln -s ../a b",
       {}},
  };
  for (const auto& [command, reasons, arguments] : rows) {
    files::remove_all(damaged);
    files::copy(sound, damaged,
                files::copy_options::recursive | files::copy_options::copy_symlinks);
    run("cd " + damaged + "; " + command);
    const string end = reasons.empty() ? "exit 0" : "exit 1";
    report said = check(arguments);
    EXPECT_EQ(said, reasons + report{end}) << command;
  }
}

TEST_F(check_test, cannot_always_be_told) {
  const std::vector<std::pair<report, string>> rows = {
      {{}, "usage: "},
      {{"a", "b", "c"}, "usage: "},
      {{"--nothing"}, PROGRAMS "/tzdata-check: unrecognized option"},
      {{"--since=MMXX", sound}, "tzdata-check: --since=MMXX: no year from 1 to 2100"},
      {{"--since=2101", sound}, "tzdata-check: --since=2101: no year from 1 to 2100"},
      {{"/var/tmp/nothing"}, "tzdata-check: cannot be told: "},
      {{sound + "/zoneinfo", "/var/tmp/nothing"}, "tzdata-check: cannot be told: "},
      {{"--replaces=/var/tmp/nothing", sound}, "tzdata-check: cannot be told: "},
      {{"--replaces=", sound}, "usage: "},
      {{"--replaces=" + sound + "/zoneinfo/posix", sound}, "tzdata-check: cannot be told: "}};
  for (const auto& [arguments, beginning] : rows) {
    const report said = check(arguments);
    EXPECT_TRUE(said.front().starts_with(beginning)) << said.front();
    EXPECT_EQ(said.back(), "exit 2") << said.front();
  }
  EXPECT_EQ(check({"--help"}).back(), "exit 0");
  EXPECT_EQ(check({"--version"}).back(), "exit 0");
  EXPECT_EQ(hear({"sh", "-c", PROGRAMS "/tzdata-check --help >/dev/full"}).back(), "exit 2");
}

// What a machine refuses, and what takes long, by faults in calls.
TEST_F(check_test, notices_faults) {
  const auto trace = [](const string& fault) {
    return report{"strace", "-o", "/dev/null", "-E", "ASAN_OPTIONS=detect_leaks=0", "-e", fault};
  };
  const string zones = sound + "/zoneinfo/Test";
  const auto untold = [](const string& reason) {
    return report{"tzdata-check: cannot be told: " + reason, "exit 2"};
  };
  const std::vector<std::pair<report, report>> rows = {
      {{"inject=clone,clone3,fork:error=EAGAIN"}, untold("fork: Resource temporarily unavailable")},
      {{"inject=wait4:error=ECHILD"}, untold("waitpid: No child processes")},
      {{"inject=chdir:error=EIO", "-f"}, untold(sound + "/icutz: Input/output error")},
      {{"inject=openat:error=EIO", "-P", zones},
       untold("filesystem error: cannot be listed: Input/output error [" + zones + "]")},
      {{"inject=openat:error=EIO", "-P", sound + summer},
       untold(sound + summer + " cannot be read: Input/output error")},
      // ICU takes its own instead.
      {{"inject=openat:error=ENOENT", "-f", "-P", "./metaZones.res"},
       {"metaZones.res: ICU cannot read it", "exit 1"}}};
  for (const auto& [fault, said] : rows) {
    const report options(fault.begin() + 1, fault.end());
    EXPECT_EQ(hear(trace(fault.front()) + options + report{PROGRAMS "/tzdata-check", sound}), said);
  }
  string slow = "exec";
  for (const string& word : trace("inject=clone,clone3,fork:delay_enter=1100000"))
    slow += " " + word;
  slow += " " PROGRAMS "/tzdata-check " + sound;
  const report shown = hear({"script", "-qec", slow, "/dev/null"});
  EXPECT_NE(shown.front().find("\rchecking zoneinfo64.res "), string::npos) << shown.front();
  EXPECT_EQ(shown.back(), "exit 0");
}

#ifdef __SANITIZE_ADDRESS__
constexpr bool has_memory_bound = false;
#else
constexpr bool has_memory_bound = true;
#endif

// In the child.
void require_bounds() {
  itimerval time{};
  rlimit memory{};
  int signal = 0;
  if (getitimer(ITIMER_PROF, &time) != 0 || time.it_value.tv_sec == 0 ||
      getrlimit(RLIMIT_AS, &memory) != 0 ||
      (has_memory_bound && memory.rlim_cur == RLIM_INFINITY) ||
      prctl(PR_GET_PDEATHSIG, &signal) != 0 || signal != SIGKILL)
    throw std::runtime_error("no bounds");
}

// Whatever becomes of the library that reads the files, it is told in a line.
TEST(canary, is_looked_after) {
  const std::vector<std::pair<std::function<void()>, report>> rows = {
      {[] {}, {}},
      {[] { std::abort(); }, {"ICU crashes (Aborted) at a zone"}},
      {[] { static_cast<void>(raise(SIGSEGV)); }, {"ICU crashes (Segmentation fault) at a zone"}},
      {[] { std::_Exit(0); }, {"ICU crashes (Aborted) at a zone"}},
      {[] { static_cast<void>(raise(SIGPROF)); }, {"ICU takes more than 10 seconds at a zone"}},
      {[] { throw std::bad_alloc(); }, {"ICU takes too much memory for it"}},
      {require_bounds, {}},
      {[] { throw std::runtime_error("no library"); }, {"thrown: no library"}}};
  for (const auto& row : rows) {
    report heard;
    try {
      run_canary(
          [&](const canary_report& report) {
            report.begin_step("a zone");
            row.first();
          },
          {[&](const string& reason) { heard.push_back(reason); }, [](const string& /*step*/) {}});
    } catch (const std::runtime_error& failure) {
      heard.push_back(string("thrown: ") + failure.what());
    }
    EXPECT_EQ(heard, row.second);
  }
}

template <typename function>
string find_damage(const function& check) {
  try {
    check();
  } catch (const std::invalid_argument& damage) {
    return damage.what();
  }
  return "";
}

TEST_F(check_test, refuses_every_cut) {
  for (const string& name : {summer, darwin}) {
    const string whole = read(sound + name);
    for (std::size_t length = 0; length < whole.size(); ++length)
      EXPECT_NE(find_damage([&] { olm_zone_file(whole.substr(0, length)); }), "") << length;
  }
  const string whole = read(sound + "/icutz/timezoneTypes.res");
  for (std::size_t length = 0; length < whole.size(); ++length)
    EXPECT_NE(find_damage([&] { check_icu_file(whole.substr(0, length)); }), "") << length;
  // As it comes out of a package.
  EXPECT_EQ(find_damage([&] { check_icu_file(read(sound + "/icutz/windowsZones.res") + "4444"); }),
            "");
}

struct changed_bytes {
  string whole;
  std::size_t offset;
  string bytes;
  string damage;
};

void expect_damage(const std::vector<changed_bytes>& rows,
                   const std::function<void(const string&)>& check) {
  for (const changed_bytes& row : rows) {
    string data = row.whole;
    data.replace(row.offset, row.bytes.size(), row.bytes);
    EXPECT_EQ(find_damage([&] { check(data); }), row.damage) << row.offset;
  }
}

TEST_F(check_test, finds_what_is_wrong_in_a_zone_file) {
  const string plain = read(sound + darwin);
  const string yearly = read(sound + summer);
  const std::vector<changed_bytes> rows = {
      {plain, 4, "5", "is of a version of the format that is not known"},
      {plain, 4, string(1, 0), "is 152 bytes long and says that it has 69"},
      {plain, 39, string(1, 0), "has numbers in its header that do not fit"},
      {plain, 73, "3", "has no table with 64 bits"},
      {plain, 38, "\xff", "is 152 bytes long and says that it has 391749 or more"},
      {plain, 121, "\2", "has a change to a time that it does not have"},
      {plain, 113, "\x1", "has changes in a far future"},
      {plain, 122, string("\0\1\x6d\xa0", 4), "has a time more than a day from UTC"},
      {plain, 126, "\2", "has a time that may or may not be daylight saving time"},
      {plain, 127, "\x8", "has a time without a name"},
      {plain, 134, "\1", "has a name that nobody can read"},
      {plain, 134, "U", "has two tables that differ"},
      {plain, 141, "X", "has a name without an end"},
      {plain, 143, "1", "has no rule in the line at its end"},
      {plain, 143, "O", "has a rule at its end that does not go on from the last change"},
      {plain, 147, "8", "has a rule at its end that does not go on from the last change"},
      {plain, 151, "X", "has no line at its end"},
      {plain, 152, "X", "goes on after the line at its end"},
      {plain, 44, "\x7f", "has two tables that differ"},
      {yearly, 657, string(1, 0), "has marks of how its changes were written that do not fit"},
      {yearly, 657, "\2", "has marks of how its changes were written that do not fit"},
      {yearly, 709, "\x7f", "has changes out of order"},
      {yearly, 1800, "D", "has a name in the rule at its end that is not in its table"}};
  expect_damage(rows, [](const string& data) { const olm_zone_file file(data); });
}

TEST_F(check_test, finds_what_is_wrong_in_a_file_of_icu) {
  const string one = read(sound + "/icutz/windowsZones.res");
  const string two = read(sound + "/icutz/metaZones.res");
  const std::size_t text = one.find(string("T\0e\0s\0t", 7));
  const std::vector<changed_bytes> rows = {
      {one, 8, "\1", "is for machines of another kind"},
      {one, 16, "\1", "is of a version of the format that is not known"},
      {one, 32, "\xff", "has parts that lie beyond its end"},
      {one, 35, "\xff", "has a resource of no known kind"},
      {one, 36, "\6", "is no file of ICU's resources"},
      {one, 56, "\5", "has names in another file"},
      {one, text, "\5\xdc", "has a text without an end"},
      {one, text, "\xff\xdf", "has parts that lie beyond its end"},
      {one, text, "\xf0\xdf", "has parts that lie beyond its end"},
      {one, one.size() - 1, "\xf0", "has a resource of no known kind"},
      {one, one.size() - 1, "\x10", "has parts that lie beyond its end"},
      {one, one.size() - 6, "\xff", "has a name without an end"},
      {two, two.find("mapTimezones"), "z", "has a table that is out of order"}};
  expect_damage(rows, [](const string& data) { check_icu_file(data); });
}

TEST(zone_rule, says_what_the_clocks_show) {
  constexpr instant january_2023 = 1672531200;
  constexpr instant day = 86400;
  struct row {
    string rule;
    instant when;
    std::int32_t offset;
  };
  const std::vector<row> rows = {
      {"<+0545>-5:45", january_2023, 20700},
      {"EST5EDT,M3.2.0,M11.1.0", january_2023, -18000},
      {"EST5EDT,M3.2.0,M11.1.0", january_2023 + 70 * day + 25199, -18000},
      {"EST5EDT,M3.2.0,M11.1.0", january_2023 + 70 * day + 25200, -14400},
      {"EST5EDT,M3.2.0,M11.1.0", january_2023 + 308 * day + 21600, -18000},
      // The half of the year that the new year is in.
      {"AEST-10AEDT,M10.1.0,M4.1.0/3", january_2023, 39600},
      // For ever.
      {"XXX3EDT4,0/0,J365/23", january_2023, -14400},
      {"XXX3EDT4,0/0,J365/23", january_2023 + 365 * day + 14399, -14400},
      // More than a day after Thursday.
      {"IST-2IDT,M3.4.4/26,M10.5.0", january_2023 + 82 * day - 1, 7200},
      {"IST-2IDT,M3.4.4/26,M10.5.0", january_2023 + 82 * day, 10800},
      // The first of March, in a common year and a leap year.
      {"AAA0BBB,J60/0,J61/0", january_2023 + 59 * day, 3600},
      {"AAA0BBB,J60/0,J61/0", january_2023 + (365 + 59) * day, 0},
      {"AAA0BBB,J60/0,J61/0", january_2023 + (365 + 60) * day, 3600},
      {"AAA0BBB,59/0,60/0", january_2023 + (365 + 59) * day, 3600}};
  for (const auto& [rule, when, offset] : rows)
    EXPECT_EQ(olm_zone_rule(rule).find(when).offset, offset) << rule << ' ' << when;
  for (const char* const text : {"",
                                 "CE-1",
                                 "CET",
                                 "CET-25",
                                 "CET-1:60",
                                 "CET-1x",
                                 "<CET-1",
                                 "<+1>-1",
                                 "C1T-1",
                                 "CET-1CEST",
                                 "CET-1CEST,M3.5.0",
                                 "CET-1CEST,M0.5.0,M10.5.0",
                                 "CET-1CEST,M13.5.0,M10.5.0",
                                 "CET-1CEST,M3.6.0,M10.5.0",
                                 "CET-1CEST,M3.0.0,M10.5.0",
                                 "CET-1CEST,M3.5.7,M10.5.0",
                                 "CET-1CEST,M3.5,M10.5.0",
                                 "CET-1CEST,M3,M10.5.0",
                                 "CET-1CEST,J0,J5",
                                 "CET-1CEST,366,J5",
                                 "CET-1CEST,J1/168,J5",
                                 "CET-1CEST,J1/-168,J5",
                                 "CET-1CEST,J1,J5,"})
    EXPECT_NE(find_damage([&] { const olm_zone_rule rule(text); }), "") << text;
}

}  // namespace
