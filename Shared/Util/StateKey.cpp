#include "Shared/Util/StateKey.h"

namespace ZeltoTouch::Util {

bool stripDomainFromKey(std::string& key, std::string_view domain) {
    // Byte comparison over domain + "."; a key shorter than that never matches. (Domains
    // hold no zero byte, so a zero byte in the key's prefix simply fails to match.)
    const size_t prefixLength = domain.size() + 1;
    if (key.size() < prefixLength || key.compare(0, domain.size(), domain) != 0 || key[domain.size()] != '.')
        return false;
    key.erase(0, prefixLength);
    return true;
}

}  // namespace ZeltoTouch::Util
