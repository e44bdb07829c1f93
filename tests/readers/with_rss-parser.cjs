// What rss-parser sees of a feed. usage: node with_rss-parser.cjs MODULES URL
const [modules, url] = process.argv.slice(2)
const Parser = require(`${modules}/rss-parser`)

new Parser({ customFields: { item: [['orvane:image', 'image']] } }).parseURL(url).then((feed) => {
  const episodes = feed.items.map((item) => ({
    guid: item.guid,
    date: Date.parse(item.isoDate) / 1000,
    enclosure: item.enclosure.url,
    length: Number(item.enclosure.length),
    type: item.enclosure.type,
    poster: item.image ? item.image.$.href : null,
  }))
  console.log(JSON.stringify({ poster: feed.image.url, episodes }))
})
