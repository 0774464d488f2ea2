#pragma once

#include <string>

// The link to the device's local zone.
inline constexpr const char* localtime_link = "/var/db/timezone/localtime";

// Makes sure that the local zone's link goes through the zoneinfo link, so that it follows
// whichever data set is in use. A link that does is left alone, whether or not its zone exists. One
// into the system's own zone files is corrected, if the zone exists in the data set in use: prints
// "Correcting localtime link to ...". Anything else becomes a link to the default zone: prints
// "localtime link invalid; resetting to ...".
// Throws errno when the link to the default zone cannot be made; the link is then missing.
void repair_localtime_link();

// The target by which a start replaces `target` if that leads into the system's own zone files and
// the zone exists in the data set in use; else empty. Prints nothing.
[[nodiscard]] std::string correct_localtime_target(const std::string& target);

// Prints "Correcting localtime link to ...".
void announce_correction(const std::string& target);
