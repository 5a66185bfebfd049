#include "trelm/XMLParser.h"

#include <expat.h>

#include <climits>
#include <cstring>
#include <string>
#include <vector>

namespace trelm {

// State of one runParser call; expat's user data points here.
struct XMLParser::Run {
    explicit Run(XMLParser& p) : owner(p) {}

    XMLParser& owner;
    XML_Parser expat = nullptr;
    // The first failure of a callback; once set, later callbacks are ignored (expat may still
    // deliver a few events after XML_StopParser).
    uError error;
    bool stopped = false;
    // Path length before each open element, to pop in O(1).
    std::vector<unsigned> marks;

    void fail(uError const& e) {
        error = e;
        stopped = true;
        XML_StopParser(expat, XML_FALSE);
    }

    // Reused from event to event, so that a name or text that does not fit a short string
    // allocates once per run rather than once per event.
    String name;
    String text;
    Vector<String> attributes;

    static void XMLCALL onStart(void* user, XML_Char const* name, XML_Char const** atts) {
        auto* run = static_cast<Run*>(user);
        if (run->stopped) return;
        XMLParser& p = run->owner;
        run->attributes.clear();
        for (XML_Char const** a = atts; *a != nullptr; ++a) {
            uError e = run->attributes.pushBack(String(*a));
            if (e.failed()) return run->fail(e);
        }
        run->name.assign(name, static_cast<unsigned>(std::strlen(name)));
        run->marks.push_back(p.path_.size());
        p.path_ += '.';
        p.path_ += run->name;
        ++p.depth_;
        uError e = p.start(run->name, run->attributes);
        if (e.failed()) run->fail(e);
    }

    static void XMLCALL onEnd(void* user, XML_Char const* name) {
        auto* run = static_cast<Run*>(user);
        if (run->stopped) return;
        XMLParser& p = run->owner;
        if (!run->marks.empty()) {
            p.path_.erase(run->marks.back());
            run->marks.pop_back();
            --p.depth_;
        }
        run->name.assign(name, static_cast<unsigned>(std::strlen(name)));
        uError e = p.end(run->name);
        if (e.failed()) run->fail(e);
    }

    static void XMLCALL onChars(void* user, XML_Char const* text, int len) {
        auto* run = static_cast<Run*>(user);
        if (run->stopped || len <= 0) return;
        run->text.assign(text, static_cast<unsigned>(len));
        uError e = run->owner.chars(run->text);
        if (e.failed()) run->fail(e);
    }
};

XMLParser::~XMLParser() = default;

uError XMLParser::runParser(String const& xml) {
    path_ = String();
    depth_ = 0;

    Run run(*this);
    run.expat = XML_ParserCreate(nullptr);
    if (run.expat == nullptr) return TRELM_ERROR_MSG(kResource, "cannot create an XML parser");
    XML_SetUserData(run.expat, &run);
    XML_SetElementHandler(run.expat, &Run::onStart, &Run::onEnd);
    XML_SetCharacterDataHandler(run.expat, &Run::onChars);

    // XML_Parse takes an int length, so a very large document goes in slices.
    constexpr std::size_t kSlice = std::size_t(1) << 30;
    char const* data = xml.cStr();
    std::size_t left = xml.size();
    XML_Status status = XML_STATUS_OK;
    do {
        std::size_t n = left < kSlice ? left : kSlice;
        left -= n;
        status = XML_Parse(run.expat, data, static_cast<int>(n), left == 0 ? XML_TRUE : XML_FALSE);
        data += n;
    } while (status == XML_STATUS_OK && left > 0);

    uError result;
    if (run.stopped) {
        result = run.error;
    } else if (status != XML_STATUS_OK) {
        std::string text = "XML error at line " + std::to_string(XML_GetCurrentLineNumber(run.expat)) + ", column " +
                           std::to_string(XML_GetCurrentColumnNumber(run.expat)) + ": " +
                           XML_ErrorString(XML_GetErrorCode(run.expat));
        result = TRELM_ERROR_MSG(kFailure, String(text));
    } else {
        result = TRELM_OK();
    }
    XML_ParserFree(run.expat);
    path_ = String();
    depth_ = 0;
    return result;
}

bool XMLParser::isNil(Vector<String> const& attributes) {
    for (unsigned i = 0; i + 1 < attributes.size(); i += 2) {
        std::string const& name = attributes[i].str();
        std::size_t colon = name.rfind(':');
        std::string local = colon == std::string::npos ? name : name.substr(colon + 1);
        if (local == "nil" && (attributes[i + 1] == "true" || attributes[i + 1] == "1")) return true;
    }
    return false;
}

uError XMLParser::start(String const&, Vector<String> const&) { return TRELM_OK(); }
uError XMLParser::end(String const&) { return TRELM_OK(); }
uError XMLParser::chars(String const&) { return TRELM_OK(); }

}  // namespace trelm
