// Both fingerprinters and their parts without memory.

#include <memory>
#include <vector>

#include "support/fixed_twin.hpp"
#include "support/float_twin.hpp"
#include "support/signals.hpp"
#include "whole/failures/cases.hpp"

namespace kz::test::failures {

namespace {

template <class Twin>
using Samples = std::vector<typename Twin::Sample>;

template <class Twin>
Samples<Twin> sound(size_t count)
{
    Samples<Twin> samples;
    for (const int16_t sample : noise(count, 0.5, 5)) {
        samples.push_back(Twin::from_16_bits(sample));
    }
    return samples;
}

template <class Twin>
Attempt creates_config()
{
    return [] { return make_config<Twin>() != nullptr; };
}

template <class Twin>
Attempt copies_table()
{
    return [config = std::shared_ptr(make_config<Twin>())] {
        typename Twin::Edge* table = nullptr;
        uint32_t count = 0;
        const kz_status status = Twin::copy_freq_table(config.get(), &table, &count);
        static_cast<void>(_kzmem_free(table));
        return status == KZ_OK && table != nullptr;
    };
}

/// Reports success all the same, and leaves no table.
template <class Twin>
Attempt sets_table()
{
    return [] {
        const auto config = make_config<Twin>();
        if (config == nullptr) {
            return false;
        }
        const typename Twin::Edge edges[] = {100, 200};
        EXPECT_EQ(KZ_OK, Twin::set_freq_table(config.get(), edges, 2));
        EXPECT_EQ(config->freq_table != nullptr ? 2U : 0U, config->freq_table_count);
        return config->freq_table != nullptr;
    };
}

template <class Twin>
Attempt creates_manager()
{
    return [config = std::shared_ptr(make_config<Twin>())] {
        return OwnedManager<Twin>(Twin::create_frame_manager(config.get())) != nullptr;
    };
}

/// Without memory for it, a frame is lost and nothing else.
template <class Twin, class Append>
Attempt appends_frame(const Append& append)
{
    return
        [append, manager = std::shared_ptr(unlimited_manager<Twin>()), frame = sound<Twin>(32768)] {
            Twin::reset_frame_manager(manager.get());
            append(*manager, frame);
            const bool kept = Twin::get_frame_count(manager.get()) == 1;
            Twin::reset_frame_manager(manager.get());
            return kept;
        };
}

template <class Twin>
void append_in_two_pieces(typename Twin::Manager& manager, const Samples<Twin>& frame)
{
    const auto count = static_cast<uint32_t>(frame.size());
    EXPECT_EQ(KZ_OK, Twin::append_dual(&manager, frame.data(), count, frame.data(), 0));
}

template <class Twin>
Attempt condenses()
{
    const std::shared_ptr manager(unlimited_manager<Twin>());
    const auto frame = sound<Twin>(32768);
    append_in_two_pieces<Twin>(*manager, frame);
    append_in_two_pieces<Twin>(*manager, frame);
    return [manager] {
        manager->fingerprint_ready = 0;
        std::vector<uint8_t> bytes(60);
        return Twin::get_fingerprint(manager.get(), bytes.data(), 60) == 60;
    };
}

template <class Twin>
Attempt equalises(bool in_two_pieces)
{
    return [in_two_pieces, frame = sound<Twin>(1000)] {
        Samples<Twin> output(frame.size());
        std::vector<uint32_t> histogram(257);
        const auto count = static_cast<uint32_t>(frame.size());
        const kz_status status =
            in_two_pieces
                ? Twin::hist_eq_dual(frame.data(), count, frame.data(), 0, output.data(), count,
                                     histogram.data(), 256)
                : Twin::hist_eq2(frame.data(), output.data(), count, histogram.data(), 256);
        return status == KZ_OK && output != frame;
    };
}

template <class Twin>
Attempt creates_detector()
{
    return [] { return OwnedDetector<Twin>(Twin::create_detector(128, 100, 1000)) != nullptr; };
}

template <class Twin>
Attempt constructs()
{
    return [] { return make_fingerprinter<Twin>(pcm16, 48000, stereo) != nullptr; };
}

/// Two frames' worth, into a fingerprinter of its own.
template <class Twin>
Attempt feeds()
{
    return [music = noise(32768 + 11264, 0.5, 5)] {
        const auto object = make_fingerprinter<Twin>(pcm16, 11025, mono);
        if (object == nullptr) {
            return false;
        }
        uint8_t complete = 0;
        EXPECT_EQ(KZ_OK, Twin::add_samples(object.get(), music.data(),
                                           static_cast<uint32_t>(2 * music.size()), &complete));
        return Twin::get_frame_count(object->frame_manager) == 2;
    };
}

template <class Twin>
Attempt gives_result()
{
    const std::shared_ptr object(make_fingerprinter<Twin>(pcm16, 11025, mono));
    const auto music = noise(size_t{11025} * 15, 0.5, 5);
    uint8_t complete = 0;
    Twin::add_samples(object.get(), music.data(), static_cast<uint32_t>(2 * music.size()),
                      &complete);
    EXPECT_EQ(1, complete);
    return [object] {
        object->frame_manager->fingerprint_ready = 0;
        XMLTag* tree = nullptr;
        const kz_status status = Twin::get_result(object.get(), &tree);
        EXPECT_EQ(status == KZ_OK, tree != nullptr);
        return disposed_of(tree);
    };
}

Attempt takes_frame_data()
{
    std::vector<uint32_t> words(3 + size_t{15} * 3 * 2, 0);
    words[0] = 1;
    words[1] = 15;
    words[2] = 3;
    return [words, manager = std::shared_ptr(unlimited_manager<Float>())] {
        QVFM_Reset(manager.get());
        const auto size = static_cast<uint32_t>(words.size() * 4);
        const bool accepted = QVFM_AppendFrameData(manager.get(), words.data(), size) == 1;
        EXPECT_EQ(accepted ? 3U : 0U, QVFM_GetFrameCount(manager.get()));
        QVFM_Reset(manager.get());
        return accepted;
    };
}

Attempt equalises_one_piece()
{
    return [frame = sound<Float>(1000)] {
        Samples<Float> output(frame.size());
        EXPECT_EQ(KZ_OK,
                  hist_eq(frame.data(), output.data(), static_cast<uint32_t>(output.size()), 256));
        return output != frame;
    };
}

void append_in_one_piece(QVFM& manager, const Samples<Float>& frame)
{
    EXPECT_EQ(KZ_OK,
              QVFM_AppendPCMData(&manager, frame.data(), static_cast<uint32_t>(frame.size())));
}

} // namespace

std::vector<Case> qv_cases()
{
    return {
        {"kzqvfixed_config_create", Reports, creates_config<Fixed>},
        {"QVConfig_Create", Reports, creates_config<Float>},
        {"kzqvfixed_config_copy_freq_table", Reports, copies_table<Fixed>},
        {"QVConfig_CopyFreqTable", Reports, copies_table<Float>},
        {"kzqvfixed_config_set_freq_table", Reports, sets_table<Fixed>},
        {"QVConfig_SetFreqTable", Reports, sets_table<Float>},
        {"kzqvfixed_frame_manager_create", Reports, creates_manager<Fixed>},
        {"QVFM_Create", Reports, creates_manager<Float>},
        {"kzqvfixed_frame_manager_append_dual_PCM_data", Conceals, // a frame that is not equalised
         [] { return appends_frame<Fixed>(append_in_two_pieces<Fixed>); }},
        {"QVFM_AppendDualPCMData", Conceals,
         [] { return appends_frame<Float>(append_in_two_pieces<Float>); }},
        {"QVFM_AppendPCMData", Conceals, [] { return appends_frame<Float>(append_in_one_piece); }},
        {"kzqvfixed_frame_manager_get_fingerprint", Reports, condenses<Fixed>},
        {"QVFM_GetFingerprint", Reports, condenses<Float>},
        {"QVFM_AppendFrameData", Reports, takes_frame_data},
        {"kzqvfixed_hist_eq_dual", Reports, [] { return equalises<Fixed>(true); }},
        {"hist_eq_dual", Reports, [] { return equalises<Float>(true); }},
        {"kzqvfixed_hist_eq2", Reports, [] { return equalises<Fixed>(false); }},
        {"hist_eq2", Reports, [] { return equalises<Float>(false); }},
        {"hist_eq", Reports, equalises_one_piece},
        {"kzqvfixed_signal_detector_create", Reports, creates_detector<Fixed>},
        {"QVSD_Create", Reports, creates_detector<Float>},
        {"kzqvfixed_constructor", Reports, constructs<Fixed>},
        {"QVFP_Constructor", Reports, constructs<Float>},
        {"kzqvfixed_add_samples", Conceals, feeds<Fixed>},
        {"QVFP_AddSamples", Conceals, feeds<Float>},
        {"kzqvfixed_get_result", Conceals, gives_result<Fixed>}, // name or version missing
        {"QVFP_GetResult", Conceals, gives_result<Float>},
    };
}

} // namespace kz::test::failures
