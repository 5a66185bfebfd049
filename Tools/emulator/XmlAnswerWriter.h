// An answer as the service's XML document.
#pragma once

#include <string>
#include <vector>

#include "AnswerWriter.h"

namespace emu {

// `<?xml version="1.0" encoding="UTF-8"?>`, a line break, the root element with the service's
// namespaces, a line break. An element without children or text is written `<name/>`. Texts are
// cleaned and escaped by Utf8Text, so the document is well-formed whatever they hold.
class XmlAnswerWriter final : public AnswerWriter {
public:
    // `sizeHint`: about how many bytes the document will take.
    explicit XmlAnswerWriter(std::size_t sizeHint = 0);

    void open(std::string_view name, bool list) override;
    void close() override;
    void leaf(std::string_view name, std::string_view text) override;
    void nil(std::string_view name) override;

    // The document. REQUIRES: the root is closed. The writer is empty afterwards.
    std::string take();

private:
    void startTag(std::string_view name);
    void endPendingTag();

    std::string out_;
    std::vector<std::string> open_;  // names of the open elements, root first
    std::size_t depth_ = 0;          // open_[0, depth_) are in use; the rest keep their buffers
    bool pending_ = false;           // the last start tag still lacks its '>'
    bool rootWritten_ = false;
};

}  // namespace emu
