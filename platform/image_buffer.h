// ImageBuffer: the image of one captured frame with its named attachments.
//
// The capture service makes buffers and lends one to a frame handler for the length of the call; a
// receiver that wants it longer takes a reference of its own. Buffers are scarce (a device has a
// fixed pool), so give a reference back as soon as its attachments have been read. Immutable; the
// last reference may go on any thread.
#ifndef ZR_PLATFORM_IMAGE_BUFFER_H
#define ZR_PLATFORM_IMAGE_BUFFER_H

#include <memory>
#include <string_view>
#include <utility>

#include "platform/value.h"

namespace platform {

class ImageBuffer {
  public:
    explicit ImageBuffer(Dictionary attachments) : _attachments(std::move(attachments)) {}

    // The attachment of that name; a Value that holds nothing when there is none.
    const Value& attachment(std::string_view name) const { return _attachments[name]; }

  private:
    Dictionary _attachments;
};

using ImageBufferRef = std::shared_ptr<const ImageBuffer>;

}  // namespace platform

#endif
