// Parses a feed with feedsmith, into its records, and writes how many items it has.
// usage: node with_feedsmith.cjs MODULES FEED OUTPUT, with the directory that npm has installed feedsmith into
const fs = require('fs')

const [modules, feed, output] = process.argv.slice(2)
const { parseFeed } = require(`${modules}/feedsmith`)
const parsed = parseFeed(fs.readFileSync(feed, 'utf8'))
fs.writeFileSync(output, `${parsed.feed.items.length}\n`)
