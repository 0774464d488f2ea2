#include "dataset/first_word.h"

#include <fstream>

std::string read_first_word(const std::string& path) {
  std::string word;
  std::ifstream file(path);
  file >> word;
  return word;
}
