// The library's folder records as people read them.
#ifndef FILEINDEXCTL_RECORDS_H
#define FILEINDEXCTL_RECORDS_H

#include <string>

#include <json/value.h>

namespace fileindexctl {

// The media a record indexes, "document,photo", or "-" for none.
std::string MediaText(const Json::Value &record);
// One record as "path", "name" and "media" lines.
void PrintRecord(const Json::Value &record);

}  // namespace fileindexctl

#endif
