// Takes on a boot's sandbox, tries what that must let through and what it must keep off, and prints
// a line for each thing that it could do. With an argument it stays outside, where all can be done:
// so each try could fail. It does so in a private root only.
#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <fstream>
#include <string>

#include "boot/confine.h"

namespace {

// Files outside, of which the second is to be made, and links that lead there.
constexpr const char* outside = "/var/outside";
constexpr const char* made = "/var/made";
constexpr const char* link_to_file = "/var/db/sandbox-file";
constexpr const char* link_to_directory = "/var/db/sandbox-directory";

void say(const char* what, bool can_be_done) {
  if (can_be_done) std::puts(what);
}

bool can_open(const char* path, int flags) { return open(path, flags, 0644) != -1; }

bool can_link(const char* path, const char* target) {
  return symlink(target, path) == 0 || errno == EEXIST;
}

bool can_start_process() {
  const pid_t child = fork();
  if (child == 0) _exit(0);
  return child != -1 && waitpid(child, nullptr, 0) == child;
}

// Whether the process that this file tells of has capabilities, or may get some.
bool has_powers(std::istream& status) {
  bool answer = false;
  for (std::string word; status >> word;) {
    if (word == "CapPrm:" && status >> word)
      answer |= word.find_first_not_of('0') != std::string::npos;
    if (word == "NoNewPrivs:" && status >> word) answer |= word == "0";
  }
  return answer;
}

}  // namespace

int main(int count, char** /*arguments*/) {
  if (access("/var/private-root", F_OK) != 0 || !can_open(outside, O_CREAT | O_WRONLY) ||
      !can_link(link_to_file, outside) || !can_link(link_to_directory, "/etc"))
    return 1;
  const char* const secret = access("/etc/shadow", R_OK) == 0 ? "/etc/shadow" : "/etc/passwd";
  std::ifstream status("/proc/self/status");
  if (count == 1) confine_process();

  say("reads below /usr/share", can_open("/usr/share/zoneinfo.default/+VERSION", O_RDONLY));
  say("writes below /var/db",
      can_open("/var/db/sandbox-made", O_CREAT | O_WRONLY) && unlink("/var/db/sandbox-made") == 0);
  say("reads a file", can_open(secret, O_RDONLY));
  say("reads through a link",
      can_open((std::string(link_to_directory) + "/passwd").c_str(), O_RDONLY));
  say("writes through a link", can_open(link_to_file, O_WRONLY | O_TRUNC));
  say("makes a file",
      can_open(made, O_CREAT | O_WRONLY) || can_open("/usr/share/made", O_CREAT | O_WRONLY));
  say("makes a link",
      symlink(outside, "/var/made-link") == 0 || link(outside, "/var/db/sandbox-made") == 0);
  say("cuts a file short", truncate(outside, 0) == 0);
  say("opens a device", can_open("/dev/null", O_RDWR));
  say("opens a device below /var/db", can_open("/var/db/sandbox-device", O_RDWR));
  say("reads the kernel's settings", can_open("/proc/sys/kernel/hostname", O_RDONLY));
  say("signals", kill(getppid(), 0) == 0);
  const sockaddr local{.sa_family = AF_INET, .sa_data = {}};
  say("opens a port", bind(socket(AF_INET, SOCK_STREAM, 0), &local, sizeof local) == 0);
  say("makes a socket", socket(AF_INET, SOCK_STREAM, 0) != -1);
  say("starts a process", can_start_process());
  say("changes a mode", chmod(outside, 0600) == 0);
  say("changes a time", utimensat(AT_FDCWD, outside, nullptr, 0) == 0);
  say("changes an attribute", setxattr(outside, "user.made", "", 0, 0) == 0 || errno == ENOTSUP);
  say("removes a file", unlink(outside) == 0);
  say("has powers", has_powers(status));
  static_cast<void>(std::fflush(stdout));
  execl("/bin/echo", "echo", "runs a program", nullptr);
  _exit(0);
}
