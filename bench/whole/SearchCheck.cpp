#include "bench/whole/SearchCheck.h"

#include <cstdio>
#include <stdexcept>
#include <string>
#include <vector>

#include <curl/curl.h>
#include <boost/json.hpp>

#include "bench/whole/CommandRun.h"
#include "bench/whole/FloorLoop.h"
#include "bench/whole/ServeProcess.h"

namespace wholebench {

namespace {

namespace fs = std::filesystem;

const int kFiles = 1000;
const std::size_t kFileSize = 512;
const int kReplacements = 10;
const int kRounds = 5;     // a batch takes a fraction of a second: more rounds, less noise
const long kParallel = 6;  // the processor's connections per host

std::string Bearer()
{
    return std::string("Authorization: Bearer ") + kBenchToken;
}

std::string Escaped(const std::string& text)
{
    char* escaped = curl_easy_escape(nullptr, text.data(), static_cast<int>(text.size()));
    const std::string result(escaped);
    curl_free(escaped);
    return result;
}

// The search an upload makes for its name among the group's live members.
std::string SearchUrl(const std::string& api, const std::string& name, const std::string& groupId)
{
    const std::string query =
        boost::json::serialize(boost::json::object{{"name", name}, {"trashed", boost::json::object{{"$ne", true}}}});
    const std::string scope = boost::json::serialize(boost::json::array{"/collections/" + groupId});
    return api + "/search?q=" + Escaped(query) + "&metadata=true&scope=" + Escaped(scope);
}

size_t Append(char* data, size_t size, size_t count, void* text)
{
    static_cast<std::string*>(text)->append(data, size * count);
    return size * count;
}

// One search's answer, parsed.
boost::json::array Search(const std::string& url)
{
    CURL* easy = curl_easy_init();
    curl_slist* headers = curl_slist_append(nullptr, Bearer().c_str());
    std::string body;
    curl_easy_setopt(easy, CURLOPT_URL, url.c_str());
    curl_easy_setopt(easy, CURLOPT_HTTPHEADER, headers);
    curl_easy_setopt(easy, CURLOPT_POST, 1L);
    curl_easy_setopt(easy, CURLOPT_POSTFIELDS, "");
    curl_easy_setopt(easy, CURLOPT_WRITEFUNCTION, Append);
    curl_easy_setopt(easy, CURLOPT_WRITEDATA, &body);
    const CURLcode result = curl_easy_perform(easy);
    long status = 0;
    curl_easy_getinfo(easy, CURLINFO_RESPONSE_CODE, &status);
    curl_slist_free_all(headers);
    curl_easy_cleanup(easy);
    if (result != CURLE_OK || status != 200) throw std::runtime_error("search check: " + url + " failed");
    return boost::json::parse(body).as_array();
}

// The id of the one live group called `name`.
std::string GroupId(const std::string& api, const std::string& name)
{
    const std::string query =
        boost::json::serialize(boost::json::object{{"name", name}, {"trashed", boost::json::object{{"$ne", true}}}});
    const boost::json::array found = Search(api + "/search?q=" + Escaped(query) + "&metadata=true");
    if (found.size() != 1) throw std::runtime_error("search check: no single group " + name);
    const std::string id(found[0].as_object().at("id").as_string());
    return id.substr(id.rfind('/') + 1);
}

std::vector<std::string> SyncOf(const fs::path& work, const std::string& group)
{
    return {"--app",
            group,
            "--pref-dir",
            (work / ("pref-" + group)).string(),
            "sync",
            "-q",
            "--json",
            "--dir",
            "path=" + (work / group).string() + ",group=" + group + ",ext=.bin,checksum"};
}

void RequireUploads(const CommandCost& cost, const std::string& group)
{
    const boost::json::value& uploaded = boost::json::parse(cost.mOut).at("result").at("uploaded");
    if (uploaded.as_int64() != kFiles)
        throw std::runtime_error("search check: " + group + " uploaded " + boost::json::serialize(uploaded) +
                                 " files, not " + std::to_string(kFiles));
}

double TimeSearches(const std::string& api, const std::string& groupId)
{
    std::vector<FloorRequest> requests;
    for (int i = 0; i < kFiles; ++i)
        requests.push_back(
            {"POST", SearchUrl(api, "f" + std::to_string(10000 + i) + ".bin", groupId), {Bearer()}, nullptr, 200, ""});
    return RunFloor(requests, kParallel);
}

}  // namespace

boost::json::object RunSearchCheck(const fs::path& work)
{
    std::vector<double> fresh, replaced;
    {
        ServeProcess serve(work / "service");
        const std::string& api = serve.Api();
        WriteSmallFiles(work / "Fresh", kFiles, kFileSize, 0);
        RequireUploads(RunSync(api, work / "scratch", SyncOf(work, "Fresh")), "Fresh");
        // Each replacement changes every file, so that its upload deletes the
        // asset it replaces and posts a new one, as a re-upload does.
        for (int round = 0; round <= kReplacements; ++round) {
            WriteSmallFiles(work / "Replaced", kFiles, kFileSize, round + 1);
            RequireUploads(RunSync(api, work / "scratch", SyncOf(work, "Replaced")), "Replaced");
        }
        const std::string freshId = GroupId(api, "Fresh");
        const std::string replacedId = GroupId(api, "Replaced");
        if (Search(SearchUrl(api, "f10000.bin", replacedId)).size() != 1)
            throw std::runtime_error("search check: a replaced file is not found once");
        for (int round = 0; round < kRounds; ++round) {
            fresh.push_back(TimeSearches(api, freshId));
            replaced.push_back(TimeSearches(api, replacedId));
        }
    }
    RemoveUnlessKept(work);
    const double freshSeconds = Median(fresh);
    const double replacedSeconds = Median(replaced);
    const double ratio = replacedSeconds / freshSeconds;
    std::printf(
        "search by name, %d searches (medians of %d): fresh group %.3f s, each file replaced %d times %.3f s: "
        "%.2fx %s (<= 1.2x)\n",
        kFiles, kRounds, freshSeconds, kReplacements, replacedSeconds, ratio, ratio <= 1.2 ? "ok" : "MISSED");
    return {{"searches", kFiles},
            {"replacements", kReplacements},
            {"freshSeconds", freshSeconds},
            {"replacedSeconds", replacedSeconds},
            {"ratio", ratio}};
}

}  // namespace wholebench
