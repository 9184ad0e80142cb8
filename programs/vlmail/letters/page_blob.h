#pragma once
// Pages on their way from a worker to a mailing.

#include "programs/production/letter_parts.h"
#include "programs/vlmail/letters/worker_message.h"
#include "vlservice/pack/shared_mem_buffer.h"

#include <vector>

namespace VlMail {

/// A page of a document as it is printed.
struct PageBlob {
    /// In its document, from 1.
    int number = 0;
    /// Compressed, as containers and databases keep it; empty where pages are only planned.
    SharedMemBuffer data = {};
    /// The same page where its letter is not the first of those that go out as one; empty when it is no
    /// other.
    SharedMemBuffer laterData = {};
    Production::PageSize size = {};
    bool isColoured = false;
    bool isLaterColoured = false;
};

void put(WorkerMessage& message, std::vector<PageBlob> const& blobs);
std::vector<PageBlob> takeBlobs(WorkerMessage& message);

} // namespace VlMail
