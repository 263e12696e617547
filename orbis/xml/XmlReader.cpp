#include "orbis/xml/XmlReader.h"

#include <expat.h>

#include <algorithm>
#include <exception>
#include <new>

#include "orbis/ParseException.h"
#include "orbis/xml/PendingToken.h"
#include "orbis/xml/TreeBuilder.h"

namespace Orbis::Xml {

namespace {

// Cannot stand in a name, and a namespace that holds one is refused.
constexpr char nameSeparator = '\n';

constexpr std::size_t chunkBytes = 64u << 10;
constexpr std::size_t largestChunkBytes = 256u << 20;

constexpr std::size_t smallestArenaBytes = 1u << 10;
constexpr std::size_t largestFirstArenaBytes = 1u << 20;
constexpr std::size_t treeBytesPerTextByte = 4;

struct FreeParser {
  void operator()(XML_Parser parser) const noexcept { XML_ParserFree(parser); }
};
using ParserHandle = std::unique_ptr<XML_ParserStruct, FreeParser>;

std::string_view OrEmpty(const XML_Char* text) {
  return text != nullptr ? std::string_view(text) : std::string_view();
}

Name NameFrom(const XML_Char* qualified) {
  const std::string_view text(qualified);
  const std::size_t separator = text.find(nameSeparator);
  if (separator == std::string_view::npos) {
    return {{}, text};
  }
  return {text.substr(0, separator), text.substr(separator + 1)};
}

bool IsUtf8(std::string_view encoding) {
  constexpr std::string_view utf8 = "utf-8";
  return std::equal(encoding.begin(), encoding.end(), utf8.begin(), utf8.end(), [](char c, char lower) {
    return c == lower || (c >= 'A' && c <= 'Z' && c + 32 == lower);
  });
}

// One pass of the XML library over one text.
//
// The library is C: nothing may be thrown through it. Every callback runs under Guarded(), which
// keeps the first exception and stops the parser; Feed() throws it again on the outside.
class Parse {
 public:
  Parse(std::string_view text, const Limits& limits, TreeBuilder& builder)
      : _text(text), _limits(limits), _builder(builder) {}

  void Run();

 private:
  void CheckBytes() const;
  void OpenParser();
  void Feed(std::size_t begin, std::size_t end);
  [[noreturn]] void ThrowParserError() const;
  int Line() const { return static_cast<int>(XML_GetCurrentLineNumber(_parser.get())); }

  template <typename Step>
  void Attempt(Step step);
  template <typename Step>
  static void Guarded(void* self, Step step) noexcept;

  static void OnDeclaration(void* self, const XML_Char* version, const XML_Char* encoding, int standalone);
  static void OnDoctype(void* self, const XML_Char* name, const XML_Char*, const XML_Char*, int);
  static void OnInstruction(void* self, const XML_Char* target, const XML_Char* content);
  static void OnNamespace(void* self, const XML_Char* prefix, const XML_Char* uri);
  static void OnStart(void* self, const XML_Char* name, const XML_Char** attributes);
  static void OnEnd(void* self, const XML_Char* name);
  static void OnText(void* self, const XML_Char* text, int size);
  static void OnComment(void* self, const XML_Char* text);
  static void OnCdataStart(void* self);
  static void OnCdataEnd(void* self);

