// The page in a browser. Each test opens a page about an invented story (makepage.cpp) from the
// disk; whatever the browser complains of or asks for from elsewhere fails the test.
'use strict';

const assert = require('node:assert/strict');
const {execFileSync} = require('node:child_process');
const fs = require('node:fs');
const os = require('node:os');
const path = require('node:path');
const {after, before, test} = require('node:test');
const {pathToFileURL} = require('node:url');
const {chromium} = require('playwright-core');

const kDrawnMilliseconds = 1000; // what fifty services and ten thousand events may take
const kLoads = 10;               // a busy machine's slow ones do not count
const kWaitMilliseconds = 60000; // a busy machine takes its time
const kDaySeconds = 86400;
const kLeastContrast = 4.5;
const kLeastTargetPixels = 44;

let browser;
let folder;
const pages = new Map();

before(async () => {
    folder = fs.mkdtempSync(path.join(os.tmpdir(), 'tolkwd-report-page-'));
    browser = await chromium.launch({
        executablePath: process.env.CHROMIUM,
        args: ['--no-sandbox'],
    });
});

after(async () => {
    await browser?.close();
    fs.rmSync(folder, {recursive: true, force: true});
});

function pageabout(story) {
    if (!pages.has(story)) {
        const file = path.join(folder, `${story}.html`);
        const text = execFileSync(process.env.MAKEPAGE, [story], {maxBuffer: 2 ** 28});
        fs.writeFileSync(file, text);
        pages.set(story, pathToFileURL(file).href);
    }
    return pages.get(story);
}

// Opens a story's page, hands it to `look` when it is drawn, and closes it.
async function open(story, look, options = {}) {
    const url = pageabout(story);
    const context = await browser.newContext({
        viewport: {width: 1280, height: 900}, colorScheme: 'light', ...options,
    });
    const page = await context.newPage();
    page.setDefaultTimeout(kWaitMilliseconds);
    const problems = [];
    page.on('console', (said) => problems.push(`console: ${said.text()}`));
    page.on('pageerror', (error) => problems.push(`error: ${error.message}`));
    page.on('dialog', (dialog) => {
        problems.push(`dialog: ${dialog.message()}`);
        dialog.dismiss();
    });
    page.on('request', (request) => {
        if (request.url() !== url && request.url() !== 'data:,') {
            problems.push(`request: ${request.url()}`);
        }
    });
    try {
        await page.goto(url);
        await page.waitForSelector('html[data-drawn]');
        await look(page, problems);
        assert.deepEqual(problems, []);
    } finally {
        await context.close();
    }
}

function texts(page, selector) {
    return page.locator(selector).allTextContents();
}

const servicesinlines = (page) => texts(page, '.row .name');
const servicesintable = (page) => texts(page, 'tbody .name');

// Until the page has drawn what it was last asked for.
function drawn(page) {
    return page.evaluate(() => new Promise((resolve) => {
        requestAnimationFrame(() => requestAnimationFrame(resolve));
    }));
}

// What part of the log is shown, in seconds since 1970; all of it if it does not say.
async function shown(page) {
    await drawn(page);
    const moments = /(\d{4}-\d\d-\d\d \d\d:\d\d:\d\d) to (\d{4}-\d\d-\d\d \d\d:\d\d:\d\d)/;
    const range = await page.textContent('#range');
    const [, from, to] = moments.exec(range) ?? moments.exec(await page.textContent('#period'));
    const seconds = (text) => Date.parse(`${text.replace(' ', 'T')}Z`) / 1000;
    const [begin, end] = [seconds(from), seconds(to)];
    return {from: begin, to: end, length: end - begin, whole: range === 'All of the log is shown.'};
}

async function track(page, row = 0) {
    return page.locator('.row .track').nth(row).boundingBox();
}

// The place at a share of a time line's width.
async function pointon(page, share, row = 0) {
    const {x, y, width, height} = await track(page, row);
    return {x: x + width * share, y: y + height * 0.6};
}

async function rowof(page, service) {
    const row = (await servicesinlines(page)).indexOf(service);
    assert.notEqual(row, -1, `${service} has no time line`);
    return row;
}

function details(page) {
    return page.locator('#details').innerText();
}

