#include "dataset/olm_dataset.h"

#include <algorithm>
#include <stdexcept>
#include <string_view>
#include <utility>

#include "dataset/olm_icu.h"
#include "dataset/olm_zoneinfo.h"
#include "fs/device.h"
#include "fs/file_operations.h"

namespace {

constexpr std::size_t update_area_length = std::string_view(update_area).size();

bool is_below_update_area(const std::string& path) {
  return path.size() > update_area_length && path.starts_with(update_area);
}

}  // namespace

olm_dataset::olm_dataset() : olm_dataset(std::string()) {}

olm_dataset::olm_dataset(std::string directory) : path(std::move(directory)) {
  create_components();
}

void olm_dataset::create_components() {
  const std::shared_ptr<olm_zoneinfo> zoneinfo(new olm_zoneinfo(path));
  if (path.empty()) {
    name = zoneinfo->get_version_text() + ".1.0";
  } else if (is_below_update_area(path)) {
    name = path.substr(update_area_length);
  } else {
    device::warn("olm_dataset::create_components: bad path %s", path.c_str());
    throw std::invalid_argument("badpath");
  }
  version.parse(name);
  components.push_back(zoneinfo);
  components.push_back(std::shared_ptr<olm_icu>(new olm_icu(path)));
}

bool olm_dataset::compatible_with(const olm_dataset& other) const {
  const auto [ours, theirs] = std::mismatch(
      components.begin(), components.end(), other.components.begin(), other.components.end(),
      [](const auto& one, const auto& another) { return one->compatible_schema(*another); });
  return ours == components.end() && theirs == other.components.end();
}

bool olm_dataset::same_path(const olm_dataset& other) const { return path == other.path; }

bool olm_dataset::operator>(const olm_dataset& other) const { return version > other.version; }

void olm_dataset::install_links() const {
  for (const auto& component : components) component->install_link();
}

std::string olm_dataset::get_name() const { return name; }

bool may_stay(const olm_dataset& current, const olm_dataset& system) {
  return current.compatible_with(system) && !(system > current);
}

bool takes_over(const olm_dataset& latest, const olm_dataset& current, const olm_dataset& system) {
  return latest.compatible_with(system) && latest > current;
}

std::string latest_dataset_path() { return fs::read_symlink(latest_link); }

std::optional<std::string> find_dataset_path(const std::string& target) {
  if (target == system_zoneinfo_directory) return "";
  const std::size_t last_slash = target.rfind('/');
  const bool is_in_update = is_below_update_area(target) && last_slash > update_area_length;
  return is_in_update ? std::optional(target.substr(0, last_slash)) : std::nullopt;
}

std::string dataset_path_from_link(const std::string& target) {
  if (auto path = find_dataset_path(target)) return *std::move(path);
  device::warn("Bad zoneinfo link %s", target.c_str());
  throw -1;
}

std::string current_dataset_path() {
  return dataset_path_from_link(fs::read_symlink(zoneinfo_link));
}
