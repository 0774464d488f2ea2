// Archives as publishers make them: ustar, uncompressed, with zoneinfo and icutz at the top.
#pragma once

#include "update/olm_contents.h"
#include "update/steps.h"

// What is in the archive that is open on `archive`. Looks at all of its headers, and writes
// nothing. Throws olm_refusal where something in it is wrong or not as in an update, and
// std::system_error where it cannot be read. Prints nothing.
[[nodiscard]] olm_contents read_archive(int archive);

// Writes `contents`, which read_archive gave, into the empty `directory`, readable as the umask
// allows. Throws std::system_error where that fails. Prints nothing.
void unpack(int archive, const olm_contents& contents, const olm_directory& directory);
