#pragma once

#include "b_exception.h"
#include "b_log.h"

namespace gltf {

/// Does `work`, which may fail without ending the export: whatever it throws is logged under
/// `message`. Returns whether it threw nothing.
template <class Work>
bool guarded(base::string_view message, const Work& work) {
    base::Log& log = base::log();
    try {
        work();
        return true;
    } catch (const base::exception& error) {
        log.log(base::logSystem, base::logError, message);
        error.report(log);
    } catch (const std::exception& error) {
        log.log(base::logSystem, base::logError, message);
        log.log(base::logSystem, base::logError, error.what());
    } catch (...) {
        log.log(base::logSystem, base::logError, "{} Unhandled exception has occurred!", message);
    }
    return false;
}

} // namespace gltf
