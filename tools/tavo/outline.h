#pragma once
// A tree as text for people, and as JSON for programs.

#include "text.h"

#include <TAVO/xml.h>

namespace tool {

// One line per element, indented: name, attributes, text.
void PrintOutline(const TAVO::XML::CPXMLObject& root, Pairs pairs);

// One object per element: "name", and where there are any "attributes" (an object), "text", "children" (an array).
void PrintJson(const TAVO::XML::CPXMLObject& root, Pairs pairs);

} // namespace tool
