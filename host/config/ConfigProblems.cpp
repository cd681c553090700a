#include "host/config/ConfigProblems.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

ConfigProblems::ConfigProblems(std::string file) : m_file(std::move(file)) {}

void ConfigProblems::add(unsigned line, const std::string& key, const std::string& what,
                         const std::string& cure) {
    if (m_problems.size() == mostTexts) {
        ++m_more;
        return;
    }
    std::string text = m_file + ':';
    if (line > 0) {
        text += std::to_string(line) + ':';
    }
    text += ' ';
    if (!key.empty()) {
        text += key + ": ";
    }
    m_problems.push_back({line, text + what + "; " + cure});
}

std::vector<std::string> ConfigProblems::texts() const {
    std::vector<Problem> sorted = m_problems;
    std::stable_sort(sorted.begin(), sorted.end(),
                     [](const Problem& a, const Problem& b) { return a.line < b.line; });
    std::vector<std::string> texts;
    texts.reserve(sorted.size());
    for (const Problem& problem : sorted) {
        texts.push_back(problem.text);
    }
    if (m_more > 0) {
        texts.push_back(m_file + ": " + std::to_string(m_more) +
                        " more problems; correct those above first");
    }
    return texts;
}

} // namespace zrm::host
