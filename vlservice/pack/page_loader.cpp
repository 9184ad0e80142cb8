#include "vlservice/pack/page_loader.h"

#include "vlservice/pack/blob_format.h"
#include "vlservice/pack/little_endian.h"
#include "vlservice/platform/log.h"

#include <zlib.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <new>
#include <utility>

namespace {

/// Claims up to this size are believed whatever the stream: reserving that much does no harm.
constexpr std::uint64_t HARMLESS_CLAIM = std::uint64_t{1} << 30;
/// No deflate stream gives more than this many bytes for one.
constexpr std::uint64_t MOST_EXPANSION = 1032;

bool isBlob(SharedMemBuffer const& data) {
    return data.size() >= DB_ZIP_MAGIC.size() &&
           std::memcmp(data.data(), DB_ZIP_MAGIC.data(), DB_ZIP_MAGIC.size()) == 0;
}

SharedMemBuffer notDecompressed(char const* why = "") {
    Log::Lock(4).logStreamLine() << "Failed to decompress data from db" << why;
    return {};
}

/// The bytes of `stream`, as many as the header claims.
SharedMemBuffer decompress(unsigned char const* stream, std::uint64_t length, std::uint64_t claim) {
    SharedMemBuffer plain;
    plain.resize(claim);
    uLongf written = claim;
    if (uncompress(plain.data(), &written, stream, length) != Z_OK)
        return notDecompressed();
    // A stream may hold less than its header claims. No old memory may leak out behind it.
    if (written < claim)
        std::memset(plain.data() + written, 0, claim - written);
    return plain;
}

} // namespace

PageLoaderI::PageLoaderI(std::string packId) : packId_(std::move(packId)) {}

PageLoaderI::~PageLoaderI() = default;

void PageLoaderI::requestPageData(std::string const& document, std::string const& page, PageFunc func) {
    pending_[document][page].push_back(std::move(func));
}

bool PageLoaderI::nothingPening() const { return pending_.empty(); }

void PageLoaderI::done() {}

SharedMemBuffer PageLoaderI::unzipDbData(SharedMemBuffer data) {
    if (!isBlob(data))
        return data;
    if (data.size() < DB_ZIP_HEADER_SIZE)
        return notDecompressed(". Size too small");
    auto const claim = LittleEndian::load<std::uint64_t>(data.data() + DB_ZIP_MAGIC.size());
    std::uint64_t const length = data.size() - DB_ZIP_HEADER_SIZE;
    if (claim > HARMLESS_CLAIM && claim / MOST_EXPANSION > length)
        return notDecompressed();
    try {
        return decompress(data.data() + DB_ZIP_HEADER_SIZE, length, claim);
    } catch (std::bad_alloc const&) {
        return notDecompressed();
    }
}

void PageLoaderI::callPgFunc(std::string const& document, std::string const& page, SharedMemBuffer data) {
    PageFunc const func = findFuncToExec(document, page);
    if (!func)
        throw std::bad_function_call();
    try {
        func(std::move(data));
    } catch (...) {
        eraseClaimed(document, page);
        throw;
    }
    afterExecutedFunc(document, page);
}

PageLoaderI::PageFunc PageLoaderI::findFuncToExec(std::string const& document, std::string const& page) {
    auto const requests = pending_.find(document);
    if (requests == pending_.end())
        return {};
    auto const ofPage = requests->second.find(page);
    if (ofPage == requests->second.end())
        return {};
    for (PageFunc& func : ofPage->second)
        if (func)
            return std::exchange(func, nullptr);
    return {};
}

void PageLoaderI::afterExecutedFunc(std::string const& document, std::string const& page) {
    eraseClaimed(document, page);
    chkCallDone();
}

void PageLoaderI::chkCallDone() {
    if (nothingPening())
        done();
}

void PageLoaderI::setPackId(std::string packId) { packId_ = std::move(packId); }

void PageLoaderI::eraseClaimed(std::string const& document, std::string const& page) {
    auto const requests = pending_.find(document);
    if (requests == pending_.end())
        return;
    auto const ofPage = requests->second.find(page);
    if (ofPage == requests->second.end())
        return;
    std::list<PageFunc>& funcs = ofPage->second;
    auto const claimed = std::find_if(funcs.begin(), funcs.end(), [](PageFunc const& func) { return !func; });
    if (claimed != funcs.end())
        funcs.erase(claimed);
    if (funcs.empty())
        requests->second.erase(ofPage);
    if (requests->second.empty())
        pending_.erase(requests);
}
