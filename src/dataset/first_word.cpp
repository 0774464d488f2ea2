#include "dataset/first_word.h"

#include "fs/device.h"

std::string read_first_word(const std::string& path) {
  std::string word;
  std::ifstream file = device::open_to_read(path);
  file >> word;
  return word;
}
