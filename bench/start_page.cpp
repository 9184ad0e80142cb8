// The words of a document's first page and its picture at 36 dots per inch, by poppler and nothing else: what
// vlmail is held against in start.cpp.
#include <poppler-document.h>
#include <poppler-page-renderer.h>
#include <poppler-page.h>

#include <memory>

int main(int, char** argv) {
    std::unique_ptr<poppler::document> const document(poppler::document::load_from_file(argv[1]));
    std::unique_ptr<poppler::page> const page(document->create_page(0));
    poppler::page_renderer renderer;
    renderer.set_image_format(poppler::image::format_rgb24);
    renderer.set_render_hint(poppler::page_renderer::antialiasing);
    renderer.set_render_hint(poppler::page_renderer::text_antialiasing);
    bool const hasWords = !page->text_list(poppler::page::text_list_include_font).empty();
    return hasWords && renderer.render_page(page.get(), 36, 36).is_valid() ? 0 : 1;
}
