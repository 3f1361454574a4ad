/// @file
/// The two families side by side, for tests of what they have in common.
#pragma once

#include <ostream>

#include <sys/resource.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "kzsdk/disc/disc.h"

namespace kz::test {

/// Restores at its end what it was given.
template <class Restore>
class AtEnd {
public:
    explicit AtEnd(Restore restore) : restore_(restore) {}
    ~AtEnd() { restore_(); }
    AtEnd(const AtEnd&) = delete;
    AtEnd& operator=(const AtEnd&) = delete;

private:
    Restore restore_;
};

struct DiscFamilyCalls {
    const char* name;
    kz_status (*initialize)();
    kz_status (*shutdown)();
    kz_status (*query_availability)();
    kz_status (*get_error)();
    int32_t (*open)(const char*);
    int64_t (*seek)(int32_t, int64_t, int32_t);
    int32_t (*read)(int32_t, void*, uint32_t);
    int32_t (*read_at)(int32_t, int64_t, void*, uint32_t);
    kz_status (*close)(int32_t);
    kz_status (*read_vol_label)(const char*, uint32_t, uint32_t*, char*);
    kz_status (*get_volume_label)(int32_t, char*, uint32_t);
    int64_t label_offset;
};

inline void PrintTo(const DiscFamilyCalls& family, std::ostream* out) { *out << family.name; }

inline constexpr DiscFamilyCalls kBluray = {"Bluray",
                                            kzbdfs_initialize,
                                            kzbdfs_shutdown,
                                            kzbdfs_query_availability,
                                            kzbdfs_get_error,
                                            kzbdfs_open,
                                            kzbdfs_seek,
                                            kzbdfs_read,
                                            kzbdfs_read_at,
                                            kzbdfs_close,
                                            kzbdfs_read_vol_label,
                                            kzbdfs_get_volume_label,
                                            65561};

inline constexpr DiscFamilyCalls kDvd = {"Dvd",
                                         kzdvdfs_initialize,
                                         kzdvdfs_shutdown,
                                         kzdvdfs_query_availability,
                                         kzdvdfs_get_error,
                                         kzdvdfs_open,
                                         kzdvdfs_seek,
                                         kzdvdfs_read,
                                         kzdvdfs_read_at,
                                         kzdvdfs_close,
                                         kzdvdfs_read_vol_label,
                                         kzdvdfs_get_volume_label,
                                         32808};

/// Both families are off, without a last error, before and after each test.
class DiscOff : public ::testing::TestWithParam<DiscFamilyCalls> {
protected:
    void SetUp() override { reset(); }
    void TearDown() override { reset(); }

    const DiscFamilyCalls& family() const { return GetParam(); }

private:
    static void reset()
    {
        for (const DiscFamilyCalls& each : {kBluray, kDvd}) {
            each.shutdown();
            each.get_error();
        }
    }
};

/// The family under test is on.
class DiscOn : public DiscOff {
protected:
    void SetUp() override
    {
        DiscOff::SetUp();
        ASSERT_EQ(KZ_OK, family().initialize());
    }

    void expect_error(kz_status status) const
    {
        EXPECT_EQ(status, family().get_error());
        EXPECT_EQ(KZ_OK, family().get_error()) << "the last error is taken by whoever asks";
    }
};

inline std::string family_name(const ::testing::TestParamInfo<DiscFamilyCalls>& info)
{
    return info.param.name;
}

/// Runs `act` without root's privilege to read everything.
template <class Act>
void as_nobody(Act act)
{
    constexpr uid_t kNobody = 65534;
    const uid_t before = ::geteuid();
    if (before == 0) {
        ASSERT_EQ(0, ::seteuid(kNobody));
    }
    const AtEnd restore([before] { EXPECT_EQ(0, ::seteuid(before)); });
    act();
}

/// Runs `act` while the process can open nothing.
template <class Act>
void without_descriptors(Act act)
{
    rlimit before{};
    ASSERT_EQ(0, ::getrlimit(RLIMIT_NOFILE, &before));
    const rlimit none{0, before.rlim_max};
    ASSERT_EQ(0, ::setrlimit(RLIMIT_NOFILE, &none));
    const AtEnd restore([&before] { static_cast<void>(::setrlimit(RLIMIT_NOFILE, &before)); });
    act();
}

} // namespace kz::test
