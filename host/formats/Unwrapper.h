#ifndef ZRM_HOST_UNWRAPPER_H
#define ZRM_HOST_UNWRAPPER_H

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm {
class EntryFields;
}

namespace zrm::host {

/// Takes apart the lines in which a container runtime keeps what a program writes. One line of the
/// program may be in several of them. Reused from one to the next: keeps its memory. One thread.
class Unwrapper {
public:
    enum class Kind : unsigned char {
        docker, ///< Docker's json-file: {"log":"TEXT\n","stream":"stdout","time":"..."}
        cri,    ///< of Kubernetes: TIME stdout F TEXT; P instead of F: not the end of the line
    };
    /// None if no kind has this name.
    static std::optional<Kind> kindOf(std::string_view name) noexcept;

    /// Throws std::bad_alloc.
    explicit Unwrapper(Kind kind);
    Unwrapper(const Unwrapper&) = delete;
    Unwrapper& operator=(const Unwrapper&) = delete;
    ~Unwrapper();

    /// Reads an entry of one or several lines. False if one of them is not such a line: reason()
    /// says why. Texts are valid until the next call.
    bool read(std::string_view entry);
    /// What the program has written, without the last line end.
    std::string_view text() const noexcept { return m_text; }
    /// True if that is not the end of the program's line.
    bool isUnfinished() const noexcept { return m_isUnfinished; }
    /// Of the first line, as the runtime has written it.
    std::string_view time() const noexcept { return m_time; }
    /// stdout or stderr.
    std::string_view stream() const noexcept { return m_stream; }
    /// Adds the stream, and what else Docker says of the container ("attrs.NAME"). All is copied.
    void addFields(EntryFields& fields) const;
    /// A clause.
    std::string_view reason() const noexcept { return m_reason; }

private:
    struct Json; // with the parser's types

    bool readLine(std::string_view line, bool isFirst);
    bool readDocker(std::string_view line, bool isFirst);
    bool readCri(std::string_view line, bool isFirst);
    template <class Object> bool readAttributes(Object attributes);
    void append(std::string_view text, std::string_view time, std::string_view stream,
                bool isFirst);
    bool refuse(std::string_view reason) noexcept;

    const Kind m_kind;
    std::unique_ptr<Json> m_json; ///< of kind docker
    std::string m_text;
    std::string m_time;
    std::string m_stream;
    std::vector<std::pair<std::string_view, std::string_view>> m_attributes; ///< of the last line
    bool m_isUnfinished = false;
    std::string_view m_reason;
};

} // namespace zrm::host

#endif
