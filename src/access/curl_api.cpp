#include "access/curl_api.h"

#include <mutex>

#include "platform/dynamic_library.h"

const CurlApi* LoadCurl(std::string* error) {
  static CurlApi api;
  static const CurlApi* loaded = nullptr;
  static std::string reason;
  static std::once_flag once;
  std::call_once(once, [] {
    static DynamicLibrary library;
    // The name the development package's library carries at run time, then
    // the same interface built on GnuTLS.
    if (!library.Open({"libcurl.so.4", "libcurl-gnutls.so.4"}, &reason)) return;
    std::string missing;
    library.Take("curl_global_init", api.global_init, missing);
    library.Take("curl_free", api.free, missing);
    library.Take("curl_url", api.url, missing);
    library.Take("curl_url_cleanup", api.url_cleanup, missing);
    library.Take("curl_url_dup", api.url_dup, missing);
    library.Take("curl_url_get", api.url_get, missing);
    library.Take("curl_url_set", api.url_set, missing);
    library.Take("curl_easy_init", api.easy_init, missing);
    library.Take("curl_easy_cleanup", api.easy_cleanup, missing);
    library.Take("curl_easy_reset", api.easy_reset, missing);
    library.Take("curl_easy_setopt", api.easy_setopt, missing);
    library.Take("curl_easy_getinfo", api.easy_getinfo, missing);
    library.Take("curl_easy_strerror", api.easy_strerror, missing);
    library.Take("curl_multi_init", api.multi_init, missing);
    library.Take("curl_multi_cleanup", api.multi_cleanup, missing);
    library.Take("curl_multi_add_handle", api.multi_add_handle, missing);
    library.Take("curl_multi_remove_handle", api.multi_remove_handle, missing);
    library.Take("curl_multi_perform", api.multi_perform, missing);
    library.Take("curl_multi_info_read", api.multi_info_read, missing);
    library.Take("curl_multi_poll", api.multi_poll, missing);
    if (!missing.empty()) {
      reason = "libcurl lacks " + missing;
      return;
    }
    if (api.global_init(CURL_GLOBAL_DEFAULT) != CURLE_OK) {
      reason = "libcurl failed to initialise";
      return;
    }
    loaded = &api;
  });
  if (loaded == nullptr && error != nullptr) *error = reason;
  return loaded;
}
