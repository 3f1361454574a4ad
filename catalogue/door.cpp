// The C interface: version, opening, facts, and the care of a catalogue.

#include <algorithm>

#include "catalogue/handles.hpp"
#include "catalogue/store/memory/memory_store.hpp"
#include "catalogue/store/postgresql/postgres_store.hpp"
#include "catalogue/store/sqlite/sqlite_store.hpp"

namespace {

using namespace kzcat;

Access to_access(uint32_t access)
{
    switch (access) {
    case KZCAT_ACCESS_READ:
        return Access::read;
    case KZCAT_ACCESS_WRITE:
        return Access::write;
    case KZCAT_ACCESS_CREATE:
        return Access::create;
    default:
        throw Failure(KZCAT_ERROR_INVALID_ARGUMENT,
                      "the access is none of KZCAT_ACCESS_...; pass one of these");
    }
}

std::optional<Plan> to_plan(uint32_t plan)
{
    switch (plan) {
    case KZCAT_PLAN_MEASURED:
        return {};
    case KZCAT_PLAN_SCAN:
        return Plan::scan;
    case KZCAT_PLAN_PARTS:
        return Plan::parts;
    default:
        throw Failure(KZCAT_ERROR_INVALID_ARGUMENT,
                      "the plan is none of KZCAT_PLAN_...; pass one of these");
    }
}

IndexOptions to_index_options(const char* path, const kzcat_settings& settings)
{
    require(all_zero(settings.reserved),
            "a reserved field of the settings is not 0; fill them with "
            "kzcat_initialize_settings()");
    require(settings.index_file <= 1 && settings.fall_back <= 1 && settings.partial <= 1,
            "index_file, fall_back and partial are 0 or 1");
    IndexOptions options;
    if (path != nullptr && is_server_address(path)) {
        options.server = path;
        options.partial = settings.partial == 1;
        options.write = settings.index_file == 1;
    } else if (path != nullptr && settings.index_file == 1) {
        options.path = std::string(path) + ".idx";
    }
    options.fall_back = settings.fall_back == 1;
    options.plan = to_plan(settings.plan);
    if (settings.index_from != 0) {
        options.write_from = settings.index_from;
    }
    return options;
}

std::unique_ptr<Store> open_store(const char* path, uint32_t access)
{
    if (path == nullptr) {
        require(access == KZCAT_ACCESS_CREATE, "a catalogue in memory is empty at first; open it "
                                               "with KZCAT_ACCESS_CREATE");
        return make_memory_store();
    }
    if (is_server_address(path)) {
        return open_postgres_store(path, to_access(access));
    }
    return open_sqlite_store(path, to_access(access));
}

/// A caller's progress function, and whether it stopped the work.
class Watched {
public:
    Watched(kzcat_progress function, void* context) : function_(function), context_(context) {}

    bool operator()(uint64_t done, uint64_t total)
    {
        stopped_ = function_ != nullptr && function_(context_, done, total) == 0;
        return !stopped_;
    }
    void complain_if_stopped() const
    {
        if (stopped_) {
            throw Failure(KZCAT_ERROR_CANCELLED, kzcat_status_text(KZCAT_ERROR_CANCELLED));
        }
    }

private:
    kzcat_progress function_;
    void* context_;
    bool stopped_ = false;
};

uint32_t to_number(Plan plan)
{
    return plan == Plan::parts ? uint32_t{KZCAT_PLAN_PARTS} : uint32_t{KZCAT_PLAN_SCAN};
}

uint32_t to_number(IndexState state)
{
    switch (state) {
    case IndexState::current:
        return KZCAT_INDEX_CURRENT;
    case IndexState::missing:
        return KZCAT_INDEX_MISSING;
    case IndexState::stale:
        return KZCAT_INDEX_STALE;
    case IndexState::unusable:
        return KZCAT_INDEX_UNUSABLE;
    case IndexState::none:
        break;
    }
    return KZCAT_INDEX_NONE;
}

void fill_index_facts(const IndexFacts& index, kzcat_facts& facts)
{
    facts.index_bytes = index.file_bytes;
    facts.scan_ms = index.scan_ms;
    facts.parts_ms = index.parts_ms;
    facts.plan = to_number(index.plan);
    facts.index_state = to_number(index.state);
    facts.left_out = index.left_out;
}

} // namespace

