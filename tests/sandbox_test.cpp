// A boot's sandbox: what it keeps off, and how a boot goes on where there is none.
#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <unistd.h>

#include "starts.h"

namespace {

using std::string;

// What sandbox_probe.cpp tries, and the version of Landlock that is the first to keep it off.
constexpr long without = -1;
constexpr long never = 1000;
const std::vector<std::pair<long, report>> tries = {
    {never, {"reads below /usr/share", "writes below /var/db"}},
    {1,
     {"reads a file", "reads through a link", "writes through a link", "makes a file",
      "makes a link"}},
    {3, {"cuts a file short"}},
    {1, {"opens a device", "reads the kernel's settings"}},
    {6, {"signals"}},
    {4, {"opens a port"}},
    {never,
     {"makes a socket", "starts a process", "changes a mode", "changes a time",
      "changes an attribute"}},
    {1, {"removes a file"}},
    {without, {"has powers"}},
    {1, {"runs a program"}}};

TEST(sandbox, keeps_off) {
  lay_out(on_first);
  const long version = syscall(SYS_landlock_create_ruleset, nullptr, 0, 1);
  ASSERT_GE(version, 1) << "this kernel has no Landlock";
  report all;
  report left;
  for (const auto& [since, what] : tries) {
    all = all + what;
    if (version < since) left = left + what;
  }
  EXPECT_EQ(hear({PROGRAMS "/tests/sandbox-probe"}), left + report{"exit 0"});
  EXPECT_EQ(hear({PROGRAMS "/tests/sandbox-probe", "outside"}), all + report{"exit 0"});
}

// What a boot says on the device as it is, run by root, under strace.
report boot_as_root(const report& tracing) {
  return hear(report{"strace", "-o", "/dev/null", "-E", "ASAN_OPTIONS=detect_leaks=0"} + tracing +
              report{PROGRAMS "/tzdata-boot"});
}

TEST(sandbox, may_be_refused) {
  const string unconfined = "tzdata-boot: going on unconfined: ";
  const std::vector<std::pair<report, string>> rows = {
      {{"inject=landlock_create_ruleset:error=ENOSYS"},
       unconfined + "landlock_create_ruleset: Function not implemented"},
      {{"inject=landlock_create_ruleset:error=E2BIG:when=2"},
       unconfined + "landlock_create_ruleset: Argument list too long"},
      {{"inject=landlock_add_rule:error=ENOMEM"},
       unconfined + "/usr/share: Cannot allocate memory"},
      {{"inject=openat:error=EACCES:when=1", "-P", "/var/db"},
       unconfined + "/var/db: Permission denied"},
      {{"inject=landlock_restrict_self:error=EPERM"},
       unconfined + "landlock_restrict_self: Operation not permitted"},
      // Only if it is not really confined can a program that counts its lines write the counts
      // down.
      {{"inject=capset:error=EPERM", "-e", "inject=landlock_restrict_self:retval=0"},
       "tzdata-boot: going on with capabilities"}};
  for (const auto& [refusal, line] : rows) {
    SCOPED_TRACE(refusal[0]);
    lay_out(on_first);
    EXPECT_EQ(boot_as_root(report{"-e"} + refusal), (report{line, "exit 0"}));
    EXPECT_EQ(look(), change(change({}, on_first), links(second) + file(at::marker, "") +
                                                       file(at::record, "2020a.9.0_2020a.10.0")));
  }
}

// Also the text of errno, which neither confining itself nor looking for spares changes.
TEST(sandbox, leaves_a_start_its_words) {
  const entries before = on_second + link_to(at::legacy_icutz, "/usr/share/icu") +
                         file(at::marker, "") + file("/var/db/icu", "");
  lay_out(before);
  const report heard = hear({PROGRAMS "/tzdata-select"});
  EXPECT_TRUE(heard[0].ends_with(": Success")) << heard[0];
  lay_out(before);
  EXPECT_EQ(boot_as_root({}), heard);
}

// The directories of the system's ICU data and of the updates may be links to elsewhere; an
// update may not, unless nothing is confined.
TEST(sandbox, is_told_beforehand) {
  lay_out(update("/var/updates/2020a.9.0") + update("/var/elsewhere") +
          link_to("/var/updates/2020a.10.0", "/var/elsewhere") +
          file("/var/icu/icutzformat.txt", "44l"));
  const report unconfined = {"-e", "inject=landlock_create_ruleset:error=ENOSYS"};
  for (const auto& [tracing, used] : {std::pair{report{}, first}, {unconfined, second}}) {
    lay_out(on_first + link_to("/usr/share/icu", "/var/icu") +
            link_to(at::base + "tz", "/var/updates") +
            link_to(at::zone, "/usr/share/zoneinfo/Asia/Tokyo"));
    EXPECT_EQ(ask({"--query"}, tracing).at(9), "Next-Zoneinfo: " + used + "/zoneinfo");
    boot(tracing);
    EXPECT_EQ(look()[at::zoneinfo], "-> " + used + "/zoneinfo");
  }
}

}  // namespace
