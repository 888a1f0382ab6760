// Round trips per second over loopback: the request processor against a tight
// libcurl multi loop that sends the same requests to the same server. The
// processor's cost over the loop is its two thread hops per request and its
// bookkeeping; the goal is at least 80% of the loop's rate.
//
// Each benchmark runs batches of requests: inFlight:1 sends each request from
// the previous one's completion, inFlight:8 keeps eight going.
//
// Each kind runs as a benchmark of its own; repeat them (--benchmark_repetitions,
// --benchmark_enable_random_interleaving) and compare medians. On a virtual
// machine the cost of waking a thread on an idle CPU swings with what ran just
// before, so running the two kinds in turn within one benchmark measures that
// swing rather than either of them.

#include <benchmark/benchmark.h>

#include <condition_variable>
#include <memory>
#include <mutex>
#include <vector>

#include <curl/curl.h>

#include "foundation/net/CurlRequestProcessor.h"
#include "support/LoopbackHttpServer.h"

using namespace tolmonet;
using namespace tolmonet::http;

namespace {

constexpr int kRequestsPerIteration = 200;

testsupport::LoopbackHttpServer& Server()
{
    static auto* sServer = new testsupport::LoopbackHttpServer([](const testsupport::HttpRequest&) {
        testsupport::HttpAnswer answer;
        answer.mHeaders = {{"Content-Type", "application/json"}, {"ETag", "\"1\""}};
        answer.mBody = "{\"name\":\"item\",\"size\":12345}";
        return answer;
    });
    return *sServer;
}

// Keeps `inFlight` requests going on the processor until `total` are done.
class ProcessorRun {
public:
    ProcessorRun(RequestProcessor& processor, const ImmutableString& url, int total)
        : mProcessor(processor), mUrl(url), mLeftToStart(total), mLeftToFinish(total)
    {
    }

    void RunAndWait(int inFlight)
    {
        for (int i = 0; i < inFlight; ++i) StartOne();
        std::unique_lock<std::mutex> lock(mMutex);
        mDone.wait(lock, [this] { return mLeftToFinish == 0; });
    }

private:
    // Called on the bench thread first, then only on the completion thread.
    void StartOne()
    {
        {
            std::lock_guard<std::mutex> lock(mMutex);
            if (mLeftToStart == 0) return;
            --mLeftToStart;
        }
        mProcessor.GET(
            Guid::CreateUnique(),
            [this](const Guid&, const boost::shared_ptr<Response>& response) {
                benchmark::DoNotOptimize(response->body);
                {
                    std::lock_guard<std::mutex> lock(mMutex);
                    if (--mLeftToFinish == 0) mDone.notify_one();
                }
                StartOne();
            },
            mUrl, HeaderList(), Configuration());
    }

    RequestProcessor& mProcessor;
    const ImmutableString mUrl;
    std::mutex mMutex;
    std::condition_variable mDone;
    int mLeftToStart;
    int mLeftToFinish;
};

void BM_Processor(benchmark::State& state)
{
    const ImmutableString url = ImmutableString::CreateDynamic(Server().Url("/item"));
    CurlRequestProcessor processor;
    for (auto _ : state) {
        ProcessorRun run(processor, url, kRequestsPerIteration);
        run.RunAndWait(static_cast<int>(state.range(0)));
    }
    state.SetItemsProcessed(state.iterations() * kRequestsPerIteration);
}

size_t CollectBody(char* data, size_t size, size_t count, void* body)
{
    auto* bytes = static_cast<std::vector<unsigned char>*>(body);
    bytes->insert(bytes->end(), data, data + size * count);
    return size * count;
}

size_t CountHeader(char*, size_t size, size_t count, void* bytes)
{
    *static_cast<size_t*>(bytes) += size * count;
    return size * count;
}

// The same requests with nothing around them: one thread, one multi handle
// with the processor's default limits, easy handles re-added the moment they
// finish.
class TightLoop {
public:
    TightLoop(const std::string& url, int inFlight) : mHandles(inFlight), mBodies(inFlight)
    {
        curl_global_init(CURL_GLOBAL_DEFAULT);
        mMulti = curl_multi_init();
        curl_multi_setopt(mMulti, CURLMOPT_MAX_TOTAL_CONNECTIONS, 16L);
        curl_multi_setopt(mMulti, CURLMOPT_MAX_HOST_CONNECTIONS, 6L);
        for (int i = 0; i < inFlight; ++i) {
            mHandles[i] = curl_easy_init();
            curl_easy_setopt(mHandles[i], CURLOPT_URL, url.c_str());
            curl_easy_setopt(mHandles[i], CURLOPT_WRITEFUNCTION, &CollectBody);
            curl_easy_setopt(mHandles[i], CURLOPT_WRITEDATA, &mBodies[i]);
            curl_easy_setopt(mHandles[i], CURLOPT_HEADERFUNCTION, &CountHeader);
            curl_easy_setopt(mHandles[i], CURLOPT_HEADERDATA, &mHeaderBytes);
            curl_easy_setopt(mHandles[i], CURLOPT_PRIVATE, &mBodies[i]);
        }
    }
    ~TightLoop()
    {
        for (CURL* easy : mHandles) curl_easy_cleanup(easy);
        curl_multi_cleanup(mMulti);
    }

    void Run(int total)
    {
        int started = 0;
        int finished = 0;
        for (; started < static_cast<int>(mHandles.size()) && started < total; ++started)
            curl_multi_add_handle(mMulti, mHandles[started]);
        while (finished < total) {
            int running = 0;
            curl_multi_perform(mMulti, &running);
            int left = 0;
            while (CURLMsg* message = curl_multi_info_read(mMulti, &left)) {
                if (message->msg != CURLMSG_DONE) continue;
                CURL* easy = message->easy_handle;
                curl_multi_remove_handle(mMulti, easy);
                std::vector<unsigned char>* body = nullptr;
                curl_easy_getinfo(easy, CURLINFO_PRIVATE, &body);
                benchmark::DoNotOptimize(body->data());
                body->clear();
                ++finished;
                if (started < total) {
                    curl_multi_add_handle(mMulti, easy);
                    ++started;
                }
            }
            if (finished < total) curl_multi_poll(mMulti, nullptr, 0, 1000, nullptr);
        }
    }

private:
    CURLM* mMulti;
    std::vector<CURL*> mHandles;
    std::vector<std::vector<unsigned char> > mBodies;
    size_t mHeaderBytes = 0;
};

void BM_TightCurlLoop(benchmark::State& state)
{
    TightLoop loop(Server().Url("/item"), static_cast<int>(state.range(0)));
    for (auto _ : state) loop.Run(kRequestsPerIteration);
    state.SetItemsProcessed(state.iterations() * kRequestsPerIteration);
}

}  // namespace

BENCHMARK(BM_Processor)->ArgName("inFlight")->Arg(1)->Arg(8)->UseRealTime();
BENCHMARK(BM_TightCurlLoop)->ArgName("inFlight")->Arg(1)->Arg(8)->UseRealTime();
