/// @file
/// Owners for the objects of either fingerprinter. A `Twin` is support/fixed_twin.hpp's or
/// support/float_twin.hpp's.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>

#include "support/input_formats.hpp"

namespace kz::test {

template <class Twin>
struct Destroy {
    void operator()(typename Twin::Config* p) const { Twin::destroy_config(p); }
    void operator()(typename Twin::Detector* p) const { Twin::destroy_detector(p); }
    void operator()(typename Twin::Manager* p) const { Twin::destroy_frame_manager(p); }
    void operator()(typename Twin::Object* p) const { Twin::destruct(p); }
};

template <class Twin, class T>
using Owned = std::unique_ptr<T, Destroy<Twin>>;

template <class Twin>
using OwnedConfig = Owned<Twin, typename Twin::Config>;
template <class Twin>
using OwnedDetector = Owned<Twin, typename Twin::Detector>;
template <class Twin>
using OwnedManager = Owned<Twin, typename Twin::Manager>;
template <class Twin>
using OwnedObject = Owned<Twin, typename Twin::Object>;

template <class Twin>
OwnedConfig<Twin> make_config()
{
    typename Twin::Config* config = nullptr;
    Twin::create_config(&config);
    return OwnedConfig<Twin>(config);
}

/// A frame manager from the defaults with changes.
template <class Twin>
OwnedManager<Twin>
make_manager(const std::function<void(typename Twin::Config&)>& change = [](auto&) {})
{
    const auto config = make_config<Twin>();
    if (config == nullptr) {
        return nullptr;
    }
    change(*config);
    return OwnedManager<Twin>(Twin::create_frame_manager(config.get()));
}

template <class Twin>
OwnedManager<Twin> unlimited_manager()
{
    return make_manager<Twin>([](auto& config) { config.frame_limit = 0; });
}

template <class Twin>
OwnedObject<Twin> make_fingerprinter(Format format, uint32_t rate, Channels channels)
{
    typename Twin::Object* object = nullptr;
    Twin::construct(Twin::kAlgorithm, rate, number(format), number(channels), &object);
    return OwnedObject<Twin>(object);
}

} // namespace kz::test
