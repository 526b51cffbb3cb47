#include "host/zrlab/store_command.h"

#include <cstdint>
#include <variant>

#include <fmt/format.h>

#include "host/record/problem.h"
#include "host/record/run_text.h"
#include "host/store/spool.h"
#include "host/store/store.h"

namespace host {

namespace {

StoreAnswer sync(const std::string& where) {
    // Runs may be the first that a store gets.
    Store store(where);
    const Spool spool(defaultSpoolFolder(where));
    const Spool::Delivery delivery = spool.deliver(store);
    StoreAnswer answer{
        fmt::format("{}: {} delivered\n", store.name(), plural(delivery.delivered, "run", "runs")),
        {},
        kExitPassed};
    for (const std::string& line : delivery.setAside) {
        answer.problems.push_back("set aside: " + line);
    }
    if (delivery.problem.has_value()) {
        answer.problems.push_back(fmt::format("store {}; {} in {}", *delivery.problem,
                                              plural(delivery.waiting, "run waits", "runs wait"),
                                              spool.folder().string()));
    }
    answer.status = answer.problems.empty() ? kExitPassed : kExitError;
    return answer;
}

StoreAnswer show(const std::string& where) {
    Store store(where, Access::Existing);
    const Spool spool(defaultSpoolFolder(where));
    StoreAnswer answer{fmt::format("store    {}\n", store.name()), {}, kExitPassed};
    try {
        const Rows rows = store.query("SELECT COUNT(*) FROM runs");
        answer.text += fmt::format("runs     {}\n", std::get<std::int64_t>(rows.at(0).at(0)));
    } catch (const StoreProblem& problem) {
        answer.problems.push_back(fmt::format("store {}", problem.what()));
        answer.status = kExitError;
    }
    answer.text += fmt::format("waiting  {} in {}\n", spool.waiting(), spool.folder().string());
    return answer;
}

}  // namespace

void requireNamedStore(const std::string& command, const std::string& where) {
    if (where.empty()) {
        throw Problem(
            kExitUsage,
            fmt::format("{}: which store? Give --store, the variable ZRLAB_STORE or a line "
                        "\"store = WHERE\" of a settings file",
                        command));
    }
}

StoreAnswer storeCommand(const std::string& action, const std::string& where) {
    requireNamedStore("store", where);
    return action == "sync" ? sync(where) : show(where);
}

}  // namespace host
