#include "Modules/MetrikSdk/otlp/InstanceId.h"

#include <stdexcept>

#include <boost/uuid/name_generator_sha1.hpp>
#include <boost/uuid/string_generator.hpp>
#include <boost/uuid/uuid_io.hpp>

namespace MetrikSdk::otlp {
namespace {

/// A person may have edited the file. So an id that is no UUID is allowed, and is used as a name.
boost::uuids::uuid Namespace(const std::string& outboxId) {
    try {
        return boost::uuids::string_generator()(outboxId);
    } catch (const std::runtime_error&) {
        return boost::uuids::name_generator_sha1(boost::uuids::ns::oid())(outboxId);
    }
}

} // namespace

std::string InstanceId(const std::string& outboxId, const std::string& moduleId) {
    return boost::uuids::to_string(boost::uuids::name_generator_sha1(Namespace(outboxId))(moduleId));
}

} // namespace MetrikSdk::otlp
