#include "records.h"

#include <iostream>

namespace fileindexctl {

std::string MediaText(const Json::Value &record)
{
    std::string media;
    for (const char *kind : {"document", "audio", "video", "photo"}) {
        if (record[kind].isBool() && record[kind].asBool()) {
            media += (media.empty() ? "" : ",") + std::string(kind);
        }
    }
    return media.empty() ? "-" : media;
}

void PrintRecord(const Json::Value &record)
{
    std::cout << "path:  " << record["path"].asString() << "\n"
              << "name:  " << record["name"].asString() << "\n"
              << "media: " << MediaText(record) << "\n";
}

}  // namespace fileindexctl
