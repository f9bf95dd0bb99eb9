// Releases a Config's lock when the operation that took it returns, on every path.
#ifndef FILEINDEX_CONFIG_UNLOCK_ON_RETURN_H
#define FILEINDEX_CONFIG_UNLOCK_ON_RETURN_H

#include "fileindex/config.h"

namespace VEXO {
namespace FILEINDEX {

class UnlockOnReturn {
public:
    explicit UnlockOnReturn(Config &config) : m_config(config) {}
    ~UnlockOnReturn() { m_config.Unlock(); }
    UnlockOnReturn(const UnlockOnReturn &) = delete;
    UnlockOnReturn &operator=(const UnlockOnReturn &) = delete;

private:
    Config &m_config;
};

}  // namespace FILEINDEX
}  // namespace VEXO

#endif
