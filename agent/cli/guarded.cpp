#include "agent/cli/guarded.h"

#include <exception>
#include <string>

#include "agent/cli/print.h"
#include "agent/core/signals.h"

namespace cvagent {

ExitStatus endWith(const Failure& failure) {
    if (*failure.what() != '\0') {
        complain(failure.what());
    }
    return failure.status();
}

ExitStatus guarded(const std::function<ExitStatus()>& command) {
    try {
        return command();
    } catch (const Failure& failure) {
        return endWith(failure);
    } catch (const Problem& problem) {
        return endWith(Failure(problem));
    } catch (const Interrupted&) {
        complain("nothing was done");
        StopSignals::die();
    } catch (const std::exception& exception) {
        complain(std::string("unexpected failure: ") + exception.what());
        return ExitStatus::failed;
    }
}

}  // namespace cvagent
