#pragma once

#include <string>
#include <string_view>

namespace trelm {
namespace host {

// `text` made safe to write to a terminal: what the service, a plug-in or the user typed can hold
// control characters (an escape sequence can recolour, move or clear the screen, a line feed can
// fake a line of output). Printable ASCII and well-formed UTF-8 characters stay as they are; C0
// and C1 control characters, DEL and bytes that are not part of a well-formed UTF-8 character are
// written as \xNN (line feed, carriage return and tab as \n, \r and \t).
std::string terminalText(std::string_view text);

}  // namespace host
}  // namespace trelm
