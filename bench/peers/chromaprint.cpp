#include <cstdlib>
#include <cstring>
#include <memory>
#include <utility>

#include "peers/peers.hpp"

#ifdef KZ_PEER_CHROMAPRINT

#include <chromaprint.h>
#include <malloc.h>

namespace kz::bench {

namespace {

struct Free {
    void operator()(ChromaprintContext* context) const { chromaprint_free(context); }
    void operator()(char* text) const { chromaprint_dealloc(text); }
};
using Context = std::unique_ptr<ChromaprintContext, Free>;
using Text = std::unique_ptr<char, Free>;

Context started(uint32_t rate, uint32_t channels)
{
    Context context(chromaprint_new(CHROMAPRINT_ALGORITHM_DEFAULT));
    require(context && chromaprint_start(context.get(), static_cast<int>(rate),
                                         static_cast<int>(channels)) == 1,
            "chromaprint: no start");
    return context;
}

void listen(ChromaprintContext* context, const std::vector<int16_t>& samples)
{
    require(chromaprint_feed(context, samples.data(), static_cast<int>(samples.size())) == 1 &&
                chromaprint_finish(context) == 1,
            "chromaprint: cannot be fed");
}

Text text_of(ChromaprintContext* context)
{
    char* text = nullptr;
    require(chromaprint_get_fingerprint(context, &text) == 1, "chromaprint: no fingerprint");
    return Text(text);
}

// As many items as the sound's length allows, and a text of them.
void verify_length(ChromaprintContext* context, double seconds)
{
    const int available = static_cast<int>(seconds * 1000) - chromaprint_get_delay_ms(context);
    const int expected = available / chromaprint_get_item_duration_ms(context);
    int size = 0;
    require(chromaprint_get_raw_fingerprint_size(context, &size) == 1 && expected > 0 &&
                std::abs(size - expected) <= 2,
            "chromaprint: " + std::to_string(size) + " items instead of " +
                std::to_string(expected));
    require(std::strlen(text_of(context).get()) > static_cast<size_t>(size),
            "chromaprint: no text");
}

} // namespace

Peer chromaprint_fingerprint(std::vector<int16_t> samples, uint32_t rate, uint32_t channels)
{
    const auto sound = std::make_shared<const std::vector<int16_t>>(std::move(samples));
    const auto run = [sound, rate, channels] {
        const Context context = started(rate, channels);
        listen(context.get(), *sound);
        keep(text_of(context.get()).get());
    };
    const auto verify = [sound, rate, channels] {
        const Context context = started(rate, channels);
        listen(context.get(), *sound);
        verify_length(context.get(), static_cast<double>(sound->size()) / channels / rate);
    };
    return {kChromaprint, run, verify};
}

Peer chromaprint_life(uint32_t rate, uint32_t channels)
{
    return {kChromaprint, [rate, channels] { keep(started(rate, channels).get()); }};
}

ContextHeap chromaprint_heap(const std::vector<int16_t>& samples, uint32_t rate, uint32_t channels)
{
    const auto whole_heap = [] {
        const struct mallinfo2 info = mallinfo2();
        return static_cast<int64_t>(info.uordblks + info.hblkhd);
    };
    const int64_t before = whole_heap();
    const Context context = started(rate, channels);
    const int64_t fresh = whole_heap() - before;
    listen(context.get(), samples);
    return {fresh, whole_heap() - before};
}

} // namespace kz::bench

#else

namespace kz::bench {

Peer chromaprint_fingerprint(std::vector<int16_t>, uint32_t, uint32_t) { return {kChromaprint}; }
Peer chromaprint_life(uint32_t, uint32_t) { return {kChromaprint}; }
ContextHeap chromaprint_heap(const std::vector<int16_t>&, uint32_t, uint32_t) { return {}; }

} // namespace kz::bench

#endif
