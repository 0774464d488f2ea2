// What a boot does: a start, and around it what heals an interruption of this start or an earlier
// one.
#pragma once

// Sees to the local-time link, makes the start, and sees to the ICU link. Where nothing was
// interrupted, and the links fit together, it leaves and prints what run_start does, but for the
// place of one warning. Each link that it mends is mended in one step, with a warning. If the start
// then fails, a local-time link that was corrected before stays so. Gives what run_start gives,
// throws nothing.
[[nodiscard]] int run_boot();

// Whether the ICU link is as it should be beside the zoneinfo link: with an update in use, it names
// that one's ICU data; with the system partition, it does not lead below update_area. True where
// the zoneinfo link names no data set. Prints nothing.
[[nodiscard]] bool do_halves_fit();
