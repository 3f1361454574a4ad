// The builders of a disc's names, for any root, number and size: exactly the text that fits, and
// not a byte beyond the room.

#include <algorithm>

#include "fuzz.hpp"
#include "kzsdk/disc/disc.h"

namespace kz::fuzz {

namespace {

struct Request {
    std::string root;
    uint32_t number;
    uint32_t size;
};

std::string padded(int64_t number, int digits)
{
    char text[32];
    std::snprintf(text, sizeof text, "%0*lld", digits, static_cast<long long>(number));
    return text;
}

std::string below_bluray(const std::string& root, const std::string& tail)
{
    return root.size() > 1 && root.back() == '/' ? root + tail : root + '/' + tail;
}

/// The room that a builder is given, filled with a mark.
class Room {
public:
    explicit Room(uint32_t size) : bytes_(size > 0 ? new char[size] : nullptr), size_(size)
    {
        std::fill_n(bytes_.get(), size, kMark);
    }
    char* data() const { return bytes_.get(); }
    std::string text() const { return std::string(bytes_.get(), ::strnlen(bytes_.get(), size_)); }
    char last() const { return bytes_[size_ - 1]; }

private:
    static constexpr char kMark = '\x5a';
    std::unique_ptr<char[]> bytes_;
    uint32_t size_;
};

template <class Build>
void check_bluray(const Request& request, const std::string& text, bool tells, Build build)
{
    char none = 0;
    const Room room(request.size);
    const kz_status status = build(request.size > 0 ? room.data() : &none);
    if (request.size == 0) {
        ASSERT_EQ(KZ_DISC_ERROR_INVALID_ARGUMENT, status);
        return;
    }
    const bool cut = request.size <= text.size() % 65536;
    ASSERT_EQ(tells && cut ? KZ_DISC_ERROR_MEMORY : KZ_OK, status);
    ASSERT_EQ(text.substr(0, request.size - 1), room.text());
    ASSERT_EQ('\0', room.last());
}

template <class Build>
void check_dvd(const Request& request, const std::string& text, Build build)
{
    const Room room(request.size);
    ASSERT_EQ(static_cast<int32_t>(text.size()), build(room.data()));
    if (request.size > 0) {
        ASSERT_EQ(text.substr(0, request.size - 1), room.text());
    }
}

} // namespace

void run(Choices& choices)
{
    const auto which = choices.ConsumeIntegralInRange<int>(0, 7);
    const auto number = choices.ConsumeIntegral<uint32_t>();
    const auto size = choices.ConsumeIntegralInRange<uint32_t>(0, 300);
    const std::string root = choices.ConsumeRandomLengthString(200).c_str();
    const Request request{root, number, size};
    const char* const path = request.root.c_str();
    const auto bluray = [&](const std::string& tail, bool tells, auto build) {
        check_bluray(request, below_bluray(root, tail), tells,
                     [&](char* room) { return build(path, room, size); });
    };
    const auto set = static_cast<int32_t>(number);
    switch (which) {
    case 0:
        return check_bluray(
            request, "Content" + padded(number, 3) + ".cer", false,
            [&](char* room) { return kzbdfs_get_cert_filename(room, number, size); });
    case 1:
        return bluray("AACS/", true, kzbdfs_get_cert_dirname);
    case 2:
        return bluray("BDMV/index.bdmv", false, kzbdfs_get_index_bdmv_name);
    case 3:
        return bluray("BDMV/MovieObject.bdmv", false, kzbdfs_get_movieobject_bdmv_name);
    case 4:
        return bluray("BDMV/PLAYLIST/", false, kzbdfs_get_playlist_dirname);
    case 5:
        return bluray("BDMV/PLAYLIST/" + padded(number, 5) + ".mpls", false,
                      [&](const char* from, char* room, uint32_t count) {
                          return kzbdfs_get_playlist_filename(from, number, room, count);
                      });
    case 6:
        return check_dvd(request, root + "/VIDEO_TS/VIDEO_TS.IFO", [&](char* room) {
            return kzdvdfs_get_video_ts_ifoname(path, room, size);
        });
    default:
        return check_dvd(
            request, root + "/VIDEO_TS/VTS_" + padded(set, 2) + "_0.IFO",
            [&](char* room) { return kzdvdfs_get_vts_ifoname(path, set, room, size); });
    }
}

} // namespace kz::fuzz
