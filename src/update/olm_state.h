#pragma once

#include <string>

#include "fs/olm_descriptor.h"
#include "update/steps.h"

// What taking an update changes on the device, by one process at a time: each link in one step, and
// each directory in one step under its own name. Until then they stand under other names. What is
// left there goes with this object, and if the process was killed, when the next one is made. All
// but the destructor throws std::system_error where it fails. Nothing here prints.
class olm_state {
 public:
  // Throws std::runtime_error where another process is at work.
  olm_state();
  olm_state(const olm_state&) = delete;
  olm_state& operator=(const olm_state&) = delete;
  ~olm_state();

  // Makes `path`, in the state's directory, a link to `target`, in place of what is there, once the
  // names of all updates are on the disk. With an empty target, removes it.
  void set_link(const std::string& path, const std::string& target) const;

  // Sees that what set_link did is on the disk.
  void sync_links() const;

 private:
  olm_descriptor links_;
  olm_descriptor updates_;
};

// The rest is for whoever has that object. It throws std::system_error where it fails, and prints
// nothing.

// Where a new update stands until it has its name.
inline constexpr const char* part_directory = "/var/db/timezone/tz/.part";

// Makes that directory, which is empty then.
[[nodiscard]] olm_directory make_part();

// Gives that directory its name, `update`.
void put_in_place(const std::string& update);

// Removes the directory `update`, be it ever so large.
void remove_update(const std::string& update);

// Sees that all that changed in the file system of `directory` is on the disk.
void sync_all(const std::string& directory);
