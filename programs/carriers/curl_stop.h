#pragma once
// Transfers of libcurl that are given up when a stop sign is raised.

#include "programs/carriers/carrier.h"

#include <curl/curl.h>

namespace Carriers {

/// libcurl asks about once a second, also while nothing comes. The sign has to outlive the transfer.
inline void giveUpWhenRaised(CURL* handle, StopSign const& stop) {
    curl_xferinfo_callback const isRaised = [](void* sign, curl_off_t, curl_off_t, curl_off_t, curl_off_t) {
        return static_cast<StopSign const*>(sign)->isRaised() ? 1 : 0;
    };
    curl_easy_setopt(handle, CURLOPT_NOPROGRESS, 0L);
    curl_easy_setopt(handle, CURLOPT_XFERINFOFUNCTION, isRaised);
    curl_easy_setopt(handle, CURLOPT_XFERINFODATA, &stop);
}

} // namespace Carriers
