#pragma once
// Faults a test asks the in-memory server to meet, and the counts of what
// was asked of it.
//
// A request here is one step on the wire of a real client: one operation of
// SyncServer may take several (an upload is a search, a delete per asset of
// that name, the post and a header). Each request is counted when the client
// side tries to send it, refused ones included, and tagged with the
// operation that started it, so a test can aim at "the second search of a
// FetchChildrenAsync" as well as at "the fifth request of any kind".
//
// Thread-safe: tests install faults on their own thread while requests go
// out from theirs and from the completion thread.

#include <cstdint>
#include <mutex>
#include <ostream>
#include <string>
#include <vector>

#include <boost/function.hpp>

#include "foundation/core/Guid.h"
#include "foundation/net/Response.h"

namespace testsupport {

// The operations of SyncServer, as entry points: what a caller called.
enum InMemoryOperation : int {
    InMemoryOperation_Any = -1,  // matches every operation in a fault; counts them all
    InMemoryOperation_GetRoot = 0,
    InMemoryOperation_GetUserFileRoot,
    InMemoryOperation_GetPreferencesRoot,
    InMemoryOperation_CreateCollection,  // both forms
    InMemoryOperation_Delete,            // of an asset
    InMemoryOperation_DeleteByName,
    InMemoryOperation_Add,
    InMemoryOperation_Upload,
    InMemoryOperation_Download,
    InMemoryOperation_Search,
    InMemoryOperation_SearchOne,
    InMemoryOperation_Header,
    InMemoryOperation_FetchChildren,
    InMemoryOperation_Connection,  // SetCredentials, CheckConnection, Logout: counted, never failed
};
constexpr int kInMemoryOperationCount = InMemoryOperation_Connection + 1;

// The requests a real service would see.
enum InMemoryRequest : int {
    InMemoryRequest_Any = -1,     // matches every request in a fault; counts them all
    InMemoryRequest_GetRoot = 0,  // the client root by name
    InMemoryRequest_Search,
    InMemoryRequest_Header,
    InMemoryRequest_CreateCollection,
    InMemoryRequest_Add,
    InMemoryRequest_Delete,
    InMemoryRequest_Upload,
    InMemoryRequest_Download,
};
constexpr int kInMemoryRequestCount = InMemoryRequest_Download + 1;

const char* InMemoryOperationName(InMemoryOperation operation);
const char* InMemoryRequestName(InMemoryRequest request);
// By name, so that a failed expectation reads well.
std::ostream& operator<<(std::ostream& stream, InMemoryOperation operation);
std::ostream& operator<<(std::ostream& stream, InMemoryRequest request);

// One fault: which requests it meets and what happens to them.
struct InMemoryFault {
    InMemoryOperation mOperation = InMemoryOperation_Any;
    InMemoryRequest mRequest = InMemoryRequest_Any;
    // The Nth matching request sent after the fault was installed, from 1; 0
    // meets every matching request. A fault with an N fires at most once.
    unsigned mNth = 1;
    // True: the layer below does not take the request. The first request of
    // an operation then makes it return a nil Guid with no callback; a
    // follow-up request ends the operation the way the real client ends it.
    // False: the service answers mStatus with mBody, and changes nothing.
    bool mRefuse = false;
    tolmonet::StatusCode mStatus = 500;
    std::string mBody;
    // Called on the sending thread each time the fault fires, outside every
    // lock of the server; may be empty.
    boost::function<void(InMemoryOperation, InMemoryRequest, const Guid&)> mOnFire;
};

// What became of one request at its sending.
struct InMemoryFaultDecision {
    bool mRefuse = false;
    bool mFail = false;
    tolmonet::StatusCode mStatus = 0;
    std::string mBody;
};

class InMemoryFaultTable {
public:
    using FaultId = unsigned;

    FaultId Add(const InMemoryFault& fault);
    // Removes every fault; counts and hits stay.
    void Clear();
    // How often the fault fired so far; 0 for an unknown id.
    unsigned Hits(FaultId fault) const;

    // Counts one request and gives what the first matching fault makes of
    // it (faults are tried in the order they were added).
    InMemoryFaultDecision OnSend(InMemoryOperation operation, InMemoryRequest request, const Guid& requestUID);
    // Counts a call of an operation by its caller.
    void OnCall(InMemoryOperation operation);

    // Requests of a kind, or of all kinds with InMemoryRequest_Any.
    unsigned RequestCount(InMemoryRequest request) const;
    // Calls of an operation by its caller (not the steps it makes itself),
    // or of all operations with InMemoryOperation_Any.
    unsigned OperationCount(InMemoryOperation operation) const;
    // Every request so far, in the order of sending.
    std::vector<InMemoryRequest> RequestLog() const;

private:
    struct Entry {
        FaultId mId;
        InMemoryFault mFault;
        unsigned mSeen = 0;  // matching requests since it was added
        bool mSpent = false;
    };

    mutable std::mutex mMutex;  // guards everything below
    std::vector<Entry> mFaults;
    std::vector<unsigned> mHits;  // by FaultId - 1; outlives Clear()
    unsigned mRequestCounts[kInMemoryRequestCount] = {};
    unsigned mOperationCounts[kInMemoryOperationCount] = {};
    std::vector<InMemoryRequest> mLog;
};

}  // namespace testsupport
