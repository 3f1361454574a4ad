// The numbers that callers may have stored or sent, and the sentence for each.

#include "kzsdk/abs/status.h"

#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include <gtest/gtest.h>

namespace {

constexpr kz_status code(uint32_t module, uint32_t reason)
{
    return UINT32_C(9) << 28 | module << 16 | reason;
}

/// Every failure that the header defines.
std::vector<kz_status> defined_failures()
{
    std::ifstream in(KZ_STATUS_HEADER);
    const std::string text{std::istreambuf_iterator<char>(in), {}};
    const std::regex definition("#define KZ_\\w+ UINT32_C\\((0x[0-9a-f]{8})\\)");
    std::vector<kz_status> found;
    for (std::sregex_iterator it(text.begin(), text.end(), definition), end; it != end; ++it) {
        found.push_back(static_cast<kz_status>(std::stoul((*it)[1], nullptr, 16)));
    }
    return found;
}

const std::string kUnknown = kz_status_text(1);

TEST(Status, OfSuccessIsZero) { EXPECT_EQ(0u, KZ_OK); }

TEST(Status, OfTheCoreIsMadeOfModuleAndReason)
{
    EXPECT_EQ(code(0x00, 0x004), KZ_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(code(0x02, 0x001), KZ_XML_ERROR_MEMORY);
    EXPECT_EQ(code(0x02, 0x002), KZ_XML_ERROR_NOT_FOUND);
    EXPECT_EQ(code(0x02, 0x004), KZ_XML_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(code(0x03, 0x001), KZ_DYN_BUF_ERROR_MEMORY);
    EXPECT_EQ(code(0x03, 0x004), KZ_DYN_BUF_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(code(0x04, 0x005), KZ_MEM_ALREADY_ON);
    EXPECT_EQ(code(0x04, 0x006), KZ_MEM_NOT_ON);
    EXPECT_EQ(code(0x05, 0x006), KZ_INIT_ERROR_NOT_HELD);
    EXPECT_EQ(code(0x05, 0x990), KZ_INIT_ERROR_NO_RECORD);
    EXPECT_EQ(code(0x05, 0x991), KZ_INIT_ERROR_TOO_MANY_HOLDERS);
}

TEST(Status, OfDiscsIsMadeOfModuleAndReason)
{
    EXPECT_EQ(code(0x06, 0x001), KZ_DISC_ERROR_MEMORY);
    EXPECT_EQ(code(0x06, 0x004), KZ_DISC_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(code(0x06, 0x005), KZ_DISC_ALREADY_ON);
    EXPECT_EQ(code(0x06, 0x006), KZ_DISC_NOT_ON);
    EXPECT_EQ(code(0x06, 0x009), KZ_DISC_ERROR_SYSTEM);
    EXPECT_EQ(code(0x06, 0x047), KZ_DISC_ERROR_ACCESS_DENIED);
    EXPECT_EQ(code(0x06, 0x048), KZ_DISC_ERROR_NOT_FOUND);
    EXPECT_EQ(code(0x06, 0x04a), KZ_DISC_ERROR_NO_SPACE);
    EXPECT_EQ(code(0x06, 0x04b), KZ_DISC_ERROR_TOO_MANY_FILES);
    EXPECT_EQ(code(0x06, 0x04c), KZ_DISC_ERROR_BAD_DESCRIPTOR);
}

TEST(Status, OfFingerprintsIsMadeOfModuleAndReason)
{
    EXPECT_EQ(code(0x08, 0x001), KZ_FPX_ERROR_MEMORY);
    EXPECT_EQ(code(0x08, 0x004), KZ_FPX_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(code(0x08, 0x00b), KZ_FPX_ERROR_RENDER);
    EXPECT_EQ(code(0x08, 0x00f), KZ_FPX_ERROR_NO_INPUT_FORMAT);
    EXPECT_EQ(code(0x08, 0x010), KZ_FPX_ERROR_ROOM);
    EXPECT_EQ(code(0x08, 0x602), KZ_FPX_ERROR_NOT_ENOUGH_AUDIO);
    EXPECT_EQ(code(0x08, 0x606), KZ_FPX_ERROR_NO_ALGORITHM);
    EXPECT_EQ(code(0x0f, 0x001), KZ_QV_ERROR_MEMORY);
    EXPECT_EQ(code(0x0f, 0x004), KZ_QV_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(code(0x0f, 0x009), KZ_QV_ERROR_EMPTY);
    EXPECT_EQ(code(0x0f, 0x960), KZ_QV_FRAME_LIMIT_REACHED);
    EXPECT_EQ(code(0x0f, 0x961), KZ_QV_ERROR_INCOMPLETE);
}

TEST(Status, OfStreamsIsMadeOfModuleAndReason)
{
    EXPECT_EQ(code(0x09, 0x001), KZ_STREAM_ERROR_MEMORY);
    EXPECT_EQ(code(0x09, 0x004), KZ_STREAM_ERROR_INVALID_ARGUMENT);
    EXPECT_EQ(code(0x09, 0x006), KZ_STREAM_ERROR_NOT_STARTED);
    EXPECT_EQ(code(0x09, 0x010), KZ_STREAM_ERROR_ALGORITHM);
    EXPECT_EQ(code(0x09, 0x011), KZ_STREAM_ERROR_FORMAT);
    EXPECT_EQ(code(0x09, 0x012), KZ_STREAM_ERROR_RATE);
    EXPECT_EQ(code(0x09, 0x013), KZ_STREAM_ERROR_CHANNELS);
    EXPECT_EQ(code(0x09, 0x014), KZ_STREAM_ERROR_FINISHED);
    EXPECT_EQ(code(0x09, 0x015), KZ_STREAM_ERROR_FAILED);
}

TEST(Status, HasItsOwnText)
{
    const std::vector<kz_status> failures = defined_failures();
    EXPECT_GT(failures.size(), 25u) << "no definitions in " KZ_STATUS_HEADER;
    std::set<std::string> texts = {kUnknown, kz_status_text(KZ_OK)};
    for (const kz_status failure : failures) {
        const std::string text = kz_status_text(failure);
        EXPECT_TRUE(texts.insert(text).second) << std::hex << failure << ": " << text;
    }
}

// A cause, a colon, and what cures it.
TEST(Status, IsDescribedInOneSentenceWithItsCure)
{
    const std::regex sentence("[A-Z][^:]+: [^:]+\\.");
    for (const kz_status failure : defined_failures()) {
        EXPECT_TRUE(std::regex_match(kz_status_text(failure), sentence)) << kz_status_text(failure);
    }
    EXPECT_TRUE(std::regex_match(kUnknown, sentence)) << kUnknown;
    EXPECT_STREQ("The call succeeded.", kz_status_text(KZ_OK));
}

TEST(Status, ThatIsUnknownHasATextToo)
{
    for (const kz_status unknown : {code(0x02, 0x003), code(0x0f, 0x962), UINT32_MAX, KZ_OK + 2}) {
        EXPECT_EQ(kUnknown, kz_status_text(unknown)) << unknown;
    }
}

} // namespace
