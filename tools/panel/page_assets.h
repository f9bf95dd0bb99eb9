// The page's files, compiled into the binary from tools/panel/page/ (embed_page.cmake): nothing is
// read from disk while the panel answers.
#ifndef FILEINDEX_PANEL_PAGE_ASSETS_H
#define FILEINDEX_PANEL_PAGE_ASSETS_H

#include <cstddef>
#include <string>

namespace fileindex_panel {

struct PageAsset {
    const char *path;          // the URL path: "/" for index.html, "/panel.js", ...
    const char *contentType;
    const unsigned char *data;
    size_t size;
};

// The asset served at path, or null.
const PageAsset *FindPageAsset(const std::string &path);

}  // namespace fileindex_panel

#endif
