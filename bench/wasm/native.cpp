// The native side of measure.mjs: does what each line of its input says with the samples of a file,
// and prints how many milliseconds it took. Wall clock, as the other side can have no other.
//
//   native FILE RATE CHANNELS    with "fingerprint" and "trail" on standard input, one a line

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#include "kzcat.h"
#include "kzsdk/kzsdk.h"

namespace {

struct Sound {
    std::vector<float> samples;
    uint32_t rate = 0;
    uint32_t channels = 0;

    uint64_t bytes() const { return samples.size() * sizeof(float); }
};

std::vector<float> read_floats(const char* path)
{
    std::ifstream file(path, std::ios::binary | std::ios::ate);
    std::vector<float> samples(static_cast<size_t>(file.tellg()) / sizeof(float));
    file.seekg(0);
    file.read(reinterpret_cast<char*>(samples.data()),
              static_cast<std::streamsize>(samples.size() * sizeof(float)));
    return samples;
}

uint32_t number_of(const char* text)
{
    return static_cast<uint32_t>(std::strtoul(text, nullptr, 10));
}

bool make_fingerprint(const Sound& sound)
{
    kz_stream_settings settings;
    kz_stream* stream = nullptr;
    uint8_t complete = 0;
    const char* document = nullptr;
    kz_stream_initialize_settings(&settings);
    settings.format = KZ_STREAM_FORMAT_FLOAT32;
    settings.sample_rate = sound.rate;
    settings.channels = sound.channels;
    const bool made =
        kz_stream_create(&settings, &stream) == KZ_OK &&
        kz_stream_feed(stream, sound.samples.data(), sound.bytes(), nullptr, &complete) == KZ_OK &&
        kz_stream_get_document(stream, &document) == KZ_OK;
    kz_stream_free(&stream);
    return made;
}

bool make_trail(const Sound& sound)
{
    const kzcat_format format = {KZ_STREAM_FORMAT_FLOAT32, sound.rate, sound.channels, 0};
    kzcat_builder* builder = nullptr;
    kzcat_trail* trail = nullptr;
    uint64_t size = 0;
    bool made = kzcat_builder_create(&format, nullptr, &builder) == KZCAT_OK &&
                kzcat_builder_feed(builder, sound.samples.data(), sound.bytes()) == KZCAT_OK &&
                kzcat_builder_finish(builder, &trail) == KZCAT_OK &&
                kzcat_trail_write(trail, nullptr, 0, &size) == KZCAT_OK;
    std::vector<char> bytes(size);
    made = made && kzcat_trail_write(trail, bytes.data(), size, &size) == KZCAT_OK;
    kzcat_trail_free(&trail);
    kzcat_builder_free(&builder);
    return made;
}

} // namespace

int main(int argc, char** argv)
{
    if (argc != 4) {
        std::fputs("usage: native FILE RATE CHANNELS\n", stderr);
        return 2;
    }
    const Sound sound{read_floats(argv[1]), number_of(argv[2]), number_of(argv[3])};
    for (std::string what; std::getline(std::cin, what);) {
        const auto begin = std::chrono::steady_clock::now();
        const bool made = what == "trail" ? make_trail(sound) : make_fingerprint(sound);
        const std::chrono::duration<double, std::milli> took =
            std::chrono::steady_clock::now() - begin;
        if (!made) {
            std::fprintf(stderr, "native: no %s was made\n", what.c_str());
            return 1;
        }
        std::printf("%.4f\n", took.count());
        std::fflush(stdout);
    }
    return 0;
}
