#include "app/CProgram.h"

int main(int argc, char** argv) { return CProgram::Main(argc, argv); }
