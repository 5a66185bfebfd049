#include "trelm/XMLParser.h"

#include <expat.h>

#include <climits>
#include <cstring>
#include <string>
#include <string_view>
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
    // Whether expat delivers character data (setTextWanted).
    bool textWanted = true;
    // Per open element: the path's length before it, to pop in O(1); with views, the length of
    // its name.
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
        if (!run->attributes.empty()) run->attributes.clear();
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
            // The closing name is the path's last one (expat refuses a mismatched end tag).
            unsigned const mark = run->marks.back();
            run->name.assign(p.path_.cStr() + mark + 1, p.path_.size() - mark - 1);
            p.path_.erase(mark);
            run->marks.pop_back();
            --p.depth_;
        } else {
            run->name.assign(name, static_cast<unsigned>(std::strlen(name)));
        }
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

    // The same events for a subclass that reads views (useViews()): no copies and no path.
    static void XMLCALL onStartView(void* user, XML_Char const* name, XML_Char const** atts) {
        auto* run = static_cast<Run*>(user);
        if (run->stopped) return;
        XMLParser& p = run->owner;
        std::size_t const length = std::strlen(name);
        run->marks.push_back(static_cast<unsigned>(length));
        ++p.depth_;
        uError e = p.startView(std::string_view(name, length), atts);
        if (e.failed()) run->fail(e);
    }

    static void XMLCALL onEndView(void* user, XML_Char const* name) {
        auto* run = static_cast<Run*>(user);
        if (run->stopped) return;
        XMLParser& p = run->owner;
        std::size_t length = 0;
        if (run->marks.empty()) {
            length = std::strlen(name);
        } else {
            // The closing name is the one that opened (expat refuses a mismatched end tag).
            length = run->marks.back();
            run->marks.pop_back();
            --p.depth_;
        }
        uError e = p.endView(std::string_view(name, length));
        if (e.failed()) run->fail(e);
    }

    static void XMLCALL onCharsView(void* user, XML_Char const* text, int len) {
        auto* run = static_cast<Run*>(user);
        if (run->stopped || len <= 0) return;
        uError e = run->owner.charsView(std::string_view(text, static_cast<std::size_t>(len)));
        if (e.failed()) run->fail(e);
    }

    XML_CharacterDataHandler charsHandler() const { return owner.views_ ? &onCharsView : &onChars; }
};

XMLParser::~XMLParser() = default;

uError XMLParser::runParser(String const& xml) {
    path_ = String();
    depth_ = 0;

    Run run(*this);
    run.expat = XML_ParserCreate(nullptr);
    if (run.expat == nullptr) return TRELM_ERROR_MSG(kResource, "cannot create an XML parser");
    XML_SetUserData(run.expat, &run);
    if (views_) {
        XML_SetElementHandler(run.expat, &Run::onStartView, &Run::onEndView);
    } else {
        XML_SetElementHandler(run.expat, &Run::onStart, &Run::onEnd);
    }
    XML_SetCharacterDataHandler(run.expat, run.charsHandler());
    run_ = &run;

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
    run_ = nullptr;
    path_ = String();
    depth_ = 0;
    return result;
}

void XMLParser::setTextWanted(bool wanted) {
    if (run_ == nullptr || run_->textWanted == wanted) return;
    XML_SetCharacterDataHandler(run_->expat, wanted ? run_->charsHandler() : nullptr);
    run_->textWanted = wanted;
}

namespace {

// A "nil" attribute under any prefix whose value is "true" or "1".
bool isNilAttribute(std::string_view name, std::string_view value) {
    std::size_t const colon = name.rfind(':');
    std::string_view const local = colon == std::string_view::npos ? name : name.substr(colon + 1);
    return local == "nil" && (value == "true" || value == "1");
}

}  // namespace

bool XMLParser::isNil(Vector<String> const& attributes) {
    for (unsigned i = 0; i + 1 < attributes.size(); i += 2) {
        if (isNilAttribute(attributes[i].view(), attributes[i + 1].view())) return true;
    }
    return false;
}

bool XMLParser::isNil(char const* const* attributes) {
    for (char const* const* a = attributes; a[0] != nullptr && a[1] != nullptr; a += 2) {
        if (isNilAttribute(a[0], a[1])) return true;
    }
    return false;
}

uError XMLParser::startView(std::string_view, char const* const*) { return TRELM_OK(); }
uError XMLParser::endView(std::string_view) { return TRELM_OK(); }
uError XMLParser::charsView(std::string_view) { return TRELM_OK(); }

uError XMLParser::start(String const&, Vector<String> const&) { return TRELM_OK(); }
uError XMLParser::end(String const&) { return TRELM_OK(); }
uError XMLParser::chars(String const&) { return TRELM_OK(); }

}  // namespace trelm
