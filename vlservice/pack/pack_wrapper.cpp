#include "vlservice/pack/pack_wrapper.h"

#include "vlservice/pack/index_search.h"
#include "vlservice/pack/index_xml.h"
#include "vlservice/pack/little_endian.h"
#include "vlservice/platform/log.h"

#include <boost/filesystem/operations.hpp>
#include <boost/system/error_code.hpp>
#include <zlib.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ios>
#include <limits>
#include <new>
#include <optional>

std::string const PackWrapper::TAG_CORBULET = Container::TAG_MAILING;
std::string const PackWrapper::TAG_CORBULET_ID = Container::MAILING_ID;
std::string const PackWrapper::TAG_CORBULET_TITLE = Container::MAILING_TITLE;
std::string const PackWrapper::TAG_VANTELAR = Container::TAG_ROOT;
std::string const PackWrapper::VL_JOBMETADATA = Container::JOB_METADATA;

namespace {

namespace fs = boost::filesystem;

/// The index is read in pieces, so that a hole of some gigabytes in a sparse file costs nothing.
constexpr std::int64_t INDEX_PIECE = std::int64_t{1} << 20;

/// A blob's size as the index and the checksum know it. Larger blobs are cut in both while the position
/// advances by all of their size: deliberate, the format has 32 bits for it.
std::uint32_t cutSize(SharedMemBuffer const& data) { return static_cast<std::uint32_t>(data.size()); }

std::uint32_t checksum(SharedMemBuffer const& data) {
    return static_cast<std::uint32_t>(crc32(0, data.data(), cutSize(data)));
}

/// A line of which as much is told as there is memory for: whoever is told of a failure gets a result, and no
/// exception.
void logFailure(LogPriority priority, char const* what, fs::path const& path,
                char const* then = "") noexcept {
    try {
        Log::Lock(priority).logStreamLine() << what << path << then;
    } catch (std::bad_alloc const&) {
    }
}

/// The text at a place, behind the first zero byte not all of it: a zero ends the index. None when it cannot
/// be read.
std::optional<std::string> readText(std::istream& in, Container::IndexPlace const& place) {
    std::string text;
    in.seekg(place.position);
    for (std::int64_t left = place.size; left > 0;) {
        std::int64_t const piece = std::min(left, INDEX_PIECE);
        std::size_t const before = text.size();
        text.resize(before + static_cast<std::size_t>(piece));
        if (!in.read(text.data() + before, piece))
            return std::nullopt;
        if (text.find('\0', before) != std::string::npos)
            break;
        left -= piece;
    }
    return text;
}

} // namespace

std::size_t PackWrapper::PageKeyHash::operator()(PageKey const& key) const {
    std::hash<std::string_view> const hash;
    return hash(key.first) * 31 + hash(key.second);
}

PackWrapper::PackWrapper(fs::path path, Purpose purpose, std::string packId)
    : PageLoaderI(std::string()), PageSaverI(std::move(packId)), pth_(std::move(path)), purpose_(purpose) {
    if (purpose_ & PURPOSE_OUTPUT)
        createOutputFile();
    else
        loadImportFile();
}

PackWrapper::~PackWrapper() = default;

bool PackWrapper::outputFinalished() const { return okSoFar() && fileStream_.fail(); }

// Output

void PackWrapper::createOutputFile() {
    try {
        fileStream_.open(pth_, std::ios::out | std::ios::binary);
        if (fileStream_)
            return;
    } catch (std::bad_alloc const&) {
        // The file may be there; it goes with the failure.
    }
    logFailure(3, "Mailing wrapper failed to create file ", pth_);
    onFailure();
}

void PackWrapper::savePage(std::string const& document, std::string const& page, SharedMemBuffer data) {
    if (!okSoFar())
        return;
    if (writeBin(document, page, Container::ROLE_PAGE, data))
        return;
    logFailure(4, "Mailing wrapper failed to save page data to ", pth_);
    onFailure();
}

