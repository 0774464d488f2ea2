// A root directory of one process's own, in memory, in which the device's paths (/var/db and
// /usr/share) are a made-up device's. The machine's programs and libraries and this project's
// sources are there read-only; its /proc and /dev and the build's directory as they are. All of it
// goes with the process. Scripts know a private root by the file /.private-root in it.
#pragma once

namespace private_root {

// Moves this process, which must have one thread, into a private root with an empty device. Takes a
// mount namespace, and a user namespace where that needs one, so that root and an ordinary user can
// both do it. The umask is 022 from then on. Throws std::system_error, whose text says in one line
// which step the kernel refused.
void enter();

// Throws std::logic_error unless this process is in a private root. For whatever writes or deletes
// at the device's paths.
void require();

// Gives the private root a new, empty device in place of the one that is there; nothing is deleted.
// Throws std::logic_error outside a private root, std::system_error when the kernel refuses.
void renew_device();

}  // namespace private_root
