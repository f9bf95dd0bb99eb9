// The JSON API under /api/v1/: each route reads its request strictly, makes its library calls
// through CallLibrary, and answers with the records fileindexctl --json gives for the same thing.
#ifndef FILEINDEX_PANEL_API_H
#define FILEINDEX_PANEL_API_H

#include <httplib.h>

#include "status_feed.h"

namespace fileindex_panel {

// The status reading the feed serves: the overall state, the pause, each folder's state and the
// shares' marks, all taken under one hold of the library mutex.
Reply ReadStatus();

// Registers every route on server. Changes made through the API invalidate the feed's reading.
void AddApiRoutes(httplib::Server &server, StatusFeed &feed);

}  // namespace fileindex_panel

#endif
