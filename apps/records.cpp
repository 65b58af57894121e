// `vxogc records URL [--start N] [--post] [--all]`: pages of a catalogue's service records
// as a table (identifier, type, title, online resources).
#include <unistd.h>

#include <algorithm>
#include <iostream>
#include <stdexcept>
#include <vector>

#include "commands.h"
#include "ogc/cswservice.h"
#include "ogc/ogcservice.h"
#include "vx/stringutils.h"
#include "vx/xmlutilities.h"

namespace {

struct Record {
    std::string identifier, type, title;
    std::vector<std::string> links;
};

struct Page {
    long long matched = -1, returned = 0, next = 0;
    std::vector<Record> records;
};

void registerNamespaces(NamespaceStack& ns) {
    ns.registerPrefix("http://www.opengis.net/cat/csw/2.0.2", "csw");
    ns.registerPrefix("http://www.isotc211.org/2005/gmd", "gmd");
    ns.registerPrefix("http://www.isotc211.org/2005/gco", "gco");
    ns.registerPrefix("http://www.isotc211.org/2005/srv", "srv");
    ns.registerPrefix("http://purl.org/dc/elements/1.1/", "dc");
    ns.registerPrefix("http://purl.org/dc/terms/", "dct");
}

// First descendant (depth first, document order) with the given name.
const TiXmlElement* findDescendant(const NamespaceStack& ns, const TiXmlElement* e, const std::string& name) {
    for (const TiXmlElement* c = e->FirstChildElement(); c; c = c->NextSiblingElement()) {
        if (ns.elementName(c) == name) return c;
        if (const TiXmlElement* d = findDescendant(ns, c, name)) return d;
    }
    return nullptr;
}

void collectDescendants(const NamespaceStack& ns, const TiXmlElement* e, const std::string& name,
                        std::vector<const TiXmlElement*>& out) {
    for (const TiXmlElement* c = e->FirstChildElement(); c; c = c->NextSiblingElement()) {
        if (ns.elementName(c) == name) out.push_back(c);
        collectDescendants(ns, c, name, out);
    }
}

// Text of the element at a path of child names below e; empty when absent.
std::string pathText(const NamespaceStack& ns, const TiXmlElement* e, std::initializer_list<const char*> path) {
    for (const char* step : path) {
        if (!e) return std::string();
        e = ns.findChild(e, step);
    }
    return vxElementText(e).trimmed().str();
}

Record isoRecord(const NamespaceStack& ns, const TiXmlElement* md) {
    Record r;
    r.identifier = pathText(ns, md, {"gmd.fileIdentifier", "gco.CharacterString"});
    if (const TiXmlElement* scope = findDescendant(ns, md, "gmd.MD_ScopeCode")) {
        const char* v = scope->Attribute("codeListValue");
        r.type = v && *v ? v : vxElementText(scope).trimmed().str();
    }
    if (const TiXmlElement* info = ns.findChild(md, "gmd.identificationInfo"))
        if (const TiXmlElement* cit = findDescendant(ns, info, "gmd.CI_Citation"))
            r.title = pathText(ns, cit, {"gmd.title", "gco.CharacterString"});
    std::vector<const TiXmlElement*> resources;
    collectDescendants(ns, md, "gmd.CI_OnlineResource", resources);
    for (const TiXmlElement* res : resources) {
        const std::string url = pathText(ns, res, {"gmd.linkage", "gmd.URL"});
        if (!url.empty()) r.links.push_back(url);
    }
    return r;
}

Record dcRecord(const NamespaceStack& ns, const TiXmlElement* rec) {
    Record r;
    for (const TiXmlElement* c = rec->FirstChildElement(); c; c = c->NextSiblingElement()) {
        const std::string n = ns.elementName(c);
        const std::string t = vxElementText(c).trimmed().str();
        if (n == "dc.identifier" && r.identifier.empty()) r.identifier = t;
        else if (n == "dc.title" && r.title.empty()) r.title = t;
        else if (n == "dc.type" && r.type.empty()) r.type = t;
        else if ((n == "dct.references" || n == "dc.URI") && !t.empty()) r.links.push_back(t);
    }
    return r;
}

Page readPage(const TiXmlDocument& doc) {
    Page page;
    NamespaceStack ns;
    registerNamespaces(ns);
    const TiXmlElement* root = doc.RootElement();
    const TiXmlElement* results = root ? findDescendant(ns, root, "csw.SearchResults") : nullptr;
    if (!results) throw std::runtime_error("the answer holds no search results");
    auto number = [&](const char* name) -> long long {
        const char* v = results->Attribute(name);
        return v ? VxStringUtils::atoi64(v) : -1;
    };
    page.matched = number("numberOfRecordsMatched");
    page.returned = number("numberOfRecordsReturned");
    page.next = number("nextRecord");
    for (const TiXmlElement* c = results->FirstChildElement(); c; c = c->NextSiblingElement()) {
        const std::string n = ns.elementName(c);
        if (n == "gmd.MD_Metadata") page.records.push_back(isoRecord(ns, c));
        else if (n == "csw.Record" || n == "csw.SummaryRecord" || n == "csw.BriefRecord")
            page.records.push_back(dcRecord(ns, c));
    }
    return page;
}

std::string clip(const std::string& s, size_t width) {
    return s.size() <= width ? s : s.substr(0, width - 3) + "...";
}

void printTable(const std::vector<Record>& records) {
    size_t wid = 10, wtype = 4, wtitle = 5;
    for (const Record& r : records) {
        wid = std::max(wid, std::min<size_t>(r.identifier.size(), 40));
        wtype = std::max(wtype, std::min<size_t>(r.type.size(), 12));
        wtitle = std::max(wtitle, std::min<size_t>(r.title.size(), 50));
    }
    auto row = [&](const std::string& a, const std::string& b, const std::string& c, const std::string& d) {
        std::string line = clip(a, wid);
        line.resize(wid + 2, ' ');
        line += clip(b, wtype);
        line.resize(wid + wtype + 4, ' ');
        line += clip(c, wtitle);
        line.resize(wid + wtype + wtitle + 6, ' ');
        line += d;
        while (!line.empty() && line.back() == ' ') line.pop_back();
        std::cout << line << "\n";
    };
    row("IDENTIFIER", "TYPE", "TITLE", "ONLINE RESOURCES");
    for (const Record& r : records) {
        std::string links;
        for (const std::string& l : r.links) links += (links.empty() ? "" : " ") + l;
        row(r.identifier.empty() ? "-" : r.identifier, r.type.empty() ? "-" : r.type, r.title.empty() ? "-" : r.title,
            links.empty() ? "-" : links);
    }
}

}  // namespace

