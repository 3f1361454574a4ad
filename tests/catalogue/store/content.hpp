// Everything that can be read from a store, as text: equal texts, equal stores.
#pragma once

#include <sstream>
#include <string>

#include "catalogue/store/store.hpp"

namespace kzcat::test {

inline void describe(std::ostream& out, const Source& source)
{
    out << " [" << source.uri << ' ' << source.size << ' ' << source.mtime_ns << ' ';
    if (source.hash) {
        for (const uint8_t byte : *source.hash) {
            out << int{byte} << '.';
        }
    }
    out << ']';
}

inline void describe(std::ostream& out, const TrackInfo& info)
{
    out << info.id << ' ' << static_cast<uint32_t>(info.profile) << ' ' << info.samples << ' '
        << info.codes << ' ' << info.has_document_bands << ' ' << info.added << ' ';
    for (const uint8_t byte : info.key) {
        out << int{byte} << '.';
    }
    for (const Tag& tag : info.tags) {
        out << " {" << tag.name << '=' << tag.value << '}';
    }
    for (const Source& source : info.sources) {
        describe(out, source);
    }
    out << '\n';
}

/// Throws StoreError when something cannot be read. What was chosen at random may be left out.
inline std::string content(Store& store, bool with_random = true)
{
    std::ostringstream out;
    out << (with_random ? store.catalogue_id() : "") << ' ' << store.track_count() << ' '
        << store.code_count() << ' ' << store.last_change() << '\n';
    store.visit_tracks(0, [&](const TrackInfo& info) {
        describe(out, info);
        for (const uint16_t band : store.document_bands(info.id).value_or(DocumentBands{})) {
            out << band << ' ';
        }
        return true;
    });
    store.visit_trails(0, [&](int64_t track, const Trail& trail) {
        out << '\n' << track << ' ' << trail.samples << ':' << std::hex;
        for (const Code code : trail.codes) {
            out << ' ' << code;
        }
        out << std::dec;
        return true;
    });
    for (const Change& change : store.changes(0, SIZE_MAX)) {
        out << '\n'
            << change.cursor << ' ' << change.track << ' ' << (change.kind == ChangeKind::added)
            << ' ' << (with_random ? change.mark : 0);
    }
    out << '\n' << store.setting("a").value_or("-") << store.setting("b").value_or("-");
    return out.str();
}

} // namespace kzcat::test