bool PackWrapper::finalizeOutput(SharedMemBuffer metadata) {
    if (!okSoFar())
        return false;
    if (!writeBin({}, VL_JOBMETADATA, Container::ROLE_FRAMEWORK, metadata)) {
        logFailure(4, "Mailing wrapper failed to save mailing metadata to ", pth_);
        return onFailureRetFalse();
    }
    if (!Container::writeIndex(fileStream_, savedPackId(), bins_)) {
        // The odd spelling is the interface's: programs that read the log know the line so.
        logFailure(4, "Mailing wrapper failed to save bin offsetts to ", pth_);
        return onFailureRetFalse();
    }
    char trailer[Container::OFFSET_SIZE];
    LittleEndian::store(binPos_, trailer);
    // Flushed here: a full disk would otherwise show only when the file is closed.
    if (!fileStream_.write(trailer, sizeof trailer).flush()) {
        logFailure(4, "Mailing wrapper failed to save final offset to ", pth_);
        return onFailureRetFalse();
    }
    closeFile();
    return true;
}

/// The entry and the position stay advanced when the write fails.
bool PackWrapper::writeBin(std::string const& document, std::string const& name, char const* role,
                           SharedMemBuffer const& data) {
    try {
        append({name, binPos_, cutSize(data), role, checksum(data), document});
    } catch (std::bad_alloc const&) {
        return false;
    }
    binPos_ += data.size();
    fileStream_.write(reinterpret_cast<char const*>(data.data()), static_cast<std::streamsize>(data.size()));
    return !fileStream_.fail();
}

void PackWrapper::closeFile() {
    fileStream_.close();
    // Set in any case: deliberate, it is by this state that outputFinalished() knows a finished file.
    fileStream_.setstate(std::ios::failbit);
}

void PackWrapper::onFailure() {
    if (!okSoFar())
        return;
    bool const isOutput = purpose_ & PURPOSE_OUTPUT;
    purpose_ = PURPOSE_FAILED;
    if (fileStream_.fail())
        return;
    closeFile();
    boost::system::error_code ignored;
    if (isOutput)
        fs::remove(pth_, ignored);
}

bool PackWrapper::onFailureRetFalse() {
    onFailure();
    return false;
}

// Import

void PackWrapper::loadImportFile() {
    try {
        findIndex();
    } catch (std::bad_alloc const&) {
        logFailure(4, "Failed to parse file ", pth_, ". Import failed. Out of memory");
        pages_.clear();
        bins_.clear();
        onFailure();
    }
}

void PackWrapper::findIndex() {
    // The system's error is told as it was at the failure, 0 after a short read, so it is reset before each
    // step and copied before the line is built.
    auto const fail = [this](char const* what, char const* then) {
        int const code = errno;
        Log::Lock(4).logStreamLine() << what << pth_ << then << code;
        onFailure();
    };
    errno = 0;
    fileStream_.open(pth_, std::ios::in | std::ios::binary);
    if (!fileStream_)
        return fail("Failed to open for import file ", ". System error code ");

    errno = 0;
    fileEnd_ = fileStream_.seekg(0, std::ios::end).tellg();
    Container::IndexSearch::FirstBytes firstBytes;
    if (!fileStream_.seekg(0).read(firstBytes.data(), firstBytes.size()))
        return fail("Failed to read first bytes from file ", ". Import failed, system error code ");

    Container::IndexSearch search(
        firstBytes, fileEnd_, [this](std::int64_t position, char* to, std::size_t count) {
            return !fileStream_.seekg(position).read(to, static_cast<std::streamsize>(count)).fail();
        });
    std::string errorText;
    while (auto const place = search.next()) {
        errno = 0;
        auto text = readText(fileStream_, *place);
        if (!text)
            return fail("Failed to read from file ", ". Import failed, system error code ");
        auto const beside = static_cast<std::uint64_t>(fileEnd_) - text->size();
        TiXmlDocument doc;
        errorText = Container::parseIndex(doc, std::move(*text), beside);
        if (errorText.empty())
            return importCorbulet(doc, place->blobStart);
    }
    Log::Lock(4).logStreamLine() << search.failure() << " import file " << pth_
                                 << ". Possible file corruption";
    Log::Lock(4).logStreamLine() << "Failed to parse file " << pth_ << ". Import failed. " << errorText;
    onFailure();
}