int cmdRecords(const CliOptions& o) {
    if (o.positional.size() != 1) throw std::runtime_error("usage: vxogc records URL [--start N] [--post] [--all]");
    VxString url = o.positional[0];
    const bool post = o.flag("post");
    // GET parameters follow the URL directly.
    if (!post) url = VxOgcService::readyForParameters(url);
    long long start = o.has("start") ? VxStringUtils::atoi64(o.value("start")) : 1;
    if (start < 1 || start > 0x7fffffff) throw std::runtime_error("--start needs a record position from 1");
    const bool all = o.flag("all");
    const bool terminal = isatty(STDERR_FILENO);

    std::vector<Record> records;
    long long matched = -1;
    for (int pages = 0; pages < 100000; ++pages) {
        TiXmlDocument doc;
        if (!VxCswService::getRecords(url, doc, static_cast<int>(start), post, o.timeout))
            throw std::runtime_error("GetRecords failed at position " + std::to_string(start));
        Page page = readPage(doc);
        matched = page.matched;
        records.insert(records.end(), page.records.begin(), page.records.end());
        if (all && terminal)
            std::cerr << "\rFetched " << records.size() << " of " << (matched >= 0 ? std::to_string(matched) : "?")
                      << " records" << std::flush;
        // Stop when the catalogue has no more, or when it would not move on.
        if (!all || page.next <= start || page.records.empty() || (matched >= 0 && page.next > matched)) break;
        start = page.next;
    }
    if (all && terminal) std::cerr << "\n";
    printTable(records);
    std::cout << records.size() << " record(s)";
    if (matched >= 0) std::cout << " of " << matched << " matched";
    std::cout << "\n";
    return 0;
}
