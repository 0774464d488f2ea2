#include "testbed/start_table.h"

#include <fstream>
#include <sstream>
#include <stdexcept>

namespace {

// The text with its \xNN and {N*TEXT} put in full.
std::string unfold(const std::string& text) {
  std::string unfolded;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text.compare(i, 2, "\\x") == 0) {
      unfolded += static_cast<char>(std::stoi(text.substr(i + 2, 2), nullptr, 16));
      i += 3;
    } else if (text[i] == '{') {
      const std::size_t star = text.find('*', i);
      const std::size_t end = text.find('}', star);
      const std::string part = text.substr(star + 1, end - star - 1);
      for (int times = std::stoi(text.substr(i + 1)); times > 0; --times) unfolded += part;
      i = end;
    } else {
      unfolded += text[i];
    }
  }
  return unfolded;
}

}  // namespace

start_table::start_table(const std::string& file) {
  std::ifstream lines(file);
  if (!lines) throw std::runtime_error("cannot read " + file);
  const std::string complaint = file + ": cannot understand: ";
  std::string state;  // the one that is being read; empty in a case
  for (std::string line; std::getline(lines, line);) {
    if (line.empty() || line.front() == '#') continue;
    std::istringstream words(unfold(line));
    std::string word;
    std::string rest;
    std::getline(words >> word >> std::ws, rest);
    const bool indented = line.front() == ' ';
    if (!indented && word == "state") {
      state = rest;
    } else if (!indented && word == "case") {
      state.clear();
      cases.push_back({rest, "", {"exit 0"}, ""});
    } else if (indented && !state.empty()) {
      states[state] += expand(rest.empty() ? word : word.append(" ").append(rest));
    } else if (!indented || cases.empty() || !add_to_last_case(word, rest)) {
      throw std::runtime_error(complaint + line);
    }
  }
}

std::string start_table::expand(const std::string& entry) const {
  const auto state = states.find(entry);
  return state == states.end() ? entry + '\n' : state->second;
}

bool start_table::add_to_last_case(const std::string& word, const std::string& rest) {
  start_case& last = cases.back();
  if (word == "has") {
    last.device += expand(rest);
  } else if (word == "says" && rest.size() >= 2) {
    last.heard.insert(last.heard.end() - 1, rest.substr(1, rest.size() - 2));
  } else if (word == "ends") {
    last.heard.back() = rest;
  } else if (word == "then") {
    last.after += expand(rest);
  } else {
    return false;
  }
  return true;
}
