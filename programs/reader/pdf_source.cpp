// The one file that knows poppler, which reads the words and draws the pages; single pages are written by
// pdf_page.
#include "programs/base/error.h"
#include "programs/reader/clean_text.h"
#include "programs/reader/page_objects.h"
#include "programs/reader/page_source.h"
#include "programs/reader/pdf_extras.h"
#include "programs/reader/pdf_page.h"
#include "programs/reader/writing_direction.h"
#include "vlservice/platform/log.h"

#include <poppler-document.h>
#include <poppler-embedded-file.h>
#include <poppler-font.h>
#include <poppler-image.h>
#include <poppler-page-renderer.h>
#include <poppler-page.h>

#include <png.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <mutex>
#include <optional>
#include <set>
#include <utility>

#ifdef __SANITIZE_ADDRESS__
#define VLSERVICE_LEAKS_ARE_SOUGHT
#elif defined(__has_feature)
#if __has_feature(address_sanitizer)
#define VLSERVICE_LEAKS_ARE_SOUGHT
#endif
#endif

#ifdef VLSERVICE_LEAKS_ARE_SOUGHT
#ifdef __clang__
// The sanitizer asks for it by this name.
#pragma clang diagnostic ignored "-Wreserved-identifier"
#endif
/// The library with which poppler looks for fonts keeps some bytes to itself.
extern "C" __attribute__((visibility("default"))) char const* __lsan_default_suppressions();
char const* __lsan_default_suppressions() { return "leak:libfontconfig\n"; }
#endif

namespace Reader {
namespace {

/// Further out there is no paper; it keeps damaged coordinates within an int.
constexpr double MAX_COORDINATE = 1e7;
/// For fonts that do not tell their size: the share of the height of a word's box.
constexpr double SIZE_OF_HEIGHT = 0.8;
constexpr char16_t SOFT_HYPHEN = 0x00AD;
/// Of a picture: A4 at 1,000 dots per inch, about.
constexpr double MAX_PIXELS = 1e8;

/// As poppler says that it draws nothing of what is written in a font.
constexpr char const* FONT_FAILURE = "Couldn't create a font for";

/// Some of what poppler says of streams that cannot be unpacked, or whose end it has to look for.
constexpr std::array STREAM_FAILURES{"stream", "filter", "Filter"};

/// What poppler has said in this process, which reads and draws one page at a time.
struct Sayings {
    /// The last one.
    std::string fontFailure;
    std::size_t streamFailures = 0;

    void take(std::string const& message) {
        if (std::size_t const at = message.find(FONT_FAILURE); at != std::string::npos)
            fontFailure = message.substr(at);
        streamFailures += std::any_of(STREAM_FAILURES.begin(), STREAM_FAILURES.end(), [&](char const* word) {
            return message.find(word) != std::string::npos;
        });
    }
};

Sayings& sayings() {
    static Sayings all;
    return all;
}

/// Sets poppler up, once for the process.
void preparePoppler() {
    static std::once_flag once;
    std::call_once(once, [] {
        // What poppler finds wrong with a document shows in what can be read of it, but for letters that it
        // leaves out of a picture, and for contents that end early.
        poppler::set_debug_error_function([](std::string const& message, void*) { sayings().take(message); },
                                          nullptr);
    });
    // poppler drops its tables with the last document and makes them anew for the next, which costs more than
    // opening it does: an empty document keeps them.
    static std::string const EMPTY = "%PDF-1.4\n1 0 obj<</Type/Catalog/Pages 2 0 R>>endobj\n"
                                     "2 0 obj<</Type/Pages/Kids[]/Count 0>>endobj\ntrailer<</Root 1 0 R>>\n";
    static std::unique_ptr<poppler::document> const keeper(
        poppler::document::load_from_raw_data(EMPTY.data(), static_cast<int>(EMPTY.size())));
}

int toHundredths(double points) {
    double const value = points * PDF_POINT;
    return std::isnan(value)
               ? 0
               : static_cast<int>(std::lround(std::clamp(value, -MAX_COORDINATE, MAX_COORDINATE)));
}

Box boxOf(poppler::rectf const& rect) {
    auto const [left, right] = std::minmax({toHundredths(rect.left()), toHundredths(rect.right())});
    auto const [top, bottom] = std::minmax({toHundredths(rect.top()), toHundredths(rect.bottom())});
    return {left, top, right, bottom};
}

/// Some documents say "soft hyphen" for every hyphen; what has been drawn is one.
void showDrawnHyphens(std::u16string& text, poppler::text_box const& box) {
    for (std::size_t i = text.find(SOFT_HYPHEN); i != std::u16string::npos; i = text.find(SOFT_HYPHEN, i)) {
        poppler::rectf const drawn = box.char_bbox(i);
        if (drawn.width() != 0 && drawn.height() != 0)
            text[i] = u'-';
        ++i;
    }
}

std::string textOf(poppler::text_box const& box) {
    poppler::ustring const units = box.text();
    std::u16string text(units.begin(), units.end());
    showDrawnHyphens(text, box);
    return cleanText(inReadingOrder(text));
}

/// Numbers the fonts of a page.
class FontNumbers {
public:
    explicit FontNumbers(std::vector<Font>& fonts) : fonts_(fonts) {}

