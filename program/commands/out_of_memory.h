#pragma once

namespace ipmisel {

/// What failed and what to do about it, for the end of the program.
inline constexpr char kOutOfMemory[] = "out of memory";
inline constexpr char kOutOfMemoryAdvice[] =
    "give the program more, or collect fewer classes at a time";

/// Keeps some memory back for the end of a program that has run out of it, and lets that be one
/// line and an exit status wherever it happens.
void PrepareForOutOfMemory();
/// In a process whose parent tells why it ended: no line, the exit status kExitNoSource.
void LeaveOutOfMemoryToTheParent();
/// Whether an allocation has failed since.
bool HasRunOutOfMemory();

}  // namespace ipmisel
