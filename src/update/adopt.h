// Updates that another program has put where they belong.
#pragma once

#include <string>

// Makes all in the directory `update` root's, readable by everybody and changed by nobody else. No
// link is followed. Throws olm_refusal where something in it has no place in an update, or a file
// that has to be changed has another name outside; and std::system_error where a call fails. By
// then, some of it may be changed. Prints nothing.
void adopt(const std::string& update);
