#include "Shared/Algs/Algs.h"

namespace ZeltoTouch {

HIDEventList Algs::handleImage(const InputReport::Image&) { return {}; }
HIDEventList Algs::handleReset() { return {}; }
PropertyValue Algs::getState(const std::string&) const { return {}; }
void Algs::setState(const std::string&, const PropertyValue&) {}

}  // namespace ZeltoTouch
