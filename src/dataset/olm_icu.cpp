#include "dataset/olm_icu.h"

#include <err.h>
#include <fts.h>
#include <sys/stat.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <memory>
#include <regex>

#include "dataset/first_word.h"
#include "dataset/pattern.h"
#include "fs/file_operations.h"

namespace {

struct walk_closer {
  void operator()(FTS* walk) const { fts_close(walk); }
};

// A regular file directly in the walked directory that others may read.
bool may_hold_data(const FTSENT& entry) {
  return entry.fts_errno == 0 && entry.fts_level == 1 && entry.fts_namelen != 0 &&
         entry.fts_info == FTS_F && (entry.fts_statp->st_mode & S_IROTH) != 0;
}

// The schema in the name of the first ICU data file in `directory`, or nothing. Prints and throws
// errno when the walk cannot be started.
std::string find_schema(std::string directory) {
  static const olm_pattern pattern = compile_pattern(R"(icutz([0-9]+[lbe])\.dat)");
  const std::array<char*, 2> roots = {directory.data(), nullptr};
  const std::unique_ptr<FTS, walk_closer> walk(
      fts_open(roots.data(), FTS_COMFOLLOW | FTS_PHYSICAL | FTS_XDEV, nullptr));
  if (!walk) {
    warn("tz_icu::initialize: fts_open of %s failed, %s", directory.c_str(), std::strerror(errno));
    throw errno;
  }
  while (const FTSENT* entry = fts_read(walk.get())) {
    if (!may_hold_data(*entry)) continue;
    std::cmatch match;
    if (std::regex_match(&entry->fts_name[0], match, pattern)) return match[1];
  }
  return {};
}

}  // namespace

olm_icu::olm_icu() : olm_icu(std::string()) {}

olm_icu::olm_icu(const std::string& path)
    : olm_dataset_component(path),
      directory(path.empty() ? system_icu_directory : path + "/icutz") {
  initialize();
}

void olm_icu::initialize() {
  if (dataset_path.empty()) {
    schema = read_first_word(directory + schema_file);
    return;
  }
  schema = find_schema(directory);
  if (schema.empty()) warn("No ICU schema found for %s", dataset_path.c_str());
}

bool olm_icu::compatible_schema(const olm_dataset_component& other) const {
  const auto* other_icu = dynamic_cast<const olm_icu*>(&other);
  if (other_icu == nullptr) {
    warn("olm_icu::compatible_schema: could not dynamic_cast other component");
    return false;
  }
  return schema == other_icu->schema;
}

void olm_icu::install_link() const {
  try {
    fs::remove(icutz_link);
    fs::remove(legacy_icutz_link);
  } catch (...) {
    warn("unlink of ICU softlink failed");
  }
  if (!dataset_path.empty()) fs::create_symlink(directory, icutz_link);
}
