#include "kzsdk/qv/query_document.hpp"

#include <cstring>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "kzsdk/xml/xml.h"
#include "support/allocation.hpp"

namespace kz::test {

namespace {

struct Fingerprint {
    std::vector<uint16_t> values;
    kz_status status = KZ_OK;
};

kz_status extract(const void* object, uint8_t* buffer, uint32_t size,
                  qv::FingerprintTimes& times) noexcept
{
    const auto& fingerprint = *static_cast<const Fingerprint*>(object);
    if (size != 0) {
        std::memcpy(buffer, fingerprint.values.data(), size);
    }
    times = {1, 2};
    return fingerprint.status;
}

qv::FingerprintSource source_of(const Fingerprint& fingerprint)
{
    return {.name = "Quenvar",
            .version = "1.1",
            .size = static_cast<uint32_t>(fingerprint.values.size() * 2),
            .object = &fingerprint,
            .extract = extract};
}

// The document as text without white space between elements; the status in hex on failure.
std::string text_of(const Fingerprint& fingerprint)
{
    XMLTag* tree = nullptr;
    const kz_status status = qv::build_query_document(source_of(fingerprint), &tree);
    if (status != KZ_OK) {
        EXPECT_EQ(nullptr, tree);
        std::ostringstream text;
        text << std::hex << status;
        return text.str();
    }
    char* rendered = RenderXMLTagToStrEx(tree, 0, 0, 0);
    std::string text = rendered == nullptr ? "" : rendered;
    _kzmem_free(rendered);
    SmartDisposeXMLTag(&tree);
    return text;
}

std::string expected(const std::string& count, const std::string& values)
{
    return "<KZFPX_FP_QUERY VERSION=\"1.0\"><ALGORITHM><NAME>Quenvar</NAME><VERSION>1.1</VERSION>"
           "<QUERY>Quenvar&quot;1.1</QUERY></ALGORITHM><FP_BLOCKS><FP_BLOCK TYPE=\"SIGNED_INT_16\" "
           "COUNT=\"" +
           count + "\" ENCODING=\"ASCII\" SEPARATOR=\" \">" + values +
           "</FP_BLOCK></FP_BLOCKS></KZFPX_FP_QUERY>";
}

class QueryDocument : public MemoryOn {};

} // namespace

TEST_F(QueryDocument, HoldsTheElementsInTheirOrder)
{
    EXPECT_EQ(expected("3", "1 2 3"), text_of({{1, 2, 3}}));
}

TEST_F(QueryDocument, ValuesAreUnsignedWithoutPadding)
{
    EXPECT_EQ(expected("4", "0 65535 7 32768"), text_of({{0, 65535, 7, 0x8000}}));
    EXPECT_EQ(expected("1", "0"), text_of({{0}}));
}

TEST_F(QueryDocument, TheCountIsThatOfTheValues)
{
    for (const size_t count : {1U, 2U, 30U, 1000U}) {
        std::string values = "65535";
        for (size_t i = 1; i < count; ++i) {
            values += " 65535";
        }
        EXPECT_EQ(expected(std::to_string(count), values),
                  text_of({std::vector<uint16_t>(count, 65535)}));
    }
}

TEST_F(QueryDocument, AFingerprintWithoutValuesIsRefused) { EXPECT_EQ("900f0009", text_of({{}})); }

TEST_F(QueryDocument, ARefusalPassesThroughUnchanged)
{
    EXPECT_EQ("900f0961", text_of({{1, 2}, KZ_QV_ERROR_INCOMPLETE}));
}

// A failure while name or version are set is forgotten when the query succeeds: then a document
// without one of them is returned as a success. Every other failure is reported.
TEST_F(QueryDocument, EveryFailedAllocationIsReportedButTwo)
{
    const Fingerprint fingerprint{{1, 2, 3}};
    const std::string whole = text_of(fingerprint);
    std::set<std::string> losses;
    for_every_failed_allocation([&](auto fired) {
        XMLTag* tree = nullptr;
        const kz_status status = qv::build_query_document(source_of(fingerprint), &tree);
        EXPECT_EQ(status == KZ_OK, tree != nullptr);
        const bool failed = fired();
        if (status != KZ_OK) {
            EXPECT_TRUE(failed);
            EXPECT_TRUE(status == KZ_QV_ERROR_MEMORY || status == KZ_XML_ERROR_MEMORY);
            return;
        }
        if (failed) {
            const bool name = XMLGetDataAtPath(tree, "KZFPX_FP_QUERY/ALGORITHM/NAME") != nullptr;
            const bool version =
                XMLGetDataAtPath(tree, "KZFPX_FP_QUERY/ALGORITHM/VERSION") != nullptr;
            const bool document_version = GetXMLTagAttrFromStr(tree, "VERSION") != nullptr;
            losses.insert(std::string(document_version ? "" : "document version, ") +
                          (name ? "" : "name, ") + (version ? "" : "version"));
        }
        SmartDisposeXMLTag(&tree);
    });
    EXPECT_EQ(
        (std::set<std::string>{"version", "name, version", "document version, name, version"}),
        losses);
}

} // namespace kz::test