const char* kzcat_get_version() noexcept { return KZCAT_VERSION; }

kzcat_status kzcat_initialize_settings(kzcat_settings* settings) noexcept
{
    return guarded([=] {
        require(settings != nullptr, "the settings are null; pass a record");
        *settings = {};
        settings->plan = KZCAT_PLAN_MEASURED;
        settings->index_file = 1;
        settings->fall_back = 1;
    });
}

kzcat_status kzcat_open(const char* path, uint32_t access, const kzcat_settings* settings,
                        kzcat_catalogue** out_catalogue) noexcept
{
    return guarded([=] {
        clear_place(out_catalogue);
        static_cast<void>(to_access(access));
        kzcat_settings usual;
        kzcat_initialize_settings(&usual);
        IndexOptions options = to_index_options(path, settings == nullptr ? usual : *settings);
        *out_catalogue = new kzcat_catalogue{{open_store(path, access), std::move(options)}};
    });
}

uint8_t kzcat_is_server_address(const char* path) noexcept
{
    return path != nullptr && is_server_address(path) ? 1 : 0;
}

kzcat_status kzcat_show_path(const char* path, char* text, uint64_t capacity,
                             uint64_t* out_size) noexcept
{
    return guarded([=] {
        require(out_size != nullptr, "the place for the size is null; pass one");
        *out_size = 0;
        require(path != nullptr, "the path is null; pass one");
        require(text != nullptr || capacity == 0,
                "the text is null; pass room, or a capacity of 0 to learn the size");
        const std::string shown = shown_place(path);
        copy_out(std::span(shown.c_str(), shown.size() + 1), text, capacity, out_size);
    });
}

kzcat_status kzcat_close(kzcat_catalogue** catalogue_ref) noexcept
{
    return free_handle(catalogue_ref);
}

kzcat_status kzcat_get_facts(kzcat_catalogue* catalogue, uint8_t open_index,
                             kzcat_facts* out_facts) noexcept
{
    return guarded([=] {
        require(catalogue != nullptr && out_facts != nullptr,
                "the catalogue or the record for the facts is null; pass both");
        *out_facts = {};
        kzcat_facts facts = {};
        if (open_index != 0 || catalogue->whole.index_is_open()) {
            fill_index_facts(catalogue->whole.index_facts(true), facts);
        }
        catalogue->whole.with_store([&](Store& store) {
            facts.tracks = store.track_count();
            facts.codes = store.code_count();
        });
        *out_facts = facts;
    });
}

kzcat_status kzcat_verify(kzcat_catalogue* catalogue, kzcat_fault report, kzcat_progress progress,
                          void* context, uint64_t* out_faults) noexcept
{
    return guarded([=] {
        if (out_faults != nullptr) {
            *out_faults = 0;
        }
        require(catalogue != nullptr, "the catalogue is null; pass an open one");
        uint64_t faults = 0;
        Watched watched(progress, context);
        const auto take = [&](const Fault& fault) {
            ++faults;
            if (report != nullptr) {
                report(context, fault.track, fault.text.c_str());
            }
        };
        catalogue->whole.with_store([&](Store& store) { store.verify(take, std::ref(watched)); });
        if (out_faults != nullptr) {
            *out_faults = faults;
        }
        watched.complain_if_stopped();
    });
}

kzcat_status kzcat_merge(kzcat_catalogue* catalogue, kzcat_catalogue* other,
                         kzcat_progress progress, void* context, kzcat_merged* out_merged) noexcept
{
    return guarded([=] {
        kzcat_merged ignored = {};
        kzcat_merged& record = out_merged != nullptr ? *out_merged : ignored;
        record = {};
        require(catalogue != nullptr && other != nullptr,
                "a catalogue is null; pass two open ones");
        require(catalogue != other, "the two catalogues are the same; pass another one");
        Watched watched(progress, context);
        Merged merged;
        const auto report = [&](uint64_t done, uint64_t total) {
            record.tracks_new = merged.tracks_new;
            record.tracks_known = merged.tracks_known;
            record.tracks_damaged = merged.tracks_damaged;
            return watched(done, total);
        };
        static_cast<void>(catalogue->whole.merge(other->whole, report, merged));
        watched.complain_if_stopped();
    });
}
