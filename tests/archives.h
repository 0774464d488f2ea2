// Archives for the tests of tzdata-update, good and bad.
#pragma once

#include <sys/mount.h>

#include <array>
#include <cstdio>
#include <filesystem>
#include <fstream>

#include "starts.h"

// An entry of an archive, with what a header says of it.
struct tar_entry {
  std::string name;
  char type = '0';
  std::string data{};    // a link's target
  std::string size{};    // what the header has as the size, if not that of the data
  std::string prefix{};  // what belongs before the name
  unsigned sum = 0;      // added to the header's sum
  std::string magic = std::string("ustar\00000", 8);
};
using tar_entries = std::vector<tar_entry>;

inline std::string pack(const tar_entry& entry) {
  const bool is_file = entry.type == '0' || entry.type == '\0';
  std::string header(512, '\0');
  const auto put = [&](std::size_t at, const std::string& text) {
    header.replace(at, text.size(), text);
  };
  const auto to_octal = [](std::size_t number) {
    std::array<char, 12> text{};
    static_cast<void>(std::snprintf(text.data(), text.size(), "%011zo", number));
    return std::string(text.data());
  };
  put(0, entry.name);
  put(124, entry.size.empty() ? to_octal(is_file ? entry.data.size() : 0) : entry.size);
  put(148, "        ");
  put(156, {entry.type});
  if (!is_file) put(157, entry.data);
  put(257, entry.magic);
  put(345, entry.prefix);
  std::size_t sum = entry.sum;
  for (const char byte : header) sum += static_cast<unsigned char>(byte);
  put(148, to_octal(sum).substr(5) + '\0');
  if (!is_file) return header;
  return header + entry.data + std::string((512 - entry.data.size() % 512) % 512, '\0');
}

inline std::string pack_all(const tar_entries& all) {
  std::string bytes;
  for (const tar_entry& entry : all) bytes += pack(entry);
  return bytes;
}

inline const std::string tar_end(1024, '\0');
inline const tar_entries good_update = {
    {"zoneinfo/", '5'},     {"zoneinfo/+VERSION", '0', "2020b\n"},
    {"zoneinfo/Asia", '5'}, {"zoneinfo/Asia/Tokyo", '\0', std::string(513, 'x')},
    {"icutz/", '5'},        {"icutz/icutz44l.dat"}};

// Puts `bytes` into the file `path`.tar, with their sum beside it.
inline void publish(const std::string& path, const std::string& bytes) {
  std::ofstream(path + ".tar") << bytes;
  hear({"sh", "-c", "sha256sum <" + path + ".tar >" + path + ".sha256"});
}

// Puts a shell script where programs are looked for first. It goes with the private root.
inline void make_program(const std::string& name, const std::string& lines) {
  const std::string path = "/usr/local/bin/" + name;
  static_cast<void>(mount("tmpfs", "/usr/local/bin", "tmpfs", 0, "mode=755"));
  std::ofstream(path) << "#!/bin/sh\n" << lines << '\n';
  std::filesystem::permissions(path, std::filesystem::perms(0755));
}
