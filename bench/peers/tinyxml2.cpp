#include "peers/peers.hpp"

#ifdef KZ_PEER_TINYXML2

#include <tinyxml2.h>

#include "peers/document.hpp"

namespace kz::bench {

namespace {

void add(tinyxml2::XMLElement* parent, const char* name, const char* text)
{
    parent->InsertNewChildElement(name)->SetText(text);
}

std::string render(const DocumentTexts& texts)
{
    tinyxml2::XMLDocument document;
    document.InsertEndChild(document.NewDeclaration());
    auto* const root = document.NewElement("KZFPX_FP_QUERY");
    document.InsertEndChild(root);
    root->SetAttribute("VERSION", "1.0");
    auto* const algorithm = root->InsertNewChildElement("ALGORITHM");
    add(algorithm, "NAME", "Quenvar");
    add(algorithm, "VERSION", "1.1");
    add(algorithm, "QUERY", "Quenvar\"1.1");
    auto* const blocks = root->InsertNewChildElement("FP_BLOCKS");
    for (size_t i = 0; i < texts.blocks; ++i) {
        auto* const block = blocks->InsertNewChildElement("FP_BLOCK");
        block->SetAttribute("TYPE", "SIGNED_INT_16");
        block->SetAttribute("COUNT", 30);
        block->SetAttribute("ENCODING", "ASCII");
        block->SetAttribute("SEPARATOR", " ");
        block->SetText(texts.values.c_str());
    }
    tinyxml2::XMLPrinter printer;
    document.Print(&printer);
    return printer.CStr();
}

} // namespace

Peer document_by_tinyxml2(const std::string& values, size_t blocks)
{
    return document_peer(kTinyxml2, {values, blocks}, render);
}

} // namespace kz::bench

#else

namespace kz::bench {

Peer document_by_tinyxml2(const std::string&, size_t) { return {kTinyxml2}; }

} // namespace kz::bench

#endif