    std::uint16_t of(std::string const& name) {
        auto const known =
            std::find_if(fonts_.begin(), fonts_.end(), [&](Font const& font) { return font.name == name; });
        if (known != fonts_.end())
            return static_cast<std::uint16_t>(known - fonts_.begin());
        if (fonts_.size() == MAX_FONTS)
            return MAX_FONTS - 1;
        fonts_.push_back({name});
        return static_cast<std::uint16_t>(fonts_.size() - 1);
    }

private:
    /// Pages with more fonts are none that blanks could be measured on.
    static constexpr std::uint16_t MAX_FONTS = 256;

    std::vector<Font>& fonts_;
};

std::optional<Word> wordOf(poppler::text_box const& box, FontNumbers& fonts) {
    Word word;
    word.text = textOf(box);
    if (word.text.empty())
        return std::nullopt;
    word.box = boxOf(box.bbox());
    word.turn = static_cast<Turn>(box.rotation() & 3);
    word.size = toHundredths(box.get_font_size());
    if (word.size <= 0) {
        int const height = runsAcross(word.turn) ? word.box.height() : word.box.width();
        word.size = std::max(1, static_cast<int>(height * SIZE_OF_HEIGHT));
    }
    word.font = fonts.of(box.get_font_name());
    word.blankBehind = box.has_space_after();
    return word;
}

std::string pngOf(poppler::image const& image) {
    png_image png{};
    png.version = PNG_IMAGE_VERSION;
    png.width = static_cast<png_uint_32>(image.width());
    png.height = static_cast<png_uint_32>(image.height());
    png.format = PNG_FORMAT_RGB;
    png_alloc_size_t size = PNG_IMAGE_PNG_SIZE_MAX(png);
    std::string bytes(size, '\0');
    if (!png_image_write_to_memory(&png, bytes.data(), &size, 0, image.const_data(), image.bytes_per_row(),
                                   nullptr))
        throw Base::Error(Base::Code::FileUnwritable,
                          std::string("the picture of the page cannot be written: ") + png.message);
    bytes.resize(size);
    return bytes;
}

std::optional<std::string> embeddedFileIn(std::string const& pdf) {
    std::unique_ptr<poppler::document> const document(
        poppler::document::load_from_raw_data(pdf.data(), static_cast<int>(pdf.size())));
    std::vector<poppler::embedded_file*> const files =
        document ? document->embedded_files() : std::vector<poppler::embedded_file*>();
    if (files.size() != 1 || !files.front()->is_valid())
        return std::nullopt;
    poppler::byte_array const bytes = files.front()->data();
    return std::string(bytes.begin(), bytes.end());
}

/// Of a PDF that cannot be opened: whether it is because of its encryption.
bool saysEncrypted(std::string_view bytes) { return bytes.find("/Encrypt") != std::string_view::npos; }

class PdfSource : public PageSource {
public:
    PdfSource(std::string bytes, std::string where)
        : bytes_(std::move(bytes)), where_(std::move(where)), writer_(bytes_, where_, embeddedFileIn),
          objects_(bytes_), extras_(bytes_, where_) {
        preparePoppler();
        if (bytes_.size() > static_cast<std::size_t>(std::numeric_limits<int>::max()))
            throw Base::Error(Base::Code::DocumentTooLarge, where_ + ": is larger than 2 GiB; split it");
        document_.reset(
            poppler::document::load_from_raw_data(bytes_.data(), static_cast<int>(bytes_.size())));
        if (document_ && document_->is_locked())
            throw Base::Error(Base::Code::DocumentEncrypted,
                              where_ + ": is an encrypted PDF; save it without a password");
        if (!document_ || document_->pages() < 1)
            throw Base::Error(Base::Code::DocumentUnreadable,
                              where_ + (saysEncrypted(bytes_)
                                            ? ": is a PDF whose encryption is not known; save it without one"
                                            : ": is a damaged PDF; export the document again"));
    }

