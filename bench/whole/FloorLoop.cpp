#include "bench/whole/FloorLoop.h"

#include <chrono>
#include <cstdio>
#include <stdexcept>

#include <curl/curl.h>

namespace wholebench {

namespace {

struct Transfer {
    CURL* mEasy = nullptr;
    curl_slist* mHeaders = nullptr;
    const FloorRequest* mRequest = nullptr;
    FILE* mFile = nullptr;
};

size_t Receive(char* data, size_t size, size_t count, void* context)
{
    Transfer* transfer = static_cast<Transfer*>(context);
    if (transfer->mFile == nullptr) return size * count;
    return fwrite(data, size, count, transfer->mFile) * size;
}

void Start(CURLM* multi, Transfer& transfer, const FloorRequest& request)
{
    curl_easy_reset(transfer.mEasy);
    curl_slist_free_all(transfer.mHeaders);
    transfer.mHeaders = nullptr;
    for (const std::string& header : request.mHeaders)
        transfer.mHeaders = curl_slist_append(transfer.mHeaders, header.c_str());
    transfer.mRequest = &request;
    CURL* easy = transfer.mEasy;
    curl_easy_setopt(easy, CURLOPT_URL, request.mUrl.c_str());
    curl_easy_setopt(easy, CURLOPT_HTTPHEADER, transfer.mHeaders);
    curl_easy_setopt(easy, CURLOPT_WRITEFUNCTION, Receive);
    curl_easy_setopt(easy, CURLOPT_WRITEDATA, &transfer);
    if (!request.mSaveAs.empty()) transfer.mFile = fopen(request.mSaveAs.c_str(), "wb");
    curl_easy_setopt(easy, CURLOPT_PRIVATE, &transfer);
    if (request.mMethod == "POST") {
        curl_easy_setopt(easy, CURLOPT_POST, 1L);
        curl_easy_setopt(easy, CURLOPT_POSTFIELDS, request.mBody->data());
        curl_easy_setopt(easy, CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(request.mBody->size()));
    }
    curl_multi_add_handle(multi, easy);
}

}  // namespace

double RunFloor(const std::vector<FloorRequest>& requests, long parallel)
{
    CURLM* multi = curl_multi_init();
    curl_multi_setopt(multi, CURLMOPT_MAX_HOST_CONNECTIONS, parallel);
    std::vector<Transfer> transfers(static_cast<size_t>(parallel));
    for (Transfer& transfer : transfers) transfer.mEasy = curl_easy_init();

    const auto start = std::chrono::steady_clock::now();
    size_t next = 0;
    int running = 0;
    for (Transfer& transfer : transfers)
        if (next < requests.size()) Start(multi, transfer, requests[next++]);
    std::string failure;
    do {
        curl_multi_perform(multi, &running);
        int queued = 0;
        while (CURLMsg* message = curl_multi_info_read(multi, &queued)) {
            if (message->msg != CURLMSG_DONE) continue;
            Transfer* transfer = nullptr;
            curl_easy_getinfo(message->easy_handle, CURLINFO_PRIVATE, &transfer);
            long status = 0;
            curl_easy_getinfo(message->easy_handle, CURLINFO_RESPONSE_CODE, &status);
            if (failure.empty() && (message->data.result != CURLE_OK || status != transfer->mRequest->mExpectStatus))
                failure = transfer->mRequest->mMethod + " " + transfer->mRequest->mUrl + " gave " +
                          std::to_string(status) + " (" + curl_easy_strerror(message->data.result) + ")";
            curl_multi_remove_handle(multi, message->easy_handle);
            if (transfer->mFile != nullptr && fclose(transfer->mFile) != 0 && failure.empty())
                failure = "cannot write " + transfer->mRequest->mSaveAs;
            transfer->mFile = nullptr;
            if (next < requests.size()) {
                Start(multi, *transfer, requests[next++]);
                ++running;
            }
        }
        if (running > 0) curl_multi_poll(multi, nullptr, 0, 100, nullptr);
    } while (running > 0);
    const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();

    for (Transfer& transfer : transfers) {
        curl_slist_free_all(transfer.mHeaders);
        curl_easy_cleanup(transfer.mEasy);
    }
    curl_multi_cleanup(multi);
    if (!failure.empty()) throw std::runtime_error("floor: " + failure);
    return seconds;
}

}  // namespace wholebench
