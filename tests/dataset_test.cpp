// The operations on links, the components, the data sets and the marker: what they find, print,
// throw and leave behind.
#include <dlfcn.h>
#include <fts.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <cerrno>
#include <climits>
#include <cstring>
#include <filesystem>
#include <regex>
#include <type_traits>

#include "dataset/olm_dataset.h"
#include "dataset/olm_icu.h"
#include "dataset/olm_zoneinfo.h"
#include "dataset/pattern.h"
#include "driver/housekeeping.h"
#include "fs/data_protection.h"
#include "fs/file_operations.h"
#include "fs/olm_descriptor.h"
#include "testbed/device.h"

static_assert(!std::is_destructible_v<olm_dataset_component>);

static bool no_memory_for_walks = false;

// Stands before the C library's, which fails for want of memory alone.
extern "C" FTS* fts_open(char* const* roots, int options,
                         int (*compare)(const FTSENT**, const FTSENT**)) {
  errno = ENOMEM;
  if (no_memory_for_walks) return nullptr;
  // NOLINTNEXTLINE(cppcoreguidelines-pro-type-reinterpret-cast): all that dlsym can give
  static const auto next = reinterpret_cast<decltype(&fts_open)>(dlsym(RTLD_NEXT, "fts_open"));
  return next(roots, options, compare);
}

