// ZRVantorFaultAnalysis: turns the fault experiment's measurements into 64 measured results.
//
// In this order: the sixty expected counter channels, each limited to exactly 0 events; "Actual
// Frames", at least `frameCount` frames; "I2C Errors", "MIPI Errors" and "SIF Errors", each limited
// to exactly 0 errors. It holds no verdict: the host judges. Other measurements are ignored, values
// and units are not checked.
//
// One thread at a time; keeps nothing but `frameCount`.
#ifndef ZR_VANTOR_FAULT_FAULT_ANALYSIS_H
#define ZR_VANTOR_FAULT_FAULT_ANALYSIS_H

#include "frame/host_interface.h"
#include "platform/number.h"

class ZRVantorFaultAnalysis final : public ZRAnalysis, public ZRSetup {
  public:
    ZRDescription analysisDescription() const override;

    // Stores the parameter "frameCount", absent when it is missing or not a number. Checks nothing and
    // always succeeds; the error slot is left alone.
    bool setupWithParameters(const platform::Dictionary& parameters,
                             ZRDiagnosticHost* host,
                             platform::ErrorSlot error) override;

    // Null at the first measurement that is missing (ZRErrorDomain 6, no underlying error):
    //   a counter channel          "Missing measurement for %@"
    //   "FrameCount"               "Missing %@ measurement!"
    //   "I2C", "MIPI" or "SIF"     "Missing measurement named %@!"
    // Counter channels are looked up first, in the order of their list.
    ZRAnalysisResultRef analyzeExperimentResult(const ZRExperimentResult& result,
                                                platform::ErrorSlot error) override;

    // The number of frames that the stream must have delivered; absent counts as 0.
    const platform::Number& frameCount() const { return _frameCount; }
    void setFrameCount(platform::Number frameCount) { _frameCount = frameCount; }

  private:
    platform::Number _frameCount;
};

#endif
