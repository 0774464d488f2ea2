#include "update/olm_state.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <stdexcept>

#include "dataset/olm_dataset.h"
#include "driver/housekeeping.h"
#include "update/failure.h"

namespace {

using std::string;
namespace filesystem = std::filesystem;

constexpr const char* new_link = "/var/db/timezone/tz_latest.new";

olm_descriptor open_directory(const string& path) {
  const int opened = open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (opened == -1) fail(path);
  return olm_descriptor(opened);
}

void sync_directory(const olm_descriptor& directory, const char* path) {
  if (fsync(directory.get()) != 0) fail(path);
}

}  // namespace

void sync_all(const string& directory) {
  if (syncfs(open_top(directory).opened.get()) != 0) fail(directory);
}

olm_state::olm_state()
    : links_(open_directory(state_directory)), updates_(open_directory(update_area)) {
  // The kernel frees it when the process ends, however that happens.
  if (flock(links_.get(), LOCK_EX | LOCK_NB) != 0) {
    if (errno != EWOULDBLOCK) fail(state_directory);
    throw std::runtime_error("another tzdata-update is at work");
  }
  filesystem::remove_all(part_directory);
  if (filesystem::exists(filesystem::symlink_status(new_link))) filesystem::remove(new_link);
}

olm_state::~olm_state() {
  std::error_code failure;  // the next one removes it
  filesystem::remove_all(part_directory, failure);
  filesystem::remove(new_link, failure);
}

olm_directory make_part() {
  constexpr mode_t open_to_all = 0755;
  if (mkdir(part_directory, open_to_all) != 0) fail(part_directory);
  return open_top(part_directory);
}

void put_in_place(const string& update) {
  if (std::rename(part_directory, update.c_str()) != 0) fail(update);
}

// Under its own name, a part of it would be taken for the whole.
void remove_update(const string& update) {
  if (std::rename(update.c_str(), part_directory) != 0) fail(update);
  filesystem::remove_all(part_directory);
}

void olm_state::set_link(const string& path, const string& target) const {
  // What it leads to must not come onto the disk after it.
  sync_directory(updates_, update_area);
  if (target.empty()) {
    if (unlink(path.c_str()) != 0 && errno != ENOENT) fail(path);
    return;
  }
  if (symlink(target.c_str(), new_link) != 0) fail(new_link);
  if (std::rename(new_link, path.c_str()) != 0) fail(path);
}

void olm_state::sync_links() const { sync_directory(links_, state_directory); }
