// What a start does around its decision. None of these throws, except for want of memory.
#pragma once

#include <string>

// The marker that asks for a later clean-up of data no longer in use. Only its existence matters.
inline constexpr const char* needs_cleanup_marker = "/var/db/timezone/needs_cleanup";

// The directory of the links.
inline constexpr const char* state_directory = "/var/db/timezone/";

// Gives `directory` the protection class D, the one whose files can be read at any time. A
// directory that cannot be opened is passed over. Prints nothing.
void protect_directory(const std::string& directory);

// protect_directory for state_directory and then for the updates below it. Prints nothing.
void protect_directories();

// Moves the ICU link of earlier systems, /var/db/icutz, to /var/db/timezone/icutz. An old link that
// leads nowhere stays; a new one that leads somewhere is kept and the old one goes. Prints "Could
// not migrate ..." when the new link cannot be made, also because one that leads nowhere is in its
// place, and "Could not remove ..." when the old one stays, behind the failed operation's own
// warning.
void migrate_icutz_link();

// Makes sure that the marker exists; one that does is left as it is. Prints "Cannot touch file ..."
// when it cannot be made.
void touch_needs_cleanup();
