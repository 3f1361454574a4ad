#include "peers/peers.hpp"

#ifdef KZ_PEER_SWRESAMPLE

#include <memory>

extern "C" {
#include <libavutil/channel_layout.h>
#include <libavutil/opt.h>
#include <libswresample/swresample.h>
}

#include "peers/resampled.hpp"

namespace kz::bench {

namespace {

struct Free {
    void operator()(SwrContext* context) const { swr_free(&context); }
};
using Context = std::unique_ptr<SwrContext, Free>;

/// As many taps for a crossing of the cut-off as our filters have, and no margin below it.
Context converter(uint32_t rate, AVSampleFormat format)
{
    Context context(swr_alloc());
    void* const options = context.get();
    const AVChannelLayout mono = AV_CHANNEL_LAYOUT_MONO;
    const bool good = av_opt_set_chlayout(options, "in_chlayout", &mono, 0) == 0 &&
                      av_opt_set_chlayout(options, "out_chlayout", &mono, 0) == 0 &&
                      av_opt_set_int(options, "in_sample_rate", rate, 0) == 0 &&
                      av_opt_set_int(options, "out_sample_rate", kWorkingRate, 0) == 0 &&
                      av_opt_set_sample_fmt(options, "in_sample_fmt", format, 0) == 0 &&
                      av_opt_set_sample_fmt(options, "out_sample_fmt", format, 0) == 0 &&
                      av_opt_set_int(options, "filter_size", 20, 0) == 0 &&
                      av_opt_set_double(options, "cutoff", 1.0, 0) == 0 &&
                      swr_init(context.get()) == 0;
    require(good, "swresample: no converter");
    return context;
}

template <class Sample, AVSampleFormat format>
class Stream {
public:
    Stream(uint32_t rate, size_t block)
        : output(resampled_room(rate, block)), context_(converter(rate, format)),
          input_(block_of_sound<Sample>(rate, block))
    {
    }

    size_t step()
    {
        const auto* from = reinterpret_cast<const uint8_t*>(input_.data());
        auto* to = reinterpret_cast<uint8_t*>(output.data());
        const int made = swr_convert(context_.get(), &to, static_cast<int>(output.size()), &from,
                                     static_cast<int>(input_.size()));
        require(made >= 0, "swresample: failed");
        return static_cast<size_t>(made);
    }

    Aligned<Sample> output;

private:
    Context context_;
    Aligned<Sample> input_;
};

} // namespace

Peer swresample_float(uint32_t rate, size_t block)
{
    return resampling_peer<Stream<float, AV_SAMPLE_FMT_FLTP>>(kSwresample, rate, block);
}

Peer swresample_16_bits(uint32_t rate, size_t block)
{
    return resampling_peer<Stream<int16_t, AV_SAMPLE_FMT_S16P>>(kSwresample16, rate, block);
}

} // namespace kz::bench

#else

namespace kz::bench {

Peer swresample_float(uint32_t, size_t) { return {kSwresample}; }
Peer swresample_16_bits(uint32_t, size_t) { return {kSwresample16}; }

} // namespace kz::bench

#endif
