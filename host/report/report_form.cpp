#include "host/report/report_form.h"

#include <utility>

namespace host {

namespace {

class WholeReport final : public RunListener {
  public:
    WholeReport(ReportSink sink, std::string (*write)(const SessionRecord& session))
        : _sink(std::move(sink)), _write(write) {}

    void sessionEnded(const SessionRecord& session) override { _sink(_write(session)); }

  private:
    const ReportSink _sink;
    std::string (*const _write)(const SessionRecord& session);
};

}  // namespace

std::shared_ptr<RunListener> wholeReport(ReportSink sink,
                                         std::string (*write)(const SessionRecord& session)) {
    return std::make_shared<WholeReport>(std::move(sink), write);
}

}  // namespace host
