// What tzdata-update takes and refuses, what it leaves on the device, and tzdata-set-zone.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/mount.h>
#include <sys/stat.h>

#include <algorithm>
#include <fstream>
#include <functional>

#include "archives.h"
#include "fs/olm_descriptor.h"

namespace {

using namespace at;
using std::string;
namespace files = std::filesystem;

const string third = updates + "2020b.1.0";
const string published = "/var/2020b.1.0";
const string spare = zoneinfo + ".boot";

report update_by(const report& arguments, const report& tracing = {}) {
  return ask(arguments, tracing, "tzdata-update");
}

// What is there where the good update was taken.
entries taken(const string& path = third) {
  return file(path + "/zoneinfo/+VERSION", "2020b\n") +
         file(path + "/zoneinfo/Asia/Tokyo", string(513, 'x')) +
         file(path + "/icutz/icutz44l.dat", "");
}

// Of marks, only that they are there.
device look_without_sums() {
  device found = look();
  for (auto& [path, what] : found)
    if (path.ends_with("/.tzdata-update")) what.assign(1, 'x');
  return found;
}

entries mark(const string& path = third) { return file(path + "/.tzdata-update", "x"); }

class update_on_device : public testing::Test {
 protected:
  // Whether or not this machine has one.
  void SetUp() override { make_program("tzdata-check", "exit 0"); }
};

TEST_F(update_on_device, takes_what_ustar_can_say) {
  const string gnu("ustar  \0", 8);
  const string deep = string(90, 'd') + '/';
  const tar_entries more = {
      {"zoneinfo/Japan", '2', "Asia/Tokyo"},
      {"zoneinfo/Asia/up", '2', "../+VERSION"},
      {"zoneinfo/localtime", '2', "/etc/localtime"},
      {"zoneinfo/Same", '1', "zoneinfo/Asia/Tokyo"},
      {"icutz/gnu", '0', "g", "", "not a prefix", 0, gnu},
      {deep, '5', "", "", "zoneinfo"},
      {string(90, 'f'), '0', "deep", "          4 ", "zoneinfo/" + deep.substr(0, 90)}};
  lay_out(on_first);
  const device before = look();
  publish(published, pack_all(good_update + more) + tar_end + tar_end);
  EXPECT_EQ(hear({"sh", "-c", "umask 777; exec " PROGRAMS "/tzdata-update $0", published + ".tar"}),
            (report{"the next start uses 2020b.1.0", "exit 0"}));
  const device after =
      change(before, gone(second) + taken() + mark() + link_to(latest, third) +
                         link_to(third + "/zoneinfo/Japan", "Asia/Tokyo") +
                         link_to(third + "/zoneinfo/Asia/up", "../+VERSION") +
                         file(third + "/zoneinfo/Same", string(513, 'x')) +
                         file(third + "/icutz/gnu", "g") +
                         file(third + "/zoneinfo/" + deep + string(90, 'f'), "deep"));
  // Those that something else has put there stay.
  EXPECT_EQ(look_without_sums(), change(after, update(second)));
  EXPECT_EQ(files::hard_link_count(third + "/zoneinfo/Same"), 2);
  for (const auto& there : files::recursive_directory_iterator(third))
    EXPECT_EQ(files::status(there).permissions(), files::perms(there.is_directory() ? 0755 : 0644));
}

struct bad_archive {
  string bytes;
  string reason;
};

bad_archive add(const tar_entries& bad, const string& reason) {
  return {pack_all(good_update + bad) + tar_end, reason};
}
bad_archive add_type(char type) {
  return add({{"zoneinfo/x", type, "x"}},
             "zoneinfo/x has the type " + string(1, type) +
                 " in the archive: it is no plain file, directory or link of ustar");
}
bad_archive add_link(const string& target) {
  return add({{"zoneinfo/x", '2', target}},
             "zoneinfo/x is a link to " + target + ", which leads to nothing in the update");
}
bad_archive add_name(const string& name) {
  string shown = name;
  std::replace(shown.begin(), shown.end(), '\n', '?');
  return add({{name}}, shown + " is no name that an update may have");
}
bad_archive add_top(const string& name) {
  return add({{name}}, "the archive has more than zoneinfo and icutz: " + name);
}

tar_entries many() {
  tar_entries all;
  for (int number = 0; number < 20'000; ++number)
    all.push_back({"zoneinfo/" + std::to_string(number)});
  return all;
}

const string good = pack_all(good_update);
const string cut = "the archive is cut off";

const std::vector<bad_archive> bad_archives = {
    add_top("/etc/passwd"),
    add_top("../x"),
    add_top("./zoneinfo/x"),
    add_top(""),
    add_top(".tzdata-update"),
    add_name("zoneinfo/../../x"),
    add_name("zoneinfo/./x"),
    add_name("zoneinfo//x"),
    add_name("zoneinfo/x/"),
    add_name("zoneinfo/a\nb"),
    add_name("zoneinfo/a b"),
    add_name("zoneinfo/\xc3\xa4"),
    add_link("/usr/share"),
    add_link("../../x"),
    add_link("Asia/../../.."),
    add_link("../.."),
    add_link("Asia/"),
    add_link("nothing"),
    add_link("x"),
    add_link(""),
    add({{"zoneinfo/x", '1', "/etc/passwd"}},
        "zoneinfo/x is a link to /etc/passwd, which is no file before it"),
    add({{"zoneinfo/x", '1', "zoneinfo/Asia"}},
        "zoneinfo/x is a link to zoneinfo/Asia, which is no file before it"),
    add({{"zoneinfo/x", '2', "Asia"}, {"zoneinfo/x/y"}},
        "zoneinfo/x/y stands in no directory of the update"),
    add({{"zoneinfo/Europe/Berlin"}},
        "zoneinfo/Europe/Berlin stands in no directory of the update"),
    add({{"zoneinfo/Asia"}}, "zoneinfo/Asia is there twice"),
    add({{"zoneinfo/+VERSION", '2', "Asia"}}, "zoneinfo/+VERSION is there twice"),
    add_type('3'),
    add_type('4'),
    add_type('6'),
    add_type('7'),
    add_type('x'),
    add_type('g'),
    add_type('L'),
    add_type('S'),
    add({{"zoneinfo/x", '5', "", "00000001000"}},
        "the archive has data for what is no file: zoneinfo/x"),
    add({{"zoneinfo/x", '0', "", "\x80"}}, "the archive has a header with a bad number"),
    add({{"zoneinfo/x", '0', "", "8"}}, "the archive has a header with a bad number"),
    add({{"zoneinfo/x", '0', "", "-1"}}, "the archive has a header with a bad number"),
    add({{"zoneinfo/x", '0', "", "777777777777"}}, cut),
    add({{"zoneinfo/x", '0', "", "", "", 1}}, "the archive has a damaged header"),
    add({{"zoneinfo/x", '0', "", "", "", 0, string(8, '\0')}},
        "the archive is no ustar archive, or compressed"),
    add(many(), "it has more than 20000 entries"),
    {good, cut},
    {good + string(512, '\0'), cut},
    {good.substr(0, 1700), cut},
    {"", cut},
    {good + string(512, '\0') + good, "the archive goes on after its end"},
    {good + tar_end + good, "the archive goes on after its end"},
    {tar_end, "it has no directory zoneinfo"},
    {pack({"zoneinfo"}) + tar_end, "it has no directory zoneinfo"},
    {"\x1f\x8b\x08" + string(600, 'x'), "the archive is no ustar archive, or compressed"},
    {string((64 << 20) + 512, '\0'), "the archive is longer than 67108864 bytes"},
};

TEST_F(update_on_device, refuses_bad_archives) {
  lay_out(on_first);
  const device before = look();
  for (const auto& [bytes, reason] : bad_archives) {
    publish(published, bytes);
    EXPECT_EQ(update_by({published + ".tar"}), (report{reason, "exit 1"}));
    EXPECT_EQ(look(), before) << reason;
  }
}

struct device_update {
  entries before;
  report arguments;
  report says;  // and how it ends
  entries changes = {};
  std::function<void()> prepare = [] {};
  entries boots = {};  // what the next boot changes
};

const report taking = {"the next start uses 2020b.1.0", "exit 0"};
const report archive = {published + ".tar"};
const string engine = "engine's";
const entries third_waits = on_first + update(third) + link_to(latest, third);
const entries second_waits = on_first + mark(second);
const report could_not_back = {"the next start uses the system partition", "exit 0"};

// Where the record is, and the marker.
entries recorded(const string& text) { return file(record, text) + file(marker, ""); }

const std::vector<device_update> device_updates = {
    // Archives
    {on_system + mark(first), archive, taking,
     taken() + mark() + link_to(latest, third) + gone(first), [] {},
     links(third) + file(record, "2019c.1.0_2020b.1.0")},
    {on_first + mark(first) + mark(second), archive, taking,
     taken() + mark() + link_to(latest, third) + gone(second), [] {},
     links(third) + recorded("2020a.9.0_2020b.1.0")},
    // What earlier runs left
    {on_first + folder(updates + ".part/x") + link_to(latest + ".new", "x"), archive, taking,
     taken() + mark() + link_to(latest, third) + gone(updates + ".part") + gone(latest + ".new")},
    {on_first + update(third),
     archive,
     {third + " is there already, and was not made from this archive", "exit 1"}},
    // Refused by the start
    {on_first + file(version, "2020c"),
     archive,
     {"2020b.1.0 is older than the system partition 2020c.1.0", "exit 1"}},
    {on_first + file(schema, "45l"),
     archive,
     {"the update 2020b.1.0 has schema 44l; the system partition has schema 45l", "exit 1"}},
    // Zones
    {on_first + link_to(zone, zoneinfo + "/Europe/Berlin"), archive,
     report{"tzdata-update: 2020b.1.0 lacks the device's zone: " + zoneinfo + "/Europe/Berlin"} +
         taking,
     taken() + mark() + link_to(latest, third)},
    {on_first + link_to(zone, "/usr/share/zoneinfo/Europe/Berlin"), archive,
     report{"tzdata-update: 2020b.1.0 lacks the device's zone: /usr/share/zoneinfo/Europe/Berlin"} +
         taking,
     taken() + mark() + link_to(latest, third)},

    // Directories
    {on_first + update(third) + mark(second) + folder(third + "/other"),
     {third + "/"},
     taking,
     link_to(latest, third) + gone(second)},
    {on_first + update(third) + link_to(third + "/icutz/x", "/etc/passwd"),
     {third},
     {"icutz/x is a link to /etc/passwd, which leads to nothing in the update", "exit 1"}},
    {on_first + update(third),
     {third},
     {"zoneinfo/socket is no file, directory or link", "exit 1"},
     {},
     [] { EXPECT_EQ(mknod((third + "/zoneinfo/socket").c_str(), S_IFSOCK, 0), 0); }},
    {on_first + update(third) + file(base + "other", "x"),
     {third},
     {"zoneinfo/x has another name outside the update", "exit 1"},
     {},
     [] {
       files::permissions(base + "other", files::perms(0600));
       files::create_hard_link(base + "other", third + "/zoneinfo/x");
     }},
    {on_first + folder(updates + "part"),
     {updates + "part"},
     {"part is no version such as 2026a.1.0", "exit 1"}},
    {on_first + folder(updates + "9999999999a"),
     {updates + "9999999999a"},
     {"9999999999a is no version such as 2026a.1.0", "exit 1"}},
    {on_first,
     {"/usr/share"},
     {"tzdata-update: /usr/share: is no directory right below " + updates, "exit 2"}},
    {on_first + link_to(third, second),
     {third},
     {"tzdata-update: " + third + ": is no directory right below " + updates, "exit 2"}},
    {on_second, {second}, {"2020a.10.0 is in use already", "exit 0"}},
    {on_second,
     {first},
     {"the update 2020a.9.0 is older than the current data set 2020a.10.0", "exit 1"}},

    // A newer one waits
    {third_waits,
     {second},
     {"a newer update is waiting: 2020b.1.0 (with --older, this one replaces it)", "exit 1"}},
    {third_waits + mark(third),
     {"--older", second},
     {"the next start uses 2020a.10.0", "exit 0"},
     link_to(latest, second) + gone(third)},
    {third_waits,
     {"--older", first},
     {"the next start uses 2020a.9.0", "exit 0"},
     link_to(latest, first)},

    // Going back: what waits is dropped
    {second_waits, {"--back"}, {"the next start uses 2020a.9.0", "exit 0"}, link_to(latest, first)},
    {on_system, {"--back"}, could_not_back, gone(latest)},
    // The one before, unless it does not fit
    {on_second + update(updates + "2020a.8.0"),
     {"--back"},
     {"the next start uses 2020a.9.0", "exit 0"},
     link_to(latest, first) + link_to(spare, first + "/zoneinfo"),
     [] {},
     links(first) + gone(spare)},
    {on_second + gone(first + "/icutz") + folder(updates + "part") + update(third),
     {"--back"},
     could_not_back,
     gone(latest) + link_to(spare, system_zoneinfo),
     [] {},
     system_links + gone(spare)},
    {on_second + file(version, "2020a") + file(second + "/zoneinfo/+VERSION", "damaged"),
     {"--back"},
     {"the next start uses 2020a.9.0", "exit 0"},
     link_to(latest, first) + link_to(spare, first + "/zoneinfo")},
    {on_second + file(version, "2020a") + gone(first) + link_to(spare, second + "/zoneinfo"),
     {"--back"},
     could_not_back,
     gone(latest) + link_to(spare, system_zoneinfo)},
    // Once is enough
    {on_second + link_to(latest, first) + link_to(spare, first + "/zoneinfo"),
     {"--back"},
     {"the next start uses 2020a.9.0 already", "exit 0"}},
    {on_second + file(version, "2020b"),
     {"--back"},
     {"the next start uses the system partition already", "exit 0"}},
    {on_system + gone(latest),
     {"--back"},
     {"the system partition is in use, and no update waits", "exit 1"}},
    {on_second,
     {"--back"},
     {"tzdata-update: the next start would not go back; tzdata-status says what is wrong",
      "exit 2"},
     {},
     [] { EXPECT_EQ(chown(base.c_str(), 1, 1), 0); }},
    // And forward again before the next boot
    {on_second + link_to(latest, first) + link_to(spare, first + "/zoneinfo") + mark(first) +
         mark(second),
     archive, taking, taken() + mark() + link_to(latest, third), [] {},
     links(third) + recorded("2020a.9.0_2020b.1.0") + gone(spare)},
    {on_second + link_to(latest, first) + link_to(spare, first + "/zoneinfo"),
     {second},
     {"the next start uses 2020a.10.0", "exit 0"},
     link_to(latest, second),
     [] {},
     recorded("2020a.9.0_2020a.10.0") + gone(spare)},
    {on_second + link_to(latest, third) + update(third) + link_to(spare, first + "/zoneinfo"),
     {"--back"},
     {"the next start uses 2020a.9.0", "exit 0"},
     link_to(latest, first),
     [] {},
     links(first) + gone(spare)},
};

TEST_F(update_on_device, leaves_the_device_as_it_says) {
  for (const auto& row : device_updates) {
    SCOPED_TRACE(row.says.front());
    lay_out(row.before);
    publish(published, good + tar_end);
    row.prepare();
    const device before = look_without_sums();
    EXPECT_EQ(update_by(row.arguments), row.says);
    EXPECT_EQ(look_without_sums(), change(before, row.changes));
    if (row.boots.empty()) continue;
    EXPECT_EQ(boot().back(), "exit 0");
    EXPECT_EQ(look_without_sums(), change(change(before, row.changes), row.boots));
  }
}

TEST_F(update_on_device, is_taken_again) {
  lay_out(on_first);
  publish(published, good + tar_end);
  EXPECT_EQ(update_by(archive), taking);
  const device after = look();
  EXPECT_EQ(update_by(archive), taking);
  EXPECT_EQ(look(), after);
  EXPECT_EQ(boot().back(), "exit 0");
  EXPECT_EQ(update_by(archive), (report{"2020b.1.0 is in use already", "exit 0"}));
  // A correction must have a name of its own.
  publish(published, good + tar_end + tar_end);
  EXPECT_EQ(update_by(archive).back(), "exit 1");
}

// Where a call on a path fails. The sweep tells that the device is whole then; this, what is said.
TEST_F(update_on_device, says_what_failed) {
  const string part = updates + ".part";
  // The call that fails, a path to tell it from others, and what is named.
  const std::array<string, 3> rows[] = {
      {"clone,clone3", "", "sha256sum"},
      {"flock", "", base},
      {"mkdir", "", part},
      {"mkdirat", "", part + "/icutz"},
      {"pread64", published + ".tar", "the archive"},
      {"write", part + "/zoneinfo/+VERSION", part + "/zoneinfo/+VERSION"},
      {"write", part + "/.tzdata-update", part + "/.tzdata-update"},
      {"syncfs", "", part},
      {"rename", part, third},
      {"fsync", "", updates},
      {"symlink", "", latest + ".new"},
      {"rename", latest + ".new", latest}};
  const auto run_on_device = [&](const report& tracing) {
    lay_out(on_first + mark(second));
    publish(published, good + tar_end);
    return update_by(archive, tracing);
  };
  run_on_device({"-e", "inject=geteuid:retval=1000"});
  const device before = look();
  for (const auto& [call, path, named] : rows) {
    const report only = path.empty() ? report{} : report{"-P", path};
    EXPECT_EQ(run_on_device(only + report{"-e", "inject=" + call + ":error=EIO"}),
              (report{"tzdata-update: " + named + ": Input/output error", "exit 2"}));
    EXPECT_EQ(look(), before) << call;
  }
  EXPECT_EQ(
      run_on_device({"-P", second, "-e", "inject=rename:error=EIO"}),
      report{"tzdata-update: 2020a.10.0 cannot be removed: " + second + ": Input/output error"} +
          taking);
}

TEST_F(update_on_device, makes_a_directory_everybodys_to_read_and_roots_to_change) {
  lay_out(on_first + update(third) + link_to(third + "/zoneinfo/link", "Asia/Tokyo"));
  files::permissions(third, files::perms(0700));
  files::permissions(third + "/icutz/icutz44l.dat", files::perms(0600));
  files::permissions(third + "/zoneinfo/Asia", files::perms(0777));
  EXPECT_EQ(hear({"chown", "-hR", "1:1", third}), report{"exit 0"});
  EXPECT_EQ(update_by({third}), taking);
  EXPECT_EQ(
      hear({"find", third, "!",     "-user", "0",  "-o",    "!", "-group", "0",     "-o", "-type",
            "d",    "!",   "-perm", "755",   "-o", "-type", "f", "!",      "-perm", "644"}),
      report{"exit 0"});
}

TEST_F(update_on_device, asks_the_checker) {
  lay_out(on_first);
  publish(published, good + tar_end);
  const device before = look();
  make_program("tzdata-check", "echo one; echo $1 $PATH $STRAY >&2; exit 1");
  EXPECT_EQ(
      hear(report{"env", "PATH=/nowhere", "STRAY=x", PROGRAMS "/tzdata-update"} + archive),
      (report{"one", updates + ".part /usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin",
              "exit 1"}));
  make_program("tzdata-check", "echo lost >&2; exit 2");
  EXPECT_EQ(update_by(archive),
            (report{"tzdata-update: tzdata-check cannot tell: lost", "exit 2"}));
  make_program("tzdata-check", "kill -9 $$");
  EXPECT_EQ(update_by(archive),
            (report{"tzdata-update: tzdata-check cannot tell: status 137", "exit 2"}));
  // One that cannot run is not as good as none.
  make_program("tzdata-check", "");
  std::ofstream("/usr/local/bin/tzdata-check") << "#!/nowhere";
  EXPECT_EQ(update_by(archive),
            (report{"tzdata-update: tzdata-check: No such file or directory", "exit 2"}));
  EXPECT_EQ(look(), before);
  make_program("tzdata-check", "exit 0");
  EXPECT_EQ(update_by(archive), taking);
  // Nor is an unsound one gone back to.
  lay_out(on_second);
  make_program("tzdata-check", "echo bad; exit 1");
  EXPECT_EQ(update_by({"--back"}), could_not_back);
}

TEST_F(update_on_device, is_asked_wrongly_or_cannot) {
  const string usage = "usage: tzdata-update [--older] ARCHIVE";
  lay_out(on_first);
  EXPECT_EQ(update_by({"--help"}).front(), usage);
  EXPECT_EQ(update_by({"--help"}).back(), "exit 0");
  EXPECT_EQ(update_by({"--version"}).back(), "exit 0");
  for (const report& wrong : {report{}, report{"/"}, report{"one", "two"}, report{"--back", "x"},
                              report{"--back", "--older"}, report{"-x"}}) {
    EXPECT_EQ(update_by(wrong).back(), "exit 2");
  }
  publish(published, good + tar_end);
  const device before = look();
  const string unlike = published + ".sha256";
  const auto expect = [&](const string& path, const string& reason, const string& end = "exit 2") {
    EXPECT_EQ(update_by({path}), (report{reason, end}));
    EXPECT_EQ(look(), before);
  };
  const string name = "tzdata-update: ";
  expect("/var/x.gz", name + "/var/x.gz: is no directory or .tar");
  expect("/var/x.tar", "x is no version such as 2026a.1.0", "exit 1");
  expect("/var/2020c.tar", name + "/var/2020c.tar: No such file or directory");
  EXPECT_EQ(mkfifo("/var/2020c.tar", 0644), 0);
  expect("/var/2020c.tar", name + "/var/2020c.tar: is no file");
  std::ofstream(unlike) << "0";
  expect(archive.front(), "the archive is damaged: its sum is not that in " + unlike, "exit 1");
  files::remove(unlike);
  expect(archive.front(), name + unlike + ": No such file or directory");
  publish(published, good + tar_end);
  make_program("sha256sum", "echo broken; exit 1");
  expect(archive.front(), name + "sha256sum fails: broken");
  {
    const olm_descriptor held(open(base.c_str(), O_RDONLY));
    EXPECT_EQ(flock(held.get(), LOCK_EX), 0);
    expect(archive.front(), name + "another tzdata-update is at work");
  }
  EXPECT_EQ(update_by(archive, {"-e", "inject=geteuid:retval=1000"}),
            (report{name + "only root may update a device", "exit 2"}));
  files::rename(updates, base + "elsewhere");
  EXPECT_EQ(update_by(archive),
            (report{name + "this is no device: there is no directory " + updates, "exit 2"}));
}

// --- tzdata-set-zone ---

report set_zone(const string& name) { return hear({PROGRAMS "/install/tzdata-set-zone", name}); }

TEST(set_zone, sets_what_programs_go_by) {
  const string berlin = zoneinfo + "/Europe/Berlin";
  const string system_zones = "/usr/share/zoneinfo";
  const string etc = "/etc/localtime";
  const entries with_berlin = on_first + file(first + "/zoneinfo/Europe/Berlin", "TZif2") +
                              link_to(zone + ".boot", "x") + link_to(zone + ".new", "y");
  struct row {
    entries before;
    string etc_before;
    string etc_after;
  };
  ASSERT_EQ(mount("tmpfs", "/etc", "tmpfs", 0, nullptr), 0);
  ASSERT_EQ(mount("tmpfs", "/run", "tmpfs", 0, nullptr), 0);
  files::create_directories("/run/systemd/system");
  for (const auto& [before, etc_before, etc_after] : {
           row{with_berlin, zone, zone},
           row{with_berlin + link_to(system_zones, zoneinfo), "../usr/share/zoneinfo/UTC",
               system_zones + "/Europe/Berlin"},
           row{with_berlin + folder(system_zones), system_zones + "/UTC", zone},
       }) {
    lay_out(before);
    files::remove(etc);
    files::create_symlink(etc_before, etc);
    make_program("systemctl", "echo \"$@\"");
    const device found = look();
    EXPECT_EQ(set_zone("Europe/Berlin"), (report{"--quiet is-enabled tzdata-zone-name.service",
                                                 "restart tzdata-zone-name.service", "exit 0"}));
    EXPECT_EQ(look(),
              change(found, link_to(zone, berlin) + gone(zone + ".boot") + gone(zone + ".new")));
    EXPECT_EQ(files::read_symlink(etc), etc_after);
  }
}

TEST(set_zone, refuses_what_is_no_zone) {
  lay_out(on_first + file(first + "/zoneinfo/posix/UTC", "TZif2") +
          file(first + "/zoneinfo/UTC", "TZif2") + link_to(first + "/zoneinfo/out", "/etc/UTC") +
          link_to(first + "/zoneinfo/localtime", "UTC"));
  ASSERT_EQ(mount("tmpfs", "/etc", "tmpfs", 0, nullptr), 0);
  std::ofstream("/etc/UTC") << "TZif2";
  const device before = look();
  for (const string name : {"Asia/Tokyo", "Asia", "UTC/", "/UTC", "../zoneinfo/UTC", "./UTC",
                            "posix/UTC", "localtime", "out", "Nowhere/Here", "UTC UTC", "U\nTC"}) {
    string shown = name;
    std::replace(shown.begin(), shown.end(), '\n', '?');
    EXPECT_EQ(set_zone(name), (report{"tzdata-set-zone: there is no zone " + shown, "exit 1"}));
  }
  for (const string wrong : {"", "-x", "UTC 2 3 4 5 6 7 8 9 10"}) {
    EXPECT_EQ(hear({"sh", "-c", PROGRAMS "/install/tzdata-set-zone " + wrong}).back(), "exit 2");
  }
  EXPECT_EQ(set_zone("--version").back(), "exit 0");
  EXPECT_EQ(look(), before);
  lay_out(on_first + gone(zoneinfo));
  EXPECT_EQ(set_zone("UTC").back(), "exit 2");
}

}  // namespace
