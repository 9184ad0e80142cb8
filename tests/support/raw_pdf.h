#pragma once
// Writes PDFs as they are told, whether they make sense or not.

#include <algorithm>
#include <map>
#include <string>
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

    std::string bytes() const { return appendedTo("%PDF-1.7\n", 0, ""); }

    /// An incremental update of a PDF that bytes() has given: these objects stand behind it and replace its
    /// own of the same numbers.
    std::string behind(std::string const& earlier) const {
        std::size_t const last = earlier.rfind("startxref\n") + 10;
        int const size = std::stoi(earlier.substr(earlier.rfind("/Size ") + 6));
        return appendedTo(earlier, size, " /Prev " + earlier.substr(last, earlier.find('\n', last) - last));
    }

private:
    std::string appendedTo(std::string pdf, int size, std::string const& trailerKeys) const {
        size = std::max(size, objects_.rbegin()->first + 1);
        std::string table = "xref\n0 1\n0000000000 65535 f \n";
        for (auto const& [number, body] : objects_) {
            std::string const offset = std::to_string(pdf.size());
            table += std::to_string(number) + " 1\n" + std::string(10 - offset.size(), '0') + offset +
                     " 00000 n \n";
            pdf += std::to_string(number) + " 0 obj\n" + body + "\nendobj\n";
        }
        std::string const start = std::to_string(pdf.size());
        return pdf + table + "trailer\n<< /Size " + std::to_string(size) + " /Root 1 0 R" + trailerKeys +
               " >>\nstartxref\n" + start + "\n%%EOF\n";
    }

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
