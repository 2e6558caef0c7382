#pragma once

#include <cstdint>

namespace parvel::reader {

/// What confines the process: no new privileges, limits, Landlock without any path, and a filter
/// over all system calls that lets through memory, the socket and descriptors that came. Opening a
/// path is trapped (HostFiles.h), anything else fails. Gives the walls that stand, of Wall.
[[nodiscard]] std::uint32_t raiseWalls(std::uint64_t inputBytes);

/// Gives the process the address space that it needs for an input of that many bytes.
void allowAddressSpace(std::uint64_t inputBytes);
/// Ends the process when it has used this much CPU time from now on.
void limitProcessorTime(int milliseconds);
/// How much of the last limit is left; the limit is gone then. Callable from a signal handler.
[[nodiscard]] int endProcessorTimeLimit();

}  // namespace parvel::reader
