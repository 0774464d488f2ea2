#include "boot/confine.h"

#include <err.h>
#include <fcntl.h>
#include <linux/capability.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <fstream>
#include <string>

#include "fs/olm_descriptor.h"

namespace {

// What follows is the kernel's; its header here may be older than the kernel.
enum right : std::uint64_t {
  write_file = 1 << 1,
  read_file = 1 << 2,
  read_directory = 1 << 3,
  remove_directory = 1 << 4,
  remove_file = 1 << 5,
  make_file = 1 << 8,
  make_link = 1 << 12,
  truncate_file = 1 << 14
};

constexpr std::uint64_t reading = read_file | read_directory;
constexpr std::uint64_t writing =
    write_file | remove_directory | remove_file | make_file | make_link | truncate_file;

// All that a process is to be kept from unless a rule allows it.
struct ruleset_attributes {
  std::uint64_t files;
  std::uint64_t connections;
  std::uint64_t scopes;  // signals and abstract sockets
};

struct [[gnu::packed]] rule_attributes {
  std::uint64_t rights;
  std::int32_t directory;
};

long ask_version() {
  constexpr int version_flag = 1;
  return syscall(SYS_landlock_create_ruleset, nullptr, 0, version_flag);
}

// All that is known here of what a kernel of this version can keep a process from. More was added
// with most versions.
ruleset_attributes get_everything(long version) {
  constexpr std::array<int, 5> numbers_of_file_rights = {13, 14, 15, 15, 16};
  constexpr long with_connections = 4;
  constexpr long with_scopes = 6;
  const auto last = static_cast<long>(numbers_of_file_rights.size());
  const int number =
      numbers_of_file_rights.at(static_cast<std::size_t>(std::min(version, last) - 1));
  constexpr std::uint64_t both = 3;
  return {.files = (std::uint64_t{1} << number) - 1,
          .connections = version >= with_connections ? both : 0,
          .scopes = version >= with_scopes ? both : 0};
}

// Whether the rule set `rules` lets the process use `allowed`, or it is no directory.
bool allow(const olm_descriptor& rules, const allowed_directory& allowed, std::uint64_t known) {
  // With O_DIRECTORY, a mount that is made when it is looked at is made now.
  const olm_descriptor directory(open(allowed.path, O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!directory.is_open()) return is_no_directory(errno);
  const rule_attributes rule = {(allowed.may_write ? reading | writing : reading) & known,
                                directory.get()};
  constexpr int files_below = 1;
  return syscall(SYS_landlock_add_rule, rules.get(), files_below, &rule, 0) == 0;
}

// Null, or what failed, with errno set.
const char* confine_files() {
  constexpr const char* making = "landlock_create_ruleset";
  const long version = ask_version();
  if (version < 1) return making;
  const ruleset_attributes everything = get_everything(version);
  const olm_descriptor rules(
      static_cast<int>(syscall(SYS_landlock_create_ruleset, &everything, sizeof everything, 0)));
  if (!rules.is_open()) return making;
  for (const allowed_directory& allowed : allowed_directories)
    if (!allow(rules, allowed, everything.files)) return allowed.path;
  const bool is_confined = syscall(SYS_landlock_restrict_self, rules.get(), 0) == 0;
  return is_confined ? nullptr : "landlock_restrict_self";
}

bool has_capabilities() {
  std::ifstream status("/proc/self/status");
  std::string word;
  while (status >> word && word != "CapPrm:") {
  }
  status >> word;
  return !status || word.find_first_not_of('0') != std::string::npos;
}

void give_up_capabilities() {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  const std::array<__user_cap_data_struct, _LINUX_CAPABILITY_U32S_3> none{};
  // The unit's filter refuses it, but there the process has none.
  if (syscall(SYS_capset, &header, none.data()) != 0 && has_capabilities())
    warnx("going on with capabilities");
}

}  // namespace

bool is_no_directory(int error) { return error == ENOENT || error == ENOTDIR || error == ELOOP; }

bool can_confine() { return ask_version() >= 1; }

void confine_process() {
  prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0);
  give_up_capabilities();
  if (const char* const why = confine_files(); why != nullptr) {
    warn("going on unconfined: %s", why);
  } else {
    for (const allowed_directory& allowed : allowed_directories)
      if (chdir(allowed.path) == 0 && access(".", R_OK) == 0) break;
  }
  errno = 0;
}
