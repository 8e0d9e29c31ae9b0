<xsl:stylesheet version="1.0"  xmlns:xsl="http://www.w3.org/1999/XSL/Transform">
  <xsl:output omit-xml-declaration="yes" indent="yes"/>
  <xsl:template match="/*">
    <html>
      <style>
        *            {font-family: Arial}
        .tableHeader {background-color: #004B94; color: white}
        .llWarn      {background-color: #FF7B00}
        .llError     {background-color: #FF0000}
        .llFatal     {background-color: #AF0000}
      </style>
      <body>
        <div>
          Logdate: <xsl:value-of select="./@timeStamp"/><br/>
          UserName: <xsl:value-of select="./@userName"/><br/>
          Computer: <xsl:value-of select="./@computer"/><br/>
        </div>
        <br/>
        <table width="100%" border="1" cellspacing="0">
          <tr class="tableHeader" align="left">
            <th>Timestamp</th>
            <th>Thread</th>
            <th>Logger</th>
            <th>Message</th>
          </tr>
          <xsl:apply-templates select="item"/>
        </table>
      </body>
    </html>
  </xsl:template>

  <xsl:template match="item">
    <xsl:choose>
      <xsl:when test="./logLevel=4">
        <tr class="llWarn"><xsl:apply-templates select="./*"/></tr>
      </xsl:when>
      <xsl:when test="./logLevel=5">
        <tr class="llError"><xsl:apply-templates select="./*"/></tr>
      </xsl:when>
      <xsl:when test="./logLevel=6">
        <tr class="llFatal"><xsl:apply-templates select="./*"/></tr>
      </xsl:when>
      <xsl:otherwise>
        <tr><xsl:apply-templates select="./*"/></tr>
      </xsl:otherwise>
    </xsl:choose>
  </xsl:template>

  <xsl:template match="timeStamp">
    <td><xsl:value-of select="."/></td>
  </xsl:template>

  <xsl:template match="threadID">
    <td><xsl:value-of select="."/></td>
  </xsl:template>

  <xsl:template match="loggerName">
    <td><xsl:value-of select="."/></td>
  </xsl:template>

  <xsl:template match="logLevel">
  </xsl:template>

  <xsl:template match="logIndent">
  </xsl:template>

  <xsl:template match="logMessage">
    <td><xsl:value-of select="."/></td>
  </xsl:template>

</xsl:stylesheet>
