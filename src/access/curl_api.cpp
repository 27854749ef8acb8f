#include "access/curl_api.h"

#include <mutex>

#include "platform/dynamic_library.h"

namespace {

template <typename F>
void Take(const DynamicLibrary& library, const char* name, F& function, std::string& missing) {
  function = reinterpret_cast<F>(library.Symbol(name));
  if (function == nullptr) missing += (missing.empty() ? "" : ", ") + std::string(name);
}

}  // namespace

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
    Take(library, "curl_global_init", api.global_init, missing);
    Take(library, "curl_free", api.free, missing);
    Take(library, "curl_url", api.url, missing);
    Take(library, "curl_url_cleanup", api.url_cleanup, missing);
    Take(library, "curl_url_dup", api.url_dup, missing);
    Take(library, "curl_url_get", api.url_get, missing);
    Take(library, "curl_url_set", api.url_set, missing);
    Take(library, "curl_easy_init", api.easy_init, missing);
    Take(library, "curl_easy_cleanup", api.easy_cleanup, missing);
    Take(library, "curl_easy_reset", api.easy_reset, missing);
    Take(library, "curl_easy_setopt", api.easy_setopt, missing);
    Take(library, "curl_easy_getinfo", api.easy_getinfo, missing);
    Take(library, "curl_easy_strerror", api.easy_strerror, missing);
    Take(library, "curl_multi_init", api.multi_init, missing);
    Take(library, "curl_multi_cleanup", api.multi_cleanup, missing);
    Take(library, "curl_multi_add_handle", api.multi_add_handle, missing);
    Take(library, "curl_multi_remove_handle", api.multi_remove_handle, missing);
    Take(library, "curl_multi_perform", api.multi_perform, missing);
    Take(library, "curl_multi_info_read", api.multi_info_read, missing);
    Take(library, "curl_multi_poll", api.multi_poll, missing);
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
