// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <vector>

namespace keepsakes {

/// Bytes of private memory the indexer may use; a reader that wants more gets none.
inline constexpr std::uint64_t kMemoryLimit = std::uint64_t{512} * 1024 * 1024;
/// Bytes of address space, which files mapped for reading count in.
inline constexpr std::uint64_t kAddressSpaceLimit = std::uint64_t{8} * 1024 * 1024 * 1024;

/// Takes from the process, for good, what a reader of strangers' files does not need: memory
/// beyond the limits, every file but those below `readable` and `writable` (landlock), and every
/// system call but those that reading files and writing a database take (seccomp): no network, no
/// further programs, no other processes. What the kernel or the build does not have is left out
/// with one logged line. For the main thread, before the first file is read.
void confineProcess(const std::vector<std::filesystem::path>& readable,
                    const std::vector<std::filesystem::path>& writable);

}  // namespace keepsakes
