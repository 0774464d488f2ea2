#include "testbed/private_root.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <system_error>

namespace private_root {
namespace {

namespace files = std::filesystem;

// What a program needs to run, where the machine has it.
constexpr std::array machine_directories = {"/bin",     "/sbin",      "/lib",       "/lib32",
                                            "/lib64",   "/etc",       "/usr/bin",   "/usr/sbin",
                                            "/usr/lib", "/usr/lib32", "/usr/lib64", "/usr/libexec"};

constexpr std::array device_directories = {"/var/db", "/usr/share"};

// The device number of the private root; 0 until this process is in it.
dev_t& own_device() {
  static dev_t device = 0;
  return device;
}

void check(int result, const std::string& step) {
  if (result == -1) {
    throw std::system_error(errno, std::generic_category(),
                            "cannot make a private root (it takes root, or a kernel that "
                            "allows user namespaces): " +
                                step);
  }
}

dev_t get_device(const char* path) {
  struct stat status {};
  check(stat(path, &status), std::string("stat ") + path);
  return status.st_dev;
}

void write_file(const files::path& path, const std::string& text) {
  std::ofstream file(path);
  file << text << std::flush;
  check(file ? 0 : -1, "write " + path.string());
}

void leave_namespaces() {
  const uid_t user = geteuid();
  const gid_t group = getegid();
  if (unshare(CLONE_NEWNS) == 0) return;
  check(unshare(CLONE_NEWNS | CLONE_NEWUSER), "mount and user namespace");
  write_file("/proc/self/setgroups", "deny");
  write_file("/proc/self/uid_map", "0 " + std::to_string(user) + " 1");
  write_file("/proc/self/gid_map", "0 " + std::to_string(group) + " 1");
}

void mount_memory(const files::path& directory) {
  files::create_directories(directory);
  check(mount("tmpfs", directory.c_str(), "tmpfs", 0, "mode=755"), "tmpfs");
}

void bind(const files::path& source, const files::path& directory, unsigned long depth) {
  files::create_directories(directory);
  check(mount(source.c_str(), directory.c_str(), nullptr, MS_BIND | depth, nullptr),
        "bind " + source.string());
}

void bind_read_only(const files::path& source, const files::path& directory, unsigned long depth) {
  bind(source, directory, depth);
  mount_attr read_only{};
  read_only.attr_set = MOUNT_ATTR_RDONLY;
  check(mount_setattr(AT_FDCWD, directory.c_str(), depth == 0 ? 0 : AT_RECURSIVE, &read_only,
                      sizeof read_only),
        "read-only " + source.string());
}

// Where a path of the machine's stands below the private root.
files::path place(const files::path& path) {
  return files::path(MOUNT_POINT) / path.relative_path();
}

void bring_in(const files::path& directory) {
  if (files::is_symlink(directory)) {
    files::copy_symlink(directory, place(directory));
  } else if (files::is_directory(directory)) {
    bind_read_only(directory, place(directory), MS_REC);
  }
}

}  // namespace

void enter() {
  // A device's files can be read by all, whatever the tester's own files can.
  umask(S_IWGRP | S_IWOTH);
  leave_namespaces();
  check(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), "private mounts");
  mount_memory(MOUNT_POINT);
  for (const char* directory : {"/usr", "/tmp"}) files::create_directory(place(directory));
  for (const char* directory : machine_directories) bring_in(directory);
  for (const char* directory : {"/proc", "/dev"}) bind(directory, place(directory), MS_REC);
  bind_read_only(SOURCE_DIRECTORY, place(SOURCE_DIRECTORY), 0);
  bind(BUILD_DIRECTORY, place(BUILD_DIRECTORY), 0);
  write_file(place("/.private-root"), "");
  const dev_t device = get_device(MOUNT_POINT);
  check(chroot(MOUNT_POINT), "chroot");
  check(chdir("/"), "chdir");
  own_device() = device;
  renew_device();
}

void require() {
  if (own_device() == 0 || get_device("/") != own_device()) {
    throw std::logic_error("not inside a private root");
  }
}

void renew_device() {
  require();
  for (const char* directory : device_directories) {
    // Fails where nothing is mounted yet, the first time.
    umount2(directory, MNT_DETACH);
    mount_memory(directory);
  }
}

}  // namespace private_root
