// ICU's files as ICU reads them.
#pragma once

#include <unicode/ures.h>

#include <memory>
#include <string>
#include <vector>

// Has ICU look for its four files in `directory` first, which becomes the working directory: ICU
// takes a colon in a path for the end of one. It must be called before ICU is asked for anything.
// Throws std::runtime_error where that fails. Prints nothing.
void set_icu_directory(const std::string& directory);

// Whether ICU has read `file`, which is there, and not data of its own. Throws std::runtime_error
// where that cannot be told. Prints nothing.
[[nodiscard]] bool has_read(const std::string& file);

// The release of the time-zone database that ICU says it has; empty where it cannot tell. Prints
// nothing.
[[nodiscard]] std::string get_icu_version();

// A resource: a file as a whole, or a part of it.
using bundle = std::unique_ptr<UResourceBundle, decltype(&ures_close)>;

// The whole of the file `name`, such as zoneinfo64; null where ICU does not take it. Prints
// nothing.
[[nodiscard]] bundle open_bundle(const std::string& name);

// What is in `resource`, a table or an array, in order; null for what cannot be read. Prints
// nothing.
[[nodiscard]] std::vector<bundle> list_inner(UResourceBundle* resource);
