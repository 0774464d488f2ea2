#pragma once

#include <string>

#include "dataset/olm_dataset_component.h"

// The link through which the device's programs find the zone files in use.
inline constexpr const char* zoneinfo_link = "/var/db/timezone/zoneinfo";

// Where the system partition keeps its zone files.
inline constexpr const char* system_zoneinfo_directory = "/usr/share/zoneinfo.default";

// Where an update keeps its zone files.
inline constexpr const char* update_zoneinfo_directory = "/zoneinfo";

// The file among the zone files that holds their version.
inline constexpr const char* version_file = "/+VERSION";

// The compiled zone files of a data set.
class olm_zoneinfo final : public olm_dataset_component {
 public:
  // The system partition's zone files; the same as an empty `path`.
  olm_zoneinfo();

  // The zone files of the data set at `path`. Reads the file "+VERSION" among them; one that is
  // missing or empty is no failure. Throws only for want of memory, prints nothing.
  explicit olm_zoneinfo(const std::string& path);

  // A copy of version_text. Prints nothing.
  [[nodiscard]] std::string get_version_text() const;

  // Always true, for a component of any kind. Prints nothing.
  [[nodiscard]] bool compatible_schema(const olm_dataset_component& other) const override;

  // Re-points /var/db/timezone/zoneinfo at `directory`. Prints "Unlink of zoneinfo softlink failed"
  // when the old link stays, and throws the errno of a link that cannot be made.
  void install_link() const override;

  std::string directory;     // the zone-file directory
  std::string version_text;  // the first word of its "+VERSION"; empty when there is none

 private:
  void read_version();
};
