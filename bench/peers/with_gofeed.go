// Parses a feed with gofeed, into its records, and writes how many items it has.
//
// usage: with_gofeed FEED OUTPUT
package main

import (
	"fmt"
	"os"

	"github.com/mmcdole/gofeed"
)

func count(feed, output string) error {
	file, err := os.Open(feed)
	if err != nil {
		return err
	}
	defer file.Close()
	parsed, err := gofeed.NewParser().Parse(file)
	if err != nil {
		return err
	}
	return os.WriteFile(output, []byte(fmt.Sprintln(len(parsed.Items))), 0o666)
}

func main() {
	if err := count(os.Args[1], os.Args[2]); err != nil {
		fmt.Fprintln(os.Stderr, err)
		os.Exit(1)
	}
}
