// What feedsmith sees of a feed. usage: node with_feedsmith.cjs MODULES URL
const [modules, url] = process.argv.slice(2)
const { parseFeed } = require(`${modules}/feedsmith`)

fetch(url).then((answer) => answer.text()).then((text) => {
  const { feed } = parseFeed(text)
  const episodes = feed.items.map((item) => ({
    guid: item.guid.value,
    date: Date.parse(item.pubDate) / 1000,
    enclosure: item.enclosures[0].url,
    length: item.enclosures[0].length,
    type: item.enclosures[0].type,
  }))
  console.log(JSON.stringify({ poster: feed.image.url, episodes }))
})
