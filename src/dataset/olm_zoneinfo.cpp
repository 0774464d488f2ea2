#include "dataset/olm_zoneinfo.h"

#include "fs/device.h"
#include "fs/file_operations.h"

olm_zoneinfo::olm_zoneinfo() : olm_zoneinfo(std::string()) {}

olm_zoneinfo::olm_zoneinfo(const std::string& path)
    : olm_dataset_component(path),
      directory(path.empty() ? system_zoneinfo_directory : path + update_zoneinfo_directory) {
  read_version();
}

void olm_zoneinfo::read_version() {
  version_text = device::read_first_word(directory + version_file);
}

std::string olm_zoneinfo::get_version_text() const { return version_text; }

bool olm_zoneinfo::compatible_schema(const olm_dataset_component& /*other*/) const { return true; }

void olm_zoneinfo::install_link() const {
  try {
    fs::remove(zoneinfo_link);
  } catch (...) {
    device::warn("Unlink of zoneinfo softlink failed");
  }
  fs::create_symlink(directory, zoneinfo_link);
}