test('fifty services and ten thousand events are on the screen in under a second', async (t) => {
    const times = [];
    const fastenough = () => times.some((time) => time < kDrawnMilliseconds);
    for (let load = 0; load < kLoads && !fastenough(); ++load) {
        await open('crowd', async (page) => {
            const {spans, marks, rows} = await page.evaluate(() => {
                const data = JSON.parse(document.getElementById('data').textContent);
                return {
                    spans: data.services.reduce((sum, service) => sum + service.spans.length, 0),
                    marks: data.marks.length,
                    rows: data.services.length,
                };
            });
            assert.equal(rows, 50);
            assert.ok(spans + marks >= 10000);
            assert.equal((await servicesintable(page)).length, 50);
            assert.ok((await servicesinlines(page)).length >= 10);
            assert.ok(await page.locator('.row:first-child .span').count() > 50);
            times.push(Number(await page.getAttribute('html', 'data-drawn')));
        });
    }
    t.diagnostic(`milliseconds of each load: ${times.join(', ')}`);
    assert.ok(fastenough(), `the fastest of ${times.length} loads: ${Math.min(...times)} ms`);
});

test('only rows in sight are in the document, and they follow the scrolling', async () => {
    await open('thousand', async (page) => {
        assert.equal((await servicesintable(page)).length, 1000);
        assert.ok((await servicesinlines(page)).length < 60);
        const {height} = await page.locator('#lines').boundingBox();
        assert.ok(height > 1000 * 20);
        const before = await servicesinlines(page);
        await page.evaluate(() => window.scrollTo(0, 20000));
        await page.waitForFunction((first) =>
            ![...document.querySelectorAll('.row .name')].some((name) => name.textContent === first),
        before[0]);
        const rows = await page.locator('.row').evaluateAll((all) => all.filter((row) => {
            const {top, bottom} = row.getBoundingClientRect();
            return bottom > 0 && top < window.innerHeight;
        }).length);
        assert.ok(rows > 20);
    });
});

test('states too short to be seen are drawn together, as the worst of them', async () => {
    await open('dense', async (page) => {
        const bars = await page.locator('.row .span').evaluateAll((all) => all.map((bar) => ({
            x: Number(bar.getAttribute('x')), label: bar.getAttribute('aria-label'),
            word: bar.classList[1],
        })));
        const {width} = await track(page);
        assert.ok(bars.length <= width / 1.5 + 2, `${bars.length} bars on ${width} pixels`);
        const together = bars.filter(({label}) => / states, the worst /.test(label));
        assert.ok(together.length > 100);
        assert.ok(together.every(({word}) => word === 'recovering'));
        // All but the edges of what there is is covered.
        const places = bars.map(({x}) => x).sort((a, b) => a - b);
        assert.ok(places.at(-1) > width * 0.99);
        assert.ok(places[0] < width * 0.01);
    });
});

test('the wheel zooms around what it points at, until the log is whole again', async () => {
    await open('week', async (page) => {
        const all = await shown(page);
        assert.ok(all.whole);
        const place = await pointon(page, 0.25);
        await page.mouse.move(place.x, place.y);
        await page.mouse.wheel(0, -500);
        const zoomed = await shown(page);
        assert.ok(zoomed.length < all.length * 0.6);
        const pointed = ({from, length}) => from + length * 0.25;
        assert.ok(Math.abs(pointed(zoomed) - pointed(all)) < all.length / 500);
        for (let turn = 0; turn < 4; ++turn) {
            await page.mouse.wheel(0, 500);
        }
        assert.ok((await shown(page)).whole);
    });
});

test('the wheel beside the lines scrolls the page', async () => {
    await open('crowd', async (page) => {
        const {x, y} = await page.locator('.row .name').first().boundingBox();
        await page.mouse.move(x + 5, y + 5);
        await page.mouse.wheel(0, 300);
        await page.waitForFunction(() => window.scrollY >= 200);
        assert.ok((await shown(page)).whole);
    });
});

test('the wheel scrolls the page where zooming out has come to its end', async () => {
    await open('crowd', async (page) => {
        const place = await pointon(page, 0.5);
        await page.mouse.move(place.x, place.y);
        await page.mouse.wheel(0, 300);
        await page.waitForFunction(() => window.scrollY >= 200);
        assert.ok((await shown(page)).whole);
    });
});

