#include "program/run_program.h"

int main(int argc, char** argv) { return ipmisel::RunProgram(argc, argv); }
