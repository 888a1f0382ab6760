// Gathering a fixed number of requests into one outcome.

#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "assets/RestException.h"
#include "sync/DeferredList.h"

using tolmonetsync::utility::DeferredList;

namespace {

boost::shared_ptr<tolmonet::Response> Failure(int status, const std::string& body)
{
    return boost::shared_ptr<tolmonet::Response>(
        new tolmonet::Response(status, tolmonet::HeaderList(), RecycledMemory::CopyOf(body.data(), body.size())));
}

// Records every call a list makes, in order.
struct Outcome {
    std::vector<float> mProgress;
    int mCompletions = 0;
    std::vector<std::string> mErrors;

    boost::shared_ptr<DeferredList> Make(unsigned long long count)
    {
        return boost::shared_ptr<DeferredList>(new DeferredList(
            count, [this] { ++mCompletions; },
            [this](const UTF16String& text) { mErrors.push_back(tolmocore::utility::ToNarrow(text)); },
            [this](float done) { mProgress.push_back(done); }, DeferredList::TextCallback()));
    }
};

}  // namespace

TEST(DeferredList, ProgressCountsSlotsDoneBeforeEachResultThenOne)
{
    Outcome outcome;
    auto list = outcome.Make(3);
    for (std::size_t i = 0; i < 3; ++i) DeferredList::Callback(list, i, list->BeginSlot(i));
    EXPECT_EQ(outcome.mProgress, (std::vector<float>{0.0f, 1.0f / 3, 2.0f / 3, 1.0f}));
    EXPECT_EQ(outcome.mCompletions, 1);
    EXPECT_TRUE(outcome.mErrors.empty());
    EXPECT_FALSE(list->mProgress);  // cleared before completion: nothing reports after it
    list.reset();
    EXPECT_EQ(outcome.mCompletions, 1);  // the destructor does not complete twice
}

TEST(DeferredList, OnlyTheLowestFailedSlotIsToldAndOnlyAfterTheLastSlot)
{
    Outcome outcome;
    auto list = outcome.Make(3);
    for (std::size_t i = 0; i < 3; ++i) list->BeginSlot(i);
    DeferredList::Errback(list, 2, list->mRequests[2].first, Failure(404, "late slot"));
    DeferredList::Errback(list, 0, list->mRequests[0].first, Failure(403, "early slot"));
    EXPECT_TRUE(outcome.mErrors.empty());
    DeferredList::Callback(list, 1, list->mRequests[1].first);
    EXPECT_EQ(outcome.mErrors, (std::vector<std::string>{"early slot"}));
    EXPECT_EQ(outcome.mProgress, (std::vector<float>{0.0f, 1.0f / 3, 2.0f / 3}));
    EXPECT_EQ(outcome.mCompletions, 0);
}

TEST(DeferredList, AllSkippedCompletesOnTheLastSkipWithOnlyTheFinalProgress)
{
    Outcome outcome;
    auto list = outcome.Make(2);
    list->Skip(0);
    EXPECT_EQ(outcome.mCompletions, 0);
    list->Skip(1);
    EXPECT_EQ(outcome.mCompletions, 1);
    EXPECT_EQ(outcome.mProgress, (std::vector<float>{1.0f}));
}

TEST(DeferredList, AbandonedSlotsEndThroughTheDestructor)
{
    // A request that could not be queued leaves its slot pending for good.
    Outcome failed;
    {
        auto list = failed.Make(2);
        DeferredList::Errback(list, 0, list->BeginSlot(0), boost::shared_ptr<tolmonet::Response>());
        list->BeginSlot(1);
    }
    EXPECT_EQ(failed.mCompletions, 0);
    EXPECT_EQ(failed.mErrors, (std::vector<std::string>{"No Response"}));
}

TEST(DeferredList, OneThreadCompletesWhenSkipsAndResultsRace)
{
    for (int round = 0; round < 200; ++round) {
        std::atomic<int> completions{0};
        const std::size_t slots = 64;
        auto list = boost::shared_ptr<DeferredList>(new DeferredList(
            slots, [&] { ++completions; }, [](const UTF16String&) {}, DeferredList::ProgressCallback(),
            DeferredList::TextCallback()));
        for (std::size_t i = 0; i < slots; i += 2) list->BeginSlot(i);
        std::thread results([&] {
            for (std::size_t i = 0; i < slots; i += 2) DeferredList::Callback(list, i, list->mRequests[i].first);
        });
        for (std::size_t i = 1; i < slots; i += 2) list->Skip(i);
        results.join();
        EXPECT_EQ(completions.load(), 1);
    }
}
