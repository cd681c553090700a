#ifndef ZRM_HOST_CONFIG_SECTION_H
#define ZRM_HOST_CONFIG_SECTION_H

#include "host/config/ConfigProblems.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <toml++/toml.h>

namespace zrm::host {

/// One table of a configuration file while it is read: returns values by key and type, records
/// every problem, and knows which keys have not been read.
class ConfigSection {
public:
    /// A text and its line number.
    using Text = std::pair<std::string, unsigned>;

    /// `name` precedes the keys in messages; empty for the file's top-level table. Both references
    /// must outlive the object.
    ConfigSection(std::string name, const toml::table& table, ConfigProblems& problems);

    /// The value of a key; none when it is missing or, which is a problem, of another type.
    std::optional<std::string> text(std::string_view key);
    std::optional<std::int64_t> number(std::string_view key);
    std::optional<bool> truth(std::string_view key);
    /// A text or a list of texts; none when the key is missing or a problem was recorded.
    std::optional<std::vector<Text>> texts(std::string_view key);
    /// A table, as in [key]; null when it is missing.
    const toml::table* table(std::string_view key);
    /// The tables of [[key]]; none when it is missing. An empty list is not missing.
    std::optional<std::vector<const toml::table*>> tables(std::string_view key);

    /// The table of a key as a section of its own; none when it is missing or of another type.
    std::optional<ConfigSection> section(std::string_view key);
    /// A table of a list of tables as a section.
    ConfigSection inner(std::string_view key, const toml::table& table) const;
    /// All keys of the table, in alphabetical order.
    std::vector<std::string> keys() const;

    bool has(std::string_view key) const { return m_table.contains(key); }
    /// Whether the value of a key is one text.
    bool isText(std::string_view key) const { return m_table[key].is_string(); }
    /// Whether the value of a key is a list of tables that is not empty, as in [[key]].
    bool isTables(std::string_view key) const { return m_table[key].is_array_of_tables(); }
    /// The line of a key's value, or of the table when the key is missing.
    unsigned line(std::string_view key) const;

    /// Records a problem with a key.
    void problem(std::string_view key, const std::string& what, const std::string& cure);
    void problem(unsigned line, std::string_view key, const std::string& what,
                 const std::string& cure);

    /// Records a problem with a key that may not be given here.
    void refuse(std::string_view key, const std::string& what,
                const std::string& cure = "leave it out");
    /// The key is not unknown, although another problem keeps it from being read.
    void passOver(std::string_view key) { find(key); }
    /// How many problems the whole file has so far.
    std::size_t problemCount() const noexcept { return m_problems.count(); }
    /// Records a problem for every key that has not been read. Call it last.
    void refuseUnknownKeys();

private:
    const toml::node* find(std::string_view key);
    bool addText(std::vector<Text>& texts, std::string_view key, const toml::node& item);
    void wrongType(std::string_view key, const toml::node& node, const char* cure);

    const std::string m_name;
    const toml::table& m_table;
    ConfigProblems& m_problems;
    std::vector<std::string> m_known; ///< keys that have been read, in that order
};

} // namespace zrm::host

#endif
