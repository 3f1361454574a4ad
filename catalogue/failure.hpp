/// @file
/// How the C interface reports what went wrong: no exception passes it.
#pragma once

#include <stdexcept>
#include <string>

#include "kzcat.h"

namespace kzcat {

/// A call that is refused: its status and a sentence with the cure.
class Failure : public std::runtime_error {
public:
    Failure(kzcat_status status, const std::string& text)
        : std::runtime_error(text), status_(status)
    {
    }
    kzcat_status status() const { return status_; }

private:
    kzcat_status status_;
};

/// Throws Failure for an argument that cannot be used, unless `holds`.
inline void require(bool holds, const char* otherwise)
{
    if (!holds) {
        throw Failure(KZCAT_ERROR_INVALID_ARGUMENT, otherwise);
    }
}

/// The status of the exception that is being handled; its text becomes that of the thread's last
/// failure.
kzcat_status report_failure() noexcept;

/// Runs the work of an exported call.
template <class Work>
kzcat_status guarded(Work work) noexcept
{
    try {
        work();
        return KZCAT_OK;
    } catch (...) {
        return report_failure();
    }
}

} // namespace kzcat
