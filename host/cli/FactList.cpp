#include "host/cli/FactList.h"

#include "host/cli/DisplayText.h"

#include <algorithm>

namespace zrm::host {

void FactList::add(std::string name, const std::string& value, Colour colour) {
    if (!value.empty()) {
        m_facts.push_back({std::move(name), DisplayText::visible(value), colour});
    }
}

std::string FactList::text(const Terminal& terminal) const {
    std::size_t widest = 0;
    for (const Fact& fact : m_facts) {
        widest = std::max(widest, fact.name.size());
    }
    std::string text;
    for (const Fact& fact : m_facts) {
        text += terminal.coloured(fact.name, Colour::FAINT) +
                std::string(widest - fact.name.size() + 2, ' ') +
                terminal.coloured(fact.value, fact.colour) + '\n';
    }
    return text;
}

} // namespace zrm::host
