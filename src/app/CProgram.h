#pragma once
// The program's start, shared by tavik-fwupdater and the window program:
// the command line, then the command it asks for.

class CProgram {
 public:
  static int Main(int argc, char** argv);
};
