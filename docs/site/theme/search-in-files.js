// A page that is read as a file loads no other file but as a script, and starts no worker: there the
// search has its index from a script, and runs in a frame.
if (location.protocol === "file:") {
  const index = new URL("search/search_index.js", document.currentScript.src);
  document.write(`<script src="${index}"></script>`);
  window.Worker = class extends EventTarget {
    constructor(url) {
      super();
      this.onmessage = null;
      this.waiting = [];
      this.frame = document.createElement("iframe");
      this.frame.hidden = true;
      document.body.append(this.frame);
      const inside = this.frame.contentWindow;
      inside.postMessage = (data) => {
        const message = new MessageEvent("message", { data });
        this.dispatchEvent(message);
        if (this.onmessage) this.onmessage(message);
      };
      inside.importScripts = (...urls) => Promise.all(urls.map((each) => this.load(each)));
      this.load(url).then(() => {
        const waiting = this.waiting;
        this.waiting = null;
        waiting.forEach((data) => this.deliver(data));
      });
    }
    load(url) {
      return new Promise((resolve, reject) => {
        const script = this.frame.contentDocument.createElement("script");
        script.onload = resolve;
        script.onerror = reject;
        script.src = url;
        this.frame.contentDocument.body.append(script);
      });
    }
    deliver(data) {
      this.frame.contentWindow.dispatchEvent(new MessageEvent("message", { data }));
    }
    postMessage(data) {
      if (this.waiting) this.waiting.push(data);
      else this.deliver(data);
    }
    terminate() {
      this.frame.remove();
    }
  };
}
