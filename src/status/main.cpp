// Tells which data sets a device has and what its next start will do. Changes nothing.
#include <err.h>
#include <getopt.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <span>
#include <string>
#include <utility>

#include "answer/answer.h"
#include "reasons/explain.h"
#include "reasons/facts.h"

namespace {

using std::string;

constexpr std::size_t label_width = 12;
constexpr std::size_t line_width = 80;

constexpr const char* usage = "usage: tzdata-status [--query] [--root=DIRECTORY] [UPDATE]\n";
constexpr const char* help =
    "Tells which time-zone data a device uses, and what its next start will do.\n"
    "With UPDATE, the path of an update, tells whether the next start would use it.\n\n"
    "  --query           print a line \"Key: value\" for each thing, for scripts\n"
    "  --root=DIRECTORY  tell of the image in DIRECTORY (needs root)\n"
    "  --help            print this help\n"
    "  --version         print the version\n\n"
    "Exit status: 0 if the next start changes no link, 1 if it changes one or fails; with UPDATE,\n"
    "0 if it is used, 1 if it is refused. 2 if that cannot be told.\n";

struct question {
  bool is_query = false;
  const char* root = nullptr;
  string update;
  bool had_slash = false;  // at the end of the update's path
};

struct answer {
  device_facts facts;
  int status = EXIT_SUCCESS;
  string verdict;  // on the update that was asked about, if any
  sentences because;
  sentences remarks;
  sentences reasons;  // for what becomes of the latest update
};

int get_status(const start_forecast& start) {
  const bool changes_nothing = start.zoneinfo.now.equals(start.zoneinfo.next) &&
                               start.icutz.now.equals(start.icutz.next) &&
                               start.localtime.now.equals(start.localtime.next);
  return start.status == EXIT_SUCCESS && changes_nothing ? EXIT_SUCCESS : EXIT_FAILURE;
}

answer find_answer(const question& asked) {
  answer found;
  suppositions supposed;
  if (!asked.update.empty()) supposed.push_back({latest_link, asked.update});
  found.facts = gather_facts(supposed);
  found.because = explain_start(found.facts);
  found.remarks = list_remarks(found.facts);
  found.reasons = explain_latest(found.facts);
  found.status = get_status(found.facts.start);
  if (asked.update.empty()) return found;
  const update_verdict verdict = judge_update(found.facts, asked.update);
  found.verdict = verdict.word;
  found.reasons = verdict.reasons;
  found.status = found.verdict == "refused" ? EXIT_FAILURE : EXIT_SUCCESS;
  if (asked.had_slash) {
    found.reasons.emplace_back("the target of tz_latest must not end in a slash, as this path did");
  }
  return found;
}

// --- For scripts ---

void print_key(const char* key, const string& value) {
  std::printf("%s: %s\n", key, clean(value).c_str());
}

void print_keys(const char* key, const sentences& values) {
  for (const string& value : values) print_key(key, value);
}

void print_keys_of_dataset(const string& which, const dataset_facts& facts) {
  print_key((which + "-Version").c_str(), facts.data ? facts.data->name : "");
  print_key((which + "-Schema").c_str(), facts.data ? get_schema(*facts.data) : "");
}

void print_query(const answer& answer) {
  const device_facts& facts = answer.facts;
  const start_forecast& start = facts.start;
  print_key("Zoneinfo", start.zoneinfo.now.target);
  print_key("Icutz", start.icutz.now.target);
  print_key("Localtime", start.localtime.now.target);
  print_keys_of_dataset("System", facts.system);
  print_keys_of_dataset("Current", facts.current);
  print_keys_of_dataset("Latest", facts.latest);
  print_key("Next-Zoneinfo", start.zoneinfo.next.target);
  print_key("Next-Icutz", start.icutz.next.target);
  print_key("Next-Localtime", start.localtime.next.target);
  print_key("Next-Status", start.status ? std::to_string(*start.status) : "none");
  print_keys("Next-Warning", start.record.warnings);
  print_keys("Because", answer.because);
  print_keys("Remark", answer.remarks);
  for (const update_facts& update : facts.updates)
    print_key("Update", update.name + ' ' + update.state);
  if (answer.verdict.empty()) return;
  print_key("Verdict", answer.verdict);
  print_keys("Reason", answer.reasons);
}

// --- For people ---

// Prints `text` beside a label, in lines that are broken at spaces.
void print_text(const char* label, const string& text) {
  constexpr std::size_t width = line_width - label_width;
  string rest = clean(text);
  do {
    std::size_t end = rest.size() <= width ? string::npos : rest.rfind(' ', width);
    if (rest.size() > width && end == string::npos) end = rest.find(' ');
    std::printf("%-*s%s\n", static_cast<int>(label_width), std::exchange(label, ""),
                rest.substr(0, end).c_str());
    rest.erase(0, end == string::npos ? end : end + 1);
  } while (!rest.empty());
}

void print_texts(const char* label, const sentences& texts) {
  for (const string& text : texts) print_text(std::exchange(label, ""), text);
}

void print_dataset(const char* label, const dataset_facts& facts) {
  string text = facts.problem.empty() ? "none" : "cannot be used: " + facts.problem;
  if (facts.data) {
    const string& schema = get_schema(*facts.data);
    text = facts.data->name + ", schema " + (schema.empty() ? "none" : schema);
  }
  print_text(label, text);
}

void print_report(const answer& answer) {
  const device_facts& facts = answer.facts;
  const start_forecast& start = facts.start;
  print_dataset("system", facts.system);
  print_dataset("current", facts.current);
  print_dataset("latest", facts.latest);
  print_text("zoneinfo", describe(start.zoneinfo.now));
  print_text("icutz", describe(start.icutz.now));
  print_text("localtime", describe(start.localtime.now));
  // One line, however long: scripts take its end.
  const string& target = start.zoneinfo.next.target;
  std::printf("%-*s%s: %s\n", static_cast<int>(label_width), "next start",
              clean(describe_start(facts)).c_str(),
              target.empty() ? "none" : clean(target).c_str());
  print_texts("because", answer.because);
  print_texts("will warn", start.record.warnings);
  print_texts("remarks", answer.remarks);
  const char* label = "updates";
  for (const update_facts& update : facts.updates) {
    string text = update.name + ' ' + update.state;
    if (update.state == "refused" && !answer.reasons.empty()) text += ": " + answer.reasons.front();
    print_text(std::exchange(label, ""), text);
  }
}

// --- What was asked ---

question read_question(int count, char** arguments) {
  const std::array<option, 5> options = {{{"query", no_argument, nullptr, 'q'},
                                          {"root", required_argument, nullptr, 'r'},
                                          {"help", no_argument, nullptr, 'h'},
                                          {"version", no_argument, nullptr, 'v'},
                                          {nullptr, 0, nullptr, 0}}};
  question asked;
  for (int next = 0; (next = getopt_long(count, arguments, "", options.data(), nullptr)) != -1;) {
    switch (next) {
      case 'q':
        asked.is_query = true;
        break;
      case 'r':
        asked.root = optarg;
        break;
      case 'h':
        print_and_exit(string(usage) + '\n' + help);
      case 'v':
        print_and_exit("tzdata-status " VERSION "\n");
      default:
        refuse_usage(usage);
    }
  }
  const auto operands = std::span(arguments, static_cast<std::size_t>(count))
                            .subspan(static_cast<std::size_t>(optind));
  if (operands.size() > 1) refuse_usage(usage);
  if (operands.empty()) return asked;
  asked.update = operands.front();
  asked.had_slash = asked.update.ends_with('/');
  while (asked.update.ends_with('/')) asked.update.pop_back();
  if (asked.update.empty()) refuse_usage(usage);
  return asked;
}

}  // namespace

int main(int count, char* arguments[]) {
  const question asked = read_question(count, arguments);
  if (asked.root != nullptr && (chroot(asked.root) != 0 || chdir("/") != 0))
    err(cannot_be_told, "--root=%s", asked.root);
  try {
    const answer found = find_answer(asked);
    if (asked.is_query) {
      print_query(found);
    } else if (found.verdict.empty()) {
      print_report(found);
    } else {
      print_text(found.verdict.c_str(), asked.update);
      print_texts("", found.reasons);
    }
    flush_output();
    return found.status;
  } catch (const std::exception& failure) {
    errx(cannot_be_told, "cannot be told: %s", clean(failure.what()).c_str());
  }
}
