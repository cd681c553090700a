#include "host/formats/FieldExtracts.h"

#include "base/EntryFields.h"

#include <utility>

namespace zrm::host {

namespace {

/// Whether a glob of '*' and '?' matches the whole text.
bool matches(std::string_view glob, std::string_view text) noexcept {
    std::size_t at = 0;
    std::size_t place = 0;
    std::size_t star = glob.npos; // the last one, which may take more
    std::size_t taken = 0;        // where what it takes ends
    while (at < text.size()) {
        if (place < glob.size() && glob[place] == '*') {
            star = place++;
            taken = at;
        } else if (place < glob.size() && (glob[place] == '?' || glob[place] == text[at])) {
            ++place;
            ++at;
        } else if (star != glob.npos) {
            place = star + 1;
            at = ++taken;
        } else {
            return false;
        }
    }
    return glob.find_first_not_of('*', place) == glob.npos;
}

std::string_view withoutProcess(std::string_view source) noexcept {
    return source.ends_with(']') ? source.substr(0, source.rfind('[')) : source;
}

} // namespace

Result<FieldExtracts> FieldExtracts::make(const std::vector<FormatDescription::Extract>& extracts) {
    FieldExtracts made;
    std::size_t count = 0;
    for (const FormatDescription::Extract& extract : extracts) {
        count += extract.patterns.size();
        if (extract.patterns.empty() || count > mostPatterns) {
            return refused(extract.patterns.empty()
                               ? "has no patterns"
                               : "there are more than " + std::to_string(mostPatterns) +
                                     " patterns",
                           R"(write patterns = ['user (?P<user>\S+)'])", "extract");
        }
        Extract& current = made.m_extracts.emplace_back(Extract{extract.source, {}});
        for (const std::string& expression : extract.patterns) {
            auto compiled = EntryPattern::compile(expression);
            if (!compiled) {
                compiled.error().field = "extract";
                return tl::unexpected(std::move(compiled.error()));
            }
            current.patterns.push_back(std::move(*compiled));
        }
    }
    return made;
}

void FieldExtracts::read(std::string_view source, std::string_view description, EntryFields& fields,
                         Workspace& workspace) const {
    const std::string_view program = withoutProcess(source);
    for (const Extract& extract : m_extracts) {
        if (!extract.source.empty() && !matches(extract.source, program)) {
            continue;
        }
        for (const EntryPattern& pattern : extract.patterns) {
            if (!pattern.match(description, workspace.captures, workspace.pattern)) {
                continue;
            }
            for (std::size_t index = 0; index < workspace.captures.size(); ++index) {
                const std::string_view value = workspace.captures[index];
                if (!pattern.names()[index].empty() && value.data() != nullptr) {
                    fields.add(pattern.names()[index], value);
                }
            }
            break;
        }
    }
}

} // namespace zrm::host
