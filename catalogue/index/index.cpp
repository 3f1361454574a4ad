/// @file
/// The searcher over a store: which plan it takes, and when its side file is written.

#include "catalogue/index/index.hpp"

#include <algorithm>
#include <cerrno>
#include <system_error>
#include <utility>

#include "catalogue/index/measure.hpp"
#include "catalogue/index/postgresql/postgres_index.hpp"
#include "catalogue/index/searches.hpp"

namespace kzcat {

namespace {

IndexHeader header_for(Store& store, const Snapshot& snapshot)
{
    IndexHeader header;
    header.catalogue = store.catalogue_id();
    header.profile = store.profile();
    header.cursor = snapshot.cursor();
    return header;
}

/// Measures both plans, and notes the faster one.
void choose_plan(IndexHeader& header, Searches& searches)
{
    constexpr size_t kLimit = 10;
    constexpr int kTimes = 3;
    const Reading reading = sample_reading(searches.snapshot().corpus());
    header.scan_us = measured_us(kTimes, [&] { searches.everything().find(reading, kLimit); });
    if (searches.has_parts()) {
        header.parts_us = measured_us(kTimes, [&] { searches.by_parts(reading, kLimit); });
        header.plan = header.parts_us < header.scan_us ? Plan::parts : Plan::scan;
    }
}

class StoreIndex final : public Index {
public:
    StoreIndex(Store& store, IndexOptions options) : options_(std::move(options))
    {
        set_snapshot(first_snapshot(store));
        keep_file(store);
    }

    std::vector<Candidate> find(const Reading& reading, size_t limit) override
    {
        return plan() == Plan::parts ? searches_->by_parts(reading, limit)
                                     : searches_->everything().find(reading, limit);
    }

    Searcher* thorough() override
    {
        return options_.fall_back && plan() == Plan::parts ? &searches_->everything() : nullptr;
    }

    std::span<const Code> codes(int64_t track) override
    {
        return searches_->everything().codes(track);
    }

    const Corpus& population() override { return searches_->everything().population(); }
    uint64_t code_count() override { return searches_->everything().code_count(); }

    IndexFacts facts() const override
    {
        const Snapshot& snapshot = searches_->snapshot();
        IndexFacts facts;
        facts.plan = plan();
        facts.state = state();
        facts.codes = snapshot.corpus().code_count();
        facts.tracks = snapshot.corpus().track_count();
        facts.tail_tracks = snapshot.tail().track_count();
        facts.left_out = snapshot.left_out();
        if (snapshot.mapped() != nullptr) {
            const IndexHeader& header = snapshot.mapped()->contents.header;
            facts.file_bytes = snapshot.mapped()->file.bytes().size();
            facts.scan_ms = header.scan_us / 1000.0;
            facts.parts_ms = header.parts_us / 1000.0;
        }
        facts.note = note_;
        return facts;
    }

    void refresh(Store& store) override
    {
        if (store.last_change() != searches_->snapshot().cursor()) {
            Snapshot snapshot = searches_->snapshot();
            set_snapshot(snapshot.update(store) ? std::move(snapshot) : Snapshot(store));
        }
        keep_file(store);
    }

private:
    Plan plan() const
    {
        if (!searches_->has_parts()) {
            return Plan::scan;
        }
        return options_.plan.value_or(searches_->snapshot().mapped()->contents.header.plan);
    }

    IndexState state() const
    {
        const Snapshot& snapshot = searches_->snapshot();
        if (snapshot.mapped() != nullptr) {
            return snapshot.is_stale() ? IndexState::stale : IndexState::current;
        }
        if (refused_) {
            return IndexState::unusable;
        }
        return is_worth_a_file() ? IndexState::missing : IndexState::none;
    }

    bool is_worth_a_file() const
    {
        return !options_.path.empty() && options_.write &&
               searches_->snapshot().corpus().code_count() >= options_.write_from;
    }

    void set_snapshot(Snapshot snapshot)
    {
        searches_ = std::make_unique<Searches>(std::move(snapshot), options_.lists);
    }

    /// From the side file when there is one that serves.
    Snapshot first_snapshot(Store& store)
    {
        if (!options_.path.empty()) {
            try {
                return Snapshot(store, map_index(options_.path));
            } catch (const IndexFileError& error) {
                refused_ = true;
                note_ = "the side file " + options_.path + " " + error.what();
            } catch (const std::system_error& error) {
                if (error.code() != std::errc::no_such_file_or_directory) {
                    refused_ = true;
                    note_ = std::string("the side file cannot be read: ") + error.what();
                }
            }
        }
        return Snapshot(store);
    }

    /// Writes the side file when it is worth it, and not while tracks are left out, of which a side
    /// file says nothing. When that fails all goes on from memory.
    void keep_file(Store& store)
    {
        const Snapshot& snapshot = searches_->snapshot();
        if (!is_worth_a_file() || !snapshot.is_stale() || snapshot.left_out() > 0) {
            return;
        }
        try {
            write_file(store);
        } catch (const StoreError&) {
            throw;
        } catch (const std::exception& error) {
            note_ = std::string("the side file was not written: ") + error.what();
        }
    }

    void write_file(Store& store)
    {
        FileReplacement file(options_.path);
        if (!file.is_ours()) {
            note_ = "the side file was not written: another process is writing it";
            return;
        }
        IndexHeader header = header_for(store, searches_->snapshot());
        write_index_file(file, header, searches_->snapshot().corpus());
        auto fresh =
            std::make_unique<Searches>(Snapshot(map_index(file.temporary())), options_.lists);
        choose_plan(header, *fresh);
        rewrite_header(file, fresh->snapshot().mapped()->file.bytes(), header);
        file.commit();
        // What was measured is in the file, not yet in what was read from it.
        set_snapshot(Snapshot(map_index(options_.path)));
    }

    IndexOptions options_;
    std::unique_ptr<Searches> searches_;
    std::string note_;
    bool refused_ = false; ///< there is a side file, but it does not serve
};

} // namespace

std::unique_ptr<Index> open_index(Store& store, const IndexOptions& options)
{
    if (!options.server.empty()) {
        if (auto index = open_postgres_index(store, options)) {
            return index;
        }
    }
    return std::make_unique<StoreIndex>(store, options);
}

} // namespace kzcat
