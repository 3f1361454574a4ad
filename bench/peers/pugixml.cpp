#include "peers/peers.hpp"

#ifdef KZ_PEER_PUGIXML

#include <pugixml.hpp>

#include "peers/document.hpp"

namespace kz::bench {

namespace {

struct Text : pugi::xml_writer {
    void write(const void* data, size_t size) override
    {
        text.append(static_cast<const char*>(data), size);
    }
    std::string text;
};

void add(pugi::xml_node parent, const char* name, const char* text)
{
    parent.append_child(name).text().set(text);
}

std::string render(const DocumentTexts& texts)
{
    pugi::xml_document document;
    auto root = document.append_child("KZFPX_FP_QUERY");
    root.append_attribute("VERSION").set_value("1.0");
    auto algorithm = root.append_child("ALGORITHM");
    add(algorithm, "NAME", "Quenvar");
    add(algorithm, "VERSION", "1.1");
    add(algorithm, "QUERY", "Quenvar\"1.1");
    auto blocks = root.append_child("FP_BLOCKS");
    for (size_t i = 0; i < texts.blocks; ++i) {
        auto block = blocks.append_child("FP_BLOCK");
        block.append_attribute("TYPE").set_value("SIGNED_INT_16");
        block.append_attribute("COUNT").set_value(30);
        block.append_attribute("ENCODING").set_value("ASCII");
        block.append_attribute("SEPARATOR").set_value(" ");
        block.text().set(texts.values.c_str());
    }
    Text written;
    document.save(written, "  ");
    return std::move(written.text);
}

} // namespace

Peer document_by_pugixml(const std::string& values, size_t blocks)
{
    return document_peer(kPugixml, {values, blocks}, render);
}

} // namespace kz::bench

#else

namespace kz::bench {

Peer document_by_pugixml(const std::string&, size_t) { return {kPugixml}; }

} // namespace kz::bench

#endif
