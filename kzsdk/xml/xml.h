/**
 * @file
 * Tag trees in memory and their text.
 *
 * A tag has a name, data or none, an ordered list of attributes and an ordered list of sub-tags.
 * Trees are made by calls only; nothing here reads XML.
 *
 * Texts. Every text that goes into a tree is copied. Texts and tags that come out of a tree are the
 * tree's: never free them; they last until the tag or attribute they come from is changed or
 * disposed of. A text handed to a function may come from the same tree.
 *
 * Str and Buf. A Buf function takes a pointer and a count of bytes, its Str twin a NUL-terminated
 * text; a null text counts as length 0. A text is empty when its pointer is null, its count is 0 or
 * its first byte is NUL; an attribute's value is empty only for null or a count of 0. Names are
 * never empty; data set to an empty text is no data. Counted bytes with a NUL among them are stored
 * whole, but whatever reads the stored text sees it end at the NUL.
 *
 * Names match when all their bytes do; case counts. A tag without a name (CreateEmptyXMLTag()) is
 * skipped by every look-up. Indexes are positions in a list, from 0.
 *
 * Names are not checked and not escaped when rendered: a name from outside that holds a `<` writes
 * mark-up. Data and values are escaped, but control bytes and bytes above 127 go out as they are.
 *
 * A tag is in one place of one tree. Callers must not add a tag to two parents, twice to one, to
 * itself or below itself: walks would be endless, and memory would be freed twice.
 *
 * Depth costs no stack: a tree may be as deep as memory allows. A walk takes 16 bytes or less of
 * memory for each level below the 32nd, in doubling blocks; disposing takes none.
 *
 * Costs. Sub-tags and attributes are linked lists, so in a list of n
 *
 *   - disposing of, cloning, mutating, copying, comparing and rendering visit each tag once (a copy
 *     of a tag with n attributes takes n squared steps for these);
 *   - counting, finding by name, index or path, adding, removing and setting an attribute take up
 *     to n steps each. Building n sub-tags with AddXMLSubTag(), or going through them by index,
 *     takes n squared: go on with GetXMLSiblingTag(), which takes one.
 *
 * Status codes: KZ_XML_ERROR_MEMORY, KZ_XML_ERROR_NOT_FOUND and KZ_XML_ERROR_INVALID_ARGUMENT. A
 * function that returns a pointer returns null for every failure. All memory comes from the
 * library's allocator, so trees live between start-up and shut-down.
 *
 * Threads: one tree belongs to one thread at a time; several may read it while none changes it.
 */
#ifndef KZSDK_XML_XML_H
#define KZSDK_XML_XML_H

#include "kzsdk/abs/base.h"
#include "kzsdk/abs/status.h"

KZ_C_BEGIN

/** An attribute of a tag. */
typedef struct XMLAttr {
    char* name;           /**< owned */
    char* value;          /**< owned */
    struct XMLAttr* next; /**< the tag's next attribute */
} XMLAttr;

/** A tag. All fields are cleared when the record is made. */
typedef struct XMLTag {
    char* name;                  /**< owned; null only after CreateEmptyXMLTag() or a failure */
    char* data;                  /**< owned; null: no data */
    XMLAttr* attributes;         /**< owned; first of the list, in the order of setting */
    struct XMLTag* sub_tags;     /**< owned; first of the list, in the order of adding */
    struct XMLTag* next_sibling; /**< next under the same parent, whose list owns it */
} XMLTag;

/* ---- Making, copying and disposing ---------------------------------------------------------- */

/** Makes an empty tag, without even a name. The caller disposes of it. */
KZ_API XMLTag* CreateEmptyXMLTag(void) KZ_NOEXCEPT;

/**
 * Makes a tag.
 *
 * @param name  Not empty, else the result is null.
 * @param data  Empty: a tag without data.
 * @return The tag, which the caller disposes of or hands to a parent; null on failure.
 */
KZ_API XMLTag* CreateXMLTagFromBuf(const char* name, uint32_t name_count, const char* data,
                                   uint32_t data_count) KZ_NOEXCEPT;

/** Str twin of CreateXMLTagFromBuf(). */
KZ_API XMLTag* CreateXMLTagFromStr(const char* name, const char* data) KZ_NOEXCEPT;

/**
 * Copies a tag: name, data and attributes, and with @p deep the whole tree below it.
 *
 * An attribute whose value is stored empty (see SetXMLTagAttrFromBuf()) is not in the copy. A
 * missing name stays missing. Time grows with the tags, and per tag with the square of its
 * attributes.
 *
 * @param deep  1: with all sub-tags; any other value: without.
 * @return The copy, without siblings, the caller's; null for null or on any failure, with nothing
 *         left behind.
 */
