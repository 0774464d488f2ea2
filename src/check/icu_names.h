// The zones that ICU has beside those of the time-zone database: short names of old, and some that
// the database gave up or never had.
#pragma once

#include <memory>
#include <string>

#include "check/olm_clocks.h"

// The zone of the time-zone database whose time ICU's own zone `name` has; empty if it is none.
// Prints and throws nothing.
[[nodiscard]] std::string find_namesake(const std::string& name);

// The clocks of ICU's own zone `name` that follow a rule of their own, which holds from 1970 on;
// null if it is none. Prints nothing.
[[nodiscard]] std::unique_ptr<const olm_clocks> make_own_zone(const std::string& name);
