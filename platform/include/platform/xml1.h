/// Base services: an event-driven XML push parser.
///
/// Names, attribute values and text are handed over in the code page of the process's default
/// locale, 0-terminated except for character data, which has a length. What that code page lacks
/// becomes "?". A document with neither a byte order mark nor an XML declaration is read in that
/// code page too, so that what was written in it comes back as it was. A parser belongs to one
/// thread at a time. Entities that expand out of all proportion are an error.
#pragma once

/// A parser; owned by the facility.
struct XML1_PARSER;

extern "C" {

/// `atts` holds name and value by turns and ends in a null pointer. All texts live until the
/// handler returns.
using XML1_StartHandler = void (*)(void* userData, const char* name, const char** atts);
using XML1_EndHandler = void (*)(void* userData, const char* name);
using XML1_DataHandler = void (*)(void* userData, const char* text, int length);

/// Makes a parser; `encoding` null means that the document says which encoding it is in. Null when
/// memory is short. Freed with XML1_ParserFree.
XML1_PARSER* XML1_ParserCreate(const char* encoding);

void XML1_SetElementHandler(XML1_PARSER* parser, XML1_StartHandler start, XML1_EndHandler end);
void XML1_SetCharacterDataHandler(XML1_PARSER* parser, XML1_DataHandler handler);

/// The pointer that every handler gets as its first argument.
void XML1_SetUserData(XML1_PARSER* parser, void* userData);

/// A buffer of at least `length` bytes for the next piece of input, owned by the parser and valid
/// until the next call. For 0 bytes there is one too. Null when memory is short, when `length` is
/// negative, and after the last piece.
void* XML1_GetBuffer(XML1_PARSER* parser, int length);

/// Parses `length` bytes of the buffer from XML1_GetBuffer; `isFinal` is non-zero for the last
/// piece. A piece of 0 bytes needs no buffer. Returns 1 on success, 0 after an error; after an
/// error or the last piece every further call returns 0. A document without an element is an error.
/// One that ends while elements are open is none: whoever handles the events knows which have not
/// been closed.
int XML1_ParseBuffer(XML1_PARSER* parser, int length, int isFinal);

/// What was wrong with the last call; 0 when nothing was.
int XML1_GetErrorCode(XML1_PARSER* parser);

/// A constant text for an error code, or null for a code that has none. The texts belong to this
/// interface: they do not depend on which XML library stands behind it, nor on its version.
const char* XML1_ErrorString(int code);

/// Where the last event or error stands; lines count from 1, columns from 0.
int XML1_GetCurrentLineNumber(XML1_PARSER* parser);
int XML1_GetCurrentColumnNumber(XML1_PARSER* parser);

/// Frees a parser; null is ignored.
void XML1_ParserFree(XML1_PARSER* parser);

}  // extern "C"
