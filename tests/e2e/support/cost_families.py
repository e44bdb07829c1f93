"""The shapes of documents of which cost.py tells what they cost."""

import base64
import random

from cost import COMPRESSED, RECORDS, Family
from hostile_documents import (array_object, ascii_object, binary_laughs, binary_podcast, chain_of_entities,
                               colliding_names, counted, declaration, dictionary_object, doctype, episodes, feed,
                               laughs, nested, numbered, overlapping_texts, percent_encoded, podcast,
                               repeated)

# The messages of refused documents, of which those of property lists are all the same.
AMPLIFIED = r"Could not load source: limit on input amplification factor \(from DTD and entities\) breached at .+"
TOO_MANY_ENTITIES = r"Could not load source: too many entities made of entities at .+"
TOO_MANY_ATTRIBUTES = r"Could not load source: too many declared attributes at .+"
NO_LIST = r'Could not initialize podcast source with string ".+"\.\n'
OUT_OF_PROPORTION = "Could not load source: a document out of all proportion to its compressed form at .+"
TOO_COMPRESSED = "Could not load source: The body is more than 50 times as large as its compressed form"


def _lists(*families):
    """Families of property lists."""
    return tuple(family._replace(extension=".plist") for family in families)


ITEM = (b"<item><title>Episode #</title><description>" + b"A walk through the town at night. " * 10 +
        b"</description><enclosure url='http://example.com/#.mp3' length='1234567' type='audio/mpeg'/>"
        b"<pubDate>Sat, 07 Sep 2002 00:00:01 GMT</pubDate><guid>http://example.com/#</guid></item>\n")
EPISODE = (b"<dict><key>EpisodeName</key><string>Episode #</string><key>EpisodeDescription</key><string>" +
           b"A walk through the town at night. " * 10 + b"</string><key>EpisodeFileSize</key><integer>1234567"
           b"</integer><key>EpisodeDate</key><date>2002-09-07T00:00:01Z</date></dict>\n")


def _many(part):
    """The part again and again, numbered, in the channel of a feed."""
    return lambda size: feed(numbered(part, size) if b"#" in part else repeated(part, size))


def _long(before, filling, behind):
    return lambda size: feed(before + repeated(filling, size) + behind)


def _nested(opening, closing):
    return lambda size: feed(nested(opening, closing, size))


def _encoded(encoding, content):
    return lambda size: declaration(encoding) + feed(b"<title>" + repeated(content, size) + b"</title>")