test('buttons zoom and pan', async () => {
    await open('week', async (page) => {
        for (const id of ['#out', '#all', '#back', '#forth']) {
            assert.ok(await page.isDisabled(id));
        }
        await page.click('#in');
        const half = await shown(page);
        assert.equal(half.length, 3.5 * kDaySeconds);
        await page.click('#back');
        assert.equal((await shown(page)).from, half.from - half.length / 4);
        await page.click('#forth');
        await page.click('#forth');
        assert.equal((await shown(page)).from, half.from + half.length / 4);
        await page.click('#out');
        assert.ok((await shown(page)).whole);
        await page.getByRole('button', {name: 'Last day'}).click();
        const last = await shown(page);
        assert.equal(last.length, kDaySeconds);
        await page.click('#all');
        const all = await shown(page);
        assert.ok(all.whole);
        assert.equal(last.to, all.to);
    });
});

test('zooming in ends where seconds can be told apart', async () => {
    await open('week', async (page) => {
        for (let i = 0; i < 30; ++i) {
            await page.click('#in');
        }
        assert.equal((await shown(page)).length, 10);
        const ticks = await texts(page, '#axis text.tick');
        assert.ok(ticks.length >= 5);
        assert.ok(ticks.every((text) => /^\d\d:\d\d:\d\d$/.test(text)), ticks.join());
    });
});

async function ticksat(story, zooms) {
    await open(story, async (page) => {
        for (let i = 0; i < zooms; ++i) {
            const {left, right} = await page.locator('#axis').evaluate((axis) => {
                const {left: begin, right: end} = axis.getBoundingClientRect();
                return {left: begin, right: end};
            });
            for (const kind of ['tick', 'context']) {
                const boxes = await page.locator(`#axis text.${kind}:not([visibility])`)
                    .evaluateAll((all) => all.map((text) => {
                        const box = text.getBoundingClientRect();
                        return [box.left, box.right];
                    }));
                assert.ok(boxes.length > 0, `no ${kind} after ${i} zooms`);
                boxes.sort((a, b) => a[0] - b[0]);
                boxes.forEach(([begin, end], place) => {
                    assert.ok(begin >= left - 3 && end <= right + 3, `a ${kind} sticks out`);
                    assert.ok(place === 0 || begin > boxes[place - 1][1], `${kind}s touch`);
                });
            }
            await page.click('#in');
            await drawn(page);
        }
    });
}

test('ticks keep apart and stay inside the picture at every zoom', async () => {
    await ticksat('week', 17);
    await ticksat('years', 24);
    await ticksat('clocks', 14);
});

test('dragging pans, and is no click', async () => {
    await open('week', async (page) => {
        await page.click('#in');
        const before = await shown(page);
        const from = await pointon(page, 0.5);
        const {width} = await track(page);
        await page.mouse.move(from.x, from.y);
        await page.mouse.down();
        await page.mouse.move(from.x + width / 8, from.y, {steps: 4});
        await page.mouse.move(from.x + width / 4, from.y, {steps: 4});
        await page.mouse.up();
        const after = await shown(page);
        assert.ok(Math.abs(before.from - after.from - before.length / 4) < before.length / 100);
        assert.equal(after.length, before.length);
        assert.equal(await page.locator('.chosen').count(), 0);
    });
});

test('two fingers pinch, one pans', async () => {
    await open('week', async (page) => {
        const session = await page.context().newCDPSession(page);
        const touch = (type, points) => session.send('Input.dispatchTouchEvent', {
            type, touchPoints: points.map(([x, y], id) => ({x, y, id})),
        });
        await page.locator('.row').first().scrollIntoViewIfNeeded();
        const {x, y} = await pointon(page, 0.5);
        const before = await shown(page);
        await touch('touchStart', [[x - 30, y], [x + 30, y]]);
        for (const spread of [45, 60, 75, 90]) {
            await touch('touchMove', [[x - spread, y], [x + spread, y]]);
        }
        await touch('touchEnd', []);
        const pinched = await shown(page);
        assert.ok(Math.abs(pinched.length - before.length / 3) < before.length / 20);
        await touch('touchStart', [[x, y]]);
        for (const moved of [20, 40, 60, 80]) {
            await touch('touchMove', [[x - moved, y]]);
        }
        await touch('touchEnd', []);
        const panned = await shown(page);
        assert.ok(panned.from > pinched.from + pinched.length / 10);
        assert.equal(Math.round(panned.length / 60), Math.round(pinched.length / 60));
    }, {viewport: {width: 400, height: 800}, hasTouch: true, isMobile: true});
});

