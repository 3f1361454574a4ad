// The index is opened before the first look-up, which would wait for it otherwise.

#include "kzfp/serve/catalogues.hpp"

#include <utility>

#include "kzfp/output/write.hpp"

namespace kzfp::serve {

namespace {

std::shared_ptr<kzcat_catalogue> opened(const std::string& path)
{
    std::shared_ptr<kzcat_catalogue> catalogue = open_catalogue(path, KZCAT_ACCESS_READ);
    kzcat_facts facts;
    check(kzcat_get_facts(catalogue.get(), 1, &facts));
    return catalogue;
}

} // namespace

Catalogues::Catalogues(std::string path, bool writes)
    : path_(std::move(path)), reading_(opened(path_))
{
    if (writes) {
        writing_ = open_catalogue(path_, KZCAT_ACCESS_WRITE);
    }
    refresh();
}

std::shared_ptr<kzcat_catalogue> Catalogues::reading() const
{
    const std::lock_guard lock(mutex_);
    return reading_;
}

void Catalogues::open_again()
{
    std::shared_ptr<kzcat_catalogue> catalogue = opened(path_);
    const std::lock_guard lock(mutex_);
    reading_.swap(catalogue);
}

Catalogues::Facts Catalogues::facts() const
{
    const std::lock_guard lock(mutex_);
    return facts_;
}

void Catalogues::refresh() noexcept
{
    kzcat_facts now;
    const bool is_read = kzcat_get_facts(reading().get(), 0, &now) == KZCAT_OK;
    const std::lock_guard lock(mutex_);
    if (facts_.is_read && !is_read) {
        write_message(std::string("the catalogue cannot be read: ") + kzcat_get_error_text());
    }
    facts_.is_read = is_read;
    if (is_read) {
        facts_.tracks = now.tracks;
        facts_.codes = now.codes;
    }
}

} // namespace kzfp::serve
