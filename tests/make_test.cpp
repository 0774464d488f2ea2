// Updates that tzdata-make-update makes of small releases.
#include <gtest/gtest.h>
#include <unicode/timezone.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <fstream>
#include <memory>
#include <optional>
#include <sstream>

#include "check/icu_bundle.h"
#include "check/icu_zones.h"
#include "check/olm_zone_file.h"
#include "device.h"

namespace {

using std::string;

const string place = "/var/tmp/";
const string made = place + "made/";

void run(const string& command) {
  const report said = hear({"sh", "-c", "cd " + place + "; " + command});
  EXPECT_EQ(said.back(), "exit 0") << command << said.front();
}

// Makes an update in an empty directory. Gives the last thing that is said, and the exit status.
string make(const report& arguments) {
  run("rm -rf made && mkdir made");
  const report said = hear(report{PROGRAMS "/tzdata-make-update", "--output=" + made} + arguments);
  return said.at(said.size() - 2) + ", " + said.back();
}

string tell_success(const string& version) {
  return "tzdata-make-update: " + made + " has " + version + ".tar and " + version +
         ".sha256, exit 0";
}

olm_zone_file read_zone(const string& name) {
  std::ifstream file(made + "zoneinfo/" + name, std::ios::binary);
  return olm_zone_file((std::ostringstream() << file.rdbuf()).str());
}

// How a zone's clocks change, and where they differ from what a zone file tells of them.
struct zone_row {
  string name;
  string source;
  bool is_cut = false;  // ICU has no such rule
  // What ICU takes for daylight saving time in January and July of 2030, if not what the file does.
  std::optional<std::pair<bool, bool>> dst = {};
};

const std::vector<zone_row> zones = {
    {"Long_Ago",
     "-15:56:08 - LMT 1844 Dec 31\n8:03:52 - LMT 1899 Sep 6 4u\n8 1 PST 1950 F 3\n8 - PST"},
    {"Fixed", "0 - UTC"},
    {"Always_Daylight", "3 - MSK 1990\n3 1 MSD"},
    {"Daylight_For_Ever", "1 A STD/DST\nR A 2020 o - Mar 31 2 1 S"},
    {"Far_Changes", "2 A STD/DST\nR A 2020 2090 - Apr Su>=1 0 1 S\nR A 2020 2090 - O 3 0 0 -"},
    {"Ends_At_24", "2 A STD/DST\nR A 2023 ma - Apr lastF 0 1 S\nR A 2023 ma - O lastTh 24 0 -"},
    {"Far_From_Its_Day",
     "2 A STD/DST\nR A 2023 ma - Mar Sa<=30 2 1 S\nR A 2023 ma - O Sa<=30 2 0 -"},
    {"Across_Months", "2 A STD/DST\nR A 2023 ma - Mar lastSa 2 1 S\nR A 2023 ma - O lastTh 50 0 -",
     true},
    {"Before_Midnight",
     "-2 A STD/DST\nR A 2023 ma - Mar lastSu -1 1 S\nR A 2023 ma - O lastSu -1 0 -"},
    {"Dates", "3:30 A STD/DST\nR A 2020 ma - Mar 22 0 1 S\nR A 2020 ma - S 22 0 0 -"},
    {"Month_Ends", "1 A STD/DST\nR A 2020 ma - Mar 31 24 1 S\nR A 2020 ma - O 1 -1 0 -"},
    {"South", "12:45 A STD/DST\nR A 2020 ma - Apr Su>=1 3 0 -\nR A 2020 ma - S lastSu 2:45s 1 S"},
    {"February",
     "5:30:20 A STD/DST\nR A 2020 ma - F lastSu 25 0:30 S\nR A 2020 ma - N Su>=1 2 0 -"},
    {"Before_February_Ends",
     "1 A STD/DST\nR A 2020 ma - F lastSu -25 1 S\nR A 2020 ma - N Su>=1 2 0 -", true},
    {"Year_Ends", "1 A STD/DST\nR A 2020 ma - D lastSu 2 1 S\nR A 2020 ma - Ja Su>=8 2 0 -"},
    {"Across_Years",
     "5:45:17 A STD/DST\nR A 1995 ma - D lastF 26:30 1 S\nR A 1995 ma - N Su>=8 14 0 -", true},
    {"One_Month", "1 A STD/DST\nR A 2020 ma - Mar Su>=1 2 1 S\nR A 2020 ma - Mar Su>=15 2 0 -"},
    {"One_Month_Without",
     "1 A STD/DST\nR A 2020 ma - Mar Su>=1 2 0 -\nR A 2020 ma - Mar Su>=15 2 1 S", true},
    {"Double", "-5 A STD/DST\nR A 2020 ma - Apr Su>=1 0 2 S\nR A 2020 ma - S Su>=1 0 0 -"},
    {"Rule_From_The_First",
     "0 - -00 2005 F 12\n0 A STD/DST\nR A 2004 ma - Mar lastSu 1u 2 S\nR A 2004 ma - O lastSu 1u 0 "
     "-"},
    {"Another_Time_Before",
     "1 - STD 2019 D 20\n2 A STD/DST\nR A 2020 ma - Mar lastSu 1u 1 S\nR A 2020 ma - O lastSu 1u 0 "
     "-"},
    {"Set_Back", "1 A STD/DST\nR A 2020 ma - O lastSu 1u -1 S\nR A 2020 ma - Mar lastSu 1u 0 -",
     false, std::pair(false, true)},
    {"Set_Back_In_The_South", "2 A STD/DST\nR A 2020 ma - Apr 5 2 -1 S\nR A 2020 ma - S 6 2 0 -",
     false, std::pair(true, false)},
    {"Set_Back_Once", "1 A STD/DST\nR A 2020 o - O lastSu 1u -1 S\nR A 2021 o - Mar lastSu 1u 0 -",
     false, std::pair(false, false)},
};

string print_source() {
  string source = "# version 2030b\n";
  for (const zone_row& row : zones) {
    // Rules, each with a name of its own, and the lines of the zone.
    std::istringstream lines(row.source);
    string zone = "Z Test/" + row.name + ' ';
    string rules;
    for (string line; std::getline(lines, line);) {
      line = line.starts_with("R A ") ? "R " + row.name + line.substr(3) : line;
      const std::size_t use = line.find(" A ");
      if (use != string::npos) line.replace(use + 1, 1, row.name);
      (line.starts_with("R ") ? rules : zone) += line + '\n';
    }
    source += rules + zone;
  }
  // ICU has zones of its own with the last two names, which are nobody's.
  return source +
         "L Test/South Test/Link\nL Test/Link Europe/Paris # and so ICU's ECT\n"
         "L Test/South UCT\nZ SystemV/MST7 -6 - MST\n";
}

// All changes of the clocks, and what they then show.
std::vector<std::pair<instant, std::pair<std::int32_t, bool>>> list_times(const olm_clocks& clocks,
                                                                          instant to,
                                                                          bool has_dst) {
  constexpr instant from = -15'000'000'000;
  std::vector<instant> changes = {from};
  clocks.list_changes(from, to, changes);
  std::sort(changes.begin(), changes.end());
  std::vector<std::pair<instant, std::pair<std::int32_t, bool>>> times;
  for (const instant change : changes) {
    const local_time time = clocks.find(change);
    const std::pair shown(time.offset, has_dst && time.is_dst);
    if (times.empty() || times.back().second != shown) times.emplace_back(change, shown);
  }
  return times;
}

// Standard time's offset, as the source has it in a zone's last line.
std::int32_t read_standard(const string& source) {
  std::istringstream lines(source);
  std::int32_t standard = 0;
  for (string line; std::getline(lines, line);) {
    if (line.starts_with("R ")) continue;
    string offset = line.substr(0, line.find(' '));
    std::replace(offset.begin(), offset.end(), ':', ' ');
    int hours = 0;
    int minutes = 0;
    int seconds = 0;
    std::istringstream(offset) >> hours >> minutes >> seconds;
    standard = hours * 3600 + minutes * 60 + seconds;
  }
  return standard;
}

// The same as ICU has it at `when`.
std::int32_t find_standard(const string& name, instant when) {
  const std::unique_ptr<icu::TimeZone> zone(
      icu::TimeZone::createTimeZone(icu::UnicodeString::fromUTF8(name)));
  std::int32_t standard = 0;
  std::int32_t saving = 0;
  UErrorCode status = U_ZERO_ERROR;
  zone->getOffset(static_cast<UDate>(when) * U_MILLIS_PER_SECOND, 0, standard, saving, status);
  return standard / U_MILLIS_PER_SECOND;
}

TEST(make_test, gives_icu_the_same_times_for_ever) {
  std::ofstream(place + "tzdata.zi") << print_source();
  std::ofstream(place + "zone.tab") << "# codes\nNZ\t-4357-17633\tTest/South\n";
  std::ofstream(place + "zone1970.tab")
      << "AU,NZ\t-43-176\tTest/South\nIN,LK\t+22+88\tTest/Dates\n";
  ASSERT_EQ(make({place + "tzdata.zi"}), tell_success("2030b.1.0"));
  run("tar --extract --directory=made --file=made/2030b.1.0.tar");
  set_icu_directory(made + "icutz");
  string found;
  constexpr instant year_2400 = 13'569'465'600;
  constexpr instant year_3000 = 32'503'680'000;
  for (const zone_row& row : zones) {
    SCOPED_TRACE(row.name);
    const auto icu = find_icu_zone("Test/" + row.name);
    ASSERT_NE(icu, nullptr);
    const instant to = row.is_cut ? year_2400 : year_3000;
    EXPECT_EQ(list_times(*icu, to, !row.dst),
              list_times(read_zone("Test/" + row.name), to, !row.dst));
    if (row.is_cut) {
      EXPECT_LT(list_times(*icu, year_3000, true).back().first, year_2400 + 2'000'000'000);
    }
    constexpr instant january = 1'893'456'000;
    constexpr instant july = january + 15'638'400;
    if (row.dst) {
      EXPECT_EQ(*row.dst, std::pair(icu->find(january).is_dst, icu->find(july).is_dst));
    } else {
      EXPECT_EQ(find_standard("Test/" + row.name, july), read_standard(row.source));
    }
  }
  // A new name has the region of a table or of its target, and ICU's own names are the zones' whose
  // names they are.
  EXPECT_EQ(find_icu_zone("SystemV/MST7")->find(0).offset, -6 * 3600);
  for (const char* const name :
       {"Test/South", "Test/Link", "Test/Dates", "Europe/Paris", "ECT", "UCT"}) {
    std::array<char, 4> region{};
    UErrorCode status = U_ZERO_ERROR;
    icu::TimeZone::getRegion(name, region.data(), region.size(), status);
    found += string(region.data()) + ' ' + std::to_string(icu::TimeZone::countEquivalentIDs(name)) +
             ", ";
  }
  EXPECT_EQ(found, "NZ 5, NZ 5, IN 0, FR 5, FR 5, NZ 5, ");
  std::filesystem::current_path("/");
}

// Makes a release with the sources that its archive has.
const string release = R"(rm -rf release && mkdir release && cd release && echo 2030c >version &&
  touch africa antarctica asia australasia europe southamerica etcetera factory backward &&
  echo "Rule A 2020 max - Oct lastSun 1:00u -1:00 S
    Rule A 2020 max - Mar lastSun 1:00u 0 -
    Zone Test/Set_Back 1:00 - WET 2020 Mar lastSun 1:00u
     1:00 A WET/WEST" >northamerica
  echo 'DATAFORM == "rearguard" { sub(/max - Oct lastSun 1:00u -1:00 S/, "max - Oct lastSun 1:00u 0 -")
    sub(/max - Mar lastSun 1:00u 0 -/, "max - Mar lastSun 1:00u 1:00 S")
    sub(/^ *1:00 A WET.WEST/, "0:00 A WET/WEST") } { print }' >ziguard.awk; )";

struct run_row {
  string prepare;  // a command, in the directory of the release
  report arguments;
  string ends;
  string check = "true";  // what must hold then
};

TEST(make_test, takes_a_release_or_says_why_not) {
  const string archive = place + "release.tar.gz";
  const string pack = "tar --create --gzip --file=../release.tar.gz *";
  const string program = "tzdata-make-update: ";
  const std::vector<run_row> rows = {
      {"true", {place + "release/"}, tell_success("2030c.1.0"), "mv made first"},
      {pack, {archive}, tell_success("2030c.1.0"), "diff made first"},
      {pack,
       {"--number=20301124.10", archive},
       tell_success("2030c.20301124.10"),
       "cmp made/2030c.20301124.10.tar first/2030c.1.0.tar"},
      // Without ziguard.awk, what counts as daylight saving time is another.
      {"tar -xf ../first/2030c.1.0.tar zoneinfo icutz",
       {place + "release/zoneinfo/tzdata.zi"},
       tell_success("2030c.1.0"),
       "tar -xf made/*.tar icutz && ! cmp icutz/zoneinfo64.res release/icutz/zoneinfo64.res"},
      {"cd ..; tar --create --gzip --file=release.tar.gz release",
       {archive},
       tell_success("2030c.1.0"),
       "diff made first"},
      // Links of an archive lead to what is not the release's.
      {"ln -s /etc/passwd zone.tab; " + pack,
       {archive},
       tell_success("2030c.1.0"),
       "diff made first"},
      {"rm asia; ln -s /etc/passwd asia; " + pack,
       {archive},
       program + archive + " has no file asia, exit 1"},
      {"echo 'BEGIN { system(\"touch /var/tmp/escaped\") }' >ziguard.awk",
       {place + "release"},
       program + "the release's ziguard.awk fails, exit 1",
       "[ ! -e escaped ]"},
      {"echo 'BEGIN { while (1) { } }' >ziguard.awk",
       {place + "release"},
       program + "the release's ziguard.awk fails, exit 1"},
      {"echo Zone x y >>asia", {place + "release"}, program + "zic fails, exit 1"},
      {"echo Link " + place + "first/2030c.1.0.tar x >>backward",
       {place + "release"},
       program + place + "release cannot be compiled, exit 1"},
      {"echo master >version",
       {place + "release"},
       program + place + "release says that its release is: master, exit 1"},
      {"printf '2030c\\nL x y' >version", {place + "release"}, "L x y, exit 1"},
      {"rm version",
       {place + "release"},
       program + place +
           "release does not say which release it is: it has no file version, exit 1"},
      {"rm northamerica",
       {place + "release"},
       program + place +
           "release is no release: it has neither northamerica nor tzdata.zi, exit 1"},
      {"echo >../release.tar.gz", {archive}, program + archive + " cannot be unpacked, exit 1"},
      {"true", {place + "nothing"}, program + place + "nothing is not there, exit 1"},
      // Only an archive that is signed.
      {pack + "; rm -f ../release.tar.gz.asc",
       {"--keyring=key", archive},
       program + archive + " has no signature " + archive + ".asc, exit 1"},
      {pack + "; echo >../release.tar.gz.asc",
       {"--keyring=key", archive},
       program + archive + ": its signature is not good, exit 1"},
      // Halves of two releases, and a base that is none.
      {"sed -i 's/1:00 A/2:00 A/' northamerica; tar -xf ../first/2030c.1.0.tar icutz",
       {"--icu=" + place + "release/icutz", place + "release"},
       program + "2030c.1.0 is not sound, exit 1",
       "[ -z \"$(ls -A made)\" ]"},
      {"tar -xf ../first/2030c.1.0.tar icutz",
       {"--icu=" + place + "release/icutz", place + "release"},
       tell_success("2030c.1.0"),
       "diff made first"},
      {"tar -xf ../first/2030c.1.0.tar icutz",
       {"--base=" + place + "release/icutz", place + "release"},
       tell_success("2030c.1.0"),
       "diff made first"},
      {"tar -xf ../first/2030c.1.0.tar icutz; truncate -s 999 icutz/metaZones.res",
       {"--base=" + place + "release/icutz", place + "release"},
       program + "ICU's files cannot be made, exit 1"},
      {"true",
       {"--number=01.0", archive},
       program + "--number takes two numbers, such as 1.0, exit 2"},
      {"true",
       {"--keyring=", archive},
       "                          [--output=DIRECTORY] RELEASE, exit 2"},
      {"true",
       {"--base=x", "--icu=y", archive},
       "                          [--output=DIRECTORY] RELEASE, exit 2"},
      {"true", {}, "                          [--output=DIRECTORY] RELEASE, exit 2"},
      {"true", {"--version"}, "tzdata-make-update " VERSION ", exit 0"},
      // What may be published already stays.
      {"true",
       {"--output=" + place + "first", place + "release"},
       "tzdata-make-update: /var/tmp/first has 2030c.1.0.tar and 2030c.1.0.sha256, exit 0"},
      {"echo '# more' >zone.tab",
       {"--output=" + place + "first", place + "release"},
       program + place +
           "first/2030c.1.0.tar is there already and differs: give another --number, or remove it, "
           "exit 1",
       "cd first && sha256sum <2030c.1.0.tar | cmp - 2030c.1.0.sha256"},
  };
  for (const run_row& row : rows) {
    SCOPED_TRACE(row.prepare + testing::PrintToString(row.arguments));
    run(release + row.prepare);
    EXPECT_EQ(make(row.arguments), row.ends);
    run(row.check);
  }
}

// What only files that another program wrote can do to what writes ICU's text.
TEST(make_test, believes_no_files) {
  const string write = PROGRAMS "/tzdata-write-icu";
  const string mark = "tzdata-write-icu: ";
  const string files = place + "zoneinfo";
  const string base = place + "icutz";
  run("rm -f *.tar; " + release);
  ASSERT_EQ(make({place + "release"}), tell_success("2030c.1.0"));
  run("tar --extract --file=made/2030c.1.0.tar");
  const std::vector<std::pair<report, string>> rows = {
      {{write, files, files}, "usage: tzdata-write-icu MARKED ZONEINFO OUTPUT [BASE]"},
      {{write, files, files, made}, "Test/Set_Back WEST is no mark of a time"},
      {{write, files, place + "nothing", made}, place + "nothing/tzdata.zi cannot be read"},
      {{"strace", "-o", "/dev/null", "-e", "inject=openat:error=ENOENT", "-P", "./metaZones.res",
        write, files, files, made, base},
       base + ": ICU cannot read its files"},
      {{"sh", "-c", "cp $1/metaZones.res $1/zoneinfo64.res; $0 $2 $2 $3 $1", write, base, files,
        made},
       "ICU cannot read the base's Names"},
      {{"sh", "-c", "echo 'L a b\nL b a' >>$1/tzdata.zi; $0 $1 $1 $2", write, files, made},
       "the link a leads nowhere"},
  };
  for (const auto& [command, reason] : rows) {
    const report said = hear(command);
    EXPECT_EQ(said.front(), mark + reason);
    EXPECT_EQ(said.back(), "exit 1");
  }
}

// --- tzdata-image ---

const string image = place + "image";
const string archive_of_image = made + "2030c.1.0.tar";

report make_image(const report& arguments) {
  return hear(report{PROGRAMS "/tzdata-image"} + arguments + report{image, archive_of_image});
}

report list_image() { return hear({"find", image, "-printf", "%P %y %l %s\n"}); }

class make_image_test : public testing::Test {
 protected:
  void SetUp() override {
    run(release + "echo Link Test/Set_Back Test/Link >backward");
    ASSERT_EQ(make({place + "release"}), tell_success("2030c.1.0"));
    run("mkdir original; cd original; mkdir -p etc var usr/share/zoneinfo usr/lib/systemd/system\n"
        "mkdir usr/share/tzdata-select; cp " DATA_SET
        "/../../install/environment usr/share/tzdata-select\n"
        "for unit in select zone-name; do : >usr/lib/systemd/system/tzdata-$unit.service; done\n"
        "ln -s ../usr/share/zoneinfo/Test/Set_Back etc/localtime; : >usr/lib/libicudata.so.72");
  }
  static void lay_out_image(const string& prepare) {
    run("rm -rf image; cp -a original image; " + prepare);
  }
};

TEST_F(make_image_test, is_ready_after_one_run) {
  // The image's own zone counts, and what a run that was killed has set aside.
  lay_out_image("mv image/usr/share/zoneinfo image/usr/share/zoneinfo.old");
  EXPECT_EQ(make_image({"--directory"}).back(), "exit 0");
  run("[ ! -L image/usr/share/zoneinfo ] && [ -d image/usr/share/zoneinfo ]");
  run("[ $(readlink image/var/db/timezone/localtime) = /var/db/timezone/zoneinfo/Test/Set_Back ]");
  EXPECT_EQ(make_image({"--directory"}), report{"exit 0"});
  EXPECT_EQ(make_image({"--zone=Test/Link"}),
            (report{"/var/db/timezone/localtime -> /var/db/timezone/zoneinfo/Test/Link",
                    "/usr/share/zoneinfo -> /var/db/timezone/zoneinfo", "exit 0"}));
}

TEST_F(make_image_test, is_left_as_it_is_where_something_is_wrong) {
  const string no_link = " is a directory, where a link belongs";
  const std::array<string, 3> rows[] = {
      {"mkdir -p image/usr/share/icu/icudt72l", "", image + "/usr/share/icu/icudt72l" + no_link},
      {"rm -r image/var", "", image + " is no system's root directory: it has no /var"},
      {"ln -s /data image/var/db", "", image + "/var/db/timezone leads out of " + image},
      {"ln -s /data image/etc/systemd", "",
       image + "/etc/systemd/system/sysinit.target.wants leads out of " + image},
      {"echo ICU_DATA=/x >image/etc/environment", "",
       image + "/etc/environment has another value than this: ICU_DATA=/usr/share/icu"},
      {"rm image/usr/lib/systemd/system/tzdata-select.service", "",
       image + " has no package tzdata-select: no tzdata-select.service"},
      {"true", "--zone=Test/Nowhere", "Test/Nowhere is no zone of " + archive_of_image},
      {"true", "--zone=../Test/Link", "../Test/Link is no zone"},
      {"echo >>made/2030c.1.0.tar", "",
       archive_of_image + " is damaged: " + made + "2030c.1.0.sha256 has another sum"},
  };
  for (const auto& [prepare, option, says] : rows) {
    lay_out_image(prepare);
    const report before = list_image();
    const report said = make_image(option.empty() ? report{} : report{option});
    EXPECT_EQ(report(said.end() - 2, said.end()), (report{"tzdata-image: " + says, "exit 1"}));
    EXPECT_EQ(list_image(), before);
  }
}

}  // namespace
