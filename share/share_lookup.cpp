// What one call keeps of the share database's answers (ShareLookups).
#include "share/share_lookup.h"

#include "platform/share_db.h"

namespace VEXO {
namespace FILEINDEX {

ShareFacts::~ShareFacts()
{
    VEXOShareFree(record);
}

bool ShareLookups::FindSharePath(const std::string &share, std::string &sharePath)
{
    const auto kept = m_sharePaths.find(share);
    if (kept != m_sharePaths.end()) {
        sharePath = kept->second;
        return true;
    }
    PVEXOSHARE record = nullptr;
    if (VEXOShareGet(share.c_str(), &record) < 0) {
        return false;
    }
    sharePath = record->szPath;
    VEXOShareFree(record);
    if (m_reuse == Reuse::kOncePerCall) {
        m_sharePaths.emplace(share, sharePath);
    }
    return true;
}

std::shared_ptr<ShareFacts> ShareLookups::FindShareFacts(const std::string &share)
{
    const auto kept = m_shareFacts.find(share);
    if (kept != m_shareFacts.end()) {
        return kept->second;
    }
    PVEXOSHARE record = nullptr;
    if (VEXOShareGet(share.c_str(), &record) < 0) {
        return nullptr;
    }
    auto facts = std::make_shared<ShareFacts>(record, GetShareIndexRefusal(record));
    if (m_reuse == Reuse::kOncePerCall) {
        m_shareFacts.emplace(share, facts);
    }
    return facts;
}

bool ShareLookups::FindQueuePath(const std::string &share, std::string &queuePath)
{
    const auto kept = m_queuePaths.find(share);
    if (kept != m_queuePaths.end()) {
        queuePath = kept->second;
        return true;
    }
    if (!GetQueuePath(queuePath, share)) {
        return false;
    }
    if (m_reuse == Reuse::kOncePerCall) {
        m_queuePaths.emplace(share, queuePath);
    }
    return true;
}

}  // namespace FILEINDEX
}  // namespace VEXO
