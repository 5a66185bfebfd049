#pragma once

#include <string_view>

#include "trelm/Export.h"
#include "trelm/String.h"
#include "trelm/Vector.h"
#include "trelm/uError.h"

namespace trelm {

// A streaming (SAX) XML reader over expat. Subclasses override the three callbacks; runParser
// feeds a whole document through them in document order.
//
// Unless the subclass reads views (useViews() below), the parser keeps the path of the current
// element: "." followed by the names of the open elements joined by "."
// (".photos_upload_response.pid"; "" outside the root). On an element
// start the element is pushed BEFORE start() is called; on an element end it is popped BEFORE
// end() is called, so end("code") of <error_response><code> sees the path ".error_response".
// Names arrive exactly as written (no namespace processing: "xsi:nil" stays "xsi:nil").
// Text of one element may arrive in several chars() calls; append, don't assign.
//
// A callback that returns a failure stops the parse at once and runParser returns that error
// unchanged. Malformed or truncated XML gives kFailure with expat's description and position.
//
// Lifetime: a parser may be run again after a run ends; each run starts with an empty path.
// Thread safety: one parser is used by one thread at a time; distinct parsers are independent.
class TRELM_API XMLParser {
public:
    XMLParser() = default;
    virtual ~XMLParser();
    XMLParser(XMLParser const&) = delete;
    XMLParser& operator=(XMLParser const&) = delete;

    // Parses the whole document `xml` (UTF-8, or the encoding its declaration names).
    uError runParser(String const& xml);

    // The current element path, see above.
    String const& path() const noexcept { return path_; }
    // Number of open elements (0 outside the root, 1 inside the root, ...).
    unsigned depth() const noexcept { return depth_; }

    // True when `attributes` (name, value, name, value, ...) mark the element as nil: an
    // attribute "nil" under any prefix ("xsi:nil") with the value "true" or "1".
    static bool isNil(Vector<String> const& attributes);
    // The same over expat's array of attributes (name, value, ..., null), as startView() gets it.
    static bool isNil(char const* const* attributes);

protected:
    // Whether chars() (or charsView()) is to be called, from now until changed; each run starts
    // with true. A subclass that needs no text inside the element just opened says false in
    // start(), and expat then skips the text instead of delivering it. Outside a run: no effect.
    void setTextWanted(bool wanted);

    // For a subclass that reads names and texts in place, to be called in its constructor: runs
    // then call startView(), endView() and charsView() instead of start(), end() and chars(), and
    // keep no element path (path() stays ""; depth() is kept). This saves a copy of every name
    // and text. The views point into expat's buffers and are valid during the call only;
    // `attributes` is expat's array: name, value, name, value, ..., then null.
    void useViews() noexcept { views_ = true; }
    virtual uError startView(std::string_view name, char const* const* attributes);
    virtual uError endView(std::string_view name);
    virtual uError charsView(std::string_view text);

    // An element opened; `attributes` holds name, value, name, value, ... in document order.
    virtual uError start(String const& name, Vector<String> const& attributes);
    // An element closed.
    virtual uError end(String const& name);
    // Character data (entities and character references already resolved).
    virtual uError chars(String const& text);

private:
    struct Run;
    friend struct Run;

    // Constant after construction.
    bool views_ = false;

    // Valid during a run only.
    String path_;
    unsigned depth_ = 0;
    Run* run_ = nullptr;
};

}  // namespace trelm
