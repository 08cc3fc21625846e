#include "program/commands/collect.h"

int main(int argc, char** argv) { return ipmisel::RunProgram(argc, argv); }
