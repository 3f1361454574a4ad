/// @file
/// libmicrohttpd's functions, which are looked up when a service starts: other commands neither
/// load it nor need it installed.
#pragma once

#include <microhttpd.h>

#include "audio/shared_library.hpp"

namespace kzfp::serve {

/// The members are named as libmicrohttpd names its functions, and documented there.
class HttpLibrary {
    audio::SharedLibrary library_{"libmicrohttpd.so.12"};

public:
    decltype(&::MHD_add_connection) MHD_add_connection = library_["MHD_add_connection"];
    decltype(&::MHD_add_response_header) MHD_add_response_header =
        library_["MHD_add_response_header"];
    decltype(&::MHD_create_response_from_buffer) MHD_create_response_from_buffer =
        library_["MHD_create_response_from_buffer"];
    decltype(&::MHD_create_response_from_buffer_with_free_callback_cls)
        MHD_create_response_from_buffer_with_free_callback_cls =
            library_["MHD_create_response_from_buffer_with_free_callback_cls"];
    decltype(&::MHD_destroy_response) MHD_destroy_response = library_["MHD_destroy_response"];
    decltype(&::MHD_get_connection_info) MHD_get_connection_info =
        library_["MHD_get_connection_info"];
    decltype(&::MHD_get_connection_values_n) MHD_get_connection_values_n =
        library_["MHD_get_connection_values_n"];
    decltype(&::MHD_is_feature_supported) MHD_is_feature_supported =
        library_["MHD_is_feature_supported"];
    decltype(&::MHD_queue_response) MHD_queue_response = library_["MHD_queue_response"];
    decltype(&::MHD_quiesce_daemon) MHD_quiesce_daemon = library_["MHD_quiesce_daemon"];
    decltype(&::MHD_resume_connection) MHD_resume_connection = library_["MHD_resume_connection"];
    decltype(&::MHD_start_daemon) MHD_start_daemon = library_["MHD_start_daemon"];
    decltype(&::MHD_stop_daemon) MHD_stop_daemon = library_["MHD_stop_daemon"];
    decltype(&::MHD_suspend_connection) MHD_suspend_connection = library_["MHD_suspend_connection"];
};

/// Opens the library the first time. Throws audio::LibraryError, with the cure.
const HttpLibrary& http_library();

} // namespace kzfp::serve