test('pointing at a state tells about it', async () => {
    await open('week', async (page) => {
        const row = await rowof(page, 'postgresql');
        const place = await pointon(page, 0.9, row);
        await page.mouse.move(place.x, place.y);
        const told = await details(page);
        assert.match(told, /postgresql/);
        assert.match(told, /gave-up/);
        assert.match(told, /2026-11-19 14:00:00 to 2026-11-22 00:00:00 \(2 d 10 h\)/);
        assert.match(told, /given up after 3 recoveries/);
        await page.mouse.move(5, 5);
        assert.match(await details(page), /Point at a time line/);
    });
});

test('what was inferred is marked and says so', async () => {
    await open('week', async (page) => {
        const row = await rowof(page, 'cron');
        const place = await pointon(page, 0.5, row);
        await page.mouse.move(place.x, place.y);
        assert.match(await details(page), /up\s*~[^]*inferred: no message of the log says/);
        const fill = await page.locator('.row').nth(row).locator('.span').getAttribute('fill');
        assert.equal(fill, 'url(#look-up-inferred)');
        assert.match(await page.textContent('#legend'), /~ lighter, hatched/);
        const state = page.locator('tbody tr', {hasText: 'cron'}).locator('.state');
        assert.match(await state.textContent(), /up~ \(inferred\)/);
    });
});

test('a short state is reached by pointing next to it', async () => {
    await open('week', async (page) => {
        const row = await rowof(page, 'nginx');
        const bar = page.locator('.row').nth(row).locator('.span.recovering').first();
        const {x, y} = await bar.boundingBox();
        await page.mouse.move(x - 1, y + 5);
        assert.match(await details(page), /2 states too short|suspect|recovering/);
        assert.match(await details(page), /2026-11-16 07:0/);
    });
});

test('a click chooses a state, which stays chosen', async () => {
    await open('week', async (page) => {
        const row = await rowof(page, 'redis-server');
        const place = await pointon(page, 0.3, row);
        await page.mouse.click(place.x, place.y);
        await page.mouse.move(5, 5);
        assert.match(await details(page), /redis-server[^]*busy/);
        assert.equal(await page.locator('.chosen').count(), 1);
        await page.keyboard.press('Escape');
        assert.equal(await page.locator('.chosen').count(), 0);
        assert.match(await details(page), /Point at a time line/);
        await page.keyboard.press('ArrowDown');
        assert.equal(await page.locator('.chosen').count(), 1);
    });
});

test('the names can be clicked and marked without choosing anything', async () => {
    await open('week', async (page) => {
        await page.locator('.row .name').nth(2).dblclick({position: {x: 12, y: 14}});
        assert.equal(await page.evaluate(() => getSelection().toString().trim()), 'postfix');
        assert.equal(await page.locator('.chosen').count(), 0);
    });
});

test('what is told of a state is not in the way of the pointer', async () => {
    await open('crowd', async (page) => {
        const told = async () => {
            const {x, y, width} = await page.locator('#details').boundingBox();
            return {x: x + width / 2, y: y + 30};
        };
        const first = await pointon(page, 0.5);
        await page.mouse.move(first.x, first.y);
        await page.waitForSelector('#details:not(.idle)');
        const covered = await told();
        await page.mouse.move(covered.x, covered.y);
        assert.doesNotMatch(await details(page), /Point at a time line/);
        assert.equal(await page.evaluate(({x, y}) =>
            document.elementFromPoint(x, y).closest('#details'), covered), null);
    });
});

test('the keyboard goes from state to state and from service to service', async () => {
    await open('week', async (page) => {
        await page.locator('#all').focus();
        await page.keyboard.press('Tab');
        const focused = () => page.evaluate(() => document.activeElement.getAttribute('aria-label'));
        assert.match(await focused(), /^postgresql: gave-up, /);
        await page.keyboard.press('ArrowLeft');
        assert.match(await focused(), /^postgresql: suspect, 2026-11-19 12:00:00/);
        await page.keyboard.press('Home');
        assert.match(await focused(), /^postgresql: up, inferred, 2026-11-15 00:00:00/);
        await page.keyboard.press('ArrowRight');
        assert.match(await focused(), /^postgresql: suspect, 2026-11-19 02:00:00/);
        await page.keyboard.press('End');
        await page.keyboard.press('ArrowDown');
        assert.match(await focused(), /^an-example[^:]*: unknown-service, /);
        assert.match(await details(page), /an-example[^]*unknown-service/);
        await page.keyboard.press('ArrowUp');
        assert.match(await focused(), /^postgresql: /);
        await page.keyboard.press('Escape');
        assert.equal(await page.locator('.chosen').count(), 0);
    });
});

