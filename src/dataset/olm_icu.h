#pragma once

#include <string>

#include "dataset/olm_dataset_component.h"

// The link through which the device's programs find the ICU data of the update in use; absent while
// the system partition is in use.
inline constexpr const char* icutz_link = "/var/db/timezone/icutz";

// Where that link stood in earlier systems.
inline constexpr const char* legacy_icutz_link = "/var/db/icutz";

// Where the system partition keeps its ICU data, and the file there that holds their schema.
inline constexpr const char* system_icu_directory = "/usr/share/icu";
inline constexpr const char* schema_file = "/icutzformat.txt";

// The schema in `name`, if that is the name of an ICU data file, such as icutz44l.dat; else empty.
// Prints nothing.
[[nodiscard]] std::string read_schema(const char* name);

// Where an update keeps its ICU data.
inline constexpr const char* update_icu_directory = "/icutz";

// Whether `text` has the form of a schema. Prints nothing.
[[nodiscard]] bool is_schema(const std::string& text);

// The ICU data of a data set. Its schema is the data's format on disk, such as 44l.
class olm_icu final : public olm_dataset_component {
 public:
  // The system partition's ICU data; the same as an empty `path`.
  olm_icu();

  // The ICU data of the data set at `path`. The system partition's schema is the first word of its
  // "icutzformat.txt"; a missing one is no failure. An update's is taken from the name of the first
  // ICU data file in its directory, in the directory's own order; where there is none, prints "No
  // ICU schema found for ...". Prints "tz_icu::initialize: fts_open of ... failed, ..." and throws
  // errno when the directory cannot be walked.
  explicit olm_icu(const std::string& path);

  // True when `other` is ICU data of an equal schema. Prints "olm_icu::compatible_schema: ..." when
  // it is a component of another kind.
  [[nodiscard]] bool compatible_schema(const olm_dataset_component& other) const override;

  // Removes /var/db/timezone/icutz, then the legacy /var/db/icutz, then, for an update, makes the
  // first point at `directory`. Prints "unlink of ICU softlink failed" when an old link stays; when
  // that is the first, the legacy link is not tried. Throws the errno of a link that cannot be
  // made.
  void install_link() const override;

  std::string schema;     // the data's format; empty when none was found
  std::string directory;  // the ICU data directory

 private:
  void initialize();
};
