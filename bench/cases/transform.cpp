// The cosine transforms. Ours work in place, so each run copies its input first; the time of the
// copy is subtracted.

#include "cases/cases.hpp"
#include "cases/sound.hpp"
#include "peers/peers.hpp"
#include "support/digest.hpp"

namespace kz::bench {

namespace {

template <class Number>
Prepared in_place(const Aligned<Number>& input, const std::function<void(Number*)>& compute)
{
    const auto data = std::make_shared<Aligned<Number>>(input);
    const auto copy = [input, data] {
        std::copy(input.begin(), input.end(), data->begin());
        keep(data->data());
    };
    const auto run = [copy, compute, data] {
        copy();
        compute(data->data());
        keep(data->data());
    };
    const auto digest = [run, data] {
        run();
        return kz::test::digest_of(*data);
    };
    const auto length = static_cast<uint32_t>(input.size());
    return {run,
            digest,
            [length] {
                return Peers{cosine_by_fftw(length), cosine_by_real_fftw(length)};
            },
            {copy}};
}

Prepared fixed_16384()
{
    FrameStages stages;
    stages.equalise();
    stages.decimate();
    const std::shared_ptr<KZDSP_DCT_fixed> dct = FixedTransform(KZDSP_DCT_fixed_create(14));
    return in_place<FxpType>(stages.half,
                             [dct](FxpType* data) { KZDSP_DCT_fixed_compute(dct.get(), data, 0); });
}

Prepared fixed_32768()
{
    FrameStages stages;
    stages.equalise();
    const std::shared_ptr<KZDSP_DCT_fixed> dct = FixedTransform(KZDSP_DCT_fixed_create(15));
    return in_place<FxpType>(stages.equalised,
                             [dct](FxpType* data) { KZDSP_DCT_fixed_compute(dct.get(), data, 0); });
}

Prepared float_32768()
{
    const std::shared_ptr<KZDSP_DCT> dct = FloatTransform(KZDSP_CreateDCT(15));
    return in_place<float>(float_sound(kWorkingHertz, kFrame),
                           [dct](float* data) { KZDSP_ComputeDCT(dct.get(), data, 0); });
}

Case transform(const std::string& name, double must, Prepared (*prepare)())
{
    return {name,
            "a transform",
            microseconds(),
            share_of(kCosineFftw, must),
            share_of(kCosineByRealFftw, 1.0),
            prepare};
}

} // namespace

std::vector<Case> transform_cases()
{
    return {
        transform("dct_fixed_16384", 0.7, fixed_16384),
        transform("dct_fixed_32768", 0.6, fixed_32768),
        transform("dct_float_32768", 0.6, float_32768),
    };
}

} // namespace kz::bench
