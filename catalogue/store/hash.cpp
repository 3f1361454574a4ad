// Hashes of features and of files.

#include "catalogue/store/hash.hpp"

#include <algorithm>
#include <array>

#include <nettle/sha2.h>

#include "catalogue/store/little_endian.hpp"

namespace kzcat {

struct FileHasher::State {
    sha256_ctx context;
};

FileHasher::FileHasher() : state_(std::make_unique<State>()) { sha256_init(&state_->context); }
FileHasher::FileHasher(FileHasher&&) noexcept = default;
FileHasher& FileHasher::operator=(FileHasher&&) noexcept = default;
FileHasher::~FileHasher() = default;

void FileHasher::update(std::span<const std::byte> bytes)
{
    sha256_update(&state_->context, bytes.size(), reinterpret_cast<const uint8_t*>(bytes.data()));
}

FileHash FileHasher::finish()
{
    FileHash hash{};
    sha256_digest(&state_->context, hash.size(), hash.data());
    return hash;
}

ContentKey content_key(const Trail& trail)
{
    sha256_ctx context;
    sha256_init(&context);
    std::array<std::byte, 12> head{};
    put_little_endian(static_cast<uint32_t>(trail.profile), head.data());
    put_little_endian(trail.samples, head.data() + 4);
    sha256_update(&context, head.size(), reinterpret_cast<const uint8_t*>(head.data()));
    std::array<std::byte, 4096> block{};
    for (std::span<const Code> rest(trail.codes); !rest.empty();) {
        const size_t count = std::min(rest.size(), block.size() / sizeof(Code));
        put_little_endian(rest.first(count), std::span(block).first(count * sizeof(Code)));
        sha256_update(&context, count * sizeof(Code),
                      reinterpret_cast<const uint8_t*>(block.data()));
        rest = rest.subspan(count);
    }
    ContentKey key{};
    sha256_digest(&context, key.size(), key.data());
    return key;
}

} // namespace kzcat
