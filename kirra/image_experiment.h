// ZRKirraImageExperiment: captures a number of image records of the Kirra sensor within a time-out,
// while the display is powered, and hands them to the host unjudged.
//
// The result's auxiliary data holds "images", a list of dictionaries in the order of arrival:
//   "frameID"                  unsigned 32-bit
//   "dScanI", "dScanQ"         lists of 48 signed 32-bit samples
//   "tmonDataInC"              float, degrees Celsius
//   "timestampInMilliseconds"  unsigned 32-bit
// It holds at least as many as asked for, and fewer when the run loop ran out of sources (the sensor
// was unplugged, say) or other code stopped it. No measurements.
//
// Owner    Make it with std::make_shared. The host owns it; the stream and the exit observer hold it
//          weakly.
// Threads  Setup and run on one thread, which must have a run loop; everything else happens on it too,
//          inside run(). No locks.
#ifndef ZR_KIRRA_IMAGE_EXPERIMENT_H
#define ZR_KIRRA_IMAGE_EXPERIMENT_H

#include <cstdint>
#include <memory>
#include <vector>

#include "frame/host_interface.h"
#include "kirra/image_stream.h"
#include "platform/run_loop.h"

class ZRKirraImageExperiment final : public ZRExperiment,
                                     public ZRSetup,
                                     public ZRKirraImageStreamDelegate,
                                     public std::enable_shared_from_this<ZRKirraImageExperiment> {
  public:
    ZRDescription experimentDescription() const override;

    // Parameters: "images", how many end the capture (0: the first one does), and "timeout" in whole
    // seconds. Missing ones read as 0.
    // Errors (ZRKirraImageExperimentErrorDomain, no underlying error):
    //   1  "Kirra is a HID device that requires a current run loop."
    //   2  "Could not get the main display to determine device power state."
    //   2  "Could not get the frame buffer to determine device power state."
    //   2  "Could not find the display power state."
    //   2  "The display is not powered."
    // The display is looked at first.
    bool setupWithParameters(const platform::Dictionary& parameters,
                             ZRDiagnosticHost* host,
                             platform::ErrorSlot error) override;

    // Errors (ZRKirraImageExperimentErrorDomain):
    //   1  as above                           this is not the thread of a setup that was accepted
    //   3  "Failed to create kirra stream."   there was no memory for it
    //   3, 4, 5                               opening the stream failed: see ZRKirraImageStream
    //   6  "Timed out after %lu seconds."     what had arrived is dropped, a sensor's error too
    // or the sensor's own error, unchanged. Throws platform::InternalInconsistency when there is no
    // HID manager, std::bad_alloc, and whatever a callback of the run loop throws. Whatever the outcome,
    // a stream that was opened is closed when run() ends.
    ZRExperimentResultRef run(platform::ErrorSlot error) override;

    // Of the stream's delegate.
    void handleImage(ZRKirraMendraImage image) override;
    void streamDidError(const platform::ErrorRef& error) override;

  private:
    static bool _displayIsPowered(platform::ErrorSlot error);
    platform::RunLoopOutcome _runObserved(platform::RunLoop& runLoop);
    std::shared_ptr<platform::RunLoopObserver> _makeExitObserver();
    void _disconnect();
    ZRExperimentResultRef _buildResult() const;

    std::shared_ptr<ZRKirraImageStream> _stream;
    std::vector<ZRKirraMendraImage> _images;
    std::uint64_t _imagesToCapture = 0;
    std::uint64_t _timeoutInSeconds = 0;
    platform::ErrorRef _asyncError;
    std::weak_ptr<platform::RunLoop> _runLoop;
};

#endif
