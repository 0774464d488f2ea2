// The devices that most tests begin with, and the table of whole starts (in start_test.cpp).
#pragma once

#include <functional>
#include <optional>

#include "device.h"

struct whole_start {
  std::string name;
  entries before;        // what stands on the device
  report says = {};      // the warnings, in order
  entries changes = {};  // what stands there otherwise afterwards; all else is as it was
  std::string ends = "exit 0";
  std::optional<report> boot_says = {};   // what a boot says, if that is something else
  entries mended = {};                    // what a boot changes after that
  report tracing = {};                    // options for strace, to have a call fail
  std::function<void()> prepare = [] {};  // what else is done to the device before
};

extern const std::vector<whole_start> starts;

inline const std::string first = at::updates + "2020a.9.0";
inline const std::string second = at::updates + "2020a.10.0";

// An update goes by the name of its directory, whatever its files say.
inline entries update(const std::string& path) {
  return file(path + "/zoneinfo/+VERSION", "1999a\n") + file(path + "/zoneinfo/Asia/Tokyo", "") +
         file(path + "/icutz/icutz44l.dat", "");
}

inline entries links(const std::string& path) {
  return link_to(at::zoneinfo, path + "/zoneinfo") + link_to(at::icutz, path + "/icutz");
}

inline const entries system_links = link_to(at::zoneinfo, at::system_zoneinfo) + gone(at::icutz);

// A system partition of 2019c and two updates, of which the second is the latest.
inline const entries on_system =
    file(at::version, "2019c") + file(at::schema, "44l") +
    file(at::system_zoneinfo + "/Asia/Tokyo", "") + link_to(at::latest, second) +
    link_to(at::zone, at::zoneinfo + "/Asia/Tokyo") + update(first) + update(second) + system_links;
inline const entries on_first = on_system + links(first);
inline const entries on_second = on_system + links(second);