KZ_API XMLTag* CloneXMLTag(const XMLTag* tag, uint8_t deep) KZ_NOEXCEPT;

/**
 * Replaces a tag's name, data, attributes and sub-tags by copies of another's. Its place among its
 * siblings stays. Copying a tag onto itself does nothing. Either may lie below the other: the copy
 * is of @p source as it was before the call.
 *
 * @return 0; KZ_XML_ERROR_INVALID_ARGUMENT when a tag is null, or an attribute of the source has no
 *         name; KZ_XML_ERROR_MEMORY when memory is short. A failure leaves @p destination a valid
 *         tag, half copied: without name and data when those failed (its attributes and sub-tags as
 *         before), else with the attributes copied so far (its sub-tags as before), else with the
 *         sub-tags copied so far.
 */
KZ_API kz_status CopyXMLTag(XMLTag* destination, const XMLTag* source) KZ_NOEXCEPT;

/**
 * Frees a tag and all below it. Does not take it out of its parent: RemoveXMLSubTag() does. Null is
 * allowed. While the memory manager is off nothing is freed or changed.
 *
 * @return 0.
 */
KZ_API kz_status DisposeXMLTag(XMLTag* tag) KZ_NOEXCEPT;

/**
 * DisposeXMLTag() for the tag in a variable, which becomes null. Null, and a variable that holds
 * null, are allowed.
 *
 * @return 0.
 */
KZ_API kz_status SmartDisposeXMLTag(XMLTag** tag) KZ_NOEXCEPT;

/* ---- Attributes ----------------------------------------------------------------------------- */

/** Number of attributes; 0 for null. */
KZ_API uint32_t GetXMLTagAttrCount(const XMLTag* tag) KZ_NOEXCEPT;

/** Name of an attribute by its index; null when there is none. */
KZ_API const char* GetXMLTagAttrName(const XMLTag* tag, uint32_t index) KZ_NOEXCEPT;

/** Value of an attribute by its index; null when there is none. */
KZ_API const char* GetXMLTagAttrValue(const XMLTag* tag, uint32_t index) KZ_NOEXCEPT;

/** Value of the first attribute of a name; null when there is none or the name is empty. */
KZ_API const char* GetXMLTagAttrFromBuf(const XMLTag* tag, const char* name,
                                        uint32_t count) KZ_NOEXCEPT;

/** Str twin of GetXMLTagAttrFromBuf(). */
KZ_API const char* GetXMLTagAttrFromStr(const XMLTag* tag, const char* name) KZ_NOEXCEPT;

/**
 * Sets an attribute: it becomes the last of the list, also when the tag had it before. An empty
 * value removes the attribute instead. Either way every attribute of this name goes, should there
 * be several (names with a NUL inside, which are read up to it, can make doubles).
 *
 * A value whose count is not 0 but whose first byte is NUL is stored and reads as an empty text;
 * CloneXMLTag() and CopyXMLTag() drop such an attribute.
 *
 * @return 0, also when there was nothing to remove; KZ_XML_ERROR_INVALID_ARGUMENT when the tag is
 *         null or the name empty; KZ_XML_ERROR_MEMORY when memory is short. A failure changes
 *         nothing.
 */
KZ_API kz_status SetXMLTagAttrFromBuf(XMLTag* tag, const char* name, uint32_t name_count,
                                      const char* value, uint32_t value_count) KZ_NOEXCEPT;

/** Str twin of SetXMLTagAttrFromBuf(). */
KZ_API kz_status SetXMLTagAttrFromStr(XMLTag* tag, const char* name, const char* value) KZ_NOEXCEPT;

/** SetXMLTagAttrFromStr() with a number in decimal. */
KZ_API kz_status SetXMLTagAttrFromInt(XMLTag* tag, const char* name, int32_t value) KZ_NOEXCEPT;

/** SetXMLTagAttrFromStr() with a number in decimal. */
KZ_API kz_status SetXMLTagAttrFromUInt(XMLTag* tag, const char* name, uint32_t value) KZ_NOEXCEPT;

/* ---- Sub-tags ------------------------------------------------------------------------------- */

/** Number of sub-tags; 0 for null. */
KZ_API uint32_t GetXMLSubTagCount(const XMLTag* tag) KZ_NOEXCEPT;

/** Number of sub-tags of a name; 0 when the tag or the name is null. */
KZ_API uint32_t GetXMLNamedSubTagCount(const XMLTag* tag, const char* name) KZ_NOEXCEPT;

