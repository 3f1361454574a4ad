/// @file
/// The query document as the peers write it: the texts of its parts, and the check of the result.
#pragma once

#include <string>

#include "case.hpp"

namespace kz::bench {

struct DocumentTexts {
    std::string values;
    size_t blocks;
};

/// Throws unless a rendered document has all its parts.
inline void verify_document(const std::string& name, const std::string& text,
                            const DocumentTexts& texts)
{
    size_t blocks = 0;
    for (size_t at = 0; (at = text.find(texts.values, at)) != std::string::npos; ++at) {
        ++blocks;
    }
    const bool whole = text.find("<NAME>Quenvar</NAME>\n") != std::string::npos &&
                       text.find("ENCODING=\"ASCII\"") != std::string::npos &&
                       text.find("</KZFPX_FP_QUERY>") != std::string::npos;
    require(whole && blocks == texts.blocks, name + ": another document");
}

/// A peer over a function that builds and renders the document and frees all but the text.
template <class Render>
Peer document_peer(const char* name, const DocumentTexts& texts, Render render)
{
    return {name, [=] { keep(render(texts).data()); },
            [=] { verify_document(name, render(texts), texts); }};
}

} // namespace kz::bench
