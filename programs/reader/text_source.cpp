// Text files: pages end with form feeds, and each character stands in a column of a typed page.
#include "programs/base/error.h"
#include "programs/reader/clean_text.h"
#include "programs/reader/page_source.h"
#include "programs/reader/text_pdf.h"
#include "programs/reader/typed_page.h"

#include <algorithm>
#include <string_view>
#include <unicode/uchar.h>
#include <unicode/utf16.h>
#include <utility>

namespace Reader {
namespace {

constexpr std::string_view UTF8_MARK = "\xEF\xBB\xBF";

/// Text in the encoding that it turns out to have.
std::u16string decode(std::string_view bytes, std::string const& where) {
    if (bytes.find('\0') != std::string_view::npos)
        throw Base::Error(Base::Code::DocumentUnreadable,
                          where + ": is neither a PDF nor text; export the document as PDF");
    if (bytes.substr(0, UTF8_MARK.size()) == UTF8_MARK)
        bytes.remove_prefix(UTF8_MARK.size());
    std::optional<std::u16string> text = utf16Of(bytes);
    return text ? std::move(*text) : utf16OfWindows1252(bytes);
}

/// Accents that are characters of their own stand above the letter before them.
bool takesColumn(UChar32 c) {
    switch (u_charType(c)) {
    case U_NON_SPACING_MARK:
    case U_ENCLOSING_MARK:
    case U_FORMAT_CHAR:
    case U_CONTROL_CHAR:
        return false;
    default:
        return true;
    }
}

/// Puts characters on pages, as a typewriter does.
class Typist {
public:
    explicit Typist(std::string const& where) : where_(where) {}

    std::vector<Page> type(std::u16string_view text) {
        newPage();
        for (std::size_t i = 0; i < text.size();) {
            UChar32 c = 0;
            U16_NEXT(text.data(), i, text.size(), c);
            bool const isPair = c == '\r' && i < text.size() && text[i] == u'\n';
            if (!isPair)
                type(c);
        }
        endWord();
        // A form feed at the end closes the last page.
        if (pages_.size() > 1 && text.back() == u'\f')
            pages_.pop_back();
        return std::move(pages_);
    }

private:
    void type(UChar32 c) {
        switch (c) {
        case '\f':
            endWord();
            newPage();
            return;
        case '\n':
        case '\r':
        case '\v':
            endWord();
            ++row_;
            column_ = 0;
            if (row_ > MAX_ROWS)
                fail("has a page of more than " + std::to_string(MAX_ROWS) +
                     " lines; end its pages with form feeds");
            return;
        case '\t':
            endWord();
            column_ += TypedPage::TAB - column_ % TypedPage::TAB;
            return;
        default:
            break;
        }
        if (u_isUWhiteSpace(c)) {
            endWord();
            ++column_;
            return;
        }
        if (word_.empty())
            wordColumn_ = column_;
        char16_t units[2];
        std::size_t length = 0;
        U16_APPEND_UNSAFE(units, length, c);
        word_.append(units, length);
        column_ += takesColumn(c) ? 1 : 0;
    }

    void endWord() {
        if (word_.empty())
            return;
        Word word;
        if (column_ > MAX_COLUMNS)
            fail("has a line of more than " + std::to_string(MAX_COLUMNS) + " characters; break its lines");
        word.text = cleanText(word_);
        word_.clear();
        if (word.text.empty())
            return;
        word.box = TypedPage::boxOf(row_, wordColumn_, std::max(column_, wordColumn_ + 1));
        word.size = TypedPage::SIZE;
        Page& page = pages_.back();
        page.width = std::max(page.width, word.box.right + TypedPage::LEFT);
        page.height = std::max(page.height, word.box.bottom + TypedPage::TOP);
        page.words.push_back(std::move(word));
    }

    void newPage() {
        if (pages_.size() == MAX_PAGES)
            fail("has more than " + std::to_string(MAX_PAGES) + " pages; split it");
        Page page;
        page.number = static_cast<int>(pages_.size()) + 1;
        page.width = TypedPage::WIDTH;
        page.height = TypedPage::HEIGHT;
        page.isTyped = true;
        page.fonts = {{TypedPage::FONT, TypedPage::COLUMN / TypedPage::SIZE}};
        pages_.push_back(std::move(page));
        row_ = 0;
        column_ = 0;
    }

    [[noreturn]] void fail(std::string const& what) const {
        throw Base::Error(Base::Code::DocumentUnreadable, where_ + ": " + what);
    }

    // What no letter needs; places on larger pages would not fit their numbers.
    static constexpr int MAX_ROWS = 10000;
    static constexpr int MAX_COLUMNS = 10000;
    static constexpr std::size_t MAX_PAGES = 100000;

    std::string const& where_;
    std::vector<Page> pages_;
    std::u16string word_;
    int row_ = 0;
    int column_ = 0;
    int wordColumn_ = 0;
};

class TextSource : public PageSource {
public:
    TextSource(std::vector<Page> pages, std::string where)
        : pages_(std::move(pages)), where_(std::move(where)) {}

    int pageCount() const override { return static_cast<int>(pages_.size()); }
    Page readPage(int number) override { return page(number); }
    PageSize pageSize(int number) override { return page(number).size(); }
    std::string singlePagePdf(int number) override { return pdfOfTypedPage(page(number), where_); }
    bool hasSameObjects(int, std::string_view) override { return false; }

    std::optional<Picture> drawPage(int, double) override { return std::nullopt; }
    std::string renderPage(int number, double dotsPerInch) override {
        return openPdf(singlePagePdf(number), where_)->renderPage(1, dotsPerInch);
    }

private:
    Page const& page(int number) const { return pages_[static_cast<std::size_t>(number - 1)]; }

    std::vector<Page> const pages_;
    std::string const where_;
};

} // namespace

std::unique_ptr<PageSource> openText(std::string_view bytes, std::string const& where) {
    constexpr std::size_t MAX_BYTES = std::size_t{64} << 20;
    if (bytes.size() > MAX_BYTES)
        throw Base::Error(Base::Code::DocumentTooLarge, where + ": has more than 64 MiB of text; split it");
    return std::make_unique<TextSource>(Typist(where).type(decode(bytes, where)), where);
}

} // namespace Reader
