#include "sync/DeferredList.h"

#include "assets/RestException.h"
#include "foundation/net/RequestProcessor.h"

namespace tolmonetsync {
namespace utility {

using tolmocore::utility::AsciiToUTF16;

DeferredList::DeferredList(unsigned long long count, const Completion& completion, const TextCallback& error,
                           const ProgressCallback& progress, const TextCallback& unauthorized)
    : mRequests(count, std::make_pair(Guid(), State_Unqueued)),
      mResponses(count),
      mCompletion(completion),
      mError(error),
      mUnauthorized(unauthorized),
      mProgress(progress),
      mCompleted(0),
      mCount(count),
      mDone(false),
      mQueued(new std::atomic<bool>[count])
{
    for (unsigned long long i = 0; i < count; ++i) mQueued[i].store(false, std::memory_order_relaxed);
}

DeferredList::~DeferredList()
{
    if (!mDone) callCompletion();
}

Guid DeferredList::BeginSlot(std::size_t index)
{
    mRequests[index] = std::make_pair(Guid::CreateUnique(), State_Pending);
    mQueued[index].store(true, std::memory_order_release);
    return mRequests[index].first;
}

void DeferredList::Skip(std::size_t index)
{
    mRequests[index].second = State_Skipped;
    if (mCompleted.fetch_add(1, std::memory_order_acq_rel) + 1 == static_cast<std::int64_t>(mCount))
        callCompletion();
}

void DeferredList::Callback(const boost::shared_ptr<DeferredList>& self, std::size_t index, const Guid&)
{
    self->mRequests[index].second = State_Succeeded;
    self->Account(index);
}

void DeferredList::Errback(const boost::shared_ptr<DeferredList>& self, std::size_t index, const Guid& requestID,
                           const boost::shared_ptr<tolmonet::Response>& response)
{
    self->mResponses[index] = std::make_pair(requestID, response);
    self->mRequests[index].second = State_Failed;
    self->Account(index);
}

void DeferredList::Account(std::size_t)
{
    // Progress counts the slots done before this one: the first result
    // reports 0, the last (n-1)/n; completion reports 1.0.
    if (mProgress) mProgress(static_cast<float>(mCompleted.load(std::memory_order_acquire)) / mCount);
    if (mCompleted.fetch_add(1, std::memory_order_acq_rel) + 1 == static_cast<std::int64_t>(mCount))
        callCompletion();
}

void DeferredList::CancelAll()
{
    const boost::shared_ptr<tolmonet::http::RequestProcessor> processor = GetGlobalSyncProcessor();
    // Finished slots are asked too; the processor ignores identifiers no
    // longer live.
    for (std::size_t i = 0; i < mCount; ++i) {
        if (mQueued[i].load(std::memory_order_acquire)) processor->TryToCancelRequest(mRequests[i].first);
    }
}

void DeferredList::callCompletion()
{
    mDone = true;
    for (std::size_t i = 0; i < mRequests.size(); ++i) {
        if (mRequests[i].second != State_Failed) continue;
        // Only the first failure by slot is told; the others are dropped.
        try {
            ThrowResponse(mResponses[i].first, mResponses[i].second);
        } catch (const UnauthorizedException& e) {
            const UTF16String text = AsciiToUTF16(e.what());
            if (mUnauthorized) mUnauthorized(text);
            mError(text);
        } catch (const std::exception& e) {
            mError(AsciiToUTF16(e.what()));
        }
        return;
    }
    if (mProgress) mProgress(1.0f);
    mProgress.clear();
    mCompletion();
}

}  // namespace utility
}  // namespace tolmonetsync
