#include "dataset/olm_selection.h"

std::string olm_selection::read_current_path() {
  try {
    return current_dataset_path();
  } catch (...) {
    reset_bad_link();
    return {};
  }
}

void olm_selection::select() {
  const olm_dataset system;
  const std::string latest_path = find_latest();
  const olm_dataset current(read_current_path());

  const bool current_is_unfit = !current.compatible_with(system) || system > current;
  if (current_is_unfit) give_up(current, system);
  const olm_dataset& in_use = current_is_unfit ? system : current;

  if (latest_path.empty()) return;
  const olm_dataset latest(latest_path);
  if (latest.compatible_with(system) && latest > current) {
    install(latest, in_use, system);
  } else {
    refuse(latest, current, system);
  }
}
