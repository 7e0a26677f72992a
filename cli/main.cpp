#include "detached_end.h"
#include "program.h"

int main(int argc, char** argv) {
  return trl::cli::RunWithDetachedEnd([&] {
    trl::cli::Program program;
    return program.Run(argc, argv);
  });
}
