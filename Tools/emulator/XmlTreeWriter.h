// Builds an answer tree from writer calls, for callers that keep the answer as XmlNode.
#pragma once

#include <vector>

#include "AnswerWriter.h"

namespace emu {

// Appends what is written as children of `root` (which stays the open element until the writer
// is gone). `root` must outlive the writer.
class XmlTreeWriter final : public AnswerWriter {
public:
    explicit XmlTreeWriter(XmlNode& root) : path_{&root} {}

    void open(std::string_view name, bool list) override;
    void close() override { path_.pop_back(); }
    void leaf(std::string_view name, std::string_view text) override;
    void nil(std::string_view name) override;

private:
    // The open elements, `root` first. Only the last one gets children, so the others' addresses
    // stay valid.
    std::vector<XmlNode*> path_;
};

}  // namespace emu
