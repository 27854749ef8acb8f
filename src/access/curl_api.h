// libcurl, loaded when the first transfer starts rather than with the
// program: it brings the TLS, Kerberos and LDAP libraries with it.
#pragma once

#include <curl/curl.h>

#include <string>

struct CurlApi {
  decltype(&::curl_global_init) global_init;
  decltype(&::curl_free) free;
  decltype(&::curl_url) url;
  decltype(&::curl_url_cleanup) url_cleanup;
  decltype(&::curl_url_dup) url_dup;
  decltype(&::curl_url_get) url_get;
  decltype(&::curl_url_set) url_set;
  decltype(&::curl_easy_init) easy_init;
  decltype(&::curl_easy_cleanup) easy_cleanup;
  decltype(&::curl_easy_reset) easy_reset;
  decltype(&::curl_easy_setopt) easy_setopt;
  decltype(&::curl_easy_getinfo) easy_getinfo;
  decltype(&::curl_easy_strerror) easy_strerror;
  decltype(&::curl_multi_init) multi_init;
  decltype(&::curl_multi_cleanup) multi_cleanup;
  decltype(&::curl_multi_add_handle) multi_add_handle;
  decltype(&::curl_multi_remove_handle) multi_remove_handle;
  decltype(&::curl_multi_perform) multi_perform;
  decltype(&::curl_multi_info_read) multi_info_read;
  decltype(&::curl_multi_poll) multi_poll;
};

// The library's functions, loaded and initialised on the first call; nullptr
// (with the reason in `error`) when it cannot be loaded.
const CurlApi* LoadCurl(std::string* error);
