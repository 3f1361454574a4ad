#include "peers/peers.hpp"

#ifdef KZ_PEER_LIBXML2

#include <memory>

#include <libxml/tree.h>

#include "peers/document.hpp"

namespace kz::bench {

namespace {

struct Free {
    void operator()(xmlDoc* document) const { xmlFreeDoc(document); }
};

const xmlChar* bytes(const char* text) { return reinterpret_cast<const xmlChar*>(text); }

xmlNode* add(xmlNode* parent, const char* name, const char* text = nullptr)
{
    return xmlNewTextChild(parent, nullptr, bytes(name), bytes(text));
}

void set(xmlNode* node, const char* name, const char* value)
{
    xmlNewProp(node, bytes(name), bytes(value));
}

std::string render(const DocumentTexts& texts)
{
    const std::unique_ptr<xmlDoc, Free> document(xmlNewDoc(bytes("1.0")));
    xmlNode* const root = xmlNewNode(nullptr, bytes("KZFPX_FP_QUERY"));
    xmlDocSetRootElement(document.get(), root);
    set(root, "VERSION", "1.0");
    xmlNode* const algorithm = add(root, "ALGORITHM");
    add(algorithm, "NAME", "Quenvar");
    add(algorithm, "VERSION", "1.1");
    add(algorithm, "QUERY", "Quenvar\"1.1");
    xmlNode* const blocks = add(root, "FP_BLOCKS");
    for (size_t i = 0; i < texts.blocks; ++i) {
        xmlNode* const block = add(blocks, "FP_BLOCK", texts.values.c_str());
        set(block, "TYPE", "SIGNED_INT_16");
        set(block, "COUNT", "30");
        set(block, "ENCODING", "ASCII");
        set(block, "SEPARATOR", " ");
    }
    xmlChar* text = nullptr;
    int size = 0;
    xmlDocDumpFormatMemoryEnc(document.get(), &text, &size, "UTF-8", 1);
    std::string written(reinterpret_cast<const char*>(text), static_cast<size_t>(size));
    xmlFree(text);
    return written;
}

} // namespace

Peer document_by_libxml2(const std::string& values, size_t blocks)
{
    return document_peer(kLibxml2, {values, blocks}, render);
}

} // namespace kz::bench

#else

namespace kz::bench {

Peer document_by_libxml2(const std::string&, size_t) { return {kLibxml2}; }

} // namespace kz::bench

#endif