test('tab reaches the time lines once and leaves them', async () => {
    await open('week', async (page) => {
        await page.locator('#in').focus();
        const inlines = () => page.evaluate(() =>
            document.getElementById('lines').contains(document.activeElement));
        const stops = [];
        for (let i = 0; i < 12; ++i) {
            await page.keyboard.press('Tab');
            stops.push(await inlines());
        }
        assert.equal(stops.filter((inside) => inside).length, 1, stops.join());
    });
});

test('keys zoom and pan', async () => {
    await open('week', async (page) => {
        await page.locator('#lines').focus();
        await page.keyboard.press('+');
        const half = await shown(page);
        assert.equal(half.length, 3.5 * kDaySeconds);
        await page.keyboard.press('Shift+ArrowLeft');
        assert.equal((await shown(page)).from, half.from - half.length / 4);
        await page.keyboard.press('Shift+ArrowRight');
        await page.keyboard.press('-');
        assert.ok((await shown(page)).whole);
        // To the chosen state, and back.
        await page.keyboard.press('ArrowLeft');
        await page.keyboard.press('Enter');
        assert.equal((await shown(page)).length, 4 * 3600);
        await page.keyboard.press('0');
        assert.ok((await shown(page)).whole);
    });
});

test('the keys of the browser itself are left to it', async () => {
    await open('week', async (page) => {
        await page.locator('#lines').focus();
        await page.keyboard.press('+');
        const half = await shown(page);
        await page.evaluate(() => {
            window.taken = [];
            window.addEventListener('keydown', ({key, defaultPrevented}) => {
                window.taken.push(`${key} ${defaultPrevented}`);
            });
        });
        for (const key of ['Control+0', 'Control+-', 'Alt+0', 'Meta+0']) {
            await page.keyboard.press(key);
        }
        assert.deepEqual(await shown(page), half);
        assert.deepEqual(await page.evaluate(() =>
            window.taken.filter((key) => !/^(Control|Alt|Meta) /.test(key))),
        ['0 false', '- false', '0 false', '0 false']);
    });
});

test('a state out of sight comes into sight when it is chosen', async () => {
    await open('crowd', async (page) => {
        await page.locator('#lines').focus();
        for (let i = 0; i < 40; ++i) {
            await page.keyboard.press('ArrowDown');
        }
        const seen = await page.evaluate(() => {
            const {top, bottom} = document.activeElement.getBoundingClientRect();
            const upper = document.getElementById('axis').getBoundingClientRect().bottom;
            const lower = document.getElementById('details').getBoundingClientRect().top;
            return {top, bottom, upper, lower};
        });
        assert.ok(seen.top >= seen.upper && seen.bottom <= seen.lower, JSON.stringify(seen));
        await page.getByRole('button', {name: 'Last hour'}).click();
        await page.locator('.chosen').focus();
        await page.keyboard.press('Home');
        const {from, to} = await shown(page);
        const begin = Date.parse('2026-11-15T00:00:00Z') / 1000;
        assert.ok(from >= begin && to < begin + 2 * kDaySeconds);
    });
});

test('the filter by name and by state holds for lines and table', async () => {
    await open('week', async (page) => {
        await page.fill('#name', 'PHP');
        assert.deepEqual(await servicesintable(page), ['php8.2-fpm']);
        await drawn(page);
        assert.deepEqual(await servicesinlines(page), ['php8.2-fpm']);
        assert.match(await page.textContent('#shown'), /1 of 10 services/);
        await page.fill('#name', 'no such thing');
        assert.deepEqual(await servicesintable(page), []);
        assert.match(await page.textContent('#shown'), /No service is like that/);
        await page.getByRole('button', {name: 'Show all'}).click();
        assert.equal((await servicesintable(page)).length, 10);
        assert.equal(await page.inputValue('#name'), '');
        const chip = page.locator('.chip[data-state="gave-up"]');
        await chip.click();
        assert.equal(await chip.getAttribute('aria-pressed'), 'true');
        assert.deepEqual(await servicesintable(page), ['postgresql']);
        await page.locator('.chip[data-state="command-not-recognised"]').click();
        assert.deepEqual(await servicesintable(page), ['postgresql', 'postfix']);
        await drawn(page);
        assert.deepEqual(await servicesinlines(page), ['postgresql', 'postfix']);
    });
});

