// Each family of the library reads the label of one kind of volume.

#include "kzfp/disc/labels.hpp"

#include <array>

#include "kzfp/disc/families.hpp"

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

    using GetLabel = kz_status (*)(int32_t descriptor, char* label, uint32_t size);

    /// Nothing when there is no such volume.
    std::optional<std::string> label(GetLabel get_label) const
    {
        std::array<char, KZ_DISC_LABEL_SIZE> text;
        const kz_status status = get_label(descriptor_, text.data(), KZ_DISC_LABEL_SIZE);
        if (status == KZ_DISC_ERROR_NOT_FOUND) {
            return {};
        }
        if (status != KZ_OK) {
            throw disc_error("cannot be read", status);
        }
        return text.data();
    }

private:
    int32_t descriptor_;
};

} // namespace

DiscLabels labels_of(const std::string& path)
{
    const File disc(path);
    DiscLabels labels = {.iso9660 = disc.label(kzdvdfs_get_volume_label),
                         .udf = disc.label(kzbdfs_get_volume_label)};
    if (!labels.iso9660 && !labels.udf) {
        throw audio::FileError("no disc: it has neither an ISO 9660 volume nor a UDF volume where "
                               "discs have them");
    }
    return labels;
}

} // namespace kzfp