/** A sub-tag by its index; null when there is none. */
KZ_API XMLTag* GetXMLSubTag(const XMLTag* tag, uint32_t index) KZ_NOEXCEPT;

/** The next tag under the same parent; null when there is none, or for null. */
KZ_API XMLTag* GetXMLSiblingTag(const XMLTag* tag) KZ_NOEXCEPT;

/** The first sub-tag of a name; null when there is none or the name is empty. */
KZ_API XMLTag* GetXMLSubTagFromBuf(const XMLTag* tag, const char* name, uint32_t count) KZ_NOEXCEPT;

/** Str twin of GetXMLSubTagFromBuf(). */
KZ_API XMLTag* GetXMLSubTagFromStr(const XMLTag* tag, const char* name) KZ_NOEXCEPT;

/** What a cursor of GetXMLSubTagFromStrEx() holds before the first call. */
#define KZ_XML_CURSOR_START UINTPTR_MAX

/**
 * Goes through all sub-tags of a name, one with each call.
 *
 * @param name            Not empty, and the same in each call.
 * @param[in,out] cursor  Where the search goes on. KZ_XML_CURSOR_START before the first call
 *                        (0xFFFFFFFF means the same everywhere); 0 once there is none left. Between
 *                        calls it holds the address of a tag: add, remove and dispose of nothing
 *                        under @p tag until the walk is over, and put in no other number.
 * @return The next sub-tag of that name; null when there is none left. Null too, with the cursor as
 *         it was, when a pointer is null or the name empty.
 */
KZ_API XMLTag* GetXMLSubTagFromStrEx(const XMLTag* tag, const char* name,
                                     uintptr_t* cursor) KZ_NOEXCEPT;

/**
 * Appends a tag to a parent's sub-tags. The parent owns it from then on. Tags that follow @p child
 * as its siblings come along with it. Null arguments do nothing.
 *
 * The end of the list is searched for each time: the cost grows with the number of sub-tags.
 *
 * @return 0.
 */
KZ_API kz_status AddXMLSubTag(XMLTag* parent, XMLTag* child) KZ_NOEXCEPT;

/**
 * Removes a tag from its parent's sub-tags. Null arguments, and a tag that is not among them, do
 * nothing.
 *
 * @param dispose  Not 0: the tag is disposed of; 0: it becomes the caller's.
 * @return 0.
 */
KZ_API kz_status RemoveXMLSubTag(XMLTag* parent, XMLTag* child, uint8_t dispose) KZ_NOEXCEPT;

/* ---- Name and data -------------------------------------------------------------------------- */

/** Data of a tag; null when it has none, or for null. */
KZ_API const char* GetXMLTagData(const XMLTag* tag) KZ_NOEXCEPT;

/** Name of a tag; null when it has none, or for null. */
KZ_API const char* GetXMLTagName(const XMLTag* tag) KZ_NOEXCEPT;

/**
 * Sets a tag's data; empty data leaves it without.
 *
 * @return 0; KZ_XML_ERROR_INVALID_ARGUMENT for a null tag; KZ_XML_ERROR_MEMORY when memory is
 *         short: the old data is gone then.
 */
KZ_API kz_status SetXMLTagDataFromBuf(XMLTag* tag, const char* data, uint32_t count) KZ_NOEXCEPT;

/** Str twin of SetXMLTagDataFromBuf(). */
KZ_API kz_status SetXMLTagDataFromStr(XMLTag* tag, const char* data) KZ_NOEXCEPT;

/**
 * Sets a tag's name.
 *
 * @return 0; KZ_XML_ERROR_INVALID_ARGUMENT for a null tag or an empty name (the old name stays);
 *         KZ_XML_ERROR_MEMORY when memory is short: the tag has no name then.
 */
KZ_API kz_status SetXMLTagNameFromBuf(XMLTag* tag, const char* name, uint32_t count) KZ_NOEXCEPT;

/** Str twin of SetXMLTagNameFromBuf(). */
KZ_API kz_status SetXMLTagNameFromStr(XMLTag* tag, const char* name) KZ_NOEXCEPT;

/* ---- Paths ------------------------------------------------------------------------------------
 *
 * A path is a text of segments with "/" between them. The five functions differ:
 *
 *                            the path begins with    a leading "/"        the last segment names
 *   GetXMLSubTagFromPath     a sub-tag of the tag    matches nothing      a sub-tag
 *   GetXMLSubTagData         a sub-tag of the tag    matches nothing      a sub-tag
 *   SetXMLSubTagDataFromStr  a sub-tag of the tag    is refused           a sub-tag
 *   XMLGetDataAtPath         the tag's own name      any number skipped   attribute or sub-tag
 *   XMLSetValueAtPath        a sub-tag of the tag    one skipped          what the resolver decides
 */

