// The sandbox that a boot puts itself into, by the kernel's Landlock; it needs nobody else.
#pragma once

#include <array>

#include "dataset/olm_dataset.h"
#include "dataset/olm_icu.h"
#include "dataset/olm_zoneinfo.h"
#include "driver/housekeeping.h"

// A directory below which a boot may read, and perhaps write. It may be a link.
struct allowed_directory {
  const char* path;
  bool may_write;
};

// Nothing else on a device can be opened, made or removed by a boot that is confined.
inline constexpr std::array<allowed_directory, 6> allowed_directories = {
    {{"/usr/share", false},
     {system_zoneinfo_directory, false},
     {system_icu_directory, false},
     {"/var/db", true},
     {state_directory, true},
     {update_area, true}}};

// Whether a directory that cannot be opened for this reason is none, as far as a boot can tell. If
// it cannot be opened for another, the boot goes unconfined: it might be there after all.
[[nodiscard]] bool is_no_directory(int error);

// Whether the kernel can confine a process. Prints and throws nothing.
[[nodiscard]] bool can_confine();

// Gives up all capabilities and every way to new ones, and confines this process to
// allowed_directories. Where the kernel or a filter refuses that, or one of them exists and cannot
// be opened, it prints "going on unconfined: ...": a start that does not see its data would give up
// good updates. Makes one of them the working directory, for a walk wants to come back to it.
// Leaves errno 0, throws nothing but for want of memory.
void confine_process();
