#include "kzsdk/fpx/inspect.hpp"

#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/qv/frame_list.hpp"
#include "kzsdk/qv/frame_pump.hpp"
#include "kzsdk/qvfixed/qvfixed.h"
#include "kzsdk/qvfloat/qvfloat.h"

namespace kz::fpx {

namespace {

// Hands the handle's instance, as what it is, to `use`.
template <class Use>
auto visit(const kz_fpx_handle& handle, Use use) noexcept
{
    if (handle.algorithm->id == KZ_FPX_ALGORITHM_FLOAT) {
        return use(*static_cast<const QVFP*>(handle.instance));
    }
    return use(*static_cast<const kzqvfixed_fingerprinter*>(handle.instance));
}

} // namespace

uint32_t next_block_frames(const kz_fpx_handle& handle) noexcept
{
    return visit(handle, [](const auto& object) { return qv::next_step_frames(object); });
}

uint32_t signal_offset(const kz_fpx_handle& handle) noexcept
{
    return visit(handle, [](const auto& object) { return object.signal_offset; });
}

bool signal_found(const kz_fpx_handle& handle) noexcept
{
    return visit(handle, [](const auto& object) { return object.searching_for_signal == 0; });
}

uint32_t percent_progress(const kz_fpx_handle& handle) noexcept
{
    return visit(handle,
                 [](const auto& object) { return qv::percent_progress(*object.frame_manager); });
}

} // namespace kz::fpx
