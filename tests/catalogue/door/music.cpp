#include "catalogue/door/music.hpp"

#include "support/signals.hpp"

namespace kz::test {

std::vector<int16_t> piece(uint64_t seed, double seconds)
{
    return tune(kRate, 1, seconds, 0.5, seed);
}

Trail trail_of(const std::vector<int16_t>& samples, bool documents)
{
    kzcat_builder_settings settings;
    kzcat_initialize_builder_settings(&settings);
    settings.documents = documents ? 1 : 0;
    const auto builder = make<Builder>(kzcat_builder_create, &kFormat, &settings);
    if (builder.status != KZCAT_OK ||
        kzcat_builder_feed(builder.handle.get(), samples.data(), samples.size() * 2) != KZCAT_OK) {
        return nullptr;
    }
    return make<Trail>(kzcat_builder_finish, builder.handle.get()).handle;
}

Query query_of(const std::vector<int16_t>& samples)
{
    auto query = make<Query>(kzcat_query_create, &kFormat);
    if (query.status != KZCAT_OK ||
        kzcat_query_feed(query.handle.get(), samples.data(), samples.size() * 2) != KZCAT_OK ||
        kzcat_query_finish(query.handle.get()) != KZCAT_OK) {
        return nullptr;
    }
    return std::move(query.handle);
}

Catalogue open_memory()
{
    return make<Catalogue>(kzcat_open, static_cast<const char*>(nullptr),
                           uint32_t{KZCAT_ACCESS_CREATE},
                           static_cast<const kzcat_settings*>(nullptr))
        .handle;
}

Catalogue open_file(const std::string& path, uint32_t access)
{
    return make<Catalogue>(kzcat_open, path.c_str(), access,
                           static_cast<const kzcat_settings*>(nullptr))
        .handle;
}

int64_t add(kzcat_catalogue* catalogue, const kzcat_trail* trail, const std::string& uri,
            const std::string& title)
{
    const kzcat_tag tag = {"title", title.c_str()};
    const kzcat_new_track track = {trail, {uri.c_str(), -1, -1, nullptr}, &tag, 1};
    kzcat_added added = {};
    return kzcat_add(catalogue, &track, 1, &added) == KZCAT_OK ? added.track : 0;
}

} // namespace kz::test
