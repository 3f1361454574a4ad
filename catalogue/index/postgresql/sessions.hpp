/// @file
/// What look-ups need of a server: sessions for several threads, and the lengths of its lists.
#pragma once

#include <memory>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "catalogue/index/probes.hpp"
#include "catalogue/store/postgresql/connection.hpp"

namespace kzcat::postgresql {

/// What a session begins with: without the first, whole tables would travel to a coordinator; with
/// the second, statements with thousands of values are not planned anew each time.
extern const char* const kSearchSession;

/// The first column of rows.
std::vector<int64_t> numbers_in(const Rows& rows);

/// Sessions with one server: as many as have ever been in use at once. A standby will do for
/// `any_server`.
class Sessions {
public:
    Sessions(std::string address, bool any_server)
        : address_(std::move(address)), any_server_(any_server)
    {
    }

    /// Gives `use` a session to which it has sole access.
    template <class Use>
    auto with(Use use)
    {
        auto session = take();
        auto result = use(*session);
        give_back(std::move(session)); // one that has failed is closed instead
        return result;
    }

private:
    std::unique_ptr<Connection> take();
    void give_back(std::unique_ptr<Connection> session);

    std::string address_;
    bool any_server_;
    std::mutex mutex_;
    std::vector<std::unique_ptr<Connection>> free_;
};

/// The lengths of all lists, of all segments and servers together.
class SummedLengths final : public ListLengths {
public:
    SummedLengths() : lengths_(size_t{kParts} * kPartValues) {}
    uint64_t words(uint32_t part, uint32_t value) const override
    {
        return lengths_[size_t{part} * kPartValues + value];
    }
    uint64_t total() const { return total_; }

    /// The lengths of a part's lists on one server.
    void add(uint32_t part, Bytes lengths);

private:
    std::vector<uint64_t> lengths_;
    uint64_t total_ = 0;
};

} // namespace kzcat::postgresql
