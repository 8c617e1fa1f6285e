// pugixml's tree and expat's events on the XML form. Neither makes values: no number is read, no
// base64 decoded, no date understood.
#include <expat.h>

#include <memory>
#include <pugixml.hpp>

#include "bench/Rows.h"

namespace bench {
namespace {

void readPugixml(benchmark::State& state, const Document& document) {
  for ([[maybe_unused]] auto iteration : state) {
    pugi::xml_document read;
    if (!read.load_buffer(document.xml.data(), document.xml.size()))
      return state.SkipWithError("not read");
    benchmark::DoNotOptimize(read);
  }
}

struct Events {
  std::size_t elements = 0;
  std::size_t characters = 0;
};

void XMLCALL beginElement(void* events, const XML_Char* /*name*/, const XML_Char** /*attributes*/) {
  ++static_cast<Events*>(events)->elements;
}
void XMLCALL endElement(void* /*events*/, const XML_Char* /*name*/) {}
void XMLCALL takeText(void* events, const XML_Char* /*text*/, int size) {
  static_cast<Events*>(events)->characters += static_cast<std::size_t>(size);
}

void readExpat(benchmark::State& state, const Document& document) {
  for ([[maybe_unused]] auto iteration : state) {
    const std::unique_ptr<XML_ParserStruct, void (*)(XML_Parser)> parser(XML_ParserCreate("UTF-8"),
                                                                         XML_ParserFree);
    Events events;
    XML_SetUserData(parser.get(), &events);
    XML_SetElementHandler(parser.get(), beginElement, endElement);
    XML_SetCharacterDataHandler(parser.get(), takeText);
    const int size = static_cast<int>(document.xml.size());
    if (XML_Parse(parser.get(), document.xml.data(), size, 1) != XML_STATUS_OK)
      return state.SkipWithError("not read");
    benchmark::DoNotOptimize(events);
  }
}

}  // namespace

void addXMLPeers() {
  addRows("read XML/pugixml", readPugixml);
  addRows("read XML/expat", readExpat);
}

}  // namespace bench
