#pragma once
// The file that carries a mailing, written as a sink of pages and read as a source of them.

#include "vlservice/export.h"
#include "vlservice/pack/container_format.h"
#include "vlservice/pack/page_loader.h"
#include "vlservice/pack/page_saver.h"

#include <boost/filesystem/fstream.hpp>
#include <boost/filesystem/path.hpp>

#include <cstdint>
#include <deque>
#include <functional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>

class TiXmlDocument;

/// A container: the blobs of all pages, a blob of metadata and an index. Blobs are stored as they are given;
/// callers hand in what PageSaverI::zipDbData() made, which also lets the layout be recognised.
/// Nothing throws for what is wrong with a file: a failure is logged and moves the wrapper into the failed
/// state. Used by one thread at a time.
class VLSERVICE_EXPORT PackWrapper : public PageLoaderI, public PageSaverI {
public:
    /// What becomes of the file.
    enum Purpose : std::uint32_t {
        PURPOSE_IMPORT = 0,
        PURPOSE_OUTPUT = 1,
        /// What a failure turns the purpose into; never passed in.
        PURPOSE_FAILED = 255,
    };

    /// What the index says of one blob.
    struct BinEntry {
        std::string name; ///< of the page in its document
        /// From the start of the file, in bytes.
        std::uint64_t offset = 0;
        std::uint32_t length = 0; ///< in bytes
        /// "page" or "framework"; in a file from elsewhere any other text.
        std::string role;
        /// CRC-32 of the blob as stored.
        std::uint32_t crc = 0;
        /// Empty for the metadata.
        std::string document;
    };

    static std::string const TAG_CORBULET;       ///< of the index, around the entries
    static std::string const TAG_CORBULET_ID;    ///< of the mailing's id
    static std::string const TAG_CORBULET_TITLE; ///< of the mailing's title

    /// Creates the file, replacing one that is there, or opens it and reads its index.
    /// The id is that of a mailing to be written; an import's packId() comes from the file.
    PackWrapper(boost::filesystem::path path, Purpose purpose, std::string packId);
    PackWrapper(PackWrapper const&) = delete;
    PackWrapper& operator=(PackWrapper const&) = delete;
    ~PackWrapper() override;

    /// A failure has happened, which is logged; nothing can be read or written.
    bool failed() const { return !okSoFar(); }
    boost::filesystem::path const& pthFile() const { return pth_; } ///< as it was given
    /// Blobs in the index, the metadata included; 0 after a failed import.
    unsigned long long szBins() const { return bins_.size(); }
    /// In file order. Throws std::out_of_range.
    BinEntry const& bin(unsigned long long index) const { return bins_.at(index); }
    /// True once the file is whole and closed; false after a failure. The odd spelling is the interface's.
    bool outputFinalished() const;

    /// Calls `func` before it returns, with the blob of the first entry of that document and page, or with
    /// the empty buffer when it cannot be read or its checksum is wrong; the wrapper stays usable then. A
    /// page that is not in the index fails the wrapper, and `func` is not called; the file of an output that
    /// is not finished is removed.
    void requestPageData(std::string const& document, std::string const& page, PageFunc func) override;
    /// The blob of an entry, or the empty buffer when it cannot be read or its checksum is wrong.
    /// Throws std::out_of_range.
    SharedMemBuffer binData(unsigned long long index);
    /// The first blob that is no page, or the empty buffer. That there is none fails the wrapper.
    SharedMemBuffer inputFullMeta();

    /// Appends a blob; does nothing in the failed state.
    void savePage(std::string const& document, std::string const& page, SharedMemBuffer data) override;
    /// Appends the metadata and the index, and closes the file. True only when all of it has reached the
    /// file. A document or page name that cannot stand in XML is a failure.
    bool finalizeOutput(SharedMemBuffer metadata);

protected:
    bool okSoFar() const { return purpose_ != PURPOSE_FAILED; } ///< nothing has failed
    /// Closes the file, and removes it when it was being written. A file whose stream has failed already is
    /// left as it is, open until the wrapper goes. Does nothing in the failed state.
    void onFailure();
    bool onFailureRetFalse(); ///< the same, for a return

private:
    static std::string const TAG_VANTELAR;
    static std::string const VL_JOBMETADATA;

    /// Document and page, as they stand in the entries.
    using PageKey = std::pair<std::string_view, std::string_view>;
    struct PageKeyHash {
        std::size_t operator()(PageKey const& key) const;
    };

    void createOutputFile();
    void closeFile();
    bool writeBin(std::string const& document, std::string const& name, char const* role,
                  SharedMemBuffer const& data);

    void loadImportFile();
    void findIndex();
    void importCorbulet(TiXmlDocument& doc, std::int64_t binStart);
    SharedMemBuffer readBin(BinEntry const& entry);
    bool readBytes(BinEntry const& entry, SharedMemBuffer& data);

    void append(BinEntry entry);

    boost::filesystem::path pth_;
    Purpose purpose_;
    std::uint64_t binPos_ = 0;
    std::int64_t fileEnd_ = 0;
    boost::filesystem::fstream fileStream_;
    // A deque: its elements never move, so that the keys may point into them.
    std::deque<BinEntry> bins_;
    std::unordered_map<PageKey, BinEntry const*, PageKeyHash> pages_;
};
