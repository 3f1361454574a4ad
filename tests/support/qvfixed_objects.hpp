/// @file
/// Owners for the fixed-point fingerprinter's objects.
#pragma once

#include <functional>
#include <memory>

#include "kzsdk/qvfixed/qvfixed.h"

namespace kz::test {

struct DestroyQvfixed {
    void operator()(kzqvfixed_config* p) const { kzqvfixed_config_destroy(p); }
    void operator()(kzqvfixed_signal_detector* p) const { kzqvfixed_signal_detector_destroy(p); }
    void operator()(kzqvfixed_frame_manager* p) const { kzqvfixed_frame_manager_destroy(p); }
    void operator()(kzqvfixed_fingerprinter* p) const { kzqvfixed_destructor(p); }
};

template <class T>
using Qvfixed = std::unique_ptr<T, DestroyQvfixed>;

inline Qvfixed<kzqvfixed_config> make_config()
{
    kzqvfixed_config* config = nullptr;
    kzqvfixed_config_create(&config);
    return Qvfixed<kzqvfixed_config>(config);
}

/// A frame manager from the defaults with changes.
inline Qvfixed<kzqvfixed_frame_manager>
make_manager(const std::function<void(kzqvfixed_config&)>& change = [](kzqvfixed_config&) {})
{
    const auto config = make_config();
    if (config == nullptr) {
        return nullptr;
    }
    change(*config);
    return Qvfixed<kzqvfixed_frame_manager>(kzqvfixed_frame_manager_create(config.get()));
}

inline Qvfixed<kzqvfixed_fingerprinter> make_fingerprinter(uint32_t rate, uint32_t format,
                                                           uint32_t channels)
{
    kzqvfixed_fingerprinter* object = nullptr;
    kzqvfixed_constructor(1, rate, format, channels, &object);
    return Qvfixed<kzqvfixed_fingerprinter>(object);
}

} // namespace kz::test
