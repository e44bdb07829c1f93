// What gofeed sees of a feed. usage: with_gofeed URL
package main

import (
	"encoding/json"
	"os"
	"strconv"

	"github.com/mmcdole/gofeed"
)

type episode struct {
	GUID      string  `json:"guid"`
	Date      int64   `json:"date"`
	Enclosure string  `json:"enclosure"`
	Length    int64   `json:"length"`
	Type      string  `json:"type"`
	Poster    *string `json:"poster"`
}

func main() {
	feed, err := gofeed.NewParser().ParseURL(os.Args[1])
	if err != nil {
		panic(err)
	}
	episodes := []episode{}
	for _, item := range feed.Items {
		enclosure := item.Enclosures[0]
		length, _ := strconv.ParseInt(enclosure.Length, 10, 64)
		seen := episode{item.GUID, item.PublishedParsed.Unix(), enclosure.URL, length, enclosure.Type, nil}
		for _, image := range item.Extensions["orvane"]["image"] {
			href := image.Attrs["href"]
			seen.Poster = &href
		}
		episodes = append(episodes, seen)
	}
	json.NewEncoder(os.Stdout).Encode(map[string]any{"poster": feed.Image.URL, "episodes": episodes})
}
