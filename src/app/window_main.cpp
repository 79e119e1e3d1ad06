#include "app/CProgram.h"
#include "app/CUpdaterRun.h"
#include "app/CWindowFrontEnd.h"

// The window program: the same program with the Qt window in it.
int main(int argc, char** argv) {
  CUpdaterRun::SetWindowFrontEnd(&CWindowFrontEnd::Run);
  return CProgram::Main(argc, argv);
}