test('a chosen state goes with its service', async () => {
    await open('week', async (page) => {
        await page.locator('#lines').focus();
        await page.fill('#name', 'cron');
        await drawn(page);
        assert.equal(await page.locator('.chosen').count(), 0);
        assert.match(await details(page), /Point at a time line/);
        await page.locator('.chip').last().focus();
        for (let stop = 0; stop < 10 && !/cron/.test(await details(page)); ++stop) {
            await page.keyboard.press('Tab');
        }
        assert.match(await details(page), /cron/);
    });
});

test('headings sort, by mouse and by key, and the lines follow', async () => {
    await open('week', async (page) => {
        const order = (id) => page.locator('th', {has: page.locator(`#by-${id}`)})
            .getAttribute('aria-sort');
        assert.equal(await order('state'), 'descending');
        assert.equal((await servicesintable(page))[0], 'postgresql');
        await page.click('#by-service');
        assert.equal(await order('service'), 'ascending');
        assert.equal(await order('state'), 'none');
        const names = await servicesintable(page);
        assert.deepEqual(names, [...names].sort());
        await page.evaluate(() => window.scrollTo(0, 0));
        await drawn(page);
        assert.deepEqual(await servicesinlines(page), names);
        await page.locator('#by-service').focus();
        await page.keyboard.press('Enter');
        assert.equal(await order('service'), 'descending');
        assert.deepEqual(await servicesintable(page), names.reverse());
        await page.click('#by-outages');
        assert.equal((await servicesintable(page))[0], 'php8.2-fpm');
        // What has no figure comes last either way.
        for (const click of [1, 2]) {
            await page.click('#by-lastoutage');
            const row = page.locator('tbody tr').last();
            assert.equal(await row.locator('td[data-title="Last outage"]').textContent(), '\u2013',
                `after click ${click}`);
        }
    });
});

test('the table has the figures', async () => {
    await open('week', async (page) => {
        const row = page.locator('tbody tr', {hasText: 'postgresql'});
        assert.deepEqual(await row.locator('td').allTextContents(), [
            'gave-up', '2026-11-19 14:00:00', '2026-11-19 02:00:00', '2 d 22 h, so far', '1',
            '2 d 22 h', '3 (0 worked)', '1', '0', '58.33\u00a0%',
        ]);
        assert.equal(await page.textContent('#headline'), '3 of 10 services in trouble');
        assert.match(await page.textContent('#counts'), /48,123 lines read/);
    });
});

test('an availability is rounded down', async () => {
    await open('week', async (page) => {
        const share = async (service) => page.locator('tbody tr', {hasText: service})
            .locator('td[data-title="Availability"]').textContent();
        assert.equal(await share('nginx'), '99.86\u00a0%'); // 99.8677
        assert.equal(await share('ssh'), '100\u00a0%');
    });
});

test('light and dark follow the system until somebody chooses', async () => {
    const back = (page) => page.evaluate(() =>
        getComputedStyle(document.documentElement).backgroundColor);
    await open('week', async (page) => {
        const dark = await back(page);
        await page.emulateMedia({colorScheme: 'light'});
        await page.waitForSelector('html[data-theme=light]');
        const light = await back(page);
        assert.notEqual(dark, light);
        await page.getByText('Dark', {exact: true}).click();
        assert.equal(await back(page), dark);
        await page.reload();
        await page.waitForSelector('html[data-drawn]');
        assert.equal(await back(page), dark);
        await page.locator('#theme input:checked').press('ArrowLeft');
        assert.equal(await back(page), light);
    }, {colorScheme: 'dark'});
});

