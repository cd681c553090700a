#ifndef ZRM_HOST_SSE_PARSER_H
#define ZRM_HOST_SSE_PARSER_H

#include <functional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Server-sent events out of the pieces in which they arrive.
class SseParser {
public:
    /// Gets the data of each event that is whole.
    using Receiver = std::function<void(const std::string& data)>;

    explicit SseParser(Receiver receiver);

    /// Takes a piece; calls the receiver for each event that ends in it. What is begun and not
    /// ended is dropped with the object.
    void take(std::string_view piece);

private:
    void line(std::string_view line);

    Receiver m_receiver;
    std::string m_line; ///< the part of a line that has arrived
    std::string m_data;
    bool m_hasData = false;
};

} // namespace zrm::host

#endif
