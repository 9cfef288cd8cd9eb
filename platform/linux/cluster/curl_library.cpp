#include "cluster/curl_library.h"

#include <dlfcn.h>

#include "cluster/cluster_error.h"

namespace kelo::platform {
namespace {

[[noreturn]] void RefuseLibrary(const char *reason) {
    throw ClusterError(KELO_FAILURE_MISSING,
                       std::string("libcurl (package libcurl4) cannot be used: ") + reason);
}

template <typename Function>
void FindFunction(void *library, const char *name, Function &function) {
    function = reinterpret_cast<Function>(dlsym(library, name));
    if (function == nullptr)
        RefuseLibrary(dlerror());
}

CurlLibrary LoadLibrary() {
    void *library = dlopen("libcurl.so.4", RTLD_NOW | RTLD_LOCAL); // stays for the life of the process
    if (library == nullptr)
        RefuseLibrary(dlerror());
    decltype(&::curl_global_init) globalInit = nullptr;
    FindFunction(library, "curl_global_init", globalInit);
    if (globalInit(CURL_GLOBAL_DEFAULT) != CURLE_OK)
        RefuseLibrary("it does not start");
    CurlLibrary curl{};
    FindFunction(library, "curl_easy_init", curl.init);
    FindFunction(library, "curl_easy_cleanup", curl.cleanup);
    FindFunction(library, "curl_easy_setopt", curl.setOption);
    FindFunction(library, "curl_easy_perform", curl.perform);
    FindFunction(library, "curl_easy_getinfo", curl.getInfo);
    FindFunction(library, "curl_easy_strerror", curl.describe);
    FindFunction(library, "curl_slist_append", curl.append);
    FindFunction(library, "curl_slist_free_all", curl.freeAll);
    return curl;
}

} // namespace

const CurlLibrary &CurlLibrary::Get() {
    static const CurlLibrary curl = LoadLibrary();
    return curl;
}

} // namespace kelo::platform
