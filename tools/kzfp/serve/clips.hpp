/// @file
/// From the body of a request to what is looked up, and from there to its answer.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "audio/descriptor.hpp"
#include "kzfp/catalogue/handles.hpp"
#include "kzfp/serve/exchange.hpp"

namespace kzfp::serve {

/// The 30 values of {"values": [...]}. Throws a Refusal.
std::vector<int16_t> values_of(std::string_view json);

/// Bytes as a file in memory, for what reads files; path() is valid as long as it lives.
class MemoryFile {
public:
    /// Throws audio::FileError.
    explicit MemoryFile(std::string_view bytes);

    std::string path() const;

private:
    audio::Descriptor file_;
};

struct Found {
    Reply reply;
    const char* verdict; ///< in words
};

struct ClipRules {
    uint32_t longest;  ///< seconds of a clip; longer ones are refused
    bool hide_sources; ///< of the path of a source only the name of its file is told
};

/// Looks up what the body holds. Throws a Refusal, and CatalogueError when the catalogue has
/// failed.
Found find_clip(kzcat_catalogue& catalogue, const Plan& plan, std::string& body,
                const ClipRules& rules);

/// The word for what is looked up by a kind of body: "trail", "document", "values" or "sound".
const char* word_of(BodyKind kind);

/// Throws a Refusal for sound that cannot be used, in the words of the decoder.
[[noreturn]] void refuse_sound(const std::string& why);

/// A trail from bytes. Throws a Refusal.
Trail trail_of(std::string_view bytes);

/// What is behind the last slash.
std::string file_name_of(const std::string& source);

} // namespace kzfp::serve