void PackWrapper::importCorbulet(TiXmlDocument& doc, std::int64_t binStart) {
    TiXmlElement const* const mailing =
        TiXmlHandle(&doc).FirstChild(TAG_VANTELAR).FirstChild(TAG_CORBULET).ToElement();
    if (!mailing) {
        Log::Lock(4).logStreamLine() << "Invalid metadata in imported file. Missing corbulet element!";
        return onFailure();
    }
    std::string const* const id = mailing->Attribute(TAG_CORBULET_ID);
    if (!id) {
        Log::Lock(4).logStreamLine() << "Invalid metadata in imported file. Missing mailing id!";
        return onFailure();
    }
    setPackId(*id);
    // The title and the count of items are not looked at: the items that are there count.
    for (auto const* node = mailing->FirstChild(Container::TAG_ITEM); node;
         node = node->NextSibling(Container::TAG_ITEM)) {
        TiXmlElement const* const item = node->ToElement();
        if (!item)
            continue;
        BinEntry entry = Container::readItem(*item);
        entry.offset += static_cast<std::uint64_t>(binStart);
        append(std::move(entry));
    }
}

void PackWrapper::requestPageData(std::string const& document, std::string const& page, PageFunc func) {
    auto const found = pages_.find(PageKey(document, page));
    if (found != pages_.end())
        return func(readBin(*found->second));
    Log::Lock(4).logStreamLine() << "Cannot find requested binary in imported file " << pth_ << ". Doc "
                                 << document << ", page " << page;
    onFailure();
}

SharedMemBuffer PackWrapper::binData(unsigned long long index) { return readBin(bins_.at(index)); }

SharedMemBuffer PackWrapper::inputFullMeta() {
    auto const meta = std::find_if(bins_.begin(), bins_.end(),
                                   [](BinEntry const& entry) { return entry.role != Container::ROLE_PAGE; });
    if (meta != bins_.end())
        return readBin(*meta);
    Log::Lock(4).logStreamLine() << "Cannot find binary metadata in imported file " << pth_;
    onFailure();
    return {};
}

SharedMemBuffer PackWrapper::readBin(BinEntry const& entry) {
    auto const fail = [&](char const* what) {
        Log::Lock(4).logStreamLine() << what << " binary " << entry.name << " from import file";
        return SharedMemBuffer();
    };
    SharedMemBuffer data;
    if (!readBytes(entry, data))
        return fail("Failed to read");
    if (checksum(data) != entry.crc)
        return fail("Failed to verify");
    return data;
}

/// False also for a length that the file cannot hold, before anything is allocated for it.
bool PackWrapper::readBytes(BinEntry const& entry, SharedMemBuffer& data) {
    // Only an import reads: a request on an output must not move the position of its writing.
    if (purpose_ & PURPOSE_OUTPUT)
        return false;
    // An offset that no file can have is refused also where there is nothing to be read.
    if (entry.length == 0)
        return entry.offset <= static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());
    auto const end = static_cast<std::uint64_t>(fileEnd_);
    if (entry.offset > end || entry.length > end - entry.offset)
        return false;
    // A blob that could not be read before leaves the stream failed, and a seek would not change that.
    fileStream_.clear();
    try {
        data.resize(entry.length);
    } catch (std::bad_alloc const&) {
        return false;
    }
    return !fileStream_.seekg(static_cast<std::streamoff>(entry.offset))
                .read(reinterpret_cast<char*>(data.data()), entry.length)
                .fail();
}

void PackWrapper::append(BinEntry entry) {
    BinEntry const& kept = bins_.emplace_back(std::move(entry));
    // The first of equals is the one that is found.
    pages_.try_emplace(PageKey(kept.document, kept.name), &kept);
}
