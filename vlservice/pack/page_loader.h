#pragma once
// Where pages come from: requests wait here until their page has arrived.

#include "vlservice/export.h"
#include "vlservice/pack/shared_mem_buffer.h"

#include <functional>
#include <list>
#include <map>
#include <string>
#include <unordered_map>

/// A source of pages. A derived class fetches what was requested and hands each arrival to callPgFunc(),
/// which answers on the calling thread. Takes no lock: the derived class serialises requests and arrivals.
class VLSERVICE_EXPORT PageLoaderI {
public:
    using PageFunc = std::function<void(SharedMemBuffer)>; ///< takes a page, or the empty buffer

    PageLoaderI(std::string packId); ///< of the mailing that pages are of
    /// Copies take the requests along.
    PageLoaderI(PageLoaderI const&) = default;
    PageLoaderI& operator=(PageLoaderI const&) = default;
    virtual ~PageLoaderI();

    /// Stores a request. Several may wait for one page; each arrival answers one of them, the oldest first.
    virtual void requestPageData(std::string const& document, std::string const& page, PageFunc func);
    /// True when no request waits or is being answered.
    /// The odd spelling is the interface's.
    virtual bool nothingPening() const;
    /// A hook that runs each time an answered request was the last one. It may delete the loader.
    virtual void done();

    std::string const& packId() const { return packId_; } ///< of the mailing

    /// Undoes PageSaverI::zipDbData(). Anything that does not begin with the blob's magic comes back as it
    /// is, the same block. Where the stream holds less than the header says, the tail is zeroes. A damaged
    /// blob, and one whose claimed size is beyond reason or memory, is logged and gives the empty buffer.
    static SharedMemBuffer unzipDbData(SharedMemBuffer data);

protected:
    /// Answers the oldest waiting request for the page. What the request's function throws passes through;
    /// the request counts as taken then, and done() does not run. Throws std::bad_function_call when none is
    /// waiting.
    void callPgFunc(std::string const& document, std::string const& page, SharedMemBuffer data);
    /// Claims the oldest waiting request: its place stays, with an empty function, until afterExecutedFunc().
    /// Gives the empty function when none is waiting.
    PageFunc findFuncToExec(std::string const& document, std::string const& page);
    /// Removes the oldest claimed request of the page; runs done() when it was the last of all requests.
    void afterExecutedFunc(std::string const& document, std::string const& page);
    void chkCallDone(); ///< runs done() when nothing waits

    void setPackId(std::string packId); ///< when it is known later

private:
    // A list for each page: a hashed multimap would not keep the order in which equal keys arrived.
    using DocumentRequests = std::unordered_map<std::string, std::list<PageFunc>>;

    void eraseClaimed(std::string const& document, std::string const& page);

    std::string packId_;
    std::map<std::string, DocumentRequests> pending_;
};
