// A label is read where its volume descriptor stands, and only when the descriptor is there.

#include "kzfp/disc/labels.hpp"

#include <array>
#include <cerrno>
#include <string_view>

#include "kzfp/disc/families.hpp"
#include "kzsdk/disc/volume_label.hpp"

namespace kzfp {

namespace {

/// A file, opened through the library.
class File {
public:
    explicit File(const std::string& path) : descriptor_(kzdvdfs_open(path.c_str()))
    {
        if (descriptor_ < 0) {
            throw disc_error("cannot be opened", kzdvdfs_get_error());
        }
    }
    ~File() { kzdvdfs_close(descriptor_); }
    File(const File&) = delete;
    File& operator=(const File&) = delete;

    bool has(int64_t offset, std::string_view bytes) const
    {
        std::array<char, 16> found = {};
        const int32_t count =
            kzdvdfs_read_at(descriptor_, offset, found.data(), static_cast<uint32_t>(bytes.size()));
        if (count < 0) {
            throw disc_error("cannot be read", kzdvdfs_get_error());
        }
        return std::string_view(found.data(), static_cast<size_t>(count)) == bytes;
    }

    std::string label(int64_t offset) const
    {
        kz::disc::VolumeLabel label{};
        if (!kz::disc::read_label(descriptor_, offset, label)) {
            throw audio::system_error("the label cannot be read", errno);
        }
        return {label.text, label.length};
    }

private:
    int32_t descriptor_;
};

} // namespace

/// The labels of the volumes that are there: the library reads whatever is there, so the marks of
/// the descriptors are checked first.
DiscLabels labels_of(const std::string& path)
{
    using kz::disc::kSector;
    using namespace std::string_view_literals;
    const File disc(path);
    DiscLabels labels;
    if (disc.has(16 * kSector, "\1CD001"sv)) {
        labels.iso9660 = disc.label(kz::disc::kIso9660Label);
    }
    if (disc.has(32 * kSector, "\1\0"sv)) {
        labels.udf = disc.label(kz::disc::kUdfLabel);
    }
    if (!labels.iso9660 && !labels.udf) {
        throw audio::FileError(
            "no disc: it has neither an ISO 9660 volume nor a UDF volume where discs "
            "have them");
    }
    return labels;
}

} // namespace kzfp
