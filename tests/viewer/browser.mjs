// Drives the page in a headless browser, for browser_test.py.
//   node browser.mjs MODULES CHROMIUM ADDRESS SCENARIO ARGUMENTS
// Prints what it found as JSON: with the results of the scenario all that the console said, all
// requests that went elsewhere, and the findings of axe-core.
import fs from 'node:fs';
import {createRequire} from 'node:module';

const [, , modules, executablePath, address, scenario, text] = process.argv;
const require = createRequire(`${modules}/`);
const {chromium} = require('playwright-core');
const options = JSON.parse(text ?? '{}');
const origin = new URL(address).origin;

const rest = (ms) => new Promise((resolve) => setTimeout(resolve, ms));
const found = {console: [], elsewhere: []};
const browser = await chromium.launch({executablePath, args: [
  '--no-sandbox', '--disable-dev-shm-usage',
  // The network is cut: no other host is ever found.
  `--host-resolver-rules=MAP * ~NOTFOUND, EXCLUDE ${new URL(address).hostname}`]});
const context = await browser.newContext({
  viewport: {width: options.width ?? 1360, height: 860}, acceptDownloads: true, colorScheme: options.dark ? 'dark' : 'light'});
const page = await context.newPage();
page.on('console', (message) => { if (message.type() !== 'log') found.console.push(message.text()); });
page.on('pageerror', (error) => found.console.push(error.message));
page.on('request', (request) => {
  if (!/^(data|blob):/.test(request.url()) && new URL(request.url()).origin !== origin) found.elsewhere.push(request.url());
});

/** Waits until the map has all its tiles. */
const settle = () => page.evaluate(() => new Promise((resolve) => {
  vexgView.map.once('rendercomplete', () => resolve());
  vexgView.map.render();
}));

/** The red, green, blue and alpha of the pixel of the picture at a pixel of the raster. */
const colorsAt = (pixels, layer = 'images') => page.evaluate(([list, name]) => {
  const {tiles} = vexgView[name][0].tiles;
  const copy = document.createElement('canvas');
  copy.width = copy.height = 1;
  const context = copy.getContext('2d', {willReadFrequently: true});
  return list.map(([x, y]) => {
    for (const tile of tiles.values()) {
      const inX = x - 256 * tile.x, inY = y - 256 * tile.y;
      if (tile.level === 0 && inX >= 0 && inY >= 0 && inX < 256 && inY < 256) {
        context.clearRect(0, 0, 1, 1);
        context.drawImage(tile.canvas, inX, inY, 1, 1, 0, 0, 1, 1);
        return [...context.getImageData(0, 0, 1, 1).data];
      }
    }
    return null;
  });
}, [pixels, layer]);

const center = (x, y, resolution = 1) => page.evaluate(([cx, cy, r]) => {
  vexgView.map.getView().setCenter([cx, -cy]);
  vexgView.map.getView().setResolution(r);
}, [x, y, resolution]).then(settle);

/** The place on the screen of a pixel's middle. */
const screenOf = async (x, y) => {
  const [left, top] = await page.evaluate(([px, py]) => vexgView.map.getPixelFromCoordinate([px + 0.5, -py - 0.5]), [x, y]);
  const box = await page.locator('#map').boundingBox();
  return [box.x + left, box.y + top];
};

const requests = () => page.evaluate(() => performance.getEntriesByType('resource').filter(({name}) => name.includes('/api/')).length);

const choose = (label, value) => page.getByLabel(label, {exact: true}).selectOption(value);

