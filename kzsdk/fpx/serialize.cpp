/// @file
/// The query document of a fingerprint as text: the algorithm's tag tree, rendered with
/// declaration, indentation and line breaks.
///
/// The tree is always freed; the text belongs to the caller. Indentation can hide that memory was
/// short while rendering, see RenderXMLTagToStrEx().
#include "kzsdk/abs/memory.h"
#include "kzsdk/fpx/algorithm.hpp"
#include "kzsdk/fpx/fpx.h"

kz_status kz_fpx_fingerprint_serialize(kz_fpx_handle* handle, char** out_text) noexcept
{
    if (handle == nullptr || out_text == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    *out_text = nullptr;
    XMLTag* tree = nullptr;
    kz_status status = handle->algorithm->get_result(handle->instance, &tree);
    if (status == KZ_OK) {
        *out_text = RenderXMLTagToStrEx(tree, 1, 1, 1);
        status = *out_text == nullptr ? KZ_FPX_ERROR_RENDER : KZ_OK;
    }
    SmartDisposeXMLTag(&tree);
    return status;
}

kz_status kz_fpx_fingerprint_serialize_free(char** text_ref) noexcept
{
    if (text_ref == nullptr) {
        return KZ_FPX_ERROR_INVALID_ARGUMENT;
    }
    if (*text_ref != nullptr) {
        static_cast<void>(_kzmem_free(*text_ref));
        *text_ref = nullptr;
    }
    return KZ_OK;
}
