#include "peers/peers.hpp"

#ifdef KZ_PEER_FFTW

#include <algorithm>
#include <cmath>
#include <memory>
#include <numbers>
#include <type_traits>

#include <fftw3.h>

#include "measure/slice.hpp"
#include "peers/cosine_rotation.hpp"
#include "support/melody.hpp"

namespace kz::bench {

namespace {

struct Free {
    void operator()(void* block) const { fftwf_free(block); }
    void operator()(fftwf_plan plan) const { fftwf_destroy_plan(plan); }
};
using Floats = std::unique_ptr<float[], Free>;
using Plan = std::unique_ptr<std::remove_pointer_t<fftwf_plan>, Free>;

Floats floats(size_t count) { return Floats(fftwf_alloc_real(count)); }

constexpr unsigned kPatience = FFTW_PATIENT | FFTW_DESTROY_INPUT;

/// Planning with patience takes minutes the first time, and nothing once the plans are stored.
template <class MakePlan>
Plan remembered(MakePlan make_plan)
{
    fftwf_import_wisdom_from_filename(KZ_FFTW_WISDOM);
    Plan plan(make_plan());
    require(plan != nullptr, "FFTW: no plan");
    fftwf_export_wisdom_to_filename(KZ_FFTW_WISDOM);
    return plan;
}

void fill_with_sound(float* values, uint32_t length)
{
    const auto sound = kz::test::melody(11025, 1, (length + 1) / 11025.0);
    std::copy_n(sound.begin(), length, values);
}

/// FFTW's own.
class Direct {
public:
    explicit Direct(uint32_t length) : input(floats(length)), output(floats(length))
    {
        plan_ = remembered([&] {
            return fftwf_plan_r2r_1d(static_cast<int>(length), input.get(), output.get(),
                                     FFTW_REDFT10, kPatience & ~unsigned{FFTW_DESTROY_INPUT});
        });
        fill_with_sound(input.get(), length);
    }

    void run() const { fftwf_execute(plan_.get()); }

    Floats input;
    Floats output;

private:
    Plan plan_;
};

/// Over the real transform of the folded input.
class Folded {
public:
    explicit Folded(uint32_t length)
        : input(floats(length)), output(floats(length)), length_(length), folded_(floats(length)),
          real_(floats(length / 2 + 1)), imaginary_(floats(length / 2 + 1)),
          cosine_(floats(length / 2 + 1)), sine_(floats(length / 2 + 1))
    {
        const fftwf_iodim dimension = {static_cast<int>(length), 1, 1};
        plan_ = remembered([&] {
            return fftwf_plan_guru_split_dft_r2c(1, &dimension, 0, nullptr, folded_.get(),
                                                 real_.get(), imaginary_.get(), kPatience);
        });
        fill_with_sound(input.get(), length);
        for (uint32_t k = 0; k <= length / 2; ++k) {
            const double angle = std::numbers::pi * k / (2.0 * length);
            cosine_[k] = static_cast<float>(std::cos(angle));
            sine_[k] = static_cast<float>(std::sin(angle));
        }
    }

    void run() const
    {
        fold(input.get(), folded_.get(), length_);
        fftwf_execute(plan_.get());
        rotate(real_.get(), imaginary_.get(), cosine_.get(), sine_.get(), output.get(), length_);
    }

    Floats input;
    Floats output;

private:
    uint32_t length_;
    Floats folded_;
    Floats real_;
    Floats imaginary_;
    Floats cosine_;
    Floats sine_;
    Plan plan_;
};

// These arrays fill much of a second-level cache, and depending on the pages that they happen to
// get a transform can take half as long again. Several are therefore made, and the fastest is kept.
template <class Transform>
std::shared_ptr<const Transform> best_placed(uint32_t length)
{
    constexpr int kTries = 5;
    std::vector<std::shared_ptr<const Transform>> tried;
    std::vector<double> times;
    for (int i = 0; i < kTries; ++i) {
        tried.push_back(std::make_shared<const Transform>(length));
        const Slice slice([transform = tried.back()] { transform->run(); }, 0.005);
        times.push_back(std::min({slice.measure(), slice.measure(), slice.measure()}));
    }
    return tried[static_cast<size_t>(std::min_element(times.begin(), times.end()) - times.begin())];
}

// One bin of the transform as it is defined.
double defined_bin(const float* input, uint32_t length, uint32_t bin)
{
    double sum = 0;
    for (uint32_t n = 0; n < length; ++n) {
        sum += 2 * double{input[n]} *
               std::cos(std::numbers::pi * (2.0 * n + 1) * bin / (2.0 * length));
    }
    return sum;
}

double largest_magnitude(const float* values, uint32_t length)
{
    double largest = 0;
    for (uint32_t k = 0; k < length; ++k) {
        largest = std::max(largest, std::abs(double{values[k]}));
    }
    return largest;
}

// FFTW's own against the definition, the folded one against FFTW's own in every bin.
void verify_direct(const Direct& direct, uint32_t length)
{
    direct.run();
    const double tolerance = 1e-5 * largest_magnitude(direct.output.get(), length);
    for (const uint32_t bin : {0U, 1U, 7U, length / 2, length - 1}) {
        const double error = direct.output[bin] - defined_bin(direct.input.get(), length, bin);
        require(std::abs(error) < tolerance, "FFTW: REDFT10 is something else");
    }
}

void verify_folded(const Folded& folded, uint32_t length)
{
    const Direct direct(length);
    direct.run();
    folded.run();
    const double tolerance = 1e-5 * largest_magnitude(direct.output.get(), length);
    for (uint32_t k = 0; k < length; ++k) {
        require(std::abs(folded.output[k] - direct.output[k]) < tolerance,
                "FFTW: the folded transform differs from REDFT10 in bin " + std::to_string(k));
    }
}

} // namespace

Peer cosine_by_fftw(uint32_t length)
{
    const auto direct = best_placed<Direct>(length);
    return {kCosineFftw, [direct] { direct->run(); },
            [direct, length] { verify_direct(*direct, length); }};
}

Peer cosine_by_real_fftw(uint32_t length)
{
    const auto folded = best_placed<Folded>(length);
    return {kCosineByRealFftw, [folded] { folded->run(); },
            [folded, length] { verify_folded(*folded, length); }};
}

} // namespace kz::bench

#else

namespace kz::bench {

Peer cosine_by_fftw(uint32_t) { return {kCosineFftw}; }
Peer cosine_by_real_fftw(uint32_t) { return {kCosineByRealFftw}; }

} // namespace kz::bench

#endif
