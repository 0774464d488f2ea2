#include "driver/process.h"
#include "driver/start.h"

int main() {
  prepare_warnings();
  return run_start();
}