    int pageCount() const override { return document_->pages(); }

    Page readPage(int number) override {
        std::size_t const failures = sayings().streamFailures;
        std::unique_ptr<poppler::page> const source = popplerPage(number);
        Page page;
        page.number = number;
        PageSize const size = sizeOf(*source);
        page.width = size.width;
        page.height = size.height;

        FontNumbers fonts(page.fonts);
        Box const visible{0, 0, page.width, page.height};
        for (poppler::text_box const& box : source->text_list(poppler::page::text_list_include_font))
            if (std::optional<Word> word = wordOf(box, fonts); word && visible.contains(word->box.centre()))
                page.words.push_back(std::move(*word));
        noteFailures(number, failures);
        return page;
    }

    PageSize pageSize(int number) override { return sizeOf(*popplerPage(number)); }

    std::string singlePagePdf(int number) override {
        popplerPage(number); // It throws for a page that was not read either.
        written_.insert(number);
        return writer_.write(number, pageCount());
    }

    /// What is written is known for certain; otherwise pages are looked through that poppler had trouble
    /// with.
    bool isWrittenAnew(int number) override {
        return (written_.count(number) != 0 || failing_.count(number) != 0) &&
               writer_.writesAnew(number, pageCount());
    }

    bool hasSameObjects(int number, std::string_view pdf) override { return objects_.areSame(number, pdf); }

    std::string renderPage(int number, double dotsPerInch) override {
        sayings().fontFailure.clear();
        poppler::image const image = draw(number, dotsPerInch);
        if (!sayings().fontFailure.empty())
            Log::Lock(4).logStreamLine()
                << where_ << ": the picture of page " << number << " lacks letters (" << sayings().fontFailure
                << "); draw it again, or embed the document's fonts";
        return pngOf(image);
    }

    std::optional<Picture> drawPage(int number, double dotsPerInch) override {
        return pictureOf(draw(number, dotsPerInch));
    }

    std::optional<Picture> drawPart(int number, Raster const& raster) override {
        if (raster.width < 1 || raster.height < 1 || 1.0 * raster.width * raster.height > MAX_PIXELS)
            throw Base::Error(Base::Code::TooLarge,
                              where_ + ": page " + std::to_string(number) +
                                  " makes too large a picture; ask for fewer dots per inch");
        poppler::page_renderer renderer;
        renderer.set_image_format(poppler::image::format_rgb24);
        poppler::image const image =
            renderer.render_page(popplerPage(number).get(), raster.acrossDotsPerInch, raster.downDotsPerInch,
                                 raster.left, raster.top, raster.width, raster.height);
        requireDrawn(image, number);
        return pictureOf(image);
    }

    PageExtras extrasOf(int number) override {
        PageExtras extras;
        std::unique_ptr<poppler::font_iterator> const fonts(document_->create_font_iterator(number - 1));
        for (poppler::font_info const& font : fonts->next())
            if (!font.is_embedded())
                extras.fontsNotEmbedded.push_back(font.name());
        extras.lostAnnotations = lostAnnotations(number);
        return extras;
    }

