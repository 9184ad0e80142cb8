#pragma once
// Writes PDFs as they are told, whether they make sense or not.

#include <algorithm>
#include <map>
#include <string>
#include <vector>
#include <zlib.h>

namespace VLServiceTest {

inline std::string deflated(std::string const& bytes) {
    uLongf length = ::compressBound(bytes.size());
    std::string result(length, '\0');
    ::compress2(reinterpret_cast<Bytef*>(result.data()), &length,
                reinterpret_cast<Bytef const*>(bytes.data()), bytes.size(), Z_BEST_COMPRESSION);
    result.resize(length);
    return result;
}

/// Objects by their numbers. Object 1 is the catalog.
class RawPdf {
public:
    RawPdf& object(int number, std::string const& body) {
        objects_[number] = body;
        return *this;
    }
    RawPdf& stream(int number, std::string const& keys, std::string const& bytes) {
        return object(number, "<< /Length " + std::to_string(bytes.size()) + ' ' + keys + " >>\nstream\n" +
                                  bytes + "\nendstream");
    }

    /// An update says that there is no such object any more.
    RawPdf& freed(int number) {
        freed_.push_back(number);
        return *this;
    }

    std::string bytes() const { return withTable(placedBehind("%PDF-1.7\n"), 0, ""); }

    // An incremental update of a PDF that bytes() or one of these has given: these objects stand behind it
    // and replace its own of the same numbers.

    std::string behind(std::string const& earlier) const {
        return withTable(placedBehind(earlier), sizeIn(earlier), previous(earlier));
    }
    /// With its references in a stream.
    std::string behindInStream(std::string const& earlier) const {
        Placed const placed = placedBehind(earlier);
        return withStart(withStream(placed, sizeIn(earlier), previous(earlier)), placed.pdf.size());
    }
    /// With its references in a stream and a table that does not have them, for readers that know no streams.
    std::string behindAsHybrid(std::string const& earlier) const {
        Placed const placed = placedBehind(earlier);
        std::string const keys = " /XRefStm " + std::to_string(placed.pdf.size()) + previous(earlier);
        Placed const hidden{withStream(placed, sizeIn(earlier), ""), {}};
        return withTable(hidden, std::max(sizeIn(earlier), nextNumber() + 1), keys);
    }

private:
    /// Objects with their offsets.
    struct Placed {
        std::string pdf;
        std::map<int, std::size_t> offsets;
    };

    static std::string previous(std::string const& earlier) {
        std::size_t const last = earlier.rfind("startxref\n") + 10;
        return " /Prev " + earlier.substr(last, earlier.find('\n', last) - last);
    }
    static int sizeIn(std::string const& earlier) {
        return std::stoi(earlier.substr(earlier.rfind("/Size ") + 6));
    }
    int nextNumber() const { return objects_.empty() ? 1 : objects_.rbegin()->first + 1; }

    Placed placedBehind(std::string const& earlier) const {
        Placed placed{earlier, {}};
        for (auto const& [number, body] : objects_) {
            placed.offsets[number] = placed.pdf.size();
            placed.pdf += std::to_string(number) + " 0 obj\n" + body + "\nendobj\n";
        }
        return placed;
    }

    static std::string withStart(std::string const& pdf, std::size_t start) {
        return pdf + "startxref\n" + std::to_string(start) + "\n%%EOF\n";
    }

    std::string withTable(Placed const& placed, int size, std::string const& keys) const {
        std::string table = "xref\n0 1\n0000000000 65535 f \n";
        for (int const number : freed_)
            table += std::to_string(number) + " 1\n0000000000 00001 f \n";
        for (auto const& [number, at] : placed.offsets) {
            std::string const offset = std::to_string(at);
            table += std::to_string(number) + " 1\n" + std::string(10 - offset.size(), '0') + offset +
                     " 00000 n \n";
        }
        return withStart(placed.pdf + table + "trailer\n<< /Size " +
                             std::to_string(std::max(size, nextNumber())) + " /Root 1 0 R" + keys + " >>\n",
                         placed.pdf.size());
    }

    std::string withStream(Placed placed, int size, std::string const& keys) const {
        int const number = std::max(size, nextNumber());
        placed.offsets[number] = placed.pdf.size();
        std::string index;
        std::string entries;
        for (auto const& [object, at] : placed.offsets) {
            index += ' ' + std::to_string(object) + " 1";
            entries += '\1';
            for (int shift = 24; shift >= 0; shift -= 8)
                entries += static_cast<char>(at >> shift);
            entries += '\0';
        }
        return placed.pdf + std::to_string(number) +
               " 0 obj\n<< /Type /XRef /Root 1 0 R /W [1 4 1] /Index [" + index + " ] /Length " +
               std::to_string(entries.size()) + " /Size " + std::to_string(number + 1) + keys +
               " >>\nstream\n" + entries + "\nendstream\nendobj\n";
    }

    std::vector<int> freed_;
    std::map<int, std::string> objects_;
};

/// One page, object 3, with the font /F and what else is in `resources`, object 5 being its content.
inline RawPdf onePage(std::string const& content, std::string const& resources = "",
                      std::string const& pageKeys = "", std::string const& catalogKeys = "") {
    RawPdf pdf;
    pdf.object(1, "<< /Type /Catalog /Pages 2 0 R " + catalogKeys + " >>");
    pdf.object(2, "<< /Type /Pages /Kids [3 0 R] /Count 1 >>");
    pdf.object(3, "<< /Type /Page /Parent 2 0 R /MediaBox [0 0 595 842] /Contents 5 0 R /Resources << /Font "
                  "<< /F 4 0 R >> " +
                      resources + " >> " + pageKeys + " >>");
    pdf.object(4, "<< /Type /Font /Subtype /Type1 /BaseFont /Courier /Encoding /WinAnsiEncoding >>");
    pdf.stream(5, "", content);
    return pdf;
}

/// Forms of which each draws a line and the next one several times.
inline std::string formTree(int depth, int width) {
    RawPdf pdf = onePage("/X6 Do", "/XObject << /X6 6 0 R >>");
    for (int form = 6; form < 6 + depth; ++form) {
        std::string const next = "X" + std::to_string(form + 1);
        std::string content = "BT /F 10 Tf 72 700 Td (Hello) Tj ET";
        for (int i = 0; i < width; ++i)
            content += " /" + next + " Do";
        pdf.stream(form,
                   "/Type /XObject /Subtype /Form /BBox [0 0 595 842] /Resources << /Font << /F 4 0 R >> "
                   "/XObject << /" +
                       next + ' ' + std::to_string(form + 1) + " 0 R >> >>",
                   content);
    }
    pdf.stream(6 + depth, "/Type /XObject /Subtype /Form /BBox [0 0 595 842]", "");
    return pdf.bytes();
}

} // namespace VLServiceTest
