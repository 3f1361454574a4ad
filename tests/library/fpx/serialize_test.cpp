#include <algorithm>
#include <cstring>
#include <set>
#include <string>
#include <vector>

#include "support/allocation.hpp"
#include "support/fingerprints.hpp"
#include "support/signals.hpp"

namespace kz::test {

namespace {

class Serialize : public MemoryOn {
protected:
    void SetUp() override
    {
        MemoryOn::SetUp();
        ASSERT_EQ(KZ_OK, create(fixed, pcm16, 11025, mono, &handle_));
    }
    void TearDown() override
    {
        EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_free(&handle_));
        MemoryOn::TearDown();
    }

    void complete() { ASSERT_TRUE(add(handle_, tune(11025, 1, 16))); }

    kz_fpx_handle* handle_ = nullptr;
};

} // namespace

TEST_F(Serialize, ADocumentIsDeclaredIndentedAndOf30Values)
{
    complete();
    char* text = nullptr;
    ASSERT_EQ(KZ_OK, kz_fpx_fingerprint_serialize(handle_, &text));
    const std::string document = text;
    EXPECT_EQ(0U, document.find("<?xml version=\"1.0\" encoding=\"UTF-8\" ?>\n"
                                "<KZFPX_FP_QUERY VERSION=\"1.0\">\n"
                                "  <ALGORITHM>\n"
                                "    <NAME>Quenvar</NAME>\n"
                                "    <VERSION>1.1</VERSION>\n"
                                "    <QUERY>Quenvar&quot;1.1</QUERY>\n"
                                "  </ALGORITHM>\n"
                                "  <FP_BLOCKS>\n"
                                "    <FP_BLOCK TYPE=\"SIGNED_INT_16\" COUNT=\"30\" "
                                "ENCODING=\"ASCII\" SEPARATOR=\" \">"));
    const size_t open = document.find("SEPARATOR=\" \">") + 14;
    const std::string values = document.substr(open, document.find('<', open) - open);
    EXPECT_EQ(29, std::count(values.begin(), values.end(), ' '));
    EXPECT_EQ("</FP_BLOCK>\n  </FP_BLOCKS>\n</KZFPX_FP_QUERY>\n",
              document.substr(document.find("</FP_BLOCK>")));
    // A buffer of 600 characters holds any such document.
    EXPECT_LE(document.size() - values.size() + 30 * 6, 600U);
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&text));
    EXPECT_EQ(nullptr, text);
}

TEST_F(Serialize, AnIncompleteFingerprintIsRefusedWithoutAText)
{
    int marker = 0;
    char* text = reinterpret_cast<char*>(&marker);
    EXPECT_EQ(KZ_QV_ERROR_INCOMPLETE, kz_fpx_fingerprint_serialize(handle_, &text));
    EXPECT_EQ(nullptr, text);
}

TEST_F(Serialize, NullsAreRefused)
{
    char* text = nullptr;
    EXPECT_EQ(KZ_FPX_ERROR_INVALID_ARGUMENT, kz_fpx_fingerprint_serialize(nullptr, &text));
    EXPECT_EQ(KZ_FPX_ERROR_INVALID_ARGUMENT, kz_fpx_fingerprint_serialize(handle_, nullptr));
    EXPECT_EQ(KZ_FPX_ERROR_INVALID_ARGUMENT, kz_fpx_fingerprint_serialize_free(nullptr));
}

TEST_F(Serialize, FreeingANullTextDoesNothing)
{
    char* text = nullptr;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize_free(&text));
    EXPECT_EQ(nullptr, text);
}

TEST_F(Serialize, TheSameFingerprintGivesTheSameText)
{
    complete();
    char* a = nullptr;
    char* b = nullptr;
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize(handle_, &a));
    EXPECT_EQ(KZ_OK, kz_fpx_fingerprint_serialize(handle_, &b));
    EXPECT_STREQ(a, b);
    kz_fpx_fingerprint_serialize_free(&a);
    kz_fpx_fingerprint_serialize_free(&b);
}

// Short of memory a call fails with a status of the layer that ran out, or returns a text. The
// texts that then differ from the whole document are those of two deliberate maskings: a query that
// succeeds after name or version failed, and an indentation that succeeds after a failure while
// rendering.
TEST_F(Serialize, FailedAllocationsAreReportedOrMaskedAsStated)
{
    complete();
    char* whole = nullptr;
    ASSERT_EQ(KZ_OK, kz_fpx_fingerprint_serialize(handle_, &whole));
    // The failed allocations after which another text was returned: first of those that fail alone,
    // then of those after which all later ones fail as well.
    std::vector<std::vector<int>> masked(1);
    int nth = 0;
    for_every_failed_allocation([&](auto fired) {
        ++nth;
        char* text = nullptr;
        const kz_status status = kz_fpx_fingerprint_serialize(handle_, &text);
        EXPECT_EQ(status == KZ_OK, text != nullptr);
        if (!fired()) {
            EXPECT_STREQ(whole, text);
            masked.emplace_back();
            nth = 0;
        } else if (status == KZ_OK) {
            EXPECT_STRNE(whole, text);
            masked.back().push_back(nth);
        } else {
            EXPECT_TRUE(status == KZ_QV_ERROR_MEMORY || status == KZ_XML_ERROR_MEMORY ||
                        status == KZ_FPX_ERROR_RENDER || status == KZ_QV_ERROR_INCOMPLETE)
                << std::hex << status;
        }
        kz_fpx_fingerprint_serialize_free(&text);
    });
    const std::vector<int> alone = {22, 23, 24, 25, 26, 27,
                                    28, 29, 30, 31, 32, // name, version, query
                                    39, 40};            // rendering
    EXPECT_EQ((std::vector<std::vector<int>>{alone, {}, {}}), masked);
    kz_fpx_fingerprint_serialize_free(&whole);
}

} // namespace kz::test
