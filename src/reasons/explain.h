// Why a start does what it does, and what is not as it should be, in plain words.
#pragma once

#include <string>
#include <vector>

#include "reasons/facts.h"

// Several lines of words. The functions print nothing, and throw what gather_facts throws.
using sentences = std::vector<std::string>;

// What stands at the place of a link: its target, or what is there instead.
[[nodiscard]] std::string describe(const olm_entry& entry);

// What the next start does, such as "installs 2026a.1.0".
[[nodiscard]] std::string describe_start(const device_facts& facts);

// Why, in the order in which a start meets it.
[[nodiscard]] sentences explain_start(const device_facts& facts);

// Why the latest update is taken into use or not.
[[nodiscard]] sentences explain_latest(const device_facts& facts);

// What becomes of an update.
struct update_verdict {
  std::string word;  // used, in-use or refused
  sentences reasons;
};

// What becomes of the update at the path `update`; `facts` are those with tz_latest as a link to
// it.
[[nodiscard]] update_verdict judge_update(const device_facts& facts, const std::string& update);

// What is not as it should be on the device, and what the next start makes of it.
[[nodiscard]] sentences list_remarks(const device_facts& facts);
