// The diagnostics host's classes as a plug-in sees them: the lab, descriptions and parameters,
// results, limits, units, error domains, and the protocols that a plug-in's classes implement.
//
// The host drives everything. For a diagnostic it calls, on one thread and in this order:
//   the experiment's factory, setup (when the class has it), run, teardown (when the class has it);
//   the analysis's factory, setup (when the class has it), analyzeExperimentResult.
// It owns every instance and every result that it receives. Failures do not cross this boundary as
// exceptions. Two cases do: an image stream opened without a HID manager, and running out of memory or
// threads.
//
// Threads. Unless a type says otherwise its objects are used by one thread at a time.
#ifndef ZR_FRAME_HOST_INTERFACE_H
#define ZR_FRAME_HOST_INTERFACE_H

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/error.h"
#include "platform/string_map.h"
#include "platform/sync.h"
#include "platform/value.h"

// Error domains. Opaque strings.
//   ZRErrorDomain                       5 a negative parameter; 6 a missing measurement
//   ZRCapturePlugInErrorDomain          200 to 213, failures of the capture stream
//   ZRMeterixErrorDomain                100, every failure of the counter-report facility
//   ZRKirraImageExperimentErrorDomain   1 to 6, failures of the image experiment
inline constexpr std::string_view ZRErrorDomain = "ZRErrorDomain";
inline constexpr std::string_view ZRCapturePlugInErrorDomain = "ZRCapturePlugInErrorDomain";
inline constexpr std::string_view ZRMeterixErrorDomain = "ZRMeterixErrorDomain";
inline constexpr std::string_view ZRKirraImageExperimentErrorDomain =
    "ZRKirraImageExperimentErrorDomain";

// A unit of counted things. The three units are the only objects of the class: compare addresses.
class ZRDimensionlessUnit {
  public:
    static const ZRDimensionlessUnit& events();
    static const ZRDimensionlessUnit& frames();
    static const ZRDimensionlessUnit& errors();

    const std::string& symbol() const { return _symbol; }

    ZRDimensionlessUnit(const ZRDimensionlessUnit&) = delete;
    ZRDimensionlessUnit& operator=(const ZRDimensionlessUnit&) = delete;

  private:
    explicit ZRDimensionlessUnit(std::string symbol) : _symbol(std::move(symbol)) {}
    std::string _symbol;
};

// A value with its unit. Immutable and shared, an object with identity.
class Measurement {
  public:
    Measurement(double doubleValue, const ZRDimensionlessUnit& unit)
        : _doubleValue(doubleValue), _unit(&unit) {}

    double doubleValue() const { return _doubleValue; }
    const ZRDimensionlessUnit& unit() const { return *_unit; }

  private:
    double _doubleValue;
    const ZRDimensionlessUnit* _unit;
};
using MeasurementRef = std::shared_ptr<const Measurement>;

// The declaration of a numeric parameter.
class ZRNumberParameter {
  public:
    ZRNumberParameter(std::string summary, bool required)
        : _summary(std::move(summary)), _required(required) {}

    const std::string& summary() const { return _summary; }
    bool required() const { return _required; }

  private:
    std::string _summary;
    bool _required;
};

// What an experiment or an analysis is for, and which parameters it takes.
class ZRDescription {
  public:
    explicit ZRDescription(std::string summary) : _summary(std::move(summary)) {}
    static ZRDescription descriptionWithSummary(std::string summary) {
        return ZRDescription(std::move(summary));
    }

    // Declares `parameter`; the host passes its value under the name.
    void addParameter(ZRNumberParameter parameter, std::string forName) {
        _parameters.emplace_back(std::move(forName), std::move(parameter));
    }

    const std::string& summary() const { return _summary; }
    // In the order in which they were added.
    const std::vector<std::pair<std::string, ZRNumberParameter>>& parameters() const {
        return _parameters;
    }

  private:
    std::string _summary;
    std::vector<std::pair<std::string, ZRNumberParameter>> _parameters;
};

// What an experiment hands back. Both containers are live: the experiment inserts into them. No
// measurement may be null.
class ZRExperimentResult {
  public:
    platform::StringMap<MeasurementRef>& measurements() { return _measurements; }
    const platform::StringMap<MeasurementRef>& measurements() const { return _measurements; }
    platform::MutableDictionary& auxiliaryData() { return _auxiliaryData; }
    const platform::MutableDictionary& auxiliaryData() const { return _auxiliaryData; }

  private:
    platform::StringMap<MeasurementRef> _measurements;
    platform::MutableDictionary _auxiliaryData;
};
using ZRExperimentResultRef = std::shared_ptr<ZRExperimentResult>;

// One end of a limit. Immutable and shared, an object with identity; one bound may serve as both.
class ZRBound {
  public:
    // An open bound excludes its own value; a closed bound includes it.
    ZRBound(MeasurementRef value, bool open) : _value(std::move(value)), _open(open) {}

    const MeasurementRef& value() const { return _value; }
    bool open() const { return _open; }

  private:
    MeasurementRef _value;
    bool _open;
};
using ZRBoundRef = std::shared_ptr<const ZRBound>;

// A named range. A bound that is null does not limit that side.
class ZRLimit {
  public:
    explicit ZRLimit(std::string name) : _name(std::move(name)) {}

    const std::string& name() const { return _name; }
    const ZRBoundRef& lowerBound() const { return _lowerBound; }
    const ZRBoundRef& upperBound() const { return _upperBound; }
    void setLowerBound(ZRBoundRef bound) { _lowerBound = std::move(bound); }
    void setUpperBound(ZRBoundRef bound) { _upperBound = std::move(bound); }

