#include "tests/support/damaged_mailing.h"

#include <cstdint>
#include <set>
#include <stdexcept>
#include <string_view>
#include <utility>

namespace VLServiceTest {
namespace {

constexpr std::size_t TRAILER = 8;
constexpr std::string_view ITEM = "<mailitem ";

struct Stretch {
    std::size_t begin = 0;
    std::size_t length = 0;

    std::size_t end() const { return begin + length; }
};

/// One item of the index: its tag, and its blob.
struct Item {
    Stretch tag;
    Stretch blob;
};

class Damages {
public:
    explicit Damages(std::string const& whole) : whole_(whole), index_(indexBegin()) { findItems(); }

    std::vector<DamagedMailing> all() {
        cutEverywhere();
        flipEverywhere();
        changePlaces();
        loseAndDouble();
        return std::move(damages_);
    }

private:
    std::size_t indexBegin() const {
        std::uint64_t position = 0;
        for (std::size_t i = 0; i < TRAILER; ++i)
            position |= std::uint64_t{static_cast<unsigned char>(whole_.at(whole_.size() - TRAILER + i))}
                        << 8 * i;
        return position;
    }

    void findItems() {
        for (std::size_t at = whole_.find(ITEM, index_); at != std::string::npos;
             at = whole_.find(ITEM, at + 1)) {
            Item item{{at, whole_.find('>', at) + 1 - at}, {}};
            item.blob = {number(item, "offset"), number(item, "length")};
            items_.push_back(item);
        }
        if (items_.size() < 3)
            throw std::runtime_error("a mailing of at least two pages is wanted");
    }

    /// What stands between the quotes.
    Stretch value(Item const& item, std::string const& attribute) const {
        std::size_t const begin = whole_.find(' ' + attribute + "=\"", item.tag.begin) + attribute.size() + 3;
        return {begin, whole_.find('"', begin) - begin};
    }
    std::size_t number(Item const& item, std::string const& attribute) const {
        Stretch const text = value(item, attribute);
        return std::stoul(whole_.substr(text.begin, text.length));
    }

    void add(std::string const& how, std::string bytes) {
        if (bytes != whole_)
            damages_.push_back({how, std::move(bytes)});
    }

    void cutEverywhere() {
        std::set<std::size_t> places{0, 1, 17, 18, index_, index_ + 1, whole_.size() - 1};
        for (Item const& item : items_)
            for (Stretch const& part : {item.blob, item.tag})
                places.insert({part.begin, part.begin + part.length / 2, part.end() - 1, part.end()});
        for (std::size_t i = 1; i <= TRAILER; ++i)
            places.insert(whole_.size() - i);
        for (std::size_t const place : places)
            add("cut behind " + std::to_string(place) + " bytes", whole_.substr(0, place));
    }

    void flip(std::string const& what, std::size_t at, int bit = 0) {
        std::string bytes = whole_;
        bytes.at(at) = static_cast<char>(bytes.at(at) ^ 1 << bit);
        add("a bit is another in " + what + " at " + std::to_string(at), bytes);
    }

    void flipEverywhere() {
        for (Item const& item : items_) {
            // The magic, the size, the stream and the checksum that ends it.
            for (std::size_t const at :
                 {std::size_t{0}, std::size_t{3}, std::size_t{12}, item.blob.length - 1})
                flip("a blob", item.blob.begin + at);
            for (char const* const attribute : {"name", "offset", "length", "role", "crc"})
                flip(attribute, value(item, attribute).begin);
        }
        flip("the index", index_ + 1);
        // One byte too early or too late the index may be read all the same.
        for (std::size_t i = 1; i <= TRAILER; ++i)
            flip("the trailer", whole_.size() - i, 6);
    }

    /// The later stretch first, so that the places of the other stay.
    std::string exchanged(Stretch a, Stretch b) const {
        if (b.begin < a.begin)
            std::swap(a, b);
        std::string bytes = whole_;
        bytes.replace(b.begin, b.length, whole_, a.begin, a.length);
        bytes.replace(a.begin, a.length, whole_, b.begin, b.length);
        return withTrailer(bytes);
    }

    /// With the trailer that names the index where it is.
    static std::string withTrailer(std::string bytes) {
        std::size_t const index = bytes.find("<?xml");
        for (std::size_t i = 0; i < TRAILER; ++i)
            bytes.at(bytes.size() - TRAILER + i) = static_cast<char>(index >> 8 * i & 0xFF);
        return bytes;
    }

    void changePlaces() {
        Item const& one = items_[0];
        Item const& other = items_[1];
        add("the first two pages change bytes", exchanged(one.blob, other.blob));
        for (char const* const attribute : {"name", "document", "offset", "length", "crc"})
            add(std::string("the first two pages change ") + attribute,
                exchanged(value(one, attribute), value(other, attribute)));
        add("a page and the metadata change bytes", exchanged(one.blob, items_.back().blob));
        add("a page and the metadata change role",
            exchanged(value(one, "role"), value(items_.back(), "role")));
    }

    std::string without(Stretch const& part) const {
        return withTrailer(std::string(whole_).erase(part.begin, part.length));
    }

    void loseAndDouble() {
        for (Item const& item : items_) {
            std::string const which = " at " + std::to_string(item.blob.begin);
            add("the entry is missing of the blob" + which, without(item.tag));
            add("the bytes are missing of the blob" + which, without(item.blob));
            add("the entry is doubled of the blob" + which,
                withTrailer(
                    std::string(whole_).insert(item.tag.begin, whole_, item.tag.begin, item.tag.length)));
            add("zeroes stand in the blob" + which,
                std::string(whole_).replace(item.blob.begin, item.blob.length, item.blob.length, '\0'));
        }
        add("zeroes stand in the index", std::string(whole_).replace(index_ + 60, 16, 16, '\0'));
    }

    std::string const& whole_;
    std::size_t index_;
    std::vector<Item> items_;
    std::vector<DamagedMailing> damages_;
};

} // namespace

std::vector<DamagedMailing> damagesOf(std::string const& mailing) { return Damages(mailing).all(); }

} // namespace VLServiceTest
