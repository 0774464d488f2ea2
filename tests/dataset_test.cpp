// The link operations, the components, the data sets and the marker: what they find, print, throw
// and leave behind.
#include <dlfcn.h>
#include <fts.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <regex>
#include <type_traits>
#include <utility>

#include "dataset/olm_dataset.h"
#include "dataset/olm_icu.h"
#include "dataset/olm_zoneinfo.h"
#include "dataset/pattern.h"
#include "device.h"
#include "driver/housekeeping.h"
#include "fs/data_protection.h"
#include "fs/file_operations.h"
#include "fs/olm_descriptor.h"

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

const string update = at::updates + "2019d.1.0";

// What comes of a failed call whose error is thrown on.
report failed(const string& warning, int error) {
  return {warning + ": " + strerror(error), "int " + std::to_string(error)};
}

std::ptrdiff_t count_descriptors() {
  return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
}

TEST(file_operations, on_each_kind_of_entry) {
  lay_out(file(at::marker, "") + link_to(at::zone, at::zone));
  EXPECT_FALSE(fs::exists(at::zone));
  fs::remove(at::icutz + "/missing");
  EXPECT_EQ(hear([] { static_cast<void>(fs::read_symlink(at::zone + "/x")); }),
            failed("read_symlink: " + at::zone + "/x", ELOOP));
  EXPECT_EQ(hear([] { fs::remove(at::marker + "/x"); }),
            failed("remove: could not remove " + at::marker + "/x", ENOTDIR));
  EXPECT_EQ(hear([] { fs::create_symlink("%s", at::zone); }),
            failed("create_symlink: from " + at::zone + " to %s", EEXIST));
  fs::remove(at::zone);
  fs::create_symlink("%s", at::zone);
  EXPECT_EQ(fs::read_symlink(at::zone), "%s");
}

// The compiled patterns ask the locale nothing, so they cannot know what these mean.
TEST(pattern, refuses_classes) {
  for (const char* refused : {"[[:digit:]]", "\\d", "[\\w]", "[[=a=]]", "[[.a.]]", "[a"})
    EXPECT_THROW(static_cast<void>(compile_pattern(refused)), std::regex_error) << refused;
}

TEST(olm_icu, finds_the_schema) {
  const auto descriptors = count_descriptors();
  const string area = update + "/icutz";
  const std::pair<string, string> rows[] = {
      {"icutz7e.dat", "7e"},    {"icutz64b.dat", "64b"},  {"icutz44L.dat", ""},
      {"icutz44.dat", ""},      {"icutz44a.dat", ""},     {"icutz44lb.dat", ""},
      {"icutz4l4l.dat", ""},    {"icutz44l.dat.bak", ""}, {"icutz44lxdat", ""},
      {"x-icutz44l.dat", ""},   {"icutzformat.txt", ""},  {"sub/icutz44l.dat", ""},
      {"icutz44l.dat/sub", ""}, {"icutz44l.dat", "44l"},
  };
  for (const auto& [name, schema] : rows) {
    lay_out(file(area + "/" + name, "44l"));
    EXPECT_EQ(olm_icu(update).schema, schema) << name;
  }
  EXPECT_EQ(chmod((area + "/icutz44l.dat").c_str(), 0660), 0);
  EXPECT_EQ(olm_icu(update).schema, "");
  EXPECT_EQ(chmod((area + "/icutz44l.dat").c_str(), 0004), 0);
  EXPECT_EQ(olm_icu(update).schema, "44l");
  // The first in the directory's own order.
  lay_out(file(area + "/icutz1l.dat", "") + file(area + "/icutz2l.dat", ""));
  const auto first = std::filesystem::directory_iterator(area)->path().filename();
  EXPECT_EQ("icutz" + olm_icu(update).schema + ".dat", first);
  // The directory may be a link, a file in it may not.
  lay_out(link_to(area, at::icutz) + file(at::icutz + "/icutz44l.dat", ""));
  EXPECT_EQ(olm_icu(update).schema, "44l");
  lay_out(link_to(area + "/icutz44l.dat", "file") + file(area + "/file", ""));
  EXPECT_EQ(olm_icu(update).schema, "");
  no_memory_for_walks = true;
  EXPECT_EQ(
      hear([] { static_cast<void>(olm_icu(update)); }),
      failed("tz_icu::initialize: fts_open of " + area + " failed, " + strerror(ENOMEM), ENOMEM));
  no_memory_for_walks = false;
  EXPECT_EQ(count_descriptors(), descriptors);
}

