// What the extractor may do once it has read a request: nothing that reaches beyond the
// descriptors it is handed. The filter kills the process on any attempt to start a program,
// make a process or a socket, and refuses every open (EACCES), so that a library subverted by a
// hostile file can neither read other files nor talk to anyone. Memory and file size are capped;
// CPU time is capped per file by the caller (CpuBudget).
#pragma once

#include <cstddef>

namespace extractor {

struct Limits {
    size_t memoryMiB = 512;  // address space
    int cpuSeconds = 10;     // per file
};

// Sets the limits and loads the filter for the rest of the process's life; false (errno set) when
// any of it could not be set, and then nothing should be extracted.
bool EnterSandbox(const Limits& limits);

// Allows `seconds` more of CPU time from now: past it the kernel stops the process (SIGXCPU).
bool CpuBudget(int seconds);

}  // namespace extractor
