#pragma once
// A fixed number of asynchronous requests gathered into one outcome.
//
// The owner sizes the list before it queues anything; each request reports
// into its own slot; when every slot is accounted for the list makes one
// call: completion if no slot failed, else error with the first failure by
// slot index. A failure does not stop requests already out.
//
// A list is owned by the bound callbacks of its own requests (and, while it
// queues, by its owner). If the last reference goes while slots are still
// open — a request that could not be queued, or one whose callbacks were
// released without a call — the destructor makes the final call.
//
// Threads: Callback/Errback run on the completion thread while the owner may
// still be queueing or skipping on another: only mCompleted is shared, and it
// is atomic, so exactly one thread sees the last slot and completes.

#include <atomic>
#include <cstdint>
#include <memory>
#include <utility>
#include <vector>

#include <boost/function.hpp>
#include <boost/shared_ptr.hpp>

#include "foundation/core/Guid.h"
#include "foundation/core/Strings.h"
#include "foundation/net/Response.h"

namespace tolmonetsync {
namespace utility {

class DeferredList {
public:
    enum State {
        State_Unqueued = 0,
        State_Pending = 1,
        State_Succeeded = 2,
        State_Failed = 3,
        State_Skipped = 4,
    };

    using Completion = boost::function<void()>;
    using TextCallback = boost::function<void(const UTF16String&)>;
    using ProgressCallback = boost::function<void(float)>;

    DeferredList(unsigned long long count, const Completion& completion, const TextCallback& error,
                 const ProgressCallback& progress, const TextCallback& unauthorized);
    virtual ~DeferredList();
    DeferredList(const DeferredList&) = delete;
    DeferredList& operator=(const DeferredList&) = delete;

    // Slot `index` succeeded / failed with `response`.
    static void Callback(const boost::shared_ptr<DeferredList>& self, std::size_t index, const Guid& requestID);
    static void Errback(const boost::shared_ptr<DeferredList>& self, std::size_t index, const Guid& requestID,
                        const boost::shared_ptr<tolmonet::Response>& response);

    // Marks slot `index` pending under a fresh identifier and gives it.
    Guid BeginSlot(std::size_t index);
    // The owner decided slot `index` needs no request.
    void Skip(std::size_t index);

    // Asks the request processor to cancel every queued slot's request; the
    // list ends when those report.
    void CancelAll();
    // The final call; the batches make it when they skip the last slot.
    void callCompletion();

    std::uint64_t Count() const { return mCount; }
    std::int64_t Completed() const { return mCompleted.load(std::memory_order_acquire); }
    State SlotState(std::size_t index) const { return mRequests[index].second; }

    std::vector<std::pair<Guid, State> > mRequests;
    std::vector<std::pair<Guid, boost::shared_ptr<tolmonet::Response> > > mResponses;
    Completion mCompletion;
    TextCallback mError;
    TextCallback mUnauthorized;
    ProgressCallback mProgress;
    std::atomic<std::int64_t> mCompleted;
    const std::uint64_t mCount;
    bool mDone;

private:
    // Set once a slot's identifier is stored, so that CancelAll, on another
    // thread, reads identifiers only after they were written and never reads
    // the states the handlers write.
    std::unique_ptr<std::atomic<bool>[]> mQueued;

    void Account(std::size_t index);
};

}  // namespace utility
}  // namespace tolmonetsync
