// What whole starts do not show: versions, names and paths one by one, the protection class, errno.
#include <dlfcn.h>
#include <fcntl.h>
#include <fts.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <functional>
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

// What `action` prints, then what it throws.
string hear(const std::function<void()>& action) {
  testing::internal::CaptureStderr();
  string thrown = "nothing";
  try {
    action();
  } catch (int value) {
    thrown = std::to_string(value);
  } catch (const std::out_of_range&) {
    thrown = "out_of_range";
  }
  return testing::internal::GetCapturedStderr() + thrown;
}

TEST(olm_version, parse) {
  const std::pair<string, string> rows[] = {
      {"2019c.1.0", "2019 c 1 0"},
      {"2019c.1", "2019 c 1 -1"},
      {"02019cc.007", "2019 cc 7 -1"},
      {"2147483647z.0.2147483647", "2147483647 z 0 2147483647"},
      // The fields before the number that does not fit are set, the others are as they were.
      {"2147483648c", "7 x 8 9 out_of_range"},
      {"2019c.99999999999", "2019 c 8 9 out_of_range"},
      {"2019c.1.99999999999", "2019 c 1 9 out_of_range"},
  };
  const auto parse = [](const string& text) {
    olm_version version("7x.8.9");
    const string thrown = hear([&] { version.parse(text); });
    return std::to_string(version.year) + ' ' + version.letters + ' ' +
           std::to_string(version.major) + ' ' + std::to_string(version.minor) +
           (thrown.ends_with("out_of_range") ? " out_of_range" : "");
  };
  for (const auto& [text, expected] : rows) EXPECT_EQ(parse(text), expected) << text;
  for (const char* text : {"2019", "2019C.1.0", "2019c.", "2019c-1.0", "2019c.1-0", "2019c.1.0.0",
                           "2019c.1.0/", "c2019", " 2019c", "2019c ", "", "2019c.-1", "2019\xE9"})
    EXPECT_EQ(parse(text), "-1  -1 -1") << text;
  const string newest_first[] = {"2020a",     "2019z",   "2019d", "2019cc", "2019c.10.1", "2019c.2",
                                 "2019c.1.9", "2019c.1", "2019c", "0a",     "no version"};
  for (const string& one : newest_first) {
    for (const string& other : newest_first)
      EXPECT_EQ(olm_version(one) > olm_version(other), &one < &other) << one << " > " << other;
  }
}

TEST(olm_icu, read_schema) {
  for (const char* name :
       {"icutz44L.dat", "icutz44.dat", "icutz44a.dat", "icutz44lb.dat", "icutz4l4l.dat",
        "icutz44l.dat.bak", "icutz44lxdat", "x-icutz44l.dat", "icutzformat.txt", ""})
    EXPECT_EQ(read_schema(name), "") << name;
  EXPECT_EQ(read_schema("icutz7e.dat") + read_schema("icutz064b.dat"), "7e064b");
  // The compiled patterns ask the locale nothing, so they cannot know what these mean.
  for (const char* refused : {"[[:digit:]]", "\\d", "[\\w]", "[[=a=]]", "[[.a.]]", "[a"})
    EXPECT_THROW(static_cast<void>(compile_pattern(refused)), std::regex_error) << refused;
}

TEST(olm_dataset, is_compared) {
  lay_out(file(at::version, "2019c"));
  const olm_dataset system;
  EXPECT_TRUE(olm_dataset("").same_path(system));
  EXPECT_TRUE(olm_zoneinfo().compatible_schema(olm_icu()));
  EXPECT_FALSE(olm_icu().compatible_schema(olm_zoneinfo()));
  olm_dataset odd;
  odd.components.pop_back();
  EXPECT_FALSE(odd.compatible_with(system));
  EXPECT_FALSE(system.compatible_with(odd));
}

TEST(olm_dataset, path_from_link) {
  const string update = at::updates + "2019d.1.0";
  EXPECT_EQ(dataset_path_from_link(update + "/a/b"), update + "/a");
  EXPECT_EQ(dataset_path_from_link(at::updates + "x/"), at::updates + "x");
  for (const string& bad :
       {string(), update, at::updates, at::updates + "/zoneinfo", "/tmp" + update,
        at::system_zoneinfo + "/", string("/usr/share/zoneinfo")}) {
    EXPECT_TRUE(hear([&] { static_cast<void>(dataset_path_from_link(bad)); }).ends_with("-1"))
        << bad;
  }
}

// A warning ends with the text of the call that failed, and its errno is thrown.
TEST(failures, keep_errno) {
  lay_out(file(at::marker, ""));
  const std::pair<std::function<void()>, int> rows[] = {
      {[] { fs::remove(at::marker + "/x"); }, ENOTDIR},
      {[] { static_cast<void>(fs::read_symlink(at::marker)); }, EINVAL},
      {[] { fs::create_symlink("x", at::marker); }, EEXIST},
      {[] { static_cast<void>(olm_icu(at::updates + "x")); }, ENOMEM},
  };
  no_memory_for_walks = true;
  for (const auto& [action, error] : rows) {
    EXPECT_TRUE(
        hear(action).ends_with(": " + string(strerror(error)) + "\n" + std::to_string(error)));
  }
  no_memory_for_walks = false;
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
  lay_out(folder(at::updates) + link_to(at::marker, "tz_latest") + file(at::latest, "kept"));
  const bool attributes = setxattr(at::base.c_str(), "user.probe", "", 0, 0) == 0;
  protect_directories();
  touch_needs_cleanup();
  EXPECT_EQ(look().at(at::latest), "kept");
  EXPECT_EQ(get_protection_class(at::latest), " ");
  fs::remove(at::marker);
  umask(0);
  touch_needs_cleanup();
  EXPECT_EQ(std::filesystem::status(at::marker).permissions(), std::filesystem::perms(0666));
  for (const string& path : {at::base, at::updates, at::marker})
    EXPECT_EQ(get_protection_class(path), attributes ? "D" : " ") << path;
  fs::remove(at::marker);
  EXPECT_EQ(get_errno_after_opening(at::marker), EXDEV);
  EXPECT_EQ(get_errno_after_opening(at::base + "missing/new"), ENOENT);
  // No attributes there.
  ASSERT_EQ(mount("ramfs", at::updates.c_str(), "ramfs", 0, nullptr), 0);
  const olm_descriptor opened(open(at::updates.c_str(), O_RDONLY));
  errno = EXDEV;
  EXPECT_EQ(fcntl(opened.get(), F_SETPROTECTIONCLASS, PROTECTION_CLASS_D), 0);
  EXPECT_EQ(errno, EXDEV);
  EXPECT_EQ(fcntl(-1, F_SETPROTECTIONCLASS, PROTECTION_CLASS_D), -1);
  EXPECT_EQ(errno, EBADF);
}

}  // namespace