TEST(olm_dataset, is_compared_and_named) {
  lay_out(file(at::version, "2019c") + file(at::schema, string("44l\0", 4)) +
          file(update + "/icutz/icutz44l.dat", ""));
  const olm_dataset system;
  EXPECT_EQ(system.get_name(), "2019c.1.0");
  EXPECT_TRUE(olm_dataset("").same_path(system));
  EXPECT_FALSE(olm_dataset(update).compatible_with(system));
  EXPECT_TRUE(olm_zoneinfo().compatible_schema(olm_icu()));
  olm_dataset odd(update);
  odd.path.back() = '1';
  EXPECT_FALSE(odd.same_path(olm_dataset(update)));
  odd.components[1] = odd.components[0];
  EXPECT_TRUE(odd.compatible_with(system));
  EXPECT_EQ(hear([&] { EXPECT_FALSE(system.compatible_with(odd)); }),
            (report{"olm_icu::compatible_schema: could not dynamic_cast other component", "done"}));
  odd.components.pop_back();
  EXPECT_FALSE(odd.compatible_with(system));
  EXPECT_FALSE(system.compatible_with(odd));
  for (const string& bad : {at::updates, at::latest, at::system_zoneinfo, string("2019d.1.0")})
    EXPECT_EQ(hear([&] { olm_dataset{bad}; }).back(), "invalid_argument badpath") << bad;
}

TEST(olm_dataset, path_from_link) {
  EXPECT_EQ(dataset_path_from_link(update + "/a/b"), update + "/a");
  EXPECT_EQ(dataset_path_from_link(at::updates + "x/"), at::updates + "x");
  for (const string& bad : {string(), update, at::updates, at::updates + "/zoneinfo",
                            "/tmp" + update, at::system_zoneinfo + "/"}) {
    EXPECT_EQ(hear([&] { static_cast<void>(dataset_path_from_link(bad)); }),
              (report{"Bad zoneinfo link " + bad, "int -1"}));
  }
}

// The class recorded at `path`, or a blank.
string get_protection_class(const string& path) {
  string letter(1, ' ');
  getxattr(path.c_str(), "user.protection_class", letter.data(), 1);
  return letter;
}

// What open_dprotected_np makes of an errno that was EXDEV.
int get_errno_after_opening(const string& path) {
  errno = EXDEV;
  const olm_descriptor opened(
      open_dprotected_np(path.c_str(), O_CREAT | O_RDWR, PROTECTION_CLASS_D, 0, 0666));
  return errno;
}

TEST(protection_class, is_recorded_and_keeps_errno_true) {
  lay_out(folder(at::updates) + file(at::schema, "44l") + link_to(at::marker, "tz_latest") +
          file(at::latest, "kept"));
  const bool attributes = setxattr(at::base.c_str(), "user.probe", "", 0, 0) == 0;
  const auto descriptors = count_descriptors();
  EXPECT_EQ(hear(touch_needs_cleanup), report{"done"});
  EXPECT_EQ(look().at(at::latest), "kept");
  EXPECT_EQ(get_protection_class(at::latest), " ");
  EXPECT_EQ(start().back(), "exit 0");
  umask(0);
  EXPECT_EQ(hear(touch_needs_cleanup), report{"done"});
  EXPECT_EQ(std::filesystem::status(at::marker).permissions(), std::filesystem::perms(0666));
  for (const string& path : {at::base, at::updates, at::marker})
    EXPECT_EQ(get_protection_class(path), attributes ? "D" : " ") << path;
  fs::remove(at::marker);
  EXPECT_EQ(get_errno_after_opening(at::marker), EXDEV);
  EXPECT_EQ(get_errno_after_opening(at::base + "missing/new"), ENOENT);
  EXPECT_EQ(count_descriptors(), descriptors);
  // No attributes there.
  ASSERT_EQ(mount("ramfs", at::updates.c_str(), "ramfs", 0, nullptr), 0);
  const olm_descriptor opened(open(at::updates.c_str(), O_RDONLY));
  errno = EXDEV;
  EXPECT_EQ(fcntl(opened.get(), F_SETPROTECTIONCLASS, PROTECTION_CLASS_D), 0);
  EXPECT_EQ(errno, EXDEV);
  EXPECT_EQ(fcntl(-1, F_SETPROTECTIONCLASS, PROTECTION_CLASS_D), -1);
  EXPECT_EQ(errno, EBADF);
  lay_out({});
  EXPECT_EQ(hear(touch_needs_cleanup),
            (report{"Cannot touch file " + at::marker + ": " + strerror(ENOENT), "done"}));
}

}  // namespace
