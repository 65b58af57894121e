#include "vx/palette.h"

VxPalette::VxPalette(std::vector<VxColor> entries) : entries_(std::move(entries)) {}

VxColor VxPalette::getColor(int index) const {
    if (index < 0 || index >= size()) return VxColor(0, 0, 0, 0);
    return entries_[static_cast<size_t>(index)];
}

void VxPalette::setColor(int index, const VxColor& c) {
    if (index < 0) return;
    if (index >= size()) entries_.resize(static_cast<size_t>(index) + 1, VxColor(0, 0, 0, 0));
    entries_[static_cast<size_t>(index)] = c;
}