namespace {

using std::string;

const string base = "/var/db/timezone/";
const string update = base + "tz/2019d.1.0";
const string version_file = "/usr/share/zoneinfo.default/+VERSION";

TEST(file_operations, one_after_the_other) {
  new_device("file =\nlink > file\ndangling > nowhere\ndirectory /\nfull > " + string(1024, 'x') +
             "\nlonger > " + string(1025, 'y'));
  EXPECT_TRUE(fs::exists(base + "link"));
  EXPECT_FALSE(fs::exists(base + "dangling"));
  EXPECT_EQ(fs::read_symlink(base + "link"), "file");
  EXPECT_EQ(fs::read_symlink(base + "missing"), "");
  EXPECT_EQ(fs::read_symlink(base + "full"), string(1024, 'x'));
  EXPECT_EQ(fs::read_symlink(base + "longer"), string(1024, 'y'));
  struct row {
    std::function<void()> action;
    string warning;
    int code;
  };
  const row rows[] = {
      {[] { EXPECT_EQ(fs::read_symlink(base + "file"), ""); }, "read_symlink: " + base + "file",
       EINVAL},
      {[] { fs::remove(base + "directory"); }, "remove: could not remove " + base + "directory",
       EISDIR},
      {[] { fs::remove(base + "file/x"); }, "remove: could not remove " + base + "file/x", ENOTDIR},
      {[] { fs::create_symlink("%s", base + "dangling"); },
       "create_symlink: from " + base + "dangling to %s", EEXIST},
      {[] { fs::remove(base + "missing/x"); }, "", 0},
      {[] { fs::remove(base + "dangling"); }, "", 0},
      {[] { fs::create_symlink("%s", base + "dangling"); }, "", 0},
  };
  for (const auto& [action, warning, code] : rows) {
    report heard = {warning + ": " + strerror(code), "int " + std::to_string(code)};
    if (code == 0) heard = {"done"};
    EXPECT_EQ(hear(action), heard);
  }
  EXPECT_EQ(fs::read_symlink(base + "dangling"), "%s");
}

// The library's own way is the measure, with each byte in each place.
TEST(pattern, matches_as_with_a_locale) {
  const char* patterns[][2] = {
      {R"(([0-9]+)([a-z]+)(?:\.([0-9]+))?(?:\.([0-9]+))?)", "2019c.1.0"},
      {R"(icutz([0-9]+[lbe])\.dat)", "icutz44l.dat"},
  };
  for (const auto& [text, example] : patterns) {
    const olm_pattern ours = compile_pattern(text);
    const std::regex theirs(text);
    string name = example;
    for (char& place : name) {
      const char before = place;
      for (int byte = 0; byte <= UCHAR_MAX; ++byte) {
        place = static_cast<char>(byte);
        std::smatch one;
        std::smatch other;
        std::regex_match(name, one, ours);
        std::regex_match(name, other, theirs);
        EXPECT_TRUE(one == other) << name;
      }
      place = before;
    }
  }
  for (const char* refused : {"[[:digit:]]", "\\d", "[\\w]", "[[=a=]]", "[[.a.]]", "[a"})
    EXPECT_THROW(static_cast<void>(compile_pattern(refused)), std::regex_error) << refused;
}

TEST(olm_icu, finds_the_schema) {
  struct row {
    string name;
    char kind;
    mode_t mode;
    string schema;
  };
  const row rows[] = {
      {"icutz44l.dat", '=', 0644, "44l"}, {"icutz64b.dat", '=', 0004, "64b"},
      {"icutz7e.dat", '=', 0644, "7e"},   {"icutz44L.dat", '=', 0644, ""},
      {"icutz44.dat", '=', 0644, ""},     {"icutz44l.dat.bak", '=', 0644, ""},
      {"x-icutz44l.dat", '=', 0644, ""},  {"icutz4l4l.dat", '=', 0644, ""},
      {"icutz44lxdat", '=', 0644, ""},    {"icutz44l.dat", '=', 0660, ""},
      {"icutz44l.dat", '/', 0755, ""},    {"sub/icutz44l.dat", '=', 0644, ""},
      {"icutzformat.txt", '=', 0644, ""},
  };
  for (const auto& [name, kind, mode, schema] : rows) {
    const string file = update + "/icutz/" + name;
    new_device(file + ' ' + kind + " 44l");
    ASSERT_EQ(chmod(file.c_str(), mode), 0);
    report heard = {"No ICU schema found for " + update, "done"};
    if (!schema.empty()) heard = {"done"};
    string found;
    EXPECT_EQ(hear([&] { found = olm_icu(update).schema; }), heard) << name;
    EXPECT_EQ(found, schema) << name;
  }
  // The first in the directory's own order.
  new_device(update + "/icutz/icutz1l.dat =\n" + update + "/icutz/icutz2l.dat =");
  const auto first = std::filesystem::directory_iterator(update + "/icutz")->path().filename();
  EXPECT_EQ("icutz" + olm_icu(update).schema + ".dat", first);
  // The directory may be a link, a file in it may not.
  new_device(update + "/icutz > /var/db/timezone/elsewhere\nelsewhere/icutz44l.dat =");
  EXPECT_EQ(olm_icu(update).schema, "44l");
  lay_out("elsewhere/icutz44l.dat > ../file\nfile =");
  EXPECT_EQ(hear([] { static_cast<void>(olm_icu(update)); }).size(), 2);
  no_memory_for_walks = true;
  const string failure = "tz_icu::initialize: fts_open of " + update +
                         "/icutz failed, Cannot allocate memory: Cannot allocate memory";
  EXPECT_EQ(hear([] { static_cast<void>(olm_icu(update)); }), (report{failure, "int 12"}));
  no_memory_for_walks = false;
}

TEST(olm_icu, accepts_its_kind_alone) {
  new_device("");
  EXPECT_TRUE(olm_zoneinfo().compatible_schema(olm_icu()));
  EXPECT_EQ(hear([] { EXPECT_FALSE(olm_icu().compatible_schema(olm_zoneinfo())); }),
            (report{"olm_icu::compatible_schema: could not dynamic_cast other component", "done"}));
}

TEST(olm_dataset, path) {
  new_device(version_file + " = 2019c");
  EXPECT_EQ(olm_dataset("").get_name(), "2019c.1.0");
  EXPECT_TRUE(olm_dataset("").same_path(olm_dataset()));
  olm_dataset shorter;
  EXPECT_TRUE(shorter.compatible_with(olm_dataset()));
  shorter.components.pop_back();
  EXPECT_FALSE(shorter.compatible_with(olm_dataset()));
  EXPECT_FALSE(olm_dataset().compatible_with(shorter));
  for (const string bad : {"/var/db/timezone/tz/", "/usr/share/zoneinfo.default", "2019d.1.0"}) {
    const report heard = {"olm_dataset::create_components: bad path " + bad,
                          "invalid_argument badpath"};
    EXPECT_EQ(hear([&] { static_cast<void>(olm_dataset(bad)); }), heard);
  }
}

TEST(olm_dataset, path_from_link) {
  EXPECT_EQ(dataset_path_from_link("/usr/share/zoneinfo.default"), "");
  EXPECT_EQ(dataset_path_from_link(update + "/zoneinfo"), update);
  EXPECT_EQ(dataset_path_from_link(update + "/a/b"), update + "/a");
  EXPECT_EQ(dataset_path_from_link(base + "tz/x/"), base + "tz/x");
  for (const string& bad :
       {string(), update, base + "tz/", base + "tz//zoneinfo", "/tmp" + update,
        string("/usr/share/zoneinfo"), string("/usr/share/zoneinfo.default/")}) {
    EXPECT_EQ(hear([&] { static_cast<void>(dataset_path_from_link(bad)); }),
              (report{"Bad zoneinfo link " + bad, "int -1"}));
  }
}

string protection_class(const string& name) {
  string letter(1, '?');
  const string path = base + name;
  const auto size = getxattr(path.c_str(), "user.protection_class", letter.data(), 1);
  return size == 1 ? letter : strerror(errno);
}

TEST(data_protection, keeps_errno_true) {
  new_device("tz /");
  ASSERT_EQ(mount("ramfs", (base + "tz").c_str(), "ramfs", 0, nullptr), 0);
  const olm_descriptor without_attributes(open((base + "tz").c_str(), O_RDONLY));
  errno = EXDEV;
  EXPECT_EQ(fcntl(without_attributes.get(), F_SETPROTECTIONCLASS, PROTECTION_CLASS_D), 0);
  EXPECT_EQ(errno, EXDEV);
  EXPECT_EQ(fcntl(-1, F_SETPROTECTIONCLASS, PROTECTION_CLASS_D), -1);
  EXPECT_EQ(errno, EBADF);
}

TEST(housekeeping, protects) {
  new_device("/usr/share/icu /\ntz /\nneeds_cleanup = kept");
  const bool attributes = setxattr(base.c_str(), "user.probe", "", 0, 0) == 0;
  const string recorded = attributes ? "D" : strerror(ENOTSUP);
  touch_needs_cleanup();
  EXPECT_EQ(look(), list("needs_cleanup = kept"));
  EXPECT_EQ(protection_class("needs_cleanup"), strerror(attributes ? ENODATA : ENOTSUP));
  lay_out("needs_cleanup -");
  const auto count_open = [] {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
  };
  const auto open_before = count_open();
  EXPECT_EQ(hear([] {
              protect_directories();
              touch_needs_cleanup();
            }),
            report{"done"});
  EXPECT_EQ(count_open(), open_before);
  EXPECT_EQ(protection_class("needs_cleanup"), recorded);
  EXPECT_EQ(std::filesystem::status(base + "needs_cleanup").permissions(),
            std::filesystem::perms(0644));
  new_device("tz /");
  EXPECT_EQ(start().back(), "exit 0");
  EXPECT_EQ(protection_class(""), recorded);
  EXPECT_EQ(protection_class("tz"), recorded);
  new_device("");
  EXPECT_EQ(
      hear(touch_needs_cleanup),
      (report{"Cannot touch file " + base + "needs_cleanup: No such file or directory", "done"}));
}

}  // namespace