    std::string printedPdf(int number) override {
        if (!extras_.printsOtherwise(number, pageCount()))
            return {};
        try {
            return printedPage(singlePagePdf(number), where_);
        } catch (std::bad_alloc const&) {
            throw;
        } catch (std::exception const&) {
            throw Base::Error(Base::Code::DocumentUnreadable,
                              where_ + ": page " + std::to_string(number) +
                                  " cannot be shown as it is printed; print the document to a new PDF");
        }
    }

    std::vector<std::string> embeddedFiles() override { return extras_.embeddedFiles(); }

private:
    static Picture pictureOf(poppler::image const& image) {
        Picture picture{image.width(), image.height(), {}};
        std::size_t const rowSize = 3 * static_cast<std::size_t>(image.width());
        picture.points.reserve(rowSize * static_cast<std::size_t>(image.height()));
        for (int row = 0; row < image.height(); ++row)
            picture.points.append(image.const_data() + row * image.bytes_per_row(), rowSize);
        return picture;
    }

    void requireDrawn(poppler::image const& image, int number) const {
        if (!image.is_valid())
            throw Base::Error(Base::Code::DocumentUnreadable,
                              where_ + ": page " + std::to_string(number) +
                                  " cannot be drawn; export the document again");
    }

    std::vector<LostAnnotation> lostAnnotations(int number) {
        std::vector<LostAnnotation> lost;
        for (PdfAnnotation const& annotation : extras_.lostAnnotations(number, pageCount()))
            lost.push_back({annotation.kind, boxOf(poppler::rectf(annotation.left, annotation.top,
                                                                  annotation.right - annotation.left,
                                                                  annotation.bottom - annotation.top))});
        return lost;
    }

    static PageSize sizeOf(poppler::page const& page) {
        poppler::rectf const sheet = page.page_rect();
        PageSize const size{toHundredths(std::abs(sheet.width())), toHundredths(std::abs(sheet.height()))};
        poppler::page::orientation_enum const orientation = page.orientation();
        bool const liesAcross =
            orientation == poppler::page::landscape || orientation == poppler::page::seascape;
        return liesAcross ? size.turned() : size;
    }

    poppler::image draw(int number, double dotsPerInch) {
        std::size_t const failures = sayings().streamFailures;
        std::unique_ptr<poppler::page> const page = popplerPage(number);
        poppler::rectf const sheet = page->page_rect();
        double const scale = dotsPerInch / 72;
        if (!(sheet.width() * scale * sheet.height() * scale <= MAX_PIXELS))
            throw Base::Error(Base::Code::TooLarge,
                              where_ + ": page " + std::to_string(number) +
                                  " makes too large a picture; ask for fewer dots per inch");

        poppler::page_renderer renderer;
        renderer.set_image_format(poppler::image::format_rgb24);
        renderer.set_render_hint(poppler::page_renderer::antialiasing);
        renderer.set_render_hint(poppler::page_renderer::text_antialiasing);
        poppler::image const image = renderer.render_page(page.get(), dotsPerInch, dotsPerInch);
        requireDrawn(image, number);
        noteFailures(number, failures);
        return image;
    }

    void noteFailures(int number, std::size_t before) {
        if (sayings().streamFailures != before)
            failing_.insert(number);
    }

    std::unique_ptr<poppler::page> popplerPage(int number) const {
        std::unique_ptr<poppler::page> page(document_->create_page(number - 1));
        if (!page)
            throw Base::Error(Base::Code::DocumentUnreadable, where_ + ": page " + std::to_string(number) +
                                                                  " is damaged; export the document again");
        return page;
    }

    /// poppler, the writer and its check read from it as long as they live.
    std::string const bytes_;
    std::string const where_;
    PdfPageWriter writer_;
    PageObjects objects_;
    PdfExtras extras_;
    std::unique_ptr<poppler::document> document_;
    /// Pages whose streams poppler has complained of, and those that were written.
    std::set<int> failing_;
    std::set<int> written_;
};

} // namespace

std::unique_ptr<PageSource> openPdf(std::string bytes, std::string const& where) {
    return std::make_unique<PdfSource>(std::move(bytes), where);
}

} // namespace Reader
