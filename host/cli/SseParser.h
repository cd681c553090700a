#ifndef ZRM_HOST_SSE_PARSER_H
#define ZRM_HOST_SSE_PARSER_H

#include <functional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Parses server-sent events from pieces as they arrive.
class SseParser {
public:
    /// Called with the data of each complete event.
    using Receiver = std::function<void(const std::string& data)>;

    explicit SseParser(Receiver receiver);

    /// Takes a piece and calls the receiver for each event that it completes. An incomplete event
    /// is dropped with the object.
    void take(std::string_view piece);

private:
    void line(std::string_view line);

    Receiver m_receiver;
    std::string m_line; ///< the part of the line received so far
    std::string m_data;
    bool m_hasData = false;
};

} // namespace zrm::host

#endif
