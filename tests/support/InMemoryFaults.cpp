#include "support/InMemoryFaults.h"

namespace testsupport {

const char* InMemoryOperationName(InMemoryOperation operation)
{
    switch (operation) {
        case InMemoryOperation_Any:
            return "any operation";
        case InMemoryOperation_GetRoot:
            return "GetRoot";
        case InMemoryOperation_GetUserFileRoot:
            return "GetUserFileRoot";
        case InMemoryOperation_GetPreferencesRoot:
            return "GetPreferencesRoot";
        case InMemoryOperation_CreateCollection:
            return "CreateCollection";
        case InMemoryOperation_Delete:
            return "Delete";
        case InMemoryOperation_DeleteByName:
            return "DeleteByName";
        case InMemoryOperation_Add:
            return "Add";
        case InMemoryOperation_Upload:
            return "Upload";
        case InMemoryOperation_Download:
            return "Download";
        case InMemoryOperation_Search:
            return "Search";
        case InMemoryOperation_SearchOne:
            return "SearchOne";
        case InMemoryOperation_Header:
            return "Header";
        case InMemoryOperation_FetchChildren:
            return "FetchChildren";
        case InMemoryOperation_Connection:
            return "Connection";
    }
    return "?";
}

const char* InMemoryRequestName(InMemoryRequest request)
{
    switch (request) {
        case InMemoryRequest_Any:
            return "any request";
        case InMemoryRequest_GetRoot:
            return "GetRoot";
        case InMemoryRequest_Search:
            return "Search";
        case InMemoryRequest_Header:
            return "Header";
        case InMemoryRequest_CreateCollection:
            return "CreateCollection";
        case InMemoryRequest_Add:
            return "Add";
        case InMemoryRequest_Delete:
            return "Delete";
        case InMemoryRequest_Upload:
            return "Upload";
        case InMemoryRequest_Download:
            return "Download";
    }
    return "?";
}

std::ostream& operator<<(std::ostream& stream, InMemoryOperation operation)
{
    return stream << InMemoryOperationName(operation);
}

std::ostream& operator<<(std::ostream& stream, InMemoryRequest request)
{
    return stream << InMemoryRequestName(request);
}

InMemoryFaultTable::FaultId InMemoryFaultTable::Add(const InMemoryFault& fault)
{
    std::lock_guard<std::mutex> lock(mMutex);
    mHits.push_back(0);
    Entry entry;
    entry.mId = static_cast<FaultId>(mHits.size());
    entry.mFault = fault;
    mFaults.push_back(entry);
    return entry.mId;
}

void InMemoryFaultTable::Clear()
{
    std::lock_guard<std::mutex> lock(mMutex);
    mFaults.clear();
}

unsigned InMemoryFaultTable::Hits(FaultId fault) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (fault == 0 || fault > mHits.size()) return 0;
    return mHits[fault - 1];
}

InMemoryFaultDecision InMemoryFaultTable::OnSend(InMemoryOperation operation, InMemoryRequest request,
                                                 const Guid& requestUID)
{
    InMemoryFaultDecision decision;
    boost::function<void(InMemoryOperation, InMemoryRequest, const Guid&)> onFire;
    {
        std::lock_guard<std::mutex> lock(mMutex);
        ++mRequestCounts[request];
        mLog.push_back(request);
        bool decided = false;
        // Every matching fault sees the request, so that each one's N counts
        // requests and not what the faults before it left over.
        for (Entry& entry : mFaults) {
            const InMemoryFault& fault = entry.mFault;
            if (entry.mSpent) continue;
            if (fault.mOperation != InMemoryOperation_Any && fault.mOperation != operation) continue;
            if (fault.mRequest != InMemoryRequest_Any && fault.mRequest != request) continue;
            ++entry.mSeen;
            if (decided || (fault.mNth != 0 && entry.mSeen != fault.mNth)) continue;
            decided = true;
            if (fault.mNth != 0) entry.mSpent = true;
            ++mHits[entry.mId - 1];
            decision.mRefuse = fault.mRefuse;
            decision.mFail = !fault.mRefuse;
            decision.mStatus = fault.mStatus;
            decision.mBody = fault.mBody;
            onFire = fault.mOnFire;
        }
    }
    if (onFire) onFire(operation, request, requestUID);
    return decision;
}

void InMemoryFaultTable::OnCall(InMemoryOperation operation)
{
    std::lock_guard<std::mutex> lock(mMutex);
    ++mOperationCounts[operation];
}

unsigned InMemoryFaultTable::RequestCount(InMemoryRequest request) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (request == InMemoryRequest_Any) return static_cast<unsigned>(mLog.size());
    return mRequestCounts[request];
}

unsigned InMemoryFaultTable::OperationCount(InMemoryOperation operation) const
{
    std::lock_guard<std::mutex> lock(mMutex);
    if (operation != InMemoryOperation_Any) return mOperationCounts[operation];
    unsigned total = 0;
    for (unsigned count : mOperationCounts) total += count;
    return total;
}

std::vector<InMemoryRequest> InMemoryFaultTable::RequestLog() const
{
    std::lock_guard<std::mutex> lock(mMutex);
    return mLog;
}

}  // namespace testsupport