// The least contrast of text against what is behind it, by the formula of the accessibility
// guidelines.
function leastcontrast(page) {
    return page.evaluate(() => {
        const channels = (colour) => colour.match(/[\d.]+/g).map(Number);
        const linear = (value) => (value <= 0.04045 ? value / 12.92 : ((value + 0.055) / 1.055) ** 2.4);
        const luminance = ([r, g, b]) => 0.2126 * linear(r / 255) + 0.7152 * linear(g / 255) +
            0.0722 * linear(b / 255);
        const behind = (element) => {
            for (let one = element; one; one = one.parentElement) {
                const colour = channels(getComputedStyle(one).backgroundColor);
                if (colour.length === 3 || colour[3] > 0) {
                    return colour;
                }
            }
            return [255, 255, 255];
        };
        const contrasts = [];
        const walker = document.createTreeWalker(document.body, NodeFilter.SHOW_TEXT);
        for (let node = walker.nextNode(); node; node = walker.nextNode()) {
            const element = node.parentElement;
            const visible = node.textContent.trim() !== '' && element.getClientRects().length > 0;
            if (visible && !element.closest('[aria-disabled=true], script, style')) {
                const style = getComputedStyle(element);
                const colour = channels(element.closest('svg') ? style.fill : style.color);
                const [less, more] = [luminance(colour), luminance(behind(element))]
                    .sort((a, b) => a - b);
                contrasts.push({contrast: (more + 0.05) / (less + 0.05), text: node.textContent});
            }
        }
        return contrasts.sort((a, b) => a.contrast - b.contrast)[0];
    });
}

for (const colorScheme of ['light', 'dark']) {
    test(`text can be read in ${colorScheme}`, async () => {
        await open('week', async (page) => {
            await page.locator('.chip').first().click();
            const {contrast, text} = await leastcontrast(page);
            assert.ok(contrast >= kLeastContrast, `${contrast} of ${text}`);
        }, {colorScheme});
    });
}

test('each state has a pattern of its own', async () => {
    await open('week', async (page) => {
        const patterns = await page.locator('#patterns pattern').evaluateAll((all) =>
            all.map((one) => [...one.querySelectorAll('path')].map((line) =>
                line.getAttribute('d') + line.getAttribute('class')).join()));
        assert.equal(patterns.length, 20);
        assert.equal(new Set(patterns).size, 20);
    });
});

test('names of any kind are text', async () => {
    await open('hostile', async (page) => {
        const names = await servicesintable(page);
        for (const name of ['<script>alert(1)</script>', '</script>', '<!--<script>',
            '"onmouseover="alert(1)', '&lt;b&gt;', 'f\\xfcr', 'a\\x0ab\tc', '\\u{202e}gnp.exe', '(no name)',
            '{{data}}', ']]>']) {
            assert.ok(names.includes(name), `${name} is not among ${names.join(' ')}`);
        }
        assert.deepEqual((await servicesinlines(page)).sort(), names.sort());
        assert.match(await page.textContent('#source'), /<\/script><script>alert\(1\)<\/script>/);
        const row = await rowof(page, '<script>alert(1)</script>');
        const place = await pointon(page, 0.5, row);
        await page.mouse.move(place.x, place.y);
        assert.match(await details(page), /given up: <script>alert\(1\)<\/script>/);
        // What is the page's own: data, d3, and its script.
        assert.equal(await page.locator('script').count(), 3);
    });
});

test('the policy lets nothing else run or be fetched', async () => {
    await open('week', async (page, problems) => {
        const refused = await page.evaluate(() => new Promise((resolve) => {
            const policies = [];
            document.addEventListener('securitypolicyviolation', (event) => {
                policies.push(event.effectiveDirective);
                if (policies.length === 4) {
                    resolve(policies.sort());
                }
            });
            const script = document.createElement('script');
            script.textContent = 'window.ran = true;';
            document.body.append(script);
            const style = document.createElement('style');
            style.textContent = 'body { color: red }';
            document.body.append(style);
            const image = document.createElement('img');
            image.src = 'nothing.png';
            document.body.append(image);
            fetch('http://127.0.0.1:9/').catch(() => {});
        }));
        assert.deepEqual(refused, ['connect-src', 'img-src', 'script-src-elem', 'style-src-elem']);
        assert.equal(await page.evaluate(() => window.ran), undefined);
        problems.length = 0;
    });
});

test('on a phone nothing sticks out and fingers have room', async () => {
    for (const story of ['week', 'hostile', 'nothing', 'crowd']) {
        await open(story, async (page) => {
            const wide = await page.evaluate(() => document.documentElement.scrollWidth);
            assert.ok(wide <= 360, `${story}: ${wide}`);
            const small = await page.locator('button:visible, .theme span:visible')
                .evaluateAll((all, least) => all.map((one) => {
                    const {width, height} = one.getBoundingClientRect();
                    return {width, height, text: one.textContent};
                }).filter(({width, height}) => width < least || height < least),
                kLeastTargetPixels);
            assert.deepEqual(small, []);
        }, {viewport: {width: 360, height: 740}, hasTouch: true, isMobile: true});
    }
});

