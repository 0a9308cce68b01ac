#include <optional>

#include "agent/cli/commands/commands.h"
#include "agent/cli/event_printer.h"
#include "agent/cli/event_program.h"
#include "agent/cli/print.h"

namespace cvagent::commands {

ExitStatus watch(Session& session, const Options& options) {
    print("");  // an output that is closed is told now, not at the first event
    EventPrinter printer(session.subscribe({}), options.json, session.marks());
    std::optional<EventProgram> program;
    if (!options.program.empty()) {
        program.emplace(options.program, EventProgram::Seconds(options.programSeconds),
                        session.subscribe(Event::Kind::alert));
    }
    complain("watching " + std::to_string(session.countNodes()) + " nodes" +
             (options.seconds ? "" : "; Ctrl-C ends it"));
    printer.printUnseen();
    const AlertsTo shown(session, [&printer](const Event&) { printer.printAll(); });
    printer.follow(options.seconds);
    session.end();
    printer.printAll();  // what came while the plug-ins were stopped
    printer.throwFailure();
    return ExitStatus::done;
}

}  // namespace cvagent::commands
