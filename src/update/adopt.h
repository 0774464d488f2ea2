// Updates that another program has put where they belong.
#pragma once

#include <string>

// Makes all in the directory `update` root's, readable by everybody and changed by nobody else. No
// link is followed. Throws olm_refusal where something in it has no place in an update, or would
// have to be changed and stands outside it, too, and std::system_error where a call fails; by then,
// some of it may be changed.
// Prints nothing.
void adopt(const std::string& update);
