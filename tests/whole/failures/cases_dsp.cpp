// Transforms and resamplers without memory.

#include "kzsdk/dsp/dct.h"
#include "kzsdk/dsp/resampler.h"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

template <class Object>
Attempt makes(Object* (*make)(), void (*destroy)(Object*))
{
    return [make, destroy] {
        Object* const object = make();
        destroy(object);
        return object != nullptr;
    };
}

} // namespace

std::vector<Case> dsp_cases()
{
    return {
        {"KZDSP_CreateDCT", Reports,
         [] { return makes<KZDSP_DCT>([] { return KZDSP_CreateDCT(8); }, KZDSP_DestroyDCT); }},
        {"KZDSP_DCT_fixed_create", Reports,
         [] {
             return makes<KZDSP_DCT_fixed>([] { return KZDSP_DCT_fixed_create(14); },
                                           KZDSP_DCT_fixed_destroy);
         }},
        {"KZDSP_CreateResampler", Reports,
         [] {
             return makes<KZDSP_resampler>([] { return KZDSP_CreateResampler(48000, 11025); },
                                           KZDSP_DestroyResampler);
         }},
        {"KZDSP_resampler_fixed_create", Reports,
         [] {
             return makes<KZDSP_resampler_fixed>(
                 [] { return KZDSP_resampler_fixed_create(48000U << 15, 11025U << 15); },
                 KZDSP_resampler_fixed_destroy);
         }},
    };
}

} // namespace kz::test::failures
