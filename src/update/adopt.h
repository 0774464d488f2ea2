// Updates that another program has put where they belong.
#pragma once

#include "update/olm_contents.h"

// Makes all in the directory `update` root's, readable by everybody and changed by nobody else, and
// gives what is in it. No link is followed. Throws olm_refusal where something in it has no place
// in an update, and std::system_error where a call fails. Prints nothing.
[[nodiscard]] olm_contents adopt(const std::string& update);
