// Every exported function that allocates, with the n-th allocation failing, alone or with all later
// ones, for n = 1, 2, 3 ... until the call succeeds: it fails as it promises, leaks nothing and
// leaves what it worked on as it was. The rooms' own tests look at the statuses one by one; this
// one sees to it that no function is forgotten.

#include <algorithm>
#include <cstdio>
#include <functional>
#include <map>
#include <memory>
#include <ostream>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include "kzsdk/abs/dyn_buf.h"
#include "kzsdk/abs/text.h"
#include "kzsdk/disc/disc.h"
#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/fpx/fpx.h"
#include "kzsdk/stream/stream.h"
#include "library/xml/tree_model.hpp"
#include "support/allocation.hpp"
#include "support/fixed_twin.hpp"
#include "support/float_twin.hpp"
#include "support/scratch_directory.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

/// Calls the function and takes back what it did. True when it succeeded.
using Attempt = std::function<bool()>;

enum Promise {
    Reports,  ///< fails whenever an allocation fails
    Conceals, ///< documented to succeed now and then all the same: docs/deliberate_behaviour.md
};

struct Case {
    const char* function;
    Promise promise;
    std::function<Attempt()> prepare; ///< makes what the attempts work on
};

void PrintTo(const Case& tested, std::ostream* out) { *out << tested.function; }

// ---- abs

bool given_back(void* block) { return block != nullptr && _kzmem_free(block) == KZ_OK; }

struct FreeBuffer {
    void operator()(kz_dyn_buf* buffer) const { kz_dyn_buf_dispose(buffer); }
};
using Buffer = std::shared_ptr<kz_dyn_buf>;

Buffer make_buffer(uint32_t capacity)
{
    Buffer buffer(kz_dyn_buf_create(capacity, 0), FreeBuffer{});
    kz_dyn_buf_append_str(buffer.get(), "abc");
    return buffer;
}

/// A call that makes a buffer larger or smaller; on failure the buffer is as it was.
Attempt resizes(const std::function<kz_status(kz_dyn_buf*)>& call)
{
    return [call] {
        const int64_t before = live_blocks();
        const auto fresh = std::unique_ptr<kz_dyn_buf, FreeBuffer>(kz_dyn_buf_create(5, 0));
        if (fresh == nullptr || kz_dyn_buf_append_str(fresh.get(), "abc") != KZ_OK) {
            return false;
        }
        const bool succeeded = call(fresh.get()) == KZ_OK;
        EXPECT_EQ(before + 2, live_blocks());
        EXPECT_EQ(0, kzmem_memcmp("abc", kz_dyn_buf_get_data(fresh.get()), 3));
        if (!succeeded) {
            EXPECT_EQ(3U, kz_dyn_buf_get_length(fresh.get()));
            EXPECT_EQ(5U, fresh->capacity);
        }
        return succeeded;
    };
}

bool made_larger()
{
    void* const block = _kzmem_malloc(8);
    void* const larger = block != nullptr ? _kzmem_realloc(block, 16) : nullptr;
    const bool succeeded = larger != nullptr;
    static_cast<void>(_kzmem_free(succeeded ? larger : block));
    return succeeded;
}

