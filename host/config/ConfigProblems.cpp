#include "host/config/ConfigProblems.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

ConfigProblems::ConfigProblems(std::string file) : m_file(std::move(file)) {}

void ConfigProblems::add(unsigned line, const Problem& problem) {
    if (m_problems.size() == mostTexts) {
        ++m_more;
        return;
    }
    line = lineOr(line);
    std::string text = m_file + ':';
    if (line > 0) {
        text += std::to_string(line) + ':';
    }
    text += ' ';
    if (!problem.field.empty()) {
        text += problem.field + ": ";
    }
    m_problems.push_back({line, text + problem.text()});
}

std::vector<std::string> ConfigProblems::texts() const {
    std::vector<Entry> sorted = m_problems;
    std::stable_sort(sorted.begin(), sorted.end(),
                     [](const Entry& a, const Entry& b) { return a.line < b.line; });
    std::vector<std::string> texts;
    texts.reserve(sorted.size());
    for (const Entry& entry : sorted) {
        texts.push_back(entry.text);
    }
    if (m_more > 0) {
        texts.push_back(m_file + ": " + std::to_string(m_more) +
                        " more problems; correct those above first");
    }
    return texts;
}

} // namespace zrm::host
