#include "bench/whole/FloorLoop.h"

#include <fcntl.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <set>
#include <stdexcept>

#include <curl/curl.h>

namespace wholebench {

namespace {

struct Transfer {
    CURL* mEasy = nullptr;
    curl_slist* mHeaders = nullptr;
    const FloorRequest* mRequest = nullptr;
    FILE* mFile = nullptr;
    std::string mWritingTo;  // the file mFile writes: mSaveAs, or its temporary
};

std::string TemporaryFor(const std::string& path)
{
    const std::filesystem::path target(path);
    return (target.parent_path() / ("." + target.filename().string() + ".floor-tmp")).string();
}

size_t Receive(char* data, size_t size, size_t count, void* context)
{
    Transfer* transfer = static_cast<Transfer*>(context);
    if (transfer->mFile == nullptr) return size * count;
    return fwrite(data, size, count, transfer->mFile) * size;
}

void Start(CURLM* multi, Transfer& transfer, const FloorRequest& request, Saving saving)
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
    if (!request.mSaveAs.empty()) {
        transfer.mWritingTo = saving == Saving::Durable ? TemporaryFor(request.mSaveAs) : request.mSaveAs;
        transfer.mFile = fopen(transfer.mWritingTo.c_str(), "wb");
    }
    curl_easy_setopt(easy, CURLOPT_PRIVATE, &transfer);
    if (request.mMethod == "POST") {
        curl_easy_setopt(easy, CURLOPT_POST, 1L);
        curl_easy_setopt(easy, CURLOPT_POSTFIELDS, request.mBody ? request.mBody->data() : "");
        curl_easy_setopt(easy, CURLOPT_POSTFIELDSIZE_LARGE,
                         static_cast<curl_off_t>(request.mBody ? request.mBody->size() : 0));
    }
    curl_multi_add_handle(multi, easy);
}

// Closes the transfer's file; a durable one is synced and renamed into place
// first. False if any step failed.
bool Finish(Transfer& transfer, Saving saving, std::set<std::string>& directories)
{
    if (transfer.mRequest->mSaveAs.empty()) return true;
    if (transfer.mFile == nullptr) return false;  // never opened: a floor that wrote nothing would flatter
    bool ok = fflush(transfer.mFile) == 0;
    if (saving == Saving::Durable) ok = ok && fsync(fileno(transfer.mFile)) == 0;
    ok = fclose(transfer.mFile) == 0 && ok;
    transfer.mFile = nullptr;
    if (saving == Saving::Durable) {
        ok = ok && std::rename(transfer.mWritingTo.c_str(), transfer.mRequest->mSaveAs.c_str()) == 0;
        directories.insert(std::filesystem::path(transfer.mRequest->mSaveAs).parent_path().string());
    }
    return ok;
}

bool SyncDirectory(const std::string& path)
{
    const int fd = open(path.c_str(), O_RDONLY | O_DIRECTORY);
    if (fd < 0) return false;
    const bool ok = fsync(fd) == 0;
    return close(fd) == 0 && ok;
}

}  // namespace

double RunFloor(const std::vector<FloorRequest>& requests, long parallel, Saving saving)
{
    CURLM* multi = curl_multi_init();
    curl_multi_setopt(multi, CURLMOPT_MAX_HOST_CONNECTIONS, parallel);
    std::vector<Transfer> transfers(static_cast<size_t>(parallel));
    for (Transfer& transfer : transfers) transfer.mEasy = curl_easy_init();
    std::set<std::string> directories;  // the ones a durable rename wrote into

    const auto start = std::chrono::steady_clock::now();
    size_t next = 0;
    int running = 0;
    for (Transfer& transfer : transfers)
        if (next < requests.size()) Start(multi, transfer, requests[next++], saving);
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
            if (!Finish(*transfer, saving, directories) && failure.empty())
                failure = "cannot write " + transfer->mRequest->mSaveAs;
            if (next < requests.size()) {
                Start(multi, *transfer, requests[next++], saving);
                ++running;
            }
        }
        if (running > 0) curl_multi_poll(multi, nullptr, 0, 100, nullptr);
    } while (running > 0);
    for (const std::string& directory : directories)
        if (!SyncDirectory(directory) && failure.empty()) failure = "cannot sync " + directory;
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
