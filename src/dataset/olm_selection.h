#pragma once

#include <string>

#include "dataset/olm_dataset.h"

// How a device's data set is chosen: the whole choice, and nothing that is done about it. That is
// the business of whoever goes through it, a start or a forecast of one; each says in its own way
// what follows from a turn that the choice has taken.
class olm_selection {
 public:
  // Keeps the current data set while it is fit to stand in for the system partition's and no older,
  // then has the latest update installed if that is fit, and newer than the current data set, even
  // if this has just been given up. Prints and throws what building a data set, reading the links
  // and the functions below do; but a zoneinfo link that cannot be read or understood counts as one
  // to the system partition, once reset_bad_link has been called.
  void select();

 protected:
  ~olm_selection() = default;

  // The path of the latest update, empty if there is none. Prints and throws what fs::read_symlink
  // does.
  [[nodiscard]] virtual std::string find_latest() { return latest_dataset_path(); }

  // The zoneinfo link cannot be understood.
  virtual void reset_bad_link() = 0;

  // The current data set is not fit, or too old. The system partition's is then in use.
  virtual void give_up(const olm_dataset& current, const olm_dataset& system) = 0;

  // The latest update takes over from what is `in_use`.
  virtual void install(const olm_dataset& latest, const olm_dataset& in_use,
                       const olm_dataset& system) = 0;

  // The latest update is not fit, or not newer than the current data set.
  virtual void refuse(const olm_dataset& latest, const olm_dataset& current,
                      const olm_dataset& system) = 0;

 private:
  [[nodiscard]] std::string read_current_path();
};
