// The lines of a check: in sections, what there is of each described thing, in columns.
#ifndef ZR_DEVICES_LINUX_CHECK_REPORT_H
#define ZR_DEVICES_LINUX_CHECK_REPORT_H

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

#include "devices/device.h"
#include "devices/linux/machine.h"
#include "devices/linux/system_problem.h"

namespace linux_device {

class CheckReport {
  public:
    explicit CheckReport(Machine machine) : _machine(std::move(machine)) {}

    // What is added from now on belongs to it.
    void begin(const std::string& section);

    void found(const std::string& name, const std::string& what);
    void constant(const std::string& name, const std::string& what);
    void missing(const std::string& name, const std::string& why);

    // Adds what `look` returns, or the problem that it throws; whether it returned.
    template <class Look>
    bool look(const std::string& name, const Look& look) {
        try {
            found(name, look());
            return true;
        } catch (const SystemProblem& problem) {
            missing(name, problem.what());
            return false;
        }
    }

    // Something to do, after everything else; each text once.
    void advise(const std::string& text);

    // The path with its owner and mode: "/dev/hidraw0 (root:root 0600)".
    std::string withOwner(const std::string& path) const;

    // Whether only the owner may read the file.
    bool isPrivate(const std::string& path) const;

    devices::Findings findings() const;

  private:
    struct Row {
        std::string state;
        std::string name;
        std::string text;
    };
    struct Section {
        std::string name;
        std::vector<Row> rows;
    };

    void _add(const std::string& state, const std::string& name, const std::string& text);

    const Machine _machine;
    std::vector<Section> _sections;
    std::vector<std::string> _advice;
};

}  // namespace linux_device

#endif