const Case kAbsCases[] = {
    {"_kzmem_malloc", Reports, [] { return [] { return given_back(_kzmem_malloc(1)); }; }},
    {"_kzmem_calloc", Reports, [] { return [] { return given_back(_kzmem_calloc(1, 1)); }; }},
    {"_kzmem_realloc", Reports, [] { return made_larger; }},
    {"kz_strdup", Reports, [] { return [] { return given_back(kz_strdup("a")); }; }},
    {"kz_makestr", Reports, [] { return [] { return given_back(kz_makestr("ab", 1)); }; }},
    {"kz_dyn_buf_create", Reports,
     [] {
         return [] {
             kz_dyn_buf* const buffer = kz_dyn_buf_create(1, 0);
             kz_dyn_buf_dispose(buffer);
             return buffer != nullptr;
         };
     }},
    {"kz_dyn_buf_clone", Reports,
     [] {
         return [source = make_buffer(4)] {
             kz_dyn_buf* const clone = kz_dyn_buf_clone(source.get());
             kz_dyn_buf_dispose(clone);
             return clone != nullptr;
         };
     }},
    {"kz_dyn_buf_append_buf", Reports,
     [] { return resizes([](auto* b) { return kz_dyn_buf_append_buf(b, "defg", 4); }); }},
    {"kz_dyn_buf_append_str", Reports,
     [] { return resizes([](auto* b) { return kz_dyn_buf_append_str(b, "defg"); }); }},
    {"kz_dyn_buf_compact", Reports, [] { return resizes(kz_dyn_buf_compact); }},
};

// ---- xml

bool disposed_of(XMLTag* tag)
{
    DisposeXMLTag(tag);
    return tag != nullptr;
}

using SharedTree = std::shared_ptr<XMLTag>;

SharedTree tree_of(XMLTag* tag) { return SharedTree(tag, DisposeXMLTag); }

/// A tag with all that a tag can have, and sub-tags.
SharedTree small_tree()
{
    XMLTag* const root = CreateXMLTagFromStr("A", "data");
    SetXMLTagAttrFromStr(root, "name", "value");
    SetXMLTagAttrFromStr(root, "other", "value");
    SetXMLTagAttrFromStr(add(root, "B", "more"), "name", "value");
    add(add(root, "C"), "D");
    return tree_of(root);
}

/// So deep that a walk needs memory for the way back up.
SharedTree deep_tree()
{
    XMLTag* const root = CreateXMLTagFromStr("A", nullptr);
    XMLTag* tag = root;
    for (int level = 0; level < 100; ++level) {
        tag = add(tag, "B");
    }
    return tree_of(root);
}

template <class Make>
Attempt copies(SharedTree tree, Make make)
{
    return [tree, make] {
        XMLTag* const copy = make(tree.get(), uint8_t{1});
        const bool is_whole = copy != nullptr && model_of(*copy) == model_of(*tree);
        DisposeXMLTag(copy);
        return is_whole;
    };
}

/// A call on a tag of its own. `keeps` says that a failure leaves the tag as it was.
template <class Call>
Attempt changes(bool keeps, Call call)
{
    return [keeps, call] {
        const auto tag = tree_of(CloneXMLTag(std::make_unique<XMLTag>().get(), 0));
        if (tag == nullptr || SetXMLTagNameFromStr(tag.get(), "A") != KZ_OK ||
            SetXMLTagDataFromStr(tag.get(), "old") != KZ_OK ||
            SetXMLTagAttrFromStr(tag.get(), "name", "old") != KZ_OK) {
            return false;
        }
        const ModelTag before = model_of(*tag);
        const kz_status status = call(tag.get());
        EXPECT_TRUE(status == KZ_OK || status == KZ_XML_ERROR_MEMORY);
        if (keeps && status != KZ_OK) {
            EXPECT_EQ(before, model_of(*tag));
        }
        return status == KZ_OK;
    };
}

int32_t resolve_to_element(XMLTag*, const char*, uint32_t, uintptr_t, const char** name,
                           uint32_t* kind)
{
    *name = "B";
    *kind = KZ_XML_KIND_ELEMENT;
    return 1;
}

kz_status set_resolved(XMLTag* tag)
{
    const int32_t set = XMLSetValueAtPath(tag, "x/y", "value", 1, resolve_to_element);
    return set == 1 ? KZ_OK : KZ_XML_ERROR_MEMORY;
}

template <class Render>
Attempt renders(SharedTree tree, const Render& render)
{
    return [tree, render] { return given_back(render(tree.get())); };
}

