/// @file
/// Long calls of the library: their progress, and their end when the user wants one.
#pragma once

#include <cstdint>
#include <exception>
#include <string>

#include "kzfp/catalogue/handles.hpp"
#include "kzfp/output/interruption.hpp"
#include "kzfp/output/progress.hpp"

namespace kzfp {

/// The context of a call's progress function, Watched::go_on, and of its other callbacks, which it
/// may be the base of. The address passed must be that of the Watched.
struct Watched {
    Watched(uint64_t tracks, ProgressMode mode, const std::string& of)
        : progress(static_cast<size_t>(tracks), mode), name(of)
    {
    }

    /// A kzcat_progress.
    static uint8_t go_on(void* context, uint64_t done, uint64_t /*total*/)
    {
        auto& watched = *static_cast<Watched*>(context);
        watched.guard([&] { watched.progress.show(static_cast<size_t>(done), watched.name); });
        return watched.error == nullptr && !interrupted() ? 1 : 0;
    }

    /// Keeps what `act()` throws, which must not pass through the library.
    template <class Act>
    void guard(Act act) noexcept
    {
        try {
            act();
        } catch (...) {
            error = error == nullptr ? std::current_exception() : error;
        }
    }

    /// What the callbacks threw, or the call's own failure.
    void check_call(kzcat_status status)
    {
        progress.clear();
        if (error != nullptr) {
            std::rethrow_exception(error);
        }
        check(status);
    }

    Progress progress;
    const std::string& name;
    std::exception_ptr error;
};

} // namespace kzfp
