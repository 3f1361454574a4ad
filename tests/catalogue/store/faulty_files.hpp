// Files below SQLite whose n-th write goes wrong: it fails, is cut short, or ends the process as a
// kill or a power cut would.
#pragma once

#include <cstdint>

namespace kzcat::test {

enum class FileFault {
    none,
    error,     ///< the call does nothing and reports an error of the device
    full,      ///< the call writes half and reports that the disk is full
    kill,      ///< half of it is written when the process is killed
    power_cut, ///< as kill, and of what was not synchronised only the first writes of each file
};

/// The name of a VFS in which the calls that change files are counted, for this process.
const char* faulty_files();

/// The n-th such call from now on (1 is the next) goes wrong; with `lasting` all after it too.
void set_file_fault(FileFault fault, uint64_t nth, bool lasting = false, uint64_t seed = 0);

/// Calls that changed files since then.
uint64_t file_changes();

/// Whether a call has gone wrong since then.
bool file_fault_fired();

} // namespace kzcat::test
