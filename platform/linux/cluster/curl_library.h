#pragma once

#include <curl/curl.h>

#include <memory>

namespace kelo::platform {

// The functions of libcurl that a cluster needs. The library is loaded with the first of them: together with
// the libraries that it needs it would double the time in which every program starts.
struct CurlLibrary {
    decltype(&::curl_easy_init) init;
    decltype(&::curl_easy_cleanup) cleanup;
    decltype(&::curl_easy_setopt) setOption;
    decltype(&::curl_easy_perform) perform;
    decltype(&::curl_easy_getinfo) getInfo;
    decltype(&::curl_easy_strerror) describe;
    decltype(&::curl_slist_append) append;
    decltype(&::curl_slist_free_all) freeAll;

    // Throws ClusterError if it is not installed.
    static const CurlLibrary &Get();
};

} // namespace kelo::platform
