#include "hublink/report.hpp"

namespace hublink {

const char* ToString(Result result) noexcept {
    switch (result) {
    case Result::Sent:
        return "Sent";
    case Result::NobodyListens:
        return "NobodyListens";
    case Result::TooLong:
        return "TooLong";
    case Result::InvalidText:
        return "InvalidText";
    case Result::InvalidJson:
        return "InvalidJson";
    case Result::InvalidEventId:
        return "InvalidEventId";
    case Result::QuoteInUser:
        return "QuoteInUser";
    case Result::OtherUsersService:
        return "OtherUsersService";
    case Result::WouldBlock:
        return "WouldBlock";
    case Result::SystemError:
        return "SystemError";
    }
    return "Unknown";
}

} // namespace hublink
