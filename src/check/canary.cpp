#include "check/canary.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <new>
#include <stdexcept>
#include <string_view>

#include "fs/olm_descriptor.h"

namespace {

constexpr int seconds_for_step = 10;

// The first byte of a line tells what the rest is.
constexpr char is_reason = 'r';
constexpr char is_step = 's';
constexpr char is_failure = 'f';
constexpr char is_end = 'e';

[[noreturn]] void fail(const char* what) {
  throw std::runtime_error(std::string(what) + ": " + std::strerror(errno));
}

void set_bounds() {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  constexpr rlimit no_core = {0, 0};
  setrlimit(RLIMIT_CORE, &no_core);
#ifndef __SANITIZE_ADDRESS__  // which takes far more for itself
  constexpr rlim_t most_bytes = rlim_t{1} << 30;
  constexpr rlimit memory = {most_bytes, most_bytes};
  setrlimit(RLIMIT_AS, &memory);
#endif
  for (const int signal : {SIGABRT, SIGBUS, SIGFPE, SIGILL, SIGSEGV, SIGPROF})
    static_cast<void>(std::signal(signal, SIG_DFL));
}

void send(int pipe, char kind, const std::string& text) {
  std::string line = kind + text;
  std::replace(line.begin(), line.end(), '\n', '?');
  line += '\n';
  for (std::string_view rest = line; !rest.empty();) {
    const ssize_t count = write(pipe, rest.data(), rest.size());
    if (count < 0) std::exit(EXIT_FAILURE);  // nobody listens any more
    rest.remove_prefix(static_cast<std::size_t>(count));
  }
}

[[noreturn]] void be_canary(const std::function<void(const canary_report&)>& work, int pipe) {
  const canary_report report = {
      .add_reason = [&](const std::string& reason) { send(pipe, is_reason, reason); },
      .begin_step =
          [&](const std::string& step) {
            constexpr itimerval most = {{0, 0}, {seconds_for_step, 0}};
            setitimer(ITIMER_PROF, &most, nullptr);
            send(pipe, is_step, step);
          }};
  try {
    set_bounds();
    work(report);
    send(pipe, is_end, "");
  } catch (const std::bad_alloc&) {
    send(pipe, is_reason, "ICU takes too much memory for it");
    send(pipe, is_end, "");
  } catch (const std::invalid_argument& damage) {
    send(pipe, is_reason, damage.what());
    send(pipe, is_end, "");
  } catch (const std::runtime_error& failure) {
    send(pipe, is_failure, failure.what());
  }
  std::exit(EXIT_SUCCESS);
}

// What a child came to, as far as its lines tell.
class olm_child {
 public:
  explicit olm_child(const canary_report& report) : report_(report) {}

  // Hands on each whole line of what is read.
  void take(std::string_view text) {
    for (const char byte : text) {
      if (byte != '\n') {
        line_ += byte;
      } else if (!line_.empty()) {
        take_line(line_.front(), line_.substr(1));
        line_.clear();
      }
    }
  }

  // Sees to a child that has ended with `status`.
  void finish(int status) const {
    if (!failure_.empty()) throw std::runtime_error(failure_);
    if (has_ended_) return;
    const bool is_slow = WIFSIGNALED(status) && WTERMSIG(status) == SIGPROF;
    const int signal = WIFSIGNALED(status) ? WTERMSIG(status) : SIGABRT;
    report_.add_reason("ICU " +
                       (is_slow ? "takes more than " + std::to_string(seconds_for_step) + " seconds"
                                : std::string("crashes (") + strsignal(signal) + ")") +
                       " at " + step_);
  }

 private:
  void take_line(char kind, const std::string& text) {
    if (kind == is_reason) report_.add_reason(text);
    if (kind == is_step) report_.begin_step(step_ = text);
    if (kind == is_failure) failure_ = text;
    if (kind == is_end) has_ended_ = true;
  }

  const canary_report& report_;
  std::string line_;
  std::string step_;
  std::string failure_;
  bool has_ended_ = false;
};

}  // namespace

void run_canary(const std::function<void(const canary_report&)>& work,
                const canary_report& report) {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) fail("pipe");
  const olm_descriptor output(ends.front());
  olm_descriptor input(ends.back());
  // Who starts this program may have left it so that the kernel forgets how a child ended.
  static_cast<void>(std::signal(SIGCHLD, SIG_DFL));
  const pid_t child = fork();
  if (child == -1) fail("fork");
  if (child == 0) be_canary(work, input.get());
  static_cast<void>(input.close());

  olm_child said(report);
  std::array<char, 4096> buffer{};
  for (ssize_t count = 0; (count = read(output.get(), buffer.data(), buffer.size())) > 0;)
    said.take({buffer.data(), static_cast<std::size_t>(count)});
  int status = 0;
  if (waitpid(child, &status, 0) == -1) fail("waitpid");
  said.finish(status);
}
