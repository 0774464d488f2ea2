# Writes `unit` from `unit_template`, for a program in the directory `sbin`: run when something is
# installed, with the prefix of that time.
set(prefix /) # CMake leaves nothing of this one
if(CMAKE_INSTALL_PREFIX)
  get_filename_component(prefix "${CMAKE_INSTALL_PREFIX}" ABSOLUTE)
endif()
get_filename_component(program "${sbin}/tzdata-select" ABSOLUTE BASE_DIR "${prefix}")
if(program MATCHES "[\"'\\\\]")
  message(FATAL_ERROR "systemd runs no program with quotes or backslashes in its path: ${program}")
endif()
# As systemd reads a command.
string(REPLACE "%" "%%" program "${program}")
string(REPLACE " " "\\x20" program "${program}")
configure_file("${unit_template}" "${unit}" @ONLY)
