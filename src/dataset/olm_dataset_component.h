#pragma once

#include <string>
#include <utility>

// One kind of time-zone data of a data set, which the rest of the device finds through a link of
// its own. A component reads what it needs while it is built and never changes afterwards.
class olm_dataset_component {
 public:
  // Whether this component's data can stand in for `other`, the component at the same place in
  // another data set. Each class says what decides, and what it prints. Throws nothing.
  [[nodiscard]] virtual bool compatible_schema(const olm_dataset_component& other) const = 0;

  // Makes this component's link say that this data set is in use: removes the old link, then makes
  // one to its directory, if programs are to find this data through a link at all (the system
  // partition's ICU data get none). Prints warnings for what fails and throws the errno of a link
  // that cannot be made.
  virtual void install_link() const = 0;

  std::string dataset_path;  // the owning data set's path; empty for the system partition

 protected:
  olm_dataset_component() = default;
  explicit olm_dataset_component(std::string path) : dataset_path(std::move(path)) {}

  // Neither virtual nor public: a component is deleted as its own class or not at all.
  ~olm_dataset_component() = default;
};