  private:
    std::string _name;
    ZRBoundRef _lowerBound;
    ZRBoundRef _upperBound;
};
using ZRLimitRef = std::shared_ptr<ZRLimit>;

// A measurement under the name by which it is judged, with its limit; without one (null) it is
// information only.
class ZRMeasuredResult {
  public:
    // `measurement` must not be null.
    ZRMeasuredResult(std::string name, MeasurementRef measurement)
        : _name(std::move(name)), _measurement(std::move(measurement)) {}

    const std::string& name() const { return _name; }
    const MeasurementRef& measurement() const { return _measurement; }
    const ZRLimitRef& limit() const { return _limit; }
    void setLimit(ZRLimitRef limit) { _limit = std::move(limit); }

  private:
    std::string _name;
    MeasurementRef _measurement;
    ZRLimitRef _limit;
};
using ZRMeasuredResultRef = std::shared_ptr<ZRMeasuredResult>;

// What an analysis hands back: a live list to which it appends. It holds no verdict.
class ZRAnalysisResult {
  public:
    std::vector<ZRMeasuredResultRef>& measuredResults() { return _measuredResults; }
    const std::vector<ZRMeasuredResultRef>& measuredResults() const { return _measuredResults; }

  private:
    std::vector<ZRMeasuredResultRef> _measuredResults;
};
using ZRAnalysisResultRef = std::shared_ptr<ZRAnalysisResult>;

// The host object that setup receives. A plug-in only has to accept it.
class ZRDiagnosticHost {
  public:
    virtual ~ZRDiagnosticHost();
};

// An experiment: one instance serves one run.
class ZRExperiment {
  public:
    virtual ~ZRExperiment();

    // The summary and the declared parameters, built afresh on each call.
    virtual ZRDescription experimentDescription() const = 0;

    // Runs the whole experiment and returns only when it is over: its result, or null with an error
    // in the slot.
    virtual ZRExperimentResultRef run(platform::ErrorSlot error) = 0;
};

// An analysis: turns an experiment's measurements into measured results with limits.
class ZRAnalysis {
  public:
    virtual ~ZRAnalysis();

    // The summary and the declared parameters, built afresh on each call.
    virtual ZRDescription analysisDescription() const = 0;

    // The measured results; null with an error in the slot when the experiment's result lacks what
    // the analysis needs.
    virtual ZRAnalysisResultRef analyzeExperimentResult(const ZRExperimentResult& result,
                                                        platform::ErrorSlot error) = 0;
};

// Optional, for experiments and analyses: implemented by the classes that take parameters. The host
// finds it on the instance and calls it before anything else.
class ZRSetup {
  public:
    virtual ~ZRSetup();

    // Takes the declared parameters: names to numbers, a missing one reads as zero. False, with an
    // error in the slot, when they are not accepted. `host` is not owned.
    virtual bool setupWithParameters(const platform::Dictionary& parameters,
                                     ZRDiagnosticHost* host,
                                     platform::ErrorSlot error) = 0;
};

// Optional: implemented by the classes that hold on to something between run and teardown. The host
// calls it after every run, also a failed one, and not after a failed setup.
class ZRTeardown {
  public:
    virtual ~ZRTeardown();

    // False, with an error in the slot, on failure.
    virtual bool teardown(platform::ErrorSlot error) = 0;
};

// The lab: the process's registry of experiments, analyses and diagnostics.
//
// Nothing is ever unregistered. A name that is taken keeps what it was first registered with; the
// lab remembers the refusal. Experiments, analyses and diagnostics have name spaces of their own.
//
// Threads  Any. A factory is called on the thread that asks for an instance, without a lock.
class ZRLab {
  public:
    using ExperimentFactory = std::function<std::shared_ptr<ZRExperiment>()>;
    using AnalysisFactory = std::function<std::shared_ptr<ZRAnalysis>()>;

    struct Diagnostic {
        std::string name;
        std::string summary;
        std::string experimentName;
        std::string analysisName;
    };

    // A registration that found its name taken.
    struct Refusal {
        std::string kind;  // "experiment", "analysis" or "diagnostic"
        std::string name;
    };

    // The one lab of the process. It lives until the process ends.
    static ZRLab& defaultLab();

    void addExperimentWithName(std::string_view name, ExperimentFactory block);
    void addAnalysisWithName(std::string_view name, AnalysisFactory block);
    void addDiagnosticWithName(std::string_view name,
                               std::string_view summary,
                               std::string_view experimentName,
                               std::string_view analysisName);

    // Names in the order of registration.
    std::vector<std::string> experimentNames() const;
    std::vector<std::string> analysisNames() const;
    std::vector<Diagnostic> diagnostics() const;
    std::vector<Refusal> refusals() const;

    // A new instance from the factory of that name; null when the name is unknown.
    std::shared_ptr<ZRExperiment> makeExperiment(std::string_view name) const;
    std::shared_ptr<ZRAnalysis> makeAnalysis(std::string_view name) const;
    std::optional<Diagnostic> diagnosticNamed(std::string_view name) const;

  private:
    ZRLab() = default;

    template <class Factory>
    using Registry = std::vector<std::pair<std::string, Factory>>;

    mutable platform::Mutex _mutex;
    Registry<ExperimentFactory> _experiments ZR_GUARDED_BY(_mutex);
    Registry<AnalysisFactory> _analyses ZR_GUARDED_BY(_mutex);
    Registry<Diagnostic> _diagnostics ZR_GUARDED_BY(_mutex);
    std::vector<Refusal> _refusals ZR_GUARDED_BY(_mutex);
};

#endif
