#include "answer/answer.h"

#include <err.h>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <cstdlib>

std::string clean(std::string text) {
  std::replace_if(
      text.begin(), text.end(),
      [](char byte) { return std::iscntrl(static_cast<unsigned char>(byte)) != 0; }, '?');
  return text;
}

void flush_output() {
  if (std::fflush(stdout) != 0 || std::ferror(stdout) != 0) err(cannot_be_told, "standard output");
}

void print_and_exit(const std::string& text) {
  static_cast<void>(std::fputs(text.c_str(), stdout));
  flush_output();
  std::exit(EXIT_SUCCESS);
}

void refuse_usage(const char* usage) {
  static_cast<void>(std::fputs(usage, stderr));
  std::exit(cannot_be_told);
}