const Case kXmlCases[] = {
    {"CreateEmptyXMLTag", Reports, [] { return [] { return disposed_of(CreateEmptyXMLTag()); }; }},
    {"CreateXMLTagFromStr", Reports,
     [] { return [] { return disposed_of(CreateXMLTagFromStr("A", "data")); }; }},
    {"CreateXMLTagFromBuf", Reports,
     [] { return [] { return disposed_of(CreateXMLTagFromBuf("A", 1, "d", 1)); }; }},
    {"CloneXMLTag", Reports, [] { return copies(small_tree(), CloneXMLTag); }},
    {"CloneAndMutateXMLTag", Reports, // an incomplete copy counts as a failure here
     [] { return copies(small_tree(), CloneAndMutateXMLTag); }},
    {"CopyXMLTag", Reports,
     [] {
         return changes(
             false, [source = small_tree()](XMLTag* tag) { return CopyXMLTag(tag, source.get()); });
     }},
    {"EqualXMLTags", Reports,
     [] {
         return [a = deep_tree(), b = deep_tree()] { return EqualXMLTags(a.get(), b.get()) == 1; };
     }},
    {"SetXMLTagNameFromStr", Reports,
     [] { return changes(false, [](auto* t) { return SetXMLTagNameFromStr(t, "new"); }); }},
    {"SetXMLTagNameFromBuf", Reports,
     [] { return changes(false, [](auto* t) { return SetXMLTagNameFromBuf(t, "new", 3); }); }},
    {"SetXMLTagDataFromStr", Reports,
     [] { return changes(false, [](auto* t) { return SetXMLTagDataFromStr(t, "new"); }); }},
    {"SetXMLTagDataFromBuf", Reports,
     [] { return changes(false, [](auto* t) { return SetXMLTagDataFromBuf(t, "new", 3); }); }},
    {"SetXMLTagAttrFromStr", Reports,
     [] { return changes(true, [](auto* t) { return SetXMLTagAttrFromStr(t, "name", "new"); }); }},
    {"SetXMLTagAttrFromBuf", Reports,
     [] {
         return changes(true, [](auto* t) { return SetXMLTagAttrFromBuf(t, "name", 4, "new", 3); });
     }},
    {"SetXMLTagAttrFromInt", Reports,
     [] { return changes(true, [](auto* t) { return SetXMLTagAttrFromInt(t, "name", -1); }); }},
    {"SetXMLTagAttrFromUInt", Reports,
     [] { return changes(true, [](auto* t) { return SetXMLTagAttrFromUInt(t, "name", 1); }); }},
    {"SetXMLSubTagDataFromStr", Reports,
     [] {
         return changes(false, [](auto* t) { return SetXMLSubTagDataFromStr(t, "B/C", "x", 1); });
     }},
    {"SetXMLSubTagDataFromUInt", Reports,
     [] {
         return changes(false, [](auto* t) { return SetXMLSubTagDataFromUInt(t, "B/C", 1, 1); });
     }},
    {"XMLSetValueAtPath", Reports, [] { return changes(false, set_resolved); }},
    {"RenderXMLTagToStrEx", Reports,
     [] { return renders(small_tree(), [](auto* t) { return RenderXMLTagToStrEx(t, 1, 0, 0); }); }},
    {"RenderXMLTagToStr", Conceals, // indentation forgets failures
     [] { return renders(deep_tree(), [](auto* t) { return RenderXMLTagToStr(t, 1); }); }},
};

// ---- dsp

template <class Object>
Attempt makes(Object* (*make)(), void (*destroy)(Object*))
{
    return [make, destroy] {
        Object* const object = make();
        destroy(object);
        return object != nullptr;
    };
}

