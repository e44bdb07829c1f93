<?xml version="1.0" encoding="UTF-8"?>
<!-- What parsefeed does, as a stylesheet: a rival for those who have xsltproc. Dates stay as they are. -->
<xsl:stylesheet version="1.0" xmlns:xsl="http://www.w3.org/1999/XSL/Transform"
  xmlns:orvane="https://orvane.example/ns/podcast-1.0" exclude-result-prefixes="orvane">
  <xsl:output method="xml" encoding="UTF-8" indent="yes"
    doctype-public="-//Apple//DTD PLIST 1.0//EN" doctype-system="http://www.apple.com/DTDs/PropertyList-1.0.dtd"/>

  <xsl:template match="/rss/channel">
    <plist version="1.0">
      <dict>
        <key>Episodes</key>
        <array><xsl:apply-templates select="item"/></array>
        <xsl:call-template name="text"><xsl:with-param name="key" select="'PodcastAuthor'"/>
          <xsl:with-param name="value" select="orvane:author"/></xsl:call-template>
        <xsl:call-template name="text"><xsl:with-param name="key" select="'PodcastDescription'"/>
          <xsl:with-param name="value" select="description"/></xsl:call-template>
        <xsl:call-template name="text"><xsl:with-param name="key" select="'PodcastName'"/>
          <xsl:with-param name="value" select="title"/></xsl:call-template>
      </dict>
    </plist>
  </xsl:template>

  <xsl:template match="item">
    <dict>
      <xsl:call-template name="text"><xsl:with-param name="key" select="'EpisodeAuthor'"/>
        <xsl:with-param name="value" select="orvane:author"/></xsl:call-template>
      <xsl:call-template name="text"><xsl:with-param name="key" select="'EpisodeDate'"/>
        <xsl:with-param name="value" select="pubDate"/></xsl:call-template>
      <xsl:call-template name="text"><xsl:with-param name="key" select="'EpisodeDescription'"/>
        <xsl:with-param name="value" select="description"/></xsl:call-template>
      <xsl:call-template name="text"><xsl:with-param name="key" select="'EpisodeKeywords'"/>
        <xsl:with-param name="value" select="orvane:keywords"/></xsl:call-template>
      <xsl:call-template name="text"><xsl:with-param name="key" select="'EpisodeName'"/>
        <xsl:with-param name="value" select="title"/></xsl:call-template>
      <xsl:call-template name="text"><xsl:with-param name="key" select="'EpisodePosterReference'"/>
        <xsl:with-param name="value" select="orvane:image/@href"/></xsl:call-template>
      <xsl:call-template name="text"><xsl:with-param name="key" select="'EpisodeReference'"/>
        <xsl:with-param name="value" select="enclosure/@url"/></xsl:call-template>
      <xsl:call-template name="text"><xsl:with-param name="key" select="'EpisodeType'"/>
        <xsl:with-param name="value" select="enclosure/@type"/></xsl:call-template>
    </dict>
  </xsl:template>

  <xsl:template name="text">
    <xsl:param name="key"/>
    <xsl:param name="value"/>
    <key><xsl:value-of select="$key"/></key>
    <string><xsl:value-of select="$value"/></string>
  </xsl:template>
</xsl:stylesheet>