test('nothing sticks out of a window of any width', async () => {
    await open('week', async (page) => {
        for (const width of [320, 640, 641, 900, 1120, 1121, 1200, 1360, 1361, 1560, 1561, 2400]) {
            await page.setViewportSize({width, height: 800});
            await drawn(page);
            const [body, table] = await page.evaluate(() => [document.documentElement,
                document.getElementById('summary')].map((one) => one.scrollWidth - one.clientWidth));
            assert.deepEqual([body, table], [0, 0], `at ${width}`);
        }
    });
});

test('a tap chooses', async () => {
    await open('week', async (page) => {
        const row = await rowof(page, 'postgresql');
        await page.locator('.row').nth(row).scrollIntoViewIfNeeded();
        const place = await pointon(page, 0.9, row);
        await page.touchscreen.tap(place.x, place.y);
        await page.locator('.chosen').waitFor({state: 'attached'});
        assert.match(await details(page), /postgresql[^]*gave-up/);
    }, {viewport: {width: 360, height: 740}, hasTouch: true, isMobile: true});
});

test('paper shows everything, light, without what is to be pressed', async () => {
    await open('crowd', async (page) => {
        await page.emulateMedia({media: 'print'});
        await page.waitForFunction(() => document.querySelectorAll('.row').length === 50);
        assert.equal(await page.evaluate(() =>
            getComputedStyle(document.documentElement).backgroundColor), 'rgb(255, 255, 255)');
        for (const id of ['#theme', '#states', '#name', '#in', '#details', '#keys']) {
            assert.ok(await page.isHidden(id), id);
        }
        const tops = await page.locator('.row').evaluateAll((all) =>
            all.map((row) => row.getBoundingClientRect().top));
        assert.ok(tops.every((top, i) => i === 0 || top > tops[i - 1]));
        await page.emulateMedia({media: 'screen'});
        await page.waitForFunction(() => document.querySelectorAll('.row').length < 50);
        const paper = (await page.pdf({format: 'A4'})).toString('latin1');
        assert.ok(paper.match(/\/Type \/Page\b/g).length > 1);
    }, {colorScheme: 'dark'});
});

test('a log without a service says so', async () => {
    await open('nothing', async (page) => {
        assert.equal(await page.textContent('#headline'), 'No services');
        assert.match(await page.textContent('#empty'), /No line of this log is a message of tolkwd/);
        assert.ok(await page.isHidden('#content'));
        assert.equal(await page.textContent('#source'), 'from standard input');
        assert.match(await page.textContent('#counts'), /3 lines read .* 3 lines of others/);
    });
});

test('a configuration that could not be loaded is told first of all', async () => {
    await open('failedload', async (page) => {
        assert.match(await page.textContent('#failed'), /last load of the configuration failed/);
        assert.ok(await page.isVisible('#failed'));
    });
    await open('week', async (page) => {
        assert.ok(await page.isHidden('#failed'));
    });
});

test('a log of one instant is shown', async () => {
    await open('moment', async (page) => {
        assert.equal(await page.textContent('#period'), 'at 2026-11-15 00:00:00');
        assert.deepEqual(await servicesinlines(page), ['mail', 'web']);
        await page.locator('#lines').focus();
        assert.match(await details(page), /mail[^]*gave-up/);
        assert.ok(await page.locator('.row .span').count() >= 2);
        await page.click('#in');
        assert.ok((await shown(page)).length < 60);
    });
});

test('a clock that was set is marked, and moments are as the log has them', async () => {
    await open('clocks', async (page) => {
        assert.equal(await page.locator('.row .seam').count(), 1);
        assert.match(await page.textContent('#legend'), /set back 1 h, to 2026-11-15 11:00:00/);
        await page.locator('#lines').focus();
        await page.keyboard.press('ArrowLeft');
        assert.match(await details(page), /suspect[^]*2026-11-15 11:00:00 to 2026-11-15 11:03:30/);
        await page.keyboard.press('ArrowLeft');
        await page.keyboard.press('ArrowLeft');
        assert.match(await details(page), /suspect[^]*2026-11-15 11:00:00 to 2026-11-15 11:03:30/);
        assert.match(await page.textContent('#counts'), /the clock was set back 1 time/);
    });
});