const Case kDspCases[] = {
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

// ---- the twins

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

constexpr uint32_t kPcm16 = 2;

template <class Twin>
Attempt constructs()
{
    return [] { return make_fingerprinter<Twin>(48000, kPcm16, 2) != nullptr; };
}

/// Two frames' worth, into a fingerprinter of its own.
template <class Twin>
Attempt feeds()
{
    return [music = noise(32768 + 11264, 0.5, 5)] {
        const auto object = make_fingerprinter<Twin>(11025, kPcm16, 1);
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
    const std::shared_ptr object(make_fingerprinter<Twin>(11025, kPcm16, 1));
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

const Case kTwinCases[] = {
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

// ---- fpx

struct FreeHandle {
    void operator()(kz_fpx_handle* handle) const { kz_fpx_fingerprint_free(&handle); }
};
using Handle = std::unique_ptr<kz_fpx_handle, FreeHandle>;

Handle make_handle(uint32_t algorithm)
{
    kz_fpx_handle* handle = nullptr;
    const kz_status status =
        kz_fpx_fingerprint_create(algorithm, KZ_FPX_FORMAT_PCM16, 11025, 1, &handle);
    EXPECT_EQ(status == KZ_OK, handle != nullptr);
    return Handle(handle);
}

bool feed_handle(kz_fpx_handle* handle, const std::vector<int16_t>& music)
{
    uint8_t complete = 0;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_add_audio(
                         handle, music.data(), static_cast<uint32_t>(2 * music.size()), &complete));
    return complete == 1;
}

bool serialize(kz_fpx_handle* handle)
{
    char* text = nullptr;
    const kz_status status = kz_fpx_fingerprint_serialize(handle, &text);
    EXPECT_EQ(status == KZ_OK, text != nullptr);
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&text));
    return status == KZ_OK;
}

template <uint32_t algorithm>
Attempt creates_handle()
{
    return [] { return make_handle(algorithm) != nullptr; };
}

template <uint32_t algorithm>
Attempt feeds_handle()
{
    return [music = noise(size_t{11025} * 15, 0.5, 5)] {
        const Handle handle = make_handle(algorithm);
        return handle != nullptr && feed_handle(handle.get(), music);
    };
}

template <uint32_t algorithm>
Attempt serializes()
{
    const std::shared_ptr handle(make_handle(algorithm));
    EXPECT_TRUE(feed_handle(handle.get(), noise(size_t{11025} * 15, 0.5, 5)));
    return [handle] { return serialize(handle.get()); };
}

template <uint32_t algorithm, class Object>
Attempt copies_values()
{
    const std::shared_ptr handle(make_handle(algorithm));
    EXPECT_TRUE(feed_handle(handle.get(), noise(size_t{11025} * 15, 0.5, 5)));
    return [handle] {
        static_cast<Object*>(handle->instance)->frame_manager->fingerprint_ready = 0;
        int16_t values[30];
        uint32_t count = 0;
        return kz_fpx_fingerprint_get_values(handle.get(), values, 30, &count) == KZ_OK;
    };
}

const Case kFpxCases[] = {
    {"kz_fpx_fingerprint_create", Reports, creates_handle<KZ_FPX_ALGORITHM_FIXED>},
    {"kz_fpx_fingerprint_create", Reports, creates_handle<KZ_FPX_ALGORITHM_FLOAT>},
    {"kz_fpx_fingerprint_add_audio", Conceals, feeds_handle<KZ_FPX_ALGORITHM_FIXED>},
    {"kz_fpx_fingerprint_add_audio", Conceals, feeds_handle<KZ_FPX_ALGORITHM_FLOAT>},
    {"kz_fpx_fingerprint_serialize", Conceals, serializes<KZ_FPX_ALGORITHM_FIXED>},
    {"kz_fpx_fingerprint_serialize", Conceals, serializes<KZ_FPX_ALGORITHM_FLOAT>},
    {"kz_fpx_fingerprint_get_values", Reports,
     copies_values<KZ_FPX_ALGORITHM_FIXED, kzqvfixed_fingerprinter>},
    {"kz_fpx_fingerprint_get_values", Reports, copies_values<KZ_FPX_ALGORITHM_FLOAT, QVFP>},
};

// ---- stream

struct FreeStream {
    void operator()(kz_stream* stream) const { kz_stream_free(&stream); }
};
using Stream = std::unique_ptr<kz_stream, FreeStream>;

/// At a rate that is decimated, or at one that is not.
Stream make_stream(uint32_t rate)
{
    kz_stream_settings settings;
    EXPECT_EQ(KZ_OK, kz_stream_initialize_settings(&settings));
    settings.sample_rate = rate;
    kz_stream* stream = nullptr;
    const kz_status status = kz_stream_create(&settings, &stream);
    EXPECT_EQ(status == KZ_OK, stream != nullptr);
    return Stream(stream);
}

kz_status feed_stream(kz_stream* stream, const std::vector<int16_t>& music)
{
    uint8_t complete = 0;
    return kz_stream_feed(stream, music.data(), 2 * music.size(), nullptr, &complete);
}

Attempt feeds_stream()
{
    return [music = noise(size_t{22050} * 15, 0.5, 5)] {
        const Stream stream = make_stream(11025);
        return stream != nullptr && feed_stream(stream.get(), music) == KZ_OK;
    };
}

/// The last piece, which has the second frame's end in it, is analysed at the end.
Attempt finishes_stream()
{
    return [music = noise(size_t{22050} * 4, 0.5, 5)] {
        const Stream stream = make_stream(11025);
        uint8_t complete = 0;
        return stream != nullptr && feed_stream(stream.get(), music) == KZ_OK &&
               kz_stream_finish(stream.get(), &complete) == KZ_OK;
    };
}

Attempt copies_values_of_stream()
{
    return [music = noise(size_t{22050} * 15, 0.5, 5)] {
        const Stream stream = make_stream(11025);
        int16_t values[30];
        uint32_t count = 0;
        return stream != nullptr && feed_stream(stream.get(), music) == KZ_OK &&
               kz_stream_get_values(stream.get(), values, 30, &count) == KZ_OK;
    };
}

Attempt writes_document_of_stream()
{
    return [music = noise(size_t{22050} * 15, 0.5, 5)] {
        const Stream stream = make_stream(11025);
        const char* text = nullptr;
        return stream != nullptr && feed_stream(stream.get(), music) == KZ_OK &&
               kz_stream_get_document(stream.get(), &text) == KZ_OK;
    };
}

const Case kStreamCases[] = {
    {"kz_stream_create", Reports, [] { return [] { return make_stream(44100) != nullptr; }; }},
    {"kz_stream_create", Reports, [] { return [] { return make_stream(192000) != nullptr; }; }},
    {"kz_stream_feed", Reports, feeds_stream},
    {"kz_stream_finish", Reports, finishes_stream},
    {"kz_stream_get_values", Reports, copies_values_of_stream},
    {"kz_stream_get_document", Reports, writes_document_of_stream},
};

// ---- disc

bool lists_directory(const std::string& path)
{
    kzbdfs_dir* dir = nullptr;
    kzbdfs_open_dir(path.c_str(), &dir);
    int entries = 0;
    for (int call = 0; call < 3; ++call) {
        kzbdfs_dirent* const entry = kzbdfs_readdir(dir);
        entries += entry != nullptr ? 1 : 0;
        kzbdfs_free_dirent(entry);
    }
    kzbdfs_close_dir(dir);
    return entries == 3;
}

Attempt lists()
{
    const auto scratch = std::make_shared<ScratchDirectory>();
    scratch->write("file", "x");
    return [scratch] { return lists_directory(scratch->path()); };
}

const Case kDiscCases[] = {
    {"kzbdfs_open_dir", Reports, lists},
    {"kzbdfs_readdir", Reports, lists},
};

std::vector<Case> all_cases()
{
    std::vector<Case> cases;
    const auto add_all = [&cases](const auto& more) {
        cases.insert(cases.end(), std::begin(more), std::end(more));
    };
    add_all(kAbsCases);
    add_all(kXmlCases);
    add_all(kDspCases);
    add_all(kTwinCases);
    add_all(kFpxCases);
    add_all(kStreamCases);
    add_all(kDiscCases);
    return cases;
}

// ---- The rule

class EveryAllocation : public MemoryOn, public ::testing::WithParamInterface<Case> {};

TEST_P(EveryAllocation, MayFail)
{
    const Attempt attempt = GetParam().prepare();
    uint64_t failures = 0;
    for_every_failed_allocation([&](auto fired) {
        const bool succeeded = attempt();
        if (!fired()) {
            EXPECT_TRUE(succeeded);
        } else if (GetParam().promise == Reports) {
            EXPECT_FALSE(succeeded);
        }
        failures += fired() ? 1U : 0U;
    });
    EXPECT_GT(failures, 0U) << "it allocates nothing";
    EXPECT_TRUE(attempt()) << "it does not work any more";
}

std::string case_name(const ::testing::TestParamInfo<Case>& info)
{
    return std::to_string(info.index) + "_" + info.param.function;
}

INSTANTIATE_TEST_SUITE_P(Of, EveryAllocation, ::testing::ValuesIn(all_cases()), case_name);

// ---- That no function is missing

using Names = std::set<std::string>;

std::vector<std::string> lines_of(const std::string& command)
{
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(::popen(command.c_str(), "r"), ::pclose);
    std::vector<std::string> lines(1);
    for (int c = std::fgetc(pipe.get()); c != EOF; c = std::fgetc(pipe.get())) {
        if (c == '\n') {
            lines.emplace_back();
        } else {
            lines.back() += static_cast<char>(c);
        }
    }
    return lines;
}

/// For each function of the library, those whose code names it.
std::map<std::string, Names> callers()
{
    const std::regex head("^[0-9a-f]+ <([^>]+)>:$");
    const std::regex named("<([^>+@]+)[^>]*>$");
    std::map<std::string, Names> result;
    std::string current;
    for (const std::string& line : lines_of("objdump -d --no-show-raw-insn " KZ_LIBRARY)) {
        std::smatch found;
        if (std::regex_search(line, found, head)) {
            current = found[1];
        } else if (std::regex_search(line, found, named) && found[1] != current) {
            result[found[1]].insert(current);
        }
    }
    return result;
}

Names exported_names()
{
    Names names;
    for (const std::string& line : lines_of("nm -D --defined-only " KZ_LIBRARY)) {
        const auto name = line.substr(line.rfind(' ') + 1);
        names.insert(name.substr(0, name.find('@')));
    }
    return names;
}

/// What comes to an allocation by direct calls.
Names allocating()
{
    const auto callers_of = callers();
    Names reached = {"malloc", "calloc", "realloc", "opendir"};
    std::vector<std::string> open(reached.begin(), reached.end());
    while (!open.empty()) {
        const auto found = callers_of.find(open.back());
        open.pop_back();
        if (found == callers_of.end()) {
            continue;
        }
        for (const std::string& caller : found->second) {
            if (reached.insert(caller).second) {
                open.push_back(caller);
            }
        }
    }
    Names result;
    std::ranges::set_intersection(reached, exported_names(), std::inserter(result, result.end()));
    return result;
}

TEST(EveryAllocatingFunction, HasACaseHere)
{
    if (!KZ_COMPARED) {
        GTEST_SKIP() << "the library's code has calls that are not its own";
    }
    Names tested;
    for (const Case& one : all_cases()) {
        tested.insert(one.function);
    }
    Names expected = allocating();
    EXPECT_GT(expected.size(), 50U);
    // Calls through a table are not seen: the algorithms' table leads to the first, and that to
    // the others.
    expected.merge(Names{"kz_fpx_fingerprint_add_audio", "kz_stream_feed", "kz_stream_finish"});
    // What a Java VM calls has tests of its own, in tests/library/jni.
    expected.erase("JNI_OnLoad");
    EXPECT_EQ(expected, tested);
}

} // namespace

} // namespace kz::test
