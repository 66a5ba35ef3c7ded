#pragma once

// The one place where Quillon sees libcurl: its header and an owner for each of its handles.

#include <curl/curl.h>

#include <memory>

namespace Quillon::Http {

template <auto Free>
struct CurlDeleter
{
    template <class T>
    void operator()(T* handle) const noexcept
    {
        Free(handle);
    }
};

using EasyOwner = std::unique_ptr<CURL, CurlDeleter<curl_easy_cleanup>>;
using ShareOwner = std::unique_ptr<CURLSH, CurlDeleter<curl_share_cleanup>>;
using StringListOwner = std::unique_ptr<curl_slist, CurlDeleter<curl_slist_free_all>>;

} // namespace Quillon::Http
