#include "devices/recording/recording.h"

#include <cstddef>
#include <fstream>
#include <iterator>
#include <utility>

#include "devices/recording/coding.h"
#include "platform/text_format.h"

namespace recording {

namespace {

[[noreturn]] void fail(const std::string& name, std::string_view reason) {
    throw RecordingProblem(platform::format("%@: %@", name, reason));
}

std::size_t lengthAt(std::string_view bytes) {
    std::size_t length = 0;
    for (std::size_t at = 0; at < kLengthSize; ++at) {
        length |= std::size_t{static_cast<unsigned char>(bytes[at])} << (8 * at);
    }
    return length;
}

// Takes entries from the front of the bytes.
class EntryStream {
  public:
    EntryStream(std::string_view bytes, const std::string& name) : _bytes(bytes), _name(name) {}

    // The next entry; false when the bytes end before its end does.
    bool next(Entry& entry) {
        const std::string_view rest = _bytes.substr(_at);
        if (rest.size() < kLengthSize) {
            return false;
        }
        const std::size_t length = lengthAt(rest);
        if (length > kLongestEntry) {
            _damaged("an entry is too long");
        }
        if (rest.size() - kLengthSize < length) {
            return false;
        }
        try {
            entry = _decoder.decode(rest.substr(kLengthSize, length));
        } catch (const Damage& damage) {
            _damaged(damage.what());
        }
        _at += kLengthSize + length;
        return true;
    }

    std::size_t at() const { return _at; }
    bool isAtEnd() const { return _at == _bytes.size(); }
    [[noreturn]] void fail(std::string_view what) const {
        recording::fail(_name, platform::format("damaged at byte %lu: %@", _at, what));
    }

  private:
    [[noreturn]] void _damaged(std::string_view what) const { fail(what); }

    const std::string_view _bytes;
    const std::string& _name;
    std::size_t _at = kFileStart.size();
    Decoder _decoder;
};

// "zrlab recording " and a version.
void checkStart(std::string_view bytes, const std::string& name) {
    if (bytes.starts_with(kFileStart)) {
        return;
    }
    const std::string_view kind = kFileStart.substr(0, kFileStart.rfind(' ') + 1);
    if (!bytes.empty() && kFileStart.starts_with(bytes)) {
        fail(name, "the recording is cut before its first entry");
    }
    const std::size_t end = bytes.find('\n');
    if (bytes.starts_with(kind) && end < kind.size() + 10) {
        const std::string_view version = bytes.substr(kind.size(), end - kind.size());
        if (!version.empty() && version.find_first_not_of("0123456789") == std::string_view::npos) {
            fail(name,
                 platform::format("the recording is of version %@, this program reads 1", version));
        }
    }
    fail(name, "not a recording");
}

}  // namespace

std::vector<std::string> Recording::warnings() const {
    std::vector<std::string> lines;
    if (isCut) {
        lines.push_back(platform::format(
            "the recording is cut: it ends at byte %lu, after %lu entries", bytes, entries.size()));
    }
    if (lost.deliveries > 0 || lost.calls > 0) {
        lines.push_back(
            platform::format("the recording has holes: %lu deliveries and %lu calls were lost",
                             lost.deliveries, lost.calls));
    }
    return lines;
}

Recording parseRecording(std::string_view bytes, const std::string& name) {
    checkStart(bytes, name);
    EntryStream stream(bytes, name);
    Recording recording;
    Entry entry;
    if (!stream.next(entry)) {
        fail(name, "the recording is cut before its first entry");
    }
    auto* session = std::get_if<Session>(&entry.content);
    if (session == nullptr) {
        fail(name, "the recording does not begin with its session");
    }
    recording.session = std::move(*session);
    bool hasEnd = false;
    while (!hasEnd && stream.next(entry)) {
        if (const auto* hole = std::get_if<Hole>(&entry.content)) {
            recording.lost.deliveries += hole->deliveries;
            recording.lost.calls += hole->calls;
        }
        hasEnd = std::holds_alternative<End>(entry.content);
        if (!hasEnd) {
            recording.entries.push_back(std::move(entry));
        }
    }
    if (hasEnd && !stream.isAtEnd()) {
        stream.fail("something follows the end");
    }
    recording.isCut = !hasEnd;
    recording.bytes = stream.at();
    return recording;
}

Recording readRecording(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    const std::string bytes{std::istreambuf_iterator<char>(file), {}};
    if (!file) {
        fail(path, "cannot be read");
    }
    return parseRecording(bytes, path);
}

}  // namespace recording