  const std::string_view _text;
  const Limits& _limits;
  TreeBuilder& _builder;
  ParserHandle _parser;
  std::exception_ptr _failure;
};

void Parse::Run() {
  CheckBytes();
  OpenParser();
  PendingToken pending(_limits);
  std::size_t fed = 0;
  std::size_t tokenStart = 0;
  do {
    // Each attempt at an unfinished token starts at its beginning. A chunk as long as what is pending
    // doubles the token each time, so that all attempts together stay linear.
    const std::size_t chunk = std::clamp(fed - tokenStart, chunkBytes, largestChunkBytes);
    const std::size_t end = fed + std::min(chunk, _text.size() - fed);
    Feed(fed, end);
    fed = end;
    if (const XML_Index index = XML_GetCurrentByteIndex(_parser.get()); index >= 0) {
      tokenStart = static_cast<std::size_t>(index);
    }
    if (tokenStart < fed) {
      const std::string_view reason = pending.Examine(_text.substr(0, fed), tokenStart);
      if (!reason.empty()) {
        throw ParseException(_builder.Path(), Line(), std::string(reason));
      }
    }
  } while (fed < _text.size());
}

// What the library would accept or only notice late.
void Parse::CheckBytes() const {
  if (_text.size() > _limits.documentBytes) {
    throw ParseException("/", 0,
                         "the document is longer than " + std::to_string(_limits.documentBytes) + " bytes");
  }
  const std::string_view mark = _text.substr(0, 2);
  if (mark == "\xFE\xFF" || mark == "\xFF\xFE") {
    throw ParseException("/", 0, "the document is UTF-16, not UTF-8");
  }
  if (const std::size_t nul = _text.find('\0'); nul != std::string_view::npos) {
    const auto line = 1 + std::count(_text.begin(), _text.begin() + static_cast<std::ptrdiff_t>(nul), '\n');
    throw ParseException("/", static_cast<int>(line), "the document holds a NUL byte");
  }
}

void Parse::OpenParser() {
  _parser.reset(XML_ParserCreateNS("UTF-8", nameSeparator));
  if (!_parser) {
    throw std::bad_alloc();
  }
  XML_Parser parser = _parser.get();
  XML_SetUserData(parser, this);
  XML_SetParamEntityParsing(parser, XML_PARAM_ENTITY_PARSING_NEVER);
  XML_SetXmlDeclHandler(parser, OnDeclaration);
  XML_SetStartDoctypeDeclHandler(parser, OnDoctype);
  XML_SetProcessingInstructionHandler(parser, OnInstruction);
  XML_SetStartNamespaceDeclHandler(parser, OnNamespace);
  XML_SetElementHandler(parser, OnStart, OnEnd);
  XML_SetCharacterDataHandler(parser, OnText);
  XML_SetCommentHandler(parser, OnComment);
  XML_SetCdataSectionHandler(parser, OnCdataStart, OnCdataEnd);
}

void Parse::Feed(std::size_t begin, std::size_t end) {
  const XML_Status status = XML_Parse(_parser.get(), _text.data() + begin, static_cast<int>(end - begin),
                                      end == _text.size() ? XML_TRUE : XML_FALSE);
  if (_failure) {
    std::rethrow_exception(_failure);
  }
  if (status != XML_STATUS_OK) {
    ThrowParserError();
  }
}

void Parse::ThrowParserError() const {
  const XML_Error error = XML_GetErrorCode(_parser.get());
  if (error == XML_ERROR_NO_MEMORY) {
    throw std::bad_alloc();
  }
  throw ParseException(_builder.Path(), Line(), XML_ErrorString(error));
}

template <typename Step>
void Parse::Attempt(Step step) {
  try {
    step(_builder);
  } catch (const Refusal& refusal) {
    throw ParseException(refusal.Path(), Line(), refusal.what());
  }
}

template <typename Step>
void Parse::Guarded(void* self, Step step) noexcept {
  Parse& parse = *static_cast<Parse*>(self);
  if (parse._failure) {
    return;  // the library still reports the end of an empty element after it was stopped
  }
  try {
    parse.Attempt(step);
  } catch (...) {
    parse._failure = std::current_exception();
    XML_StopParser(parse._parser.get(), XML_FALSE);
  }
}

// The declaration does not change how the text is read, but one that says otherwise is a lie.
void Parse::OnDeclaration(void* self, const XML_Char* version, const XML_Char* encoding, int) {
  Guarded(self, [=](TreeBuilder&) {
    if (OrEmpty(version) != "1.0") {
      throw Refusal("/", "the document is not XML 1.0");
    }
    if (encoding != nullptr && !IsUtf8(encoding)) {
      throw Refusal("/", "the document declares an encoding other than UTF-8");
    }
  });
}

// Called before the first declaration inside, so that no entity is ever defined.
void Parse::OnDoctype(void* self, const XML_Char*, const XML_Char*, const XML_Char*, int) {
  Guarded(self, [](TreeBuilder& builder) { throw Refusal(builder.Path(), "a DOCTYPE is not accepted"); });
}

void Parse::OnInstruction(void* self, const XML_Char*, const XML_Char*) {
  Guarded(self, [](TreeBuilder& builder) {
    throw Refusal(builder.Path(), "a processing instruction is not accepted");
  });
}

void Parse::OnNamespace(void* self, const XML_Char* prefix, const XML_Char* uri) {
  Guarded(self, [=](TreeBuilder& builder) { builder.DeclareNamespace(OrEmpty(prefix), OrEmpty(uri)); });
}

void Parse::OnStart(void* self, const XML_Char* name, const XML_Char** attributes) {
  const auto* parse = static_cast<const Parse*>(self);
  Guarded(self, [=](TreeBuilder& builder) {
    const auto count = static_cast<std::size_t>(XML_GetSpecifiedAttributeCount(parse->_parser.get())) / 2;
    builder.OpenElement(NameFrom(name), count, parse->Line());
    for (const XML_Char** attribute = attributes; *attribute != nullptr; attribute += 2) {
      builder.AddAttribute(NameFrom(attribute[0]), attribute[1]);
    }
  });
}

void Parse::OnEnd(void* self, const XML_Char*) {
  Guarded(self, [](TreeBuilder& builder) { builder.CloseElement(); });
}

void Parse::OnText(void* self, const XML_Char* text, int size) {
  Guarded(self, [=](TreeBuilder& builder) { builder.AddText({text, static_cast<std::size_t>(size)}); });
}

void Parse::OnComment(void* self, const XML_Char* text) {
  Guarded(self, [=](TreeBuilder& builder) { builder.AddComment(text); });
}

void Parse::OnCdataStart(void* self) {
  Guarded(self, [](TreeBuilder& builder) { builder.BeginCdata(); });
}

void Parse::OnCdataEnd(void* self) {
  Guarded(self, [](TreeBuilder& builder) { builder.EndCdata(); });
}

std::size_t FirstArenaBytes(std::size_t textBytes) {
  return std::clamp(std::min(textBytes, largestFirstArenaBytes) * treeBytesPerTextByte, smallestArenaBytes,
                    largestFirstArenaBytes);
}

}  // namespace

struct Document::Store {
  explicit Store(std::size_t textBytes) : arena(FirstArenaBytes(textBytes)) {}

  Arena arena;
  const Element* root = nullptr;
};

Document::Document(std::string_view text, const Limits& limits, Attributes attributes) {
  auto store = std::make_unique<Store>(std::min(text.size(), limits.documentBytes));
  TreeBuilder builder(store->arena, limits, attributes);
  Parse(text, limits, builder).Run();
  store->root = builder.Root();
  _store = std::move(store);
}

Document::~Document() = default;
Document::Document(Document&&) noexcept = default;
Document& Document::operator=(Document&&) noexcept = default;

const Element& Document::Root() const noexcept {
  return *_store->root;
}

}  // namespace Orbis::Xml