/**
 * Finds a tag by its path. A null or empty path finds @p tag itself; one "/" at the end does not
 * count.
 *
 * @return The tag; null when a segment matches nothing, as an empty one always does.
 */
KZ_API XMLTag* GetXMLSubTagFromPath(XMLTag* tag, const char* path) KZ_NOEXCEPT;

/**
 * Data of a tag by its path. A null or empty path gives the tag's own; one "/" at the end does not
 * count.
 *
 * @return The data; null when there is no such tag or it has no data.
 */
KZ_API const char* GetXMLSubTagData(const XMLTag* tag, const char* path) KZ_NOEXCEPT;

/**
 * Sets the data of a tag by its path.
 *
 * @param path    Not empty, with no "/" at its beginning or end and no two in a row.
 * @param create  0: every tag of the path must be there; else those that are missing are made.
 * @return 0; KZ_XML_ERROR_INVALID_ARGUMENT for a null tag or a bad path; KZ_XML_ERROR_NOT_FOUND
 *         when a tag is missing; KZ_XML_ERROR_MEMORY when memory is short. Tags made on the way
 *         stay after a failure, also when a bad place of the path comes only after them.
 */
KZ_API kz_status SetXMLSubTagDataFromStr(XMLTag* tag, const char* path, const char* data,
                                         uint8_t create) KZ_NOEXCEPT;

/** SetXMLSubTagDataFromStr() with a number in decimal. */
KZ_API kz_status SetXMLSubTagDataFromUInt(XMLTag* tag, const char* path, uint32_t value,
                                          uint8_t create) KZ_NOEXCEPT;

/**
 * Value or data by a path whose first segment is the tag's own name. The last segment names an
 * attribute or else a sub-tag: an attribute wins over a sub-tag of the same name. One "/" at the
 * end does not count.
 *
 * @return The value or data; null when there is none.
 */
KZ_API const char* XMLGetDataAtPath(const XMLTag* tag, const char* path) KZ_NOEXCEPT;

/** What a resolver makes of a segment. */
enum {
    KZ_XML_KIND_ELEMENT = 2,  /**< a sub-tag */
    KZ_XML_KIND_ATTRIBUTE = 3 /**< an attribute of the current tag */
};

/**
 * Decides what a segment of a path means. Called by XMLSetValueAtPath() once for each segment.
 *
 * @param tag        The tag that the segment is looked up in.
 * @param segment    First byte of the segment's name, inside the path and not NUL-terminated. Null
 *                   with a length of 0 where the path ends behind a leading "/".
 * @param length     Bytes in the name, without a "+".
 * @param context    The caller's word.
 * @param[out] name  Takes the name to use, NUL-terminated; read before the next call only.
 * @param[out] kind  1 on entry; takes KZ_XML_KIND_ELEMENT or KZ_XML_KIND_ATTRIBUTE.
 * @return 0 to refuse the segment, else anything.
 */
typedef int32_t (*XMLPathResolver)(XMLTag* tag, const char* segment, uint32_t length,
                                   uintptr_t context, const char** name, uint32_t* kind);

/**
 * Sets a value by a path, making elements on the way. The resolver decides what each segment means.
 *
 * A segment is an optional "/", a name of ASCII letters, digits and "_", an optional "+", and an
 * optional "/". An element that is missing is made; with "+" a further one of that name is made
 * even if there is one. An attribute may only come last. So two "/" in a row are accepted, three
 * are not.
 *
 * @param path     Not empty.
 * @param value    The value of the attribute, or data of the element, that the path ends in; empty:
 *                 none.
 * @param context  Any word but 0, handed to the resolver.
 * @return 1 when the value is set. 0 when a pointer that is needed is null, the context is 0, the
 *         path is malformed, the resolver refuses a segment or memory is short: what was made
 *         before stays.
 */
KZ_API int32_t XMLSetValueAtPath(XMLTag* tag, const char* path, const char* value,
                                 uintptr_t context, XMLPathResolver resolver) KZ_NOEXCEPT;

/* ---- Comparing and mapping ------------------------------------------------------------------ */

/**
 * Compares two trees: name, data, attributes in their order, and sub-tags in
 * their order, all the way down. What is missing (a name, data) equals only what is missing too.
 * The siblings of the two tags do not count.
 *
 * @return 1 when they are equal, or both null; else 0. 0 also when memory for the way back up runs
 *         out, which can happen only with more than 32 levels that are equal so far.
 */