def _wide(codec, content):
    return lambda size: feed(b"<title>" + repeated(content, size // 2) + b"</title>").decode().encode(codec)


def _declared(declarations, part):
    """Declarations of half the size, and the part as often."""
    return lambda size: feed(repeated(part, size // 2), doctype(declarations(size // 2)))


# Numbers of objects and offsets in binary lists of more than a few.
_WIDE = {"offset_size": 4, "reference_size": 4}


def _binary_episodes(count):
    name, description, size = 3, 4, 5
    names = range(6, 6 + 2 * count, 2)
    keys = [ascii_object(b"EpisodeName"), ascii_object(b"EpisodeDescription"), ascii_object(b"EpisodeFileSize")]
    objects = [part for number in names for part in (
        dictionary_object({name: number + 1, description: number + 1, size: 6 + 2 * count}, 4),
        ascii_object(b"Episode %d of a walk through the town at night. " % number * 8))]
    return binary_podcast(b"Episodes", array_object(names, 4), *keys, *objects, b"\x12\x00\x12\xd6\x87", **_WIDE)


FEEDS = (
    Family("ordinary episodes", _many(ITEM)),
    Family("ordinary episodes, to a feed", _many(ITEM), command="createfeed"),

    Family("one long text", _long(b"<title>", b"t", b"</title>")),
    Family("one long text of references", _long(b"<title>", b"&amp;", b"</title>")),
    Family("one long text of numbered references", _long(b"<title>", b"&#65;", b"</title>")),
    Family("one long text in many CDATA sections", _long(b"<title>", b"<![CDATA[]]>", b"</title>")),
    Family("one long text cut by comments", _long(b"<title>", b"t<!---->", b"</title>")),
    Family("one long text of line ends", _long(b"<title>", b"\r\n", b"</title>")),
    Family("one long CDATA section", _long(b"<title><![CDATA[", b"t", b"]]></title>")),
    Family("one long attribute", _long(b"<item><enclosure url='", b"u", b"'/></item>")),
    Family("one long attribute of references", _long(b"<item><enclosure url='", b"&lt;", b"'/></item>")),
    Family("one long comment", _long(b"<!--", b"- ", b"-->")),
    Family("one long instruction", _long(b"<?p ", b"? ", b"?>")),
    Family("one long element name", _long(b"<", b"n", b"/>")),
    Family("one long attribute name", _long(b"<a ", b"n", b"=''/>")),
    Family("one long date", _long(b"<pubDate>", b"1 ", b"</pubDate>")),
    Family("one long zone", _long(b"<pubDate>1 Jan 2000 00:00 +", b"1", b"</pubDate>")),
    Family("one long number", _long(b"<item><enclosure length='", b"1", b"'/></item>")),
    Family("one long link", _long(b"<link>", b"collection/uuid", b"</link>")),
    Family("one long label", _long(b"<explicit>", b"Y", b"</explicit>")),
    Family("white space before the root", lambda size: feed(b"", repeated(b" \n", size))),
    Family("one long name of an encoding", lambda size: declaration("k" * size) + feed(b""),
           message="Could not load source: unknown encoding .{90,100}"),

    Family("elements in elements", _nested(b"<a>", b"</a>")),
    Family("elements in elements never closed", lambda size: b"<rss>" + repeated(b"<a>", size), 64,
           message="Could not load source: no element found at .+"),
    Family("items in items", _nested(b"<item>", b"</item>"), RECORDS),
    Family("images in images", _nested(b"<image>", b"</image>")),
    Family("links in links", _nested(b"<link>", b"</link>")),

    Family("empty items", _many(b"<item/>"), RECORDS),
    Family("empty items, to a feed", _many(b"<item/>"), RECORDS, "createfeed"),
    Family("items of one guid", _many(b"<item><guid>g</guid><qel:uuid>u</qel:uuid></item>"), 64),
    Family("items of many fields", _many(
        b"<item><title/><author/><description/><keywords/><orvane:category text=''/><orvane:image href=''/>"
        b"<enclosure url='' type=''/><qel:uuid/></item>")),
    Family("items of many fields, to a feed", _many(
        b"<item><title>t</title><author/><description/><keywords/><enclosure url='' type=''/></item>"),
           64, "createfeed"),
    Family("titles", _many(b"<title>t</title>")),
    Family("links with markers", _many(b"<link>document/uuid/collection/uuid/</link>")),
    Family("categories", _many(b"<orvane:category text='c'/>")),
    Family("enclosures", _many(b"<enclosure url='u' length='1' type='t'/>")),
    Family("texts that no element empties", _many(b"<a>text</a><qel:order>1</qel:order>")),
    Family("distinct element names", _many(b"<e#/>"), outgrows_caches=True),
    Family("distinct attribute names", _many(b"<e a#=''/>"), outgrows_caches=True),
    Family("attributes of one element", lambda size: feed(b"<e " + numbered(b"a#='' ", size) + b"/>"),
           outgrows_caches=True),
    Family("namespaces of one element", lambda size: feed(b"<e " + numbered(b"xmlns:n#='u' ", size) + b"/>"),
           outgrows_caches=True),
    Family("undeclared prefixes", _many(b"<p#:e/>"), outgrows_caches=True),
    Family("comments", _many(b"<!---->")),
    Family("instructions", _many(b"<?p?>")),

    Family("dates in distinct zones", _many(b"<item><pubDate>1 Sep 2002 00:00 +#</pubDate></item>")),
    Family("dates in unknown zones", _many(b"<item><pubDate>1 Sep 2002 00:00 Z#</pubDate></item>")),
    Family("dates of far years, to a feed", _many(b"<item><pubDate>1 Sep # 00:00 EST</pubDate></item>"),
           command="createfeed"),
    Family("dates of far days, to a feed", _many(b"<item><pubDate>#000000 Sep 2000 00:00 EST</pubDate></item>"),
           command="createfeed"),

    Family("ISO-8859-1 that grows in UTF-8", _encoded("ISO-8859-1", b"\xe9")),
    Family("Shift_JIS", _encoded("Shift_JIS", b"\x93\xfa")),
    Family("GB18030 that is none", _encoded("GB18030", b"\xff")),
    Family("UTF-7", _encoded("UTF-7", b"+2D3eAA-")),
    Family("UTF-16", _wide("utf-16", b"t")),
    Family("UTF-32", _wide("utf-32", b"t")),
    Family("UTF-16 of lone surrogates", lambda size: b"\xff\xfe" + feed(b"<title>\1</title>").decode().encode(
        "utf-16-le").replace(b"\1\0", repeated(b"\x00\xd8", size))),

    Family("declarations of entities", _declared(lambda size: numbered(b"<!ENTITY e# 'x'>", size), b"t"),
           outgrows_caches=True),
    Family("declarations of elements", _declared(lambda size: numbered(b"<!ELEMENT e# ANY>", size), b"t")),
    Family("declarations of notations", _declared(lambda size: numbered(b"<!NOTATION n# SYSTEM 's'>", size), b"t")),
    Family("a declaration of groups in groups", _declared(
        lambda size: b"<!ELEMENT a (" + nested(b"(", b")", size).replace(b"()", b"(b)") + b")>", b"t")),
    Family("declarations of external entities", _declared(
        lambda size: numbered(b"<!ENTITY e# SYSTEM 'file:///nowhere'>", size), b"t"), outgrows_caches=True),
    Family("references to an entity", _declared(lambda size: b"<!ENTITY e 't'>", b"<title>&e;</title>")),
    Family("references to an entity of elements", _declared(lambda size: b"<!ENTITY e '<item/><item/>'>", b"&e;"),
           RECORDS, message=AMPLIFIED),
    Family("references to an empty entity", _declared(lambda size: b"<!ENTITY e ''>", b"&e;")),
    Family("references to an entity of comments", _declared(
        lambda size: b"<!ENTITY e '<!--" + b"c" * 80 + b"-->'>", b"&e;"), message=AMPLIFIED),
    Family("a long entity, referred to often", _declared(
        lambda size: b"<!ENTITY e '" + repeated(b"x", size) + b"'>", b"&e;"), message=AMPLIFIED),
    Family("entities of ten entities", lambda size: feed(
        b"<title>" + repeated(b"&e11;", size) + b"</title>", doctype(laughs(11))), message=AMPLIFIED),
    Family("entities in entities", lambda size: feed(
        b"<title>&e;</title>", doctype(chain_of_entities(size))), message=TOO_MANY_ENTITIES),
    Family("declared attributes", _declared(
        lambda size: numbered(b"<!ATTLIST e a# CDATA ''>", size), b"<e/>"), message=TOO_MANY_ATTRIBUTES),
    Family("256 declared attributes of each element", _declared(
        lambda size: b"".join(b"<!ATTLIST e a%d CDATA #IMPLIED>" % number for number in range(256)), b"<e/>")),
    Family("a long attribute by default, often", _declared(
        lambda size: b"<!ATTLIST enclosure url CDATA '" + repeated(b"u", size) + b"'>",
        b"<item><enclosure/></item>"), RECORDS, message=AMPLIFIED),

    Family("a text that is escaped, to a feed", _long(b"<description>", b">", b"</description>"),
           command="createfeed"),
    Family("an attribute that is escaped, to a feed", _long(b"<item><enclosure url='", b'"', b"'/></item>"),
           command="createfeed"),
    Family("a path that is encoded, to a feed", _long(b"<item><enclosure url='/", "ä".encode(), b"'/></item>"),
           command="createfeed"),

    Family("media of one name, to a bundle", _many(b"<item><enclosure url='/nowhere/a.mp3'/></item>"),
           command="createbundle"),
    Family("media of distinct names, to a bundle", _many(b"<item><enclosure url='/nowhere/#.mp3'/></item>"),
           command="createbundle"),
    Family("media of names of one hash, to a bundle", lambda size: feed(b"".join(
        b"<item><enclosure url='file:///%s.mp3'/></item>" % percent_encoded(name)
        for name in colliding_names(max(0, (size // 800).bit_length())))), command="createbundle"),
    Family("media of no location, to a bundle", _many(b"<item/>"), RECORDS, "createbundle"),
    Family("media of one long name, to a bundle", _long(b"<item><enclosure url='/", b"a", b".mp3'/></item>"),
           command="createbundle"),
    Family("media of one long URL, to a bundle", _long(b"<item><enclosure url='http:/", b"/..", b"'/></item>"),
           command="createbundle"),
)

LISTS = _lists(
    Family("ordinary episodes in a list", lambda size: episodes(numbered(EPISODE, size))),
    Family("ordinary episodes in a list, to a feed", lambda size: episodes(numbered(EPISODE, size)),
           command="createfeed"),
    Family("episodes that are none", lambda size: episodes(repeated(b"<true/>", size)), RECORDS),
    Family("episodes of nothing", lambda size: episodes(repeated(b"<dict/>", size)), RECORDS),
    Family("episodes of nothing, to a feed", lambda size: episodes(repeated(b"<dict/>", size)), RECORDS,
           "createfeed"),
    Family("episodes of a letter", lambda size: episodes(repeated(
        b"<dict><key>EpisodeName</key><string>n</string></dict>", size))),
    Family("distinct keys", lambda size: podcast(numbered(b"<key>#</key><true/>", size))),
    Family("distinct keys of one beginning", lambda size: podcast(numbered(
        b"<key>" + b"k" * 1000 + b"#</key><true/>", size))),
    Family("one key", lambda size: podcast(repeated(b"<key>k</key><true/>", size))),
    Family("allowed types", lambda size: podcast(
        b"<key>AllowedPosterTypes</key><array>" + repeated(b"<string>png</string>", size) + b"</array>")),
    Family("lists in lists", lambda size: podcast(b"<key>k</key>" + nested(b"<array>", b"</array>", size)),
           message=NO_LIST),
    Family("dictionaries in dictionaries", lambda size: podcast(
        b"<key>k</key>" + repeated(b"<dict><key>k</key>", size)), message=NO_LIST),
    Family("one long string", lambda size: podcast(
        b"<key>PodcastName</key><string>" + b"s" * size + b"</string>")),
    Family("one long key", lambda size: podcast(b"<key>" + b"k" * size + b"</key><true/>")),
    Family("one long integer", lambda size: podcast(b"<key>k</key><integer>" + b"1" * size + b"</integer>"),
           message=NO_LIST),
    Family("one long real", lambda size: podcast(b"<key>k</key><real>0." + b"1" * size + b"</real>")),
    Family("long data", lambda size: podcast(b"<key>k</key><data>" + repeated(b"QUJD", size) + b"</data>")),
    Family("one unknown element", lambda size: podcast(b"<key>k</key><" + b"e" * size + b"/>"), message=NO_LIST),
    Family("references to an entity in a list", lambda size: b"<!DOCTYPE plist [<!ENTITY e 'eeee'>]>" + podcast(
        b"<key>PodcastName</key><string>" + repeated(b"&e;", size) + b"</string>")),
    Family("entities of ten entities in a list", lambda size: b"<!DOCTYPE plist [" + laughs(11) + b"]>" + podcast(
        b"<key>PodcastName</key><string>" + repeated(b"&e11;", size) + b"</string>"), message=NO_LIST),

    Family("binary: ordinary episodes", lambda size: _binary_episodes(size // 400)),
    Family("binary: unused objects", lambda size: binary_podcast(
        b"PodcastName", ascii_object(b"n"), *[b"\x09"] * (size // 5), **_WIDE)),
    Family("binary: episodes of nothing", lambda size: binary_podcast(
        b"Episodes", array_object(range(3, 3 + size // 9), 4), *[b"\xd0"] * (size // 9), **_WIDE), RECORDS),
    Family("binary: one episode, shared", lambda size: binary_podcast(
        b"Episodes", array_object(b"\3" * size), b"\xd0"), RECORDS, message=NO_LIST),
    Family("binary: one long name, shared", lambda size: binary_podcast(
        b"Episodes", array_object(b"\3" * (size // 2)), dictionary_object({4: 5}), ascii_object(b"EpisodeName"),
        ascii_object(b"n" * (size // 2)), offset_size=4), RECORDS, message=NO_LIST),
    Family("binary: lists of two lists", lambda size: binary_laughs(60, bytes(size)), RECORDS, message=NO_LIST),
    Family("binary: overlapping texts", overlapping_texts, RECORDS, message=NO_LIST),
    Family("binary: lists in lists", lambda size: binary_podcast(
        b"k", *(array_object([number], 4) for number in range(3, 3 + size // 10)), b"\x09", **_WIDE),
           message=NO_LIST),
    Family("binary: one long text", lambda size: binary_podcast(
        b"PodcastName", ascii_object(b"n" * size))),
    Family("binary: ASCII that is none", lambda size: binary_podcast(
        b"PodcastName", ascii_object(b"\xff" * size))),
    Family("binary: lone surrogates", lambda size: binary_podcast(
        b"PodcastName", counted(0x6, size // 2) + b"\xd8\x00" * (size // 2))),
    Family("binary: long data", lambda size: binary_podcast(b"PodcastName", counted(0x4, size) + bytes(size))),
    Family("binary: allowed types", lambda size: binary_podcast(
        b"AllowedPosterTypes", array_object(range(3, 3 + size // 12), 4), *[b"\x53png"] * (size // 12), **_WIDE),
           64),
)

def _shared(fields, count_of):
    """Episodes that share one, whose fields are shared, too; and data, so that the size is what it is."""
    def make(size):
        keys = range(4, 4 + 2 * len(fields), 2)
        objects = [ascii_object(part) for field in fields.items() for part in field]
        return binary_podcast(b"Episodes", array_object(b"\3" * count_of(size)),
                              dictionary_object({key: key + 1 for key in keys}), *objects,
                              counted(0x4, size) + bytes(size), offset_size=4)
    return make


def _described(text, count_of):
    return _shared({b"EpisodeDescription": text}, count_of)


_PATH = b"/" + b" " * 10_000  # each of which becomes three bytes

# Paths count for less than they take, so that room for a feed is to be made for all that stands beside them, too.
_BESIDE_PATHS = tuple(Family(f"binary: paths and {key.decode()}, shared, to a feed", _shared(
    {b"EpisodeReference": _PATH, b"EpisodePosterReference": _PATH, key: text}, lambda size: size // 1250), RECORDS,
                             "createfeed") for key, text in (
    (b"EpisodeAuthor", b"t" * 2000), (b"EpisodeKeywords", b"t" * 2000), (b"EpisodeCategory", b"t" * 2000),
    (b"EpisodeUUID", b"t" * 2000), (b"EpisodeType", b"t" * 2000), (b"EpisodeName", b"&" * 400),
    (b"EpisodeDescription", b"&" * 400)))

# With what is given, some 6 MB and 40 bytes for each, three in four of these texts are written.
INTO_FEEDS = _lists(
    Family("binary: ordinary episodes, to a feed", lambda size: _binary_episodes(size // 400), command="createfeed"),
    Family("binary: one text, shared, to a feed", _described(b"t" * 10_000, lambda size: size // 700), RECORDS,
           "createfeed"),
    Family("binary: one author, shared, to a feed", _shared(
        {b"EpisodeAuthor": b"t" * 10_000}, lambda size: size // 520), RECORDS, "createfeed"),
    Family("binary: one text of markup, shared, to a feed", _described(b"&" * 10_000, lambda size: size // 6000),
           RECORDS, "createfeed"),
    Family("binary: one text of markup, shared too often, to a feed", _described(
        b"&" * 10_000, lambda size: size // 10), RECORDS, "createfeed", NO_LIST),
    Family("binary: one long text of markup, to a feed", lambda size: binary_podcast(
        b"PodcastDescription", ascii_object(b"&" * size)), command="createfeed"),
    Family("binary: distinct episodes of one letter, to a feed", lambda size: binary_podcast(
        b"Episodes", array_object(range(5, 5 + size // 18), 4), ascii_object(b"EpisodeName"), ascii_object(b"n"),
        *[dictionary_object({3: 4}, 4)] * (size // 18), **_WIDE), RECORDS, "createfeed"),
    *_BESIDE_PATHS,
)


def _proportioned(ratio, make):
    """The documents, behind a comment that makes them so many times as large as their compressed form."""
    def padded(size):
        document = make(size)
        noise = random.Random(size).randbytes(len(document) // ratio)
        return b"<!--" + base64.b64encode(noise) + b"-->" + document
    return padded


COMPRESSIONS = tuple(family._replace(is_served=True, memory=COMPRESSED) for family in (
    Family("compressed: ordinary episodes", _proportioned(25, _many(ITEM))),
    Family("compressed: ordinary episodes, to a feed", _proportioned(25, _many(ITEM)), command="createfeed"),
    Family("compressed: empty items", _many(b"<item/>"), message=f"{TOO_COMPRESSED}|{OUT_OF_PROPORTION}"),
    Family("compressed 40 times: empty items", _proportioned(40, _many(b"<item/>")), message=OUT_OF_PROPORTION),
    Family("compressed 6 times: empty items", _proportioned(6, _many(b"<item/>"))),
    Family("compressed 30 times: elements never closed", _proportioned(
        30, lambda size: b"<rss>" + repeated(b"<a>", size)), message=OUT_OF_PROPORTION),
    Family("compressed 15 times: one text of markup, to a feed", _proportioned(
        15, _long(b"<item><description><![CDATA[", b"&", b"]]></description></item>")), command="createfeed"),
    Family("compressed 40 times: one long text, to a feed", _proportioned(
        40, _long(b"<item><description>", b"t", b"</description></item>")), command="createfeed"),
))


def _host(content):
    return b"<item><enclosure url='http://a" + content.encode() + b".example/a.mp3'/></item>"


_MARKS, _SYLLABLE = "\u0301\u0316", "\u1100\u1161\u11a8"
# All of them are refused: a run that asks for them would measure the network.
HOSTS = tuple(family._replace(command="createbundle") for family in (
    Family("one long host of combining marks, to a bundle", lambda size: feed(_host(_MARKS * (size // 4)))),
    Family("one long host of Hangul, to a bundle", lambda size: feed(_host(_SYLLABLE * (size // 9)))),
    Family("one long host of dots, to a bundle", lambda size: feed(_host("é." * (size // 3)))),
    Family("one long host of soft hyphens, to a bundle", lambda size: feed(_host("\u00ad" * (size // 2) + "/"))),
    Family("hosts of combining marks, to a bundle", _many(_host(_MARKS * 240))),
    Family("hosts of Hangul, to a bundle", _many(_host(_SYLLABLE * 110))),
    Family("hosts of dots, to a bundle", _many(_host("é." * 330))),
))

NAMES = (
    Family("references to distinct entities", lambda size: feed(
        b"<title>" + numbered(b"&e#;", size // 3) + b"</title>", doctype(numbered(b"<!ENTITY e# 'x'>", size))),
           outgrows_caches=True),
    Family("one long label of sigmas", _long(b"<explicit>", "Σ\u0301".encode(), b"</explicit>")),
    Family("media of names that are encoded, to a bundle", _many(
        b"<item><enclosure url='file:///nowhere/%e9#%cc%81.mp3'/></item>"), command="createbundle"),
    *_lists(
        Family("types of sigmas, to a bundle", lambda size: podcast(
            b"<key>AllowedEpisodeTypes</key><array/><key>Episodes</key><array><dict><key>EpisodeReference</key>"
            b"<string>a." + repeated("Σ\u0301".encode(), size) + b"</string></dict></array>"),
               command="createbundle"),
        Family("types that are allowed, none of them one of as many media, to a bundle", lambda size: podcast(
            b"<key>AllowedEpisodeTypes</key><array>" + numbered(b"<string>#</string>", size // 2) +
            b"</array><key>Episodes</key><array>" +
            repeated(b"<dict><key>EpisodeReference</key><string>a.mp3</string></dict>", size // 2) + b"</array>"),
               command="createbundle", outgrows_caches=True),
        Family("media of distinct names in a list, to a bundle", lambda size: episodes(numbered(
            b"<dict><key>EpisodeReference</key><string>/nowhere/#.mp3</string></dict>", size)),
               command="createbundle")),
)

FAMILIES = FEEDS + LISTS + INTO_FEEDS + COMPRESSIONS + HOSTS + NAMES

# What the parser is given in several pieces.
LARGE = tuple(family for family in FEEDS if family.name in (
    "ordinary episodes", "one long text", "one long attribute", "one long comment", "one long element name"))