const scenarios = {
  async first() {
    found.pictureMs = await page.evaluate(async () => {
      const loaded = performance.getEntriesByType('navigation')[0].domContentLoadedEventEnd;
      await new Promise((resolve) => { vexgView.map.once('rendercomplete', resolve); vexgView.map.render(); });
      return performance.now() - loaded;
    });
    found.values = [];
    for (const [x, y] of options.pixels) {
      found.values.push(await page.evaluate(async ([px, py]) => {
        const {readout} = vexgView;
        readout.told = null;
        readout.look([px + 0.5, -py - 0.5]);
        while (!readout.told) await new Promise((resolve) => setTimeout(resolve, 2));
        return readout.told.values[0];
      }, [x, y]));
    }
  },

  async style() {
    const [x, y] = options.center;
    await center(x, y);
    const before = await requests();
    found.ms = [];
    const timed = async (work) => {
      await work();
      found.ms.push(await page.evaluate(() => vexgView.images[0].repaintMs));
    };
    await timed(() => choose('Red', '2'));
    await timed(() => choose('Blue', '0'));
    await timed(() => choose('Curve', 'sqrt'));
    await timed(() => choose('Stretch', 'deviation'));
    await timed(() => choose('Colours', 'grey'));
    await timed(() => choose('Curve', 'linear'));
    await timed(() => choose('Stretch', 'range'));
    await settle();
    found.grey = await colorsAt(options.pixels);
    await choose('Colours', 'color');
    const handle = page.locator('canvas.histogram').first();
    await handle.scrollIntoViewIfNeeded();
    const box = await handle.boundingBox();
    await page.mouse.move(box.x + 2, box.y + 30);
    await page.mouse.down();
    await page.mouse.move(box.x + box.width / 2, box.y + 30, {steps: 4});
    await page.mouse.up();
    found.dragged = await page.evaluate(() => vexgView.images[0].endsOfBand(2));
    found.requests = (await requests()) - before;
  },

  async borders() {
    const [x, y] = options.center;
    await center(x, y);
    found.borders = await colorsAt(options.pixels, 'segments');
    await page.evaluate(() => vexgView.map.getView().fit([0, -4000, 4000, 0]));
    const begin = Date.now();
    await settle();
    found.wholeMs = Date.now() - begin;
  },

  async classes() {
    await center(150, 150);
    found.legend = await page.locator('.legend label').allTextContents();
    found.before = await colorsAt(options.pixels, 'classes');
    await page.getByLabel(found.legend[1], {exact: true}).uncheck();
    found.after = await colorsAt(options.pixels, 'classes');
    await page.getByLabel(found.legend[1], {exact: true}).check();
    const [left, top] = await screenOf(...options.pixels[0]);
    await page.mouse.move(left, top);
    await page.waitForFunction(() => document.getElementById('readout').textContent.includes('classes'));
    found.readout = await page.locator('#readout').textContent();
  },

  async segment() {
    await center(...options.pixel);
    await page.mouse.click(...await screenOf(...options.pixel));
    await page.locator('.card[data-kind=segment] table').first().waitFor();
    found.title = await page.locator('.card[data-kind=segment] h2').textContent();
    found.rows = await page.locator('.card[data-kind=segment] table').first().locator('tbody tr').allInnerTexts();
    const range = page.getByLabel('Merged up to a cost of').last();
    await range.press('End');
    await rest(600);
    await settle();
    found.told = await page.locator('.slider output').textContent();
    found.labels = await page.evaluate(() => {
      const [layer] = vexgView.segments;
      const tiles = [...layer.tiles.tiles].filter(([key]) => key.includes(`cost=${layer.cost}`)).map(([, tile]) => tile);
      return new Set(tiles.flatMap((tile) => [...tile.values])).size;
    });
  },

  async region() {
    await page.evaluate(() => vexgView.map.getView().fit([0, -vexgView.scene.rasters[0].lines, vexgView.scene.rasters[0].samples, 0]));
    await settle();
    await page.keyboard.press('r');
    for (const corner of options.ring) {
      await page.mouse.move(...await screenOf(...corner), {steps: 3});
      await page.mouse.click(...await screenOf(...corner));
      await rest(300);
    }
    await page.mouse.dblclick(...await screenOf(...options.ring.at(-1)));
    await page.locator('.card[data-kind=region] table').waitFor();
    const [download] = await Promise.all([page.waitForEvent('download'), page.getByText('Save GeoJSON').click()]);
    await download.saveAs(options.file);
    found.bands = await page.evaluate(() => vexgView.region.told.bands);
    found.cells = await page.locator('.card[data-kind=region] tbody tr').first().locator('td, th').allInnerTexts();
  },

  async swipe() {
    const [x, y] = options.pixel;
    await center(x, y);
    const shot = async () => {
      const [left, top] = await screenOf(x, y);
      const [data] = await Promise.all([page.screenshot({clip: {x: left, y: top, width: 1, height: 1}})]);
      return data.toString('base64');
    };
    found.upper = await shot();
    await page.keyboard.press('s');
    const range = page.locator('#swipe-range');
    await range.evaluate((input) => { input.value = '900'; input.dispatchEvent(new Event('input')); });
    await settle();
    found.right = await shot();
    await range.evaluate((input) => { input.value = '100'; input.dispatchEvent(new Event('input')); });
    await settle();
    found.left = await shot();
    await page.keyboard.press('s');
    await page.evaluate(() => vexgView.images[1].layer.setVisible(false));
    await settle();
    found.lower = await shot();
  },

  async shapes() {
    found.shapes = await page.evaluate(() => vexgView.map.getLayers().getArray()
      .filter((layer) => layer.getSource().getFeatures && layer.getZIndex() !== 50)
      .map((layer) => layer.getSource().getFeatures().length));
    found.layers = await page.locator('.layer label').allTextContents();
  },

  async serverGone() {
    await center(150, 150);
    process.kill(options.server);
    await rest(300);
    await page.mouse.move(...await screenOf(100, 100));
    await page.locator('#notice.fault').waitFor();
    await page.mouse.move(...await screenOf(90, 90));
    await center(0, 0, 0.5);
    found.notice = await page.locator('#notice').textContent();
    found.console = found.console.filter((text) => !/status of 422/.test(text));
  },

  async manyShapes() {
    const count = () => page.evaluate(() => vexgView.map.getLayers().getArray()
      .filter((layer) => layer.getSource().getFeatures && layer.getZIndex() !== 50)
      .map((layer) => layer.getSource().getFeatures().length)[0]);
    const wait = async (before) => {
      for (let i = 0; i < 300 && (await count()) === before; ++i) await rest(50);
      return count();
    };
    await page.waitForFunction(() => document.querySelector('.layer .note')?.textContent !== '');
    found.note = await page.locator('.layer .note').textContent();
    found.counts = [await count()];
    await center(200, 100, 0.25);
    found.counts.push(await wait(found.counts[0]));
    found.noteAfter = await page.locator('.layer .note').textContent();
  },

  async print() {
    await page.evaluate(() => { window.print = () => { window.printed = true; }; });
    await page.getByLabel('Built-up', {exact: true}).uncheck();
    await settle();
    const state = () => page.evaluate(() => [vexgView.map.getSize(), vexgView.map.getView().getResolution()]);
    const before = await state();
    const [download] = await Promise.all([page.waitForEvent('download'), page.keyboard.press('p')]);
    await download.saveAs(options.file);
    await page.keyboard.press('i');
    await page.waitForFunction(() => window.printed);
    found.states = [before, await state()];
    const shown = await page.evaluate(() => parseFloat(document.getElementById('scale-line').style.width) / vexgView.map.getSize()[0]);
    await page.emulateMedia({media: 'print'});
    found.printed = await page.evaluate(() => [...document.body.children]
      .filter((each) => each.checkVisibility()).map(({id}) => id));
    found.legend = await page.locator('.sheet-legend p').allTextContents();
    found.scale = await page.locator('.sheet-scale').textContent();
    found.picture = await page.evaluate(() => {
      const canvas = document.querySelector('#sheet canvas');
      const line = document.querySelector('.sheet-line').getBoundingClientRect().width;
      return [canvas.width, canvas.height, line / canvas.getBoundingClientRect().width];
    });
    if (options.page) await page.screenshot({path: options.page, fullPage: true});
    await page.emulateMedia({media: 'screen'});
    found.picture.push(shown);
    await page.getByLabel('Built-up', {exact: true}).check();
  },

  async picture() {
    if (options.center) await center(...options.center);
    if (options.click) {
      await page.mouse.click(...await screenOf(...options.click));
      await page.locator('.card table').first().waitFor();
    }
    for (const key of options.keys ?? []) await page.keyboard.press(key);
    if (options.scroll) await page.getByText(options.scroll, {exact: true}).first().scrollIntoViewIfNeeded();
    if (options.point) await page.mouse.move(...await screenOf(...options.point));
    await rest(700);
    await settle();
    await page.screenshot({path: options.file});
  },
};

let code = 0;
try {
  await page.goto(address);
  await page.waitForFunction(() => document.documentElement.dataset.ready === 'true', null, {timeout: 20000});
  await scenarios[scenario]();
  if (options.axe) {
    await context.newCDPSession(page).then((session) => session.send('Page.setBypassCSP', {enabled: true}));
    await page.evaluate(fs.readFileSync(require.resolve('axe-core/axe.min.js'), 'utf8'));
    const told = await page.evaluate(() => axe.run());
    found.axe = told.violations.filter(({impact}) => ['serious', 'critical'].includes(impact))
      .map(({id, nodes}) => `${id}: ${nodes.map((node) => node.html).slice(0, 3).join(' ')}`);
  }
} catch (error) {
  found.error = error.stack;
  code = 1;
}
console.log(JSON.stringify(found));
await browser.close();
process.exit(code);
