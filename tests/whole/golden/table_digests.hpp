/// @file
/// Digests of the generated tables. They change only with a table's formula; then every fingerprint
/// changes.
#pragma once

#include <cstdint>

namespace kz::test {

constexpr uint64_t kTransformDigest = 0xe061467c85c08739;
constexpr uint64_t kDigest8000 = 0xd1db7df46975baaf;
constexpr uint64_t kDigest16000 = 0x3e205d3e97776953;
constexpr uint64_t kDigest22050 = 0x75e3cf3d2df35409;
constexpr uint64_t kDigest24000 = 0xdb34ab57bb223747;
constexpr uint64_t kDigest32000 = 0xd44be068ff1519eb;
constexpr uint64_t kDigest44100 = 0x6977d5e5fdbe1651;
constexpr uint64_t kDigest48000 = 0xd1c2786e48e0424a;
constexpr uint64_t kDigest2to1 = 0x2475fa1404a4362c;
constexpr uint64_t kDigest4to1 = 0xdbf35cedf975e3c7;

} // namespace kz::test
