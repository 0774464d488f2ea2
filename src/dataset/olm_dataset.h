#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "dataset/olm_dataset_component.h"
#include "dataset/olm_version.h"

// The directory below which each update has a directory of its own, named by its version.
inline constexpr const char* update_area = "/var/db/timezone/tz/";

// The link that names the newest update.
inline constexpr const char* latest_link = "/var/db/timezone/tz_latest";

// One complete time-zone data set: the system partition's, or an update. It is whole once it is
// built, and nothing changes it afterwards.
class olm_dataset {
 public:
  // The system partition's data set; the same as an empty `directory`.
  olm_dataset();

  // The data set in `directory`, whose components read their files at once. An update's name is
  // what follows update_area in `directory`; the system partition's is its zone files' version with
  // ".1.0" behind it. A name that is no version is no failure: olm_version::parse prints its
  // warnings and the version is unknown.
  // Prints "olm_dataset::create_components: bad path ..." and throws std::invalid_argument when
  // `directory` is neither empty nor below update_area. Throws what olm_version::parse and olm_icu
  // throw.
  explicit olm_dataset(std::string directory);

  // Whether each component of this data set accepts the component at the same place in `other`.
  // Asked of a candidate about the system partition, not the other way round.
  // Prints what the components' compatible_schema prints.
  [[nodiscard]] bool compatible_with(const olm_dataset& other) const;

  // Whether both have the same path, byte for byte. Prints nothing.
  [[nodiscard]] bool same_path(const olm_dataset& other) const;

  // Whether this data set's version is newer; nothing else is compared. Prints nothing.
  [[nodiscard]] bool operator>(const olm_dataset& other) const;

  // Re-points the links, the zone files' first, then the ICU data's. Prints and throws what the
  // components' install_link does; links after one that fails are left as they were.
  void install_links() const;

  // A copy of `name`. Prints nothing.
  [[nodiscard]] std::string get_name() const;

  olm_version version;
  std::string name;
  std::string path;  // as given; empty for the system partition
  std::vector<std::shared_ptr<olm_dataset_component>> components;  // zoneinfo, then ICU

 private:
  void create_components();
};

// Whether the current data set may stay in use: it is fit, and no older than the system
// partition's. Prints what compatible_with prints.
[[nodiscard]] bool may_stay(const olm_dataset& current, const olm_dataset& system);

// Whether the latest update is to be used: it is fit, and newer than the current data set, even if
// that may not stay. Prints what compatible_with prints.
[[nodiscard]] bool takes_over(const olm_dataset& latest, const olm_dataset& current,
                              const olm_dataset& system);

// The target of latest_link; empty when there is no such link. Nothing checks it here. Prints and
// throws what fs::read_symlink does.
[[nodiscard]] std::string latest_dataset_path();

// The path of the data set whose zone files a zoneinfo link with `target` leads to; empty for the
// system partition. None when `target` is neither the system partition's directory nor something in
// a directory below update_area. Prints nothing.
[[nodiscard]] std::optional<std::string> find_dataset_path(const std::string& target);

// The same, but where there is none, prints "Bad zoneinfo link ..." and throws the int -1.
[[nodiscard]] std::string dataset_path_from_link(const std::string& target);

// The same for the link /var/db/timezone/zoneinfo as it is; a missing link is a bad one.
// Prints and throws what fs::read_symlink and dataset_path_from_link do.
[[nodiscard]] std::string current_dataset_path();
