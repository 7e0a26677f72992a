// The bundled example through the component on Windows: cscript //nologo locate.js, in this folder,
// once trllocator.dll is registered (regsvr32 trllocator.dll).
function load(path) {
  var document = new ActiveXObject("Msxml2.DOMDocument.3.0");
  document.async = false;
  document.load(path);
  return document;
}
var locate = new ActiveXObject("trlLocator.Locate");
locate.Asynchronous = false;
var merged = new ActiveXObject("Msxml2.DOMDocument.3.0");
merged.loadXML(locate.Start(load("search-options.xml"), load("application-options.xml"), 63,
                            load("fingerprint.xml")));
var found = merged.selectNodes("//a");
for (var i = 0; i < found.length; i++) {
  WScript.Echo(found.item(i).getAttribute("a_name") + " " + found.item(i).getAttribute("v_name"));
}
WScript.Echo("Status " + locate.Status);