KZ_API uint32_t EqualXMLTags(const XMLTag* a, const XMLTag* b) KZ_NOEXCEPT;

/*
 * Three maps decide what CloneAndMutateXMLTag() makes of a tree. They are settings of the process:
 * the last one installed applies to every caller. The first ones, which change nothing, cannot be
 * restored; install functions that return their argument instead. Install maps before any thread
 * clones.
 *
 * What a map returns is read, copied and never freed: one of its arguments, or a text of its own.
 * That text has to last until the tag or attribute is made, so the maps for an attribute's name and
 * its value need a buffer each if they have any.
 */

/**
 * Gives a tag its name in the copy.
 *
 * @param tag_name  Null for a tag without a name.
 * @return The name; null or an empty text refuses the tag with all below it.
 */
typedef const char* (*XMLMapTagName)(const char* tag_name);

/**
 * Gives an attribute its name in the copy.
 *
 * @param tag_name  That of the copy.
 * @return The name; null drops the attribute; an empty text fails the tag.
 */
typedef const char* (*XMLMapAttrName)(const char* tag_name, const char* attr_name);

/**
 * Gives an attribute its value in the copy.
 *
 * @param tag_name   That of the copy.
 * @param attr_name  That in the copy.
 * @return The value; null or an empty text sets none.
 */
typedef const char* (*XMLMapAttrValue)(const char* tag_name, const char* attr_name,
                                       const char* value);

/**
 * Copies a tag through the three maps.
 *
 * Attributes are set one by one, in order: of two that get the same name the later stays, at the
 * end of the list, and if that has no value, neither stays.
 *
 * A sub-tag that is refused, or for which memory is short, is left out with all below it and does
 * not fail the copy. So a copy that is there may be incomplete: CloneXMLTag() fails as a whole.
 *
 * @param deep  1: with all sub-tags; any other value: without.
 * @return The copy, without siblings, the caller's. Null for null, when the tag itself is refused,
 *         when an attribute of it gets an empty name, or when memory is short for it.
 */
KZ_API XMLTag* CloneAndMutateXMLTag(const XMLTag* tag, uint8_t deep) KZ_NOEXCEPT;

/** Installs a map for the process. Null is ignored. @return 0. */
KZ_API kz_status SetMapXMLTagName(XMLMapTagName function) KZ_NOEXCEPT;

/** Installs a map for the process. Null is ignored. @return 0. */
KZ_API kz_status SetMapXMLAttrName(XMLMapAttrName function) KZ_NOEXCEPT;

/** Installs a map for the process. Null is ignored. @return 0. */
KZ_API kz_status SetMapXMLAttrValue(XMLMapAttrValue function) KZ_NOEXCEPT;

/* ---- Rendering ------------------------------------------------------------------------------ */

/**
 * Renders a tag and all below it as text.
 *
 * Every element has a start tag and an end tag; attributes stand in double quotes, in list order. A
 * tag with data and no sub-tags takes one line; with sub-tags its data comes first, on a line of
 * its own, and so gains white space with @p indent or @p newlines on. In data and values `<`, `>`,
 * `&`, `'` and `"` are written as entities.
 *
 * With @p indent on, a failure inside an element (memory, or a sub-tag without a name) is forgotten
 * when the element's own end tag is indented: the text is then malformed but not null. Where that
 * matters, check the text, or render without indentation: then every failure gives null.
 *
 * Indentation stops at level 32767: deeper levels count on from -32768, and levels up to 0 are not
 * indented.
 *
 * @param header    Not 0: begins with `<?xml version="1.0" encoding="UTF-8" ?>`. The encoding is
 *                  declared, not checked: bytes go out as they are.
 * @param indent    Not 0: two spaces for each level at the beginning of a line.
 * @param newlines  Not 0: a new line behind the declaration, the start tag of an element with
 *                  sub-tags, the data of such an element, and each end tag.
 * @return The text, NUL-terminated, which the caller frees with _kzmem_free(); null for null or on
 *         failure.
 */
KZ_API char* RenderXMLTagToStrEx(const XMLTag* tag, uint8_t header, uint8_t indent,
                                 uint8_t newlines) KZ_NOEXCEPT;

/** RenderXMLTagToStrEx() with indentation and new lines. */
KZ_API char* RenderXMLTagToStr(const XMLTag* tag, uint8_t header) KZ_NOEXCEPT;

KZ_C_END

#endif
