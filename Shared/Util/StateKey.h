#pragma once

#include <string>
#include <string_view>

namespace ZeltoTouch::Util {

// The key-domain rule: when key begins with domain followed by ".", removes that prefix from
// key and returns true; otherwise leaves key unchanged and returns false. One level per call.
bool stripDomainFromKey(std::string& key, std::string_view domain);

}  // namespace ZeltoTouch::Util
